/// One run of a program that warns somebody of a trouble: started, watched, and ended with all that it has started.
///
/// There is no shell in between. The program gets its input as a file on standard input, so that it need not read it.
/// The end of what it prints is kept for the report. It runs in a process group of its own, as the user and in the
/// sandbox of this process, with the signals' default actions and no other descriptors. A process between this one and
/// the program ends all that the program has started, in whatever group or session, also where this process is killed.
#ifndef SENSOR_WARNINGS_INCLUDE_HOOKPROCESS_H
#define SENSOR_WARNINGS_INCLUDE_HOOKPROCESS_H

#include <poll.h>
#include <sys/types.h>

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"

struct ZTSHookCall {
    std::vector<std::string> mRun;          ///< program and arguments; a program without a slash is looked for in PATH
    std::vector<std::string> mEnvironment;  ///< "NAME=value", added to this process's own without its TAVIK_ variables
    std::string mInput;
    std::chrono::milliseconds mTimeout{};
};

class ZTCHookProcess {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    /// Starts it. Throws ZTCSystemCallEx where that fails: the program is missing, may not be run, or there is no room
    /// for a process.
    ZTCHookProcess(const ZTSHookCall& acrCall, ZTCTime aNow);
    /// Ends all of its processes, if it still runs.
    ~ZTCHookProcess();
    ZTCHookProcess(const ZTCHookProcess&) = delete;
    ZTCHookProcess& operator=(const ZTCHookProcess&) = delete;

    /// Adds what is to be polled.
    void addTo(std::vector<pollfd>& arFds) const;
    /// When step() is to be called at the latest.
    ZTCTime getNextStep(ZTCTime aNow) const;
    /// To be called after each poll(). Nothing: it runs. A text: it has ended with all that it has started. The text is
    /// empty after a success; otherwise it says in one line why the run counts as failed.
    std::optional<std::string> step(ZTCTime aNow);

private:
    void readOutput();
    std::string quoteOutput() const;
    std::string describeEnd() const;

    const std::chrono::milliseconds mTimeout;
    const ZTCTime mDeadline;
    pid_t mPid = 0;             ///< of the process between; 0: it has been waited for
    pid_t mHook = 0;            ///< leader of the program's process group
    bool mIsTold = false;       ///< to end the hook
    ZTCFileDescriptor mPidFd;   ///< readable when it has ended; closed where the kernel has no such descriptors
    ZTCFileDescriptor mOutput;  ///< what it prints
    ZTCFileDescriptor mReport;  ///< what came of it
    std::string mText;          ///< the end of that
};

#endif
