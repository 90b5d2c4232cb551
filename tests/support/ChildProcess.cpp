#include "tests/support/ChildProcess.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <stdexcept>

#include "tests/support/TemporaryDirectory.h"

static std::vector<char*> sPointersTo(std::vector<std::string>& arTexts) {
    std::vector<char*> lPointers;
    for (std::string& lrText : arTexts) {
        lPointers.push_back(lrText.data());
    }
    lPointers.push_back(nullptr);
    return lPointers;
}

// Runs between fork and exec: async-signal-safe calls only.
[[noreturn]] static void sExecute(const ZTSChildProcessSetup& acrSetup, const std::string& acrOut,
                                  const std::string& acrErr, char* const* appArguments, char* const* appEnvironment) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    sigset_t lNone;
    sigemptyset(&lNone);
    sigprocmask(SIG_SETMASK, &lNone, nullptr);
    const int lNull = open("/dev/null", O_RDONLY);
    const int lOut = open(acrOut.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0600);
    const int lErr = open(acrErr.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0600);
    umask(acrSetup.mUmask);
    if (lNull >= 0 && lOut >= 0 && lErr >= 0 && dup2(lNull, 0) >= 0 && dup2(lOut, 1) >= 0 && dup2(lErr, 2) >= 0 &&
        chdir(acrSetup.mWorkingDirectory.c_str()) == 0) {
        for (int lDescriptor = acrSetup.mHasStandardStreams ? 3 : 0; lDescriptor < 256; ++lDescriptor) {
            close(lDescriptor);
        }
        execve(acrSetup.mProgram.c_str(), appArguments, appEnvironment);
    }
    _exit(127);
}

ZTCChildProcess::ZTCChildProcess(const ZTSChildProcessSetup& acrSetup)
    : mPid(-1), mOutputPrefix(acrSetup.mOutputPrefix) {
    const std::string lOut = mOutputPrefix + ".out";
    const std::string lErr = mOutputPrefix + ".err";
    std::vector<std::string> lArguments{acrSetup.mProgram};
    lArguments.insert(lArguments.end(), acrSetup.mArguments.begin(), acrSetup.mArguments.end());
    std::vector<std::string> lEnvironment;
    for (const auto& [lName, lValue] : acrSetup.mEnvironment) {
        lEnvironment.push_back(lName + "=" + lValue);
    }
    const std::vector<char*> lArgumentPointers = sPointersTo(lArguments);
    const std::vector<char*> lEnvironmentPointers = sPointersTo(lEnvironment);
    mPid = fork();
    if (mPid == 0) {
        sExecute(acrSetup, lOut, lErr, lArgumentPointers.data(), lEnvironmentPointers.data());
    }
    if (mPid < 0) {
        throw std::runtime_error(std::string("fork: ") + std::strerror(errno));
    }
}

ZTCChildProcess::~ZTCChildProcess() {
    kill();
}

bool ZTCChildProcess::hasEnded() {
    if (!mIsReaped) {
        const pid_t lPid = waitpid(mPid, &mStatus, WNOHANG);
        if (lPid < 0 && errno != EINTR) {
            throw std::runtime_error("waitpid of " + std::to_string(mPid) + ": " + std::strerror(errno));
        }
        mIsReaped = lPid == mPid;
    }
    return mIsReaped;
}

int ZTCChildProcess::waitForExit(const ZTCDeadline& acrDeadline) {
    waitUntil([this] { return hasEnded(); }, "the end of process " + std::to_string(mPid), acrDeadline);
    return WIFEXITED(mStatus) ? WEXITSTATUS(mStatus) : 1000 + WTERMSIG(mStatus);
}

void ZTCChildProcess::sendSignal(int aSignal) const {
    if (mIsReaped || ::kill(mPid, aSignal) != 0) {
        throw std::runtime_error("cannot send signal " + std::to_string(aSignal) + " to process " +
                                 std::to_string(mPid));
    }
}

void ZTCChildProcess::kill() {
    if (!mIsReaped) {
        ::kill(mPid, SIGKILL);
        while (waitpid(mPid, &mStatus, 0) < 0 && errno == EINTR) {
        }
        mIsReaped = true;
    }
}

std::string ZTCChildProcess::standardOutput() const {
    return readFile(mOutputPrefix + ".out");
}

std::string ZTCChildProcess::standardError() const {
    return readFile(mOutputPrefix + ".err");
}

void ZTCChildProcess::becomeReaper() {
    prctl(PR_SET_CHILD_SUBREAPER, 1);
}
