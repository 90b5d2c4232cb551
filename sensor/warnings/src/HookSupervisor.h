/// The process between this one and a hook: it is a copy of this one, starts the hook, and stays the parent of all that
/// the hook starts, also of what leaves the hook's process group and session. So all of it can be ended.
#ifndef SENSOR_WARNINGS_SRC_HOOKSUPERVISOR_H
#define SENSOR_WARNINGS_SRC_HOOKSUPERVISOR_H

#include <sys/types.h>

/// Everything is made before the fork: the new process of a program with threads may do little.
struct ZTSHookPlan {
    char* const* mpArguments = nullptr;  ///< the first is the program; without a slash it is looked for in PATH
    char* const* mpEnvironment = nullptr;
    int mInput = -1;    ///< the hook's standard input
    int mOutput = -1;   ///< its standard output and error
    int mReport = -1;   ///< gets a ZTSHookStart, and from a hook that was started a ZTSHookReport
    pid_t mOwner = -1;  ///< the process that is told
};

struct ZTSHookStart {
    int mError = 0;  ///< an errno; 0: the hook runs
    pid_t mPid = 0;  ///< the hook's
};

/// What came of a hook that was started.
struct ZTSHookReport {
    int mStatus = 0;          ///< as of waitpid(); the signal's where it was ended
    bool mHasLeft = false;    ///< processes of it still ran when it had ended
    bool mIsUnended = false;  ///< some of its processes did not end when they were killed
};

/// To be called in the child of a fork(). First reports the hook's start. Ends all
/// of its processes when the hook has ended, when it gets SIGTERM, and when its owner is gone.
[[noreturn]] void superviseHook(const ZTSHookPlan& acrPlan);

#endif
