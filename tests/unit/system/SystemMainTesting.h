/// What the tests of the driver share: it runs in a process of its own, with a pid file and a log of the test's own.
#ifndef TESTS_UNIT_SYSTEM_SYSTEMMAINTESTING_H
#define TESTS_UNIT_SYSTEM_SYSTEMMAINTESTING_H

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/include/Log.h"
#include "system/include/SystemGlobals.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/TestSystem.h"

inline void runSystemMain(ZTCSystem* apSystem, std::vector<std::string> aArguments) {
    aArguments.insert(aArguments.begin(), "program");
    std::vector<char*> lArgv;
    for (std::string& lrArgument : aArguments) {
        lArgv.push_back(lrArgument.data());
    }
    lArgv.push_back(nullptr);
    setSystemObject(apSystem);
    SystemMain(static_cast<int>(aArguments.size()), lArgv.data());
}

/// The driver changes its process's signals, so each case runs it in a process of its own.
class ZTCSystemMainFixture : public testing::Test {
protected:
    ZTCSystemMainFixture() : mPidFile(mDirectory.path("a.pid")), mLogFile(mDirectory.path("a.log")) {}

    int runInChild(const ZTCForkedProcess::Function& acrFunction) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess& arSelf) {
                setLogFilePath(mLogFile.c_str());
                return acrFunction(arSelf);
            },
            mDirectory.path("child"));
        const int lStatus = lChild.waitForExit();
        EXPECT_TRUE(lStatus == 0) << readFile(mDirectory.path("child.err")) << readFile(mDirectory.path("child.out"));
        return lStatus;
    }

    ZTCTemporaryDirectory mDirectory;
    const std::string mPidFile;
    const std::string mLogFile;
};

#endif
