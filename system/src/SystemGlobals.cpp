#include "system/include/SystemGlobals.h"

#include <atomic>
#include <iostream>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Clib.h"
#include "os/common/include/ProcessEvents.h"
#include "system/include/SignalWaiter.h"
#include "system/include/System.h"

namespace {

constexpr unsigned gcDefaultHbTimeout = 240;

// Relaxed: the value stands alone.
std::atomic<unsigned> sHbTimeout{gcDefaultHbTimeout};

ZTCSystem* spSystem = nullptr;

[[noreturn]] void sRefuseToRunTwice(ZTCSystem& arSystem) {
    const std::int32_t lProcessId = arSystem.getInstanceManager()->getProcessId();
    const ZTCString lPidFilePath = arSystem.getPidFilePathStr();
    char lText[512];
    if (lProcessId > 0) {
        ClibSprintf(lText, sizeof(lText), "%s runs already, as process %d, which holds the pid file '%s'",
                    arSystem.getName().get(), lProcessId, lPidFilePath.get());
    } else {
        ClibSprintf(lText, sizeof(lText), "%s is being started already by a process that holds the pid file '%s'",
                    arSystem.getName().get(), lPidFilePath.get());
    }
    std::cerr << lText << std::endl;
    ZT_LOG_ERR("%s", lText);
    throw ZTCExitConditionEx(lText, gcErrStop);
}

/// From the instance check on, what was begun is given up on the way out through an exception.
class ZTCRunGuard {
public:
    explicit ZTCRunGuard(ZTCSystem& arSystem) : mrSystem(arSystem) {}

    ~ZTCRunGuard() {
        if (mIsArmed) {
            attempt([this] { mrSystem.destroyThreads(); });
            attempt([this] { mrSystem.stopSignalWaiter(); });
            attempt([this] { mrSystem.exitInstanceManagement(); });
        }
    }

    ZTCRunGuard(const ZTCRunGuard&) = delete;
    ZTCRunGuard& operator=(const ZTCRunGuard&) = delete;

    void disarm() { mIsArmed = false; }

private:
    template <typename Step>
    static void attempt(Step aStep) {
        try {
            aStep();
        } catch (const ZTCException& acrException) {
            ZT_LOG_ERR("Giving up the run: %s; going on", acrException.what());
        }
    }

    ZTCSystem& mrSystem;
    bool mIsArmed = true;
};

/// The life of the process from its options on.
void sRun(ZTCSystem& lrSystem) {
    lrSystem.processCommandLineArguments();

    if (lrSystem.isAnInstanceRunning()) {
        sRefuseToRunTwice(lrSystem);
    }
    ZTCRunGuard lGuard(lrSystem);
    if (lrSystem.isToRunAsDaemon()) {
        const ZTCString lNull("/dev/null");
        lrSystem.systemDaemonize(ZTCString(""), lNull, lNull, lNull);
    }
    lrSystem.markAsRunning();
    // Made here: whoever needs them to end the process must not be the first to ask for them.
    getStopEvent();
    getExitEvent();
    lrSystem.startSignalWaiter();

    lrSystem.init();
    lrSystem.createThreads();
    lrSystem.startThreads();
    lrSystem.postThreadsInit();
    lrSystem.waitForThreads();

    lrSystem.destroy();
    lrSystem.stopSignalWaiter();
    lrSystem.exitInstanceManagement();
    lrSystem.postDestroy();
    lGuard.disarm();
}

}  // namespace

void setSystemObject(ZTCSystem* apSystem) {
    spSystem = apSystem;
}

ZTCSystem* getSystemObject() {
    return spSystem;
}

void setHbTimeout(unsigned aSeconds) {
    sHbTimeout.store(aSeconds, std::memory_order_relaxed);
}

void getHbTimeout(unsigned& arSeconds) {
    arSeconds = sHbTimeout.load(std::memory_order_relaxed);
}

void SystemMain(int aArgc, char** apArgv) {
    ZTCSignalWaiter::blockSignals();
    if (spSystem == nullptr) {
        throw ZTCNoMemoryEx();
    }
    ZTCSystem& lrSystem = *spSystem;

    lrSystem.preInit();
    lrSystem.setCmdLineArgDescs();
    lrSystem.processCommandLine(aArgc, apArgv);
    try {
        sRun(lrSystem);
    } catch (const ZTCExitConditionEx&) {
        throw;
    } catch (const ZTCException& acrException) {
        // Who catches it says so at info level, which is off by default.
        std::cerr << lrSystem.getName().get() << " ends: " << acrException.what() << std::endl;
        ZT_LOG_ERR("%s ends: %s", lrSystem.getName().get(), acrException.what());
        throw;
    }
}
