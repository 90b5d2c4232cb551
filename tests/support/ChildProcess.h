/// A child process that a test starts, watches and is sure to end. Its standard output and error go to files.
#ifndef TESTS_SUPPORT_CHILDPROCESS_H
#define TESTS_SUPPORT_CHILDPROCESS_H

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

#include "tests/support/Waiting.h"

struct ZTSChildProcessSetup {
    std::string mProgram;
    std::vector<std::string> mArguments;              ///< without the program's name
    std::map<std::string, std::string> mEnvironment;  ///< the whole environment
    std::string mWorkingDirectory;
    std::string mOutputPrefix;  ///< standard output goes to this + ".out", standard error to this + ".err"
    mode_t mUmask = 022;
    bool mHasStandardStreams = true;  ///< false: the process starts without the descriptors 0 to 2
};

class ZTCChildProcess {
public:
    /// Starts the process. Throws std::runtime_error where that fails.
    explicit ZTCChildProcess(const ZTSChildProcessSetup& acrSetup);
    /// Adopts a process that the kernel has made a child of this one: an orphaned grandchild (see becomeReaper).
    explicit ZTCChildProcess(pid_t aPid) : mPid(aPid) {}
    /// Kills the process, by its pid, if it has not been waited for.
    ~ZTCChildProcess();
    ZTCChildProcess(const ZTCChildProcess&) = delete;
    ZTCChildProcess& operator=(const ZTCChildProcess&) = delete;

    pid_t getPid() const { return mPid; }
    bool hasEnded();
    /// Waits until the process has ended. Returns its exit status, or 1000 plus the signal that killed it. Throws when
    /// the deadline is over first.
    int waitForExit(const ZTCDeadline& acrDeadline = ZTCDeadline());
    void sendSignal(int aSignal) const;
    void kill();

    std::string standardOutput() const;
    std::string standardError() const;

    /// Makes orphans among this process's descendants its children, so that daemons can be adopted and waited for.
    static void becomeReaper();

private:
    pid_t mPid;
    std::string mOutputPrefix;
    bool mIsReaped = false;
    int mStatus = 0;
};

#endif
