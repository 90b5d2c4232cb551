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

// Relaxed: no other data depend on the value.
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

/// The life of the process from the instance check on.
void sRunAlone(ZTCSystem& arSystem) {
    ZTCRunGuard lGuard(arSystem);
    if (arSystem.isToRunAsDaemon()) {
        const ZTCString lNull("/dev/null");
        arSystem.systemDaemonize(ZTCString(""), lNull, lNull, lNull);
    }
    arSystem.markAsRunning();
    // Made here: a thread that needs them to end the process must not be the first to ask for them.
    getStopEvent();
    getExitEvent();
    arSystem.startSignalWaiter();

    arSystem.init();
    arSystem.createThreads();
    arSystem.startThreads();
    arSystem.postThreadsInit();
    arSystem.waitForThreads();

    arSystem.destroy();
    arSystem.stopSignalWaiter();
    arSystem.exitInstanceManagement();
    arSystem.postDestroy();
    lGuard.disarm();
}

/// Takes the steps. Says why where they end the process: its caller does so at info level, which is off by default.
template <typename Steps>
void sTakeSaidSteps(ZTCSystem& arSystem, Steps aSteps) {
    try {
        aSteps();
    } catch (const ZTCExitConditionEx& acrException) {
        // The log has a notice of its own. A daemon's standard error leads nowhere, so this is for a start by hand.
        std::cerr << arSystem.getName().get() << " ends: " << acrException.what() << std::endl;
        throw;
    } catch (const ZTCException& acrException) {
        std::cerr << arSystem.getName().get() << " ends: " << acrException.what() << std::endl;
        ZT_LOG_ERR("%s ends: %s", arSystem.getName().get(), acrException.what());
        throw;
    }
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

    sTakeSaidSteps(lrSystem, [&] {
        lrSystem.preInit();
        lrSystem.setCmdLineArgDescs();
    });
    lrSystem.processCommandLine(aArgc, apArgv);
    bool lIsAnother = false;
    sTakeSaidSteps(lrSystem, [&] {
        lrSystem.processCommandLineArguments();
        lIsAnother = lrSystem.isAnInstanceRunning();
    });
    if (lIsAnother) {
        sRefuseToRunTwice(lrSystem);
    }
    sTakeSaidSteps(lrSystem, [&] { sRunAlone(lrSystem); });
}
