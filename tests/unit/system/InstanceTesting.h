/// What the tests of the instance manager share: a pid file of the test's own, and processes that hold it.
#ifndef TESTS_UNIT_SYSTEM_INSTANCETESTING_H
#define TESTS_UNIT_SYSTEM_INSTANCETESTING_H

#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include "common/include/Exception.h"
#include "common/include/Pointer.h"
#include "system/include/ProcessInstanceManager.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/system/ForkedProcess.h"

class ZTCInstanceFixture : public testing::Test {
protected:
    ZTCInstanceFixture() : mPath(mDirectory.path("a.pid")) {}

    ZTCProcessInstanceManager* newManager(std::chrono::milliseconds aKillTimeout = std::chrono::milliseconds(20000)) {
        return new ZTCProcessInstanceManager(ZTCString(mPath.c_str()), aKillTimeout);
    }

    /// A process that is marked as running and ends, giving up its record, when it is told to.
    ZTCForkedProcess::Function runningInstance() {
        return [this](ZTCForkedProcess& arSelf) {
            const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
            if (lManager->isAnInstanceRunning()) {
                return 1;
            }
            lManager->markAsRunning();
            arSelf.tellParent();
            arSelf.waitForParent();
            lManager->exitInstanceManagement();
            return 0;
        };
    }

    std::string killAndCapture(ZTCProcessInstanceManager& arManager) {
        testing::internal::CaptureStdout();
        try {
            arManager.killRunningInstance();
        } catch (const ZTCException& acrException) {
            ADD_FAILURE() << acrException.what();
        }
        return testing::internal::GetCapturedStdout();
    }

    ZTCTemporaryDirectory mDirectory;
    const std::string mPath;
};

#endif
