#include "sensor/warnings/include/HookProcess.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/warnings/src/HookSupervisor.h"

using std::chrono::milliseconds;

/// Of what a hook prints, the last so many bytes can be in a report.
static constexpr std::size_t scMostOutput = 200;
/// Between two looks where the kernel cannot say when a process ends.
static constexpr milliseconds scLookPeriod{100};
/// For the processes of a hook to end when they are killed.
static constexpr std::chrono::seconds scEndPatience{10};

extern char** environ;

/// The input as a file that is at its beginning.
static ZTCFileDescriptor sMakeInput(const std::string& acrInput) {
    ZTCFileDescriptor lFile(memfd_create("tavik-warning", MFD_CLOEXEC));
    std::size_t lWritten = 0;
    while (lFile.isOpen() && lWritten < acrInput.size()) {
        const ssize_t lCount = write(lFile.get(), acrInput.data() + lWritten, acrInput.size() - lWritten);
        if (lCount < 0 && errno != EINTR) {
            break;
        }
        lWritten += lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    }
    if (!lFile.isOpen() || lWritten < acrInput.size() || lseek(lFile.get(), 0, SEEK_SET) != 0) {
        throw ZTCSystemCallEx("cannot make the input of a hook", errno);
    }
    return lFile;
}

/// Hooks get neither the variables of the sensor's programs nor the service manager's socket.
static bool sIsForHooks(std::string_view aVariable) {
    static constexpr std::array<std::string_view, 5> scOwn{"TAVIK_", "NOTIFY_SOCKET=", "WATCHDOG_", "LISTEN_", "ZT_"};
    return std::ranges::none_of(scOwn, [&](std::string_view aOwn) { return aVariable.starts_with(aOwn); });
}

static std::vector<char*> sToPointers(const std::vector<std::string>& acrTexts) {
    std::vector<char*> lPointers;
    for (const std::string& lrText : acrTexts) {
        lPointers.push_back(const_cast<char*>(lrText.c_str()));  // execvpe() changes none of them
    }
    lPointers.push_back(nullptr);
    return lPointers;
}

/// Reads a whole value from a pipe. False: it has ended before.
template <typename T>
static bool sReadValue(const ZTCFileDescriptor& acrPipe, T& arValue) {
    ssize_t lCount = 0;
    do {
        lCount = read(acrPipe.get(), &arValue, sizeof(arValue));
    } while (lCount < 0 && errno == EINTR);
    return lCount == static_cast<ssize_t>(sizeof(arValue));
}

struct ZTSPipe {
    ZTCFileDescriptor mReader;
    ZTCFileDescriptor mWriter;

    explicit ZTSPipe(const std::string& acrHook) {
        std::array<int, 2> lEnds{};
        if (pipe2(lEnds.data(), O_CLOEXEC) != 0) {
            throw ZTCSystemCallEx("cannot make a pipe for " + acrHook, errno);
        }
        mReader = ZTCFileDescriptor(lEnds[0]);
        mWriter = ZTCFileDescriptor(lEnds[1]);
    }
};

ZTCHookProcess::ZTCHookProcess(const ZTSHookCall& acrCall, ZTCTime aNow)
    : mTimeout(acrCall.mTimeout), mDeadline(aNow + acrCall.mTimeout) {
    const std::string& lrProgram = acrCall.mRun.front();
    const ZTCFileDescriptor lInput = sMakeInput(acrCall.mInput);
    ZTSPipe lOutput(lrProgram);
    ZTSPipe lReport(lrProgram);
    fcntl(lOutput.mReader.get(), F_SETFL, O_NONBLOCK);
    std::vector<std::string> lEnvironment;
    for (char** lppVariable = environ; *lppVariable != nullptr; ++lppVariable) {
        if (sIsForHooks(*lppVariable)) {
            lEnvironment.emplace_back(*lppVariable);
        }
    }
    lEnvironment.insert(lEnvironment.end(), acrCall.mEnvironment.begin(), acrCall.mEnvironment.end());
    const std::vector<char*> lVariables = sToPointers(lEnvironment);
    const std::vector<char*> lArguments = sToPointers(acrCall.mRun);
    const ZTSHookPlan lPlan{.mpArguments = lArguments.data(),
                            .mpEnvironment = lVariables.data(),
                            .mInput = lInput.get(),
                            .mOutput = lOutput.mWriter.get(),
                            .mReport = lReport.mWriter.get(),
                            .mOwner = getpid()};
    mPid = fork();
    if (mPid == 0) {
        superviseHook(lPlan);
    }
    ZTSHookStart lStart{.mError = mPid < 0 ? errno : ECHILD};  // the latter: it was killed before it could report
    lReport.mWriter.reset();
    const bool lIsReported = mPid > 0 && sReadValue(lReport.mReader, lStart);
    if (!lIsReported || lStart.mError != 0) {
        if (mPid > 0) {
            waitpid(mPid, nullptr, 0);
        }
        throw ZTCSystemCallEx("cannot run " + lrProgram, lStart.mError);
    }
    mHook = lStart.mPid;
    mOutput = std::move(lOutput.mReader);
    mReport = std::move(lReport.mReader);
    mPidFd = ZTCFileDescriptor(static_cast<int>(syscall(SYS_pidfd_open, mPid, 0)));
}

