/// Kills a process at its n-th system call, by ptrace(2): the kill comes exactly before or exactly after a call, at
/// every place where the process and the system meet.
#ifndef TESTS_SUPPORT_SYSTEMCALLKILLER_H
#define TESTS_SUPPORT_SYSTEMCALLKILLER_H

#include <functional>

struct ZTSKilledRun {
    bool mIsTraced = false;  ///< false: processes cannot be traced here, and nothing was run
    bool mIsKilled = false;  ///< false: it ended before that call
    unsigned mStops = 0;     ///< that it came to
    int mStatus = 0;         ///< of one that ended: its exit status, or 1000 plus the signal that killed it
};

/// Runs an action in a child process, which ends with the action's result as its exit status. The action may also
/// execute another program. Kills it at its `aStop`-th stop, from 1 on; all its threads count together. Each system
/// call is two stops: before it does anything, and after it has done everything.
ZTSKilledRun killAtSystemCall(unsigned aStop, const std::function<int()>& acrAction);

#endif
