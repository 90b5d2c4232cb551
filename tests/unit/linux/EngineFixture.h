/// An engine over the fake kernel, with everything registered.
#ifndef TESTS_UNIT_LINUX_ENGINEFIXTURE_H
#define TESTS_UNIT_LINUX_ENGINEFIXTURE_H

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "libkpm/linux/src/Engine.h"
#include "tests/support/Waiting.h"
#include "tests/unit/linux/FakeKernel.h"
#include "tests/unit/linux/LinuxRecorder.h"

using ZTCTexts = std::vector<std::string>;

class LinuxEngine : public testing::Test {
protected:
    ~LinuxEngine() override { mpEngine.reset(); }

    /// Starts the engine, and registers everything on the boards there are.
    void start() { start(mKernel.options()); }

    /// The same without regular looks: what happens is found by events alone.
    void startWithoutLooks() {
        ZTSLinuxOptions lOptions = mKernel.options();
        lOptions.mPollInterval = std::chrono::hours(1);
        start(lOptions);
    }

    void start(const ZTSLinuxOptions& acrOptions) {
        mpEngine = std::make_unique<ZTCLinuxEngine>(acrOptions, mKernel);
        mpEngine->start();
        for (std::uint32_t lBoard = 0; lBoard < mpEngine->getNumberOfAdapters(); ++lBoard) {
            mRecorder.registerAll(*mpEngine, lBoard);
        }
    }

    std::uint32_t registerPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                               std::uint32_t aSubcategory) {
        mHandle = 4711;
        return mpEngine->registerForPort(aBoard, acrPort, aCategory, aSubcategory, &mRecorder, &mHandle,
                                         &ZTCLinuxRecorder::onScope);
    }

    void waitForLog(const std::string& acrText) {
        waitUntil([&] { return mLog.count(acrText) != 0; }, "the line " + acrText);
    }

    ZTCLinuxLog mLog;
    ZTCFakeKernel mKernel;
    ZTCLinuxRecorder mRecorder;
    std::unique_ptr<ZTCLinuxEngine> mpEngine;
    std::uint32_t mHandle = 0;
};

#endif