ZTCHookProcess::~ZTCHookProcess() {
    if (mPid != 0) {
        kill(mPid, SIGTERM);
        waitpid(mPid, nullptr, 0);
    }
}

void ZTCHookProcess::addTo(std::vector<pollfd>& arFds) const {
    arFds.push_back({.fd = mPidFd.get(), .events = POLLIN, .revents = 0});
    arFds.push_back({.fd = mOutput.get(), .events = POLLIN, .revents = 0});
}

ZTCHookProcess::ZTCTime ZTCHookProcess::getNextStep(ZTCTime aNow) const {
    const ZTCTime lEnd = mIsTold ? mDeadline + scEndPatience : mDeadline;
    return mPidFd.isOpen() ? lEnd : std::min(lEnd, aNow + scLookPeriod);
}

void ZTCHookProcess::readOutput() {
    std::array<char, 4096> lBytes;
    // A hook that prints without an end must not keep this thread: the rest is read at the next step.
    for (int i = 0; i < 16 && mOutput.isOpen(); ++i) {
        const ssize_t lCount = read(mOutput.get(), lBytes.data(), lBytes.size());
        if (lCount > 0) {
            mText.append(lBytes.data(), static_cast<std::size_t>(lCount));
            mText.erase(0, mText.size() - std::min(mText.size(), scMostOutput));
        } else if (lCount == 0) {
            mOutput.reset();
        } else if (errno != EINTR) {
            return;
        }
    }
}

/// What it printed last, in one line.
std::string ZTCHookProcess::quoteOutput() const {
    std::string lText = mText;
    for (char& lrByte : lText) {
        lrByte = static_cast<unsigned char>(lrByte) < ' ' || lrByte == '\x7F' ? ' ' : lrByte;
    }
    lText.erase(0, std::min(lText.find_first_not_of(' '), lText.size()));
    lText.erase(lText.find_last_not_of(' ') + 1);
    return lText.empty() ? "" : ": " + lText;
}

std::optional<std::string> ZTCHookProcess::step(ZTCTime aNow) {
    readOutput();
    if (!mIsTold && aNow >= mDeadline) {
        kill(mPid, SIGTERM);
        mIsTold = true;
    }
    int lStatus = 0;
    pid_t lEnded = waitpid(mPid, &lStatus, WNOHANG);
    if (lEnded == 0 && aNow >= mDeadline + scEndPatience) {
        kill(mPid, SIGKILL);
        lEnded = waitpid(mPid, &lStatus, 0);
    }
    if (lEnded == 0) {
        return std::nullopt;
    }
    mPid = 0;
    readOutput();
    const std::string lProblem = describeEnd();
    return lProblem.empty() ? lProblem : lProblem + quoteOutput();
}

/// Empty: it did its work.
std::string ZTCHookProcess::describeEnd() const {
    ZTSHookReport lReport;
    const bool lIsReported = sReadValue(mReport, lReport);
    if (!lIsReported) {
        kill(-mHook, SIGKILL);
    }
    if (mIsTold) {
        const bool lIsUnended = !lIsReported || lReport.mIsUnended;
        return "it still ran after " + std::to_string(mTimeout.count() / 1000) + " s, its timeout: it " +
               (lIsUnended ? "was killed and has not ended" : "was ended");
    }
    if (!lIsReported) {
        return "the process that watches it was killed";
    }
    if (WIFSIGNALED(lReport.mStatus)) {
        return std::string("it was ended by signal ") + std::to_string(WTERMSIG(lReport.mStatus)) + " (" +
               strsignal(WTERMSIG(lReport.mStatus)) + ")";
    }
    if (WEXITSTATUS(lReport.mStatus) != 0) {
        return "it ended with status " + std::to_string(WEXITSTATUS(lReport.mStatus));
    }
    if (lReport.mHasLeft) {
        return std::string("it left processes behind, which were ") +
               (lReport.mIsUnended ? "killed and have not ended" : "ended");
    }
    return "";
}
