#include "sensor/warnings/include/HookProcess.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
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

using std::chrono::milliseconds;

/// Of what a hook prints, the last so many bytes can be in a report.
static constexpr std::size_t scMostOutput = 200;
/// Between two looks where the kernel cannot say when a process ends.
static constexpr milliseconds scLookPeriod{100};

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

/// What the sensor's programs tell each other is not for hooks, nor is the service manager's socket.
static bool sIsForHooks(std::string_view aVariable) {
    static constexpr std::array<std::string_view, 5> scOwn{"TAVIK_", "NOTIFY_SOCKET=", "WATCHDOG_", "LISTEN_", "ZT_"};
    return std::ranges::none_of(scOwn, [&](std::string_view aOwn) { return aVariable.starts_with(aOwn); });
}

static std::vector<char*> sToPointers(const std::vector<std::string>& acrTexts) {
    std::vector<char*> lPointers;
    for (const std::string& lrText : acrTexts) {
        lPointers.push_back(const_cast<char*>(lrText.c_str()));  // posix_spawn() changes none of them
    }
    lPointers.push_back(nullptr);
    return lPointers;
}

/// Attributes and file actions of a start, freed with it.
struct ZTSSpawnPlan {
    posix_spawnattr_t mAttributes;
    posix_spawn_file_actions_t mActions;

    ZTSSpawnPlan(int aInput, int aOutput) {
        posix_spawnattr_init(&mAttributes);
        posix_spawn_file_actions_init(&mActions);
        sigset_t lAll;
        sigset_t lNone;
        sigfillset(&lAll);
        sigemptyset(&lNone);
        posix_spawnattr_setflags(&mAttributes, POSIX_SPAWN_SETPGROUP | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK);
        posix_spawnattr_setpgroup(&mAttributes, 0);
        posix_spawnattr_setsigdefault(&mAttributes, &lAll);
        posix_spawnattr_setsigmask(&mAttributes, &lNone);
        posix_spawn_file_actions_adddup2(&mActions, aInput, STDIN_FILENO);
        posix_spawn_file_actions_adddup2(&mActions, aOutput, STDOUT_FILENO);
        posix_spawn_file_actions_adddup2(&mActions, aOutput, STDERR_FILENO);
        posix_spawn_file_actions_addclosefrom_np(&mActions, STDERR_FILENO + 1);
    }
    ~ZTSSpawnPlan() {
        posix_spawn_file_actions_destroy(&mActions);
        posix_spawnattr_destroy(&mAttributes);
    }
    ZTSSpawnPlan(const ZTSSpawnPlan&) = delete;
    ZTSSpawnPlan& operator=(const ZTSSpawnPlan&) = delete;
};

ZTCHookProcess::ZTCHookProcess(const ZTSHookCall& acrCall, ZTCTime aNow)
    : mTimeout(acrCall.mTimeout), mDeadline(aNow + acrCall.mTimeout) {
    const ZTCFileDescriptor lInput = sMakeInput(acrCall.mInput);
    int lEnds[2];
    if (pipe2(lEnds, O_CLOEXEC) != 0) {
        throw ZTCSystemCallEx("cannot make a pipe for the output of " + acrCall.mRun.front(), errno);
    }
    mOutput = ZTCFileDescriptor(lEnds[0]);
    const ZTCFileDescriptor lOutput(lEnds[1]);
    fcntl(mOutput.get(), F_SETFL, O_NONBLOCK);
    std::vector<std::string> lEnvironment;
    for (char** lppVariable = environ; *lppVariable != nullptr; ++lppVariable) {
        if (sIsForHooks(*lppVariable)) {
            lEnvironment.emplace_back(*lppVariable);
        }
    }
    lEnvironment.insert(lEnvironment.end(), acrCall.mEnvironment.begin(), acrCall.mEnvironment.end());
    const std::vector<char*> lVariables = sToPointers(lEnvironment);
    const std::vector<char*> lArguments = sToPointers(acrCall.mRun);
    const ZTSSpawnPlan lPlan(lInput.get(), lOutput.get());
    const int lError = posix_spawnp(&mPid, lArguments.front(), &lPlan.mActions, &lPlan.mAttributes, lArguments.data(),
                                    lVariables.data());
    if (lError != 0) {
        throw ZTCSystemCallEx("cannot run " + acrCall.mRun.front(), lError);
    }
    mPidFd = ZTCFileDescriptor(static_cast<int>(syscall(SYS_pidfd_open, mPid, 0)));
}

ZTCHookProcess::~ZTCHookProcess() {
    if (mPid != 0) {
        endGroup();
        waitpid(mPid, nullptr, 0);
    }
}

void ZTCHookProcess::endGroup() {
    kill(-mPid, SIGKILL);
}

void ZTCHookProcess::addTo(std::vector<pollfd>& arFds) const {
    arFds.push_back({.fd = mPidFd.get(), .events = POLLIN, .revents = 0});
    arFds.push_back({.fd = mOutput.get(), .events = POLLIN, .revents = 0});
}

ZTCHookProcess::ZTCTime ZTCHookProcess::getNextStep(ZTCTime aNow) const {
    return mPidFd.isOpen() ? mDeadline : std::min(mDeadline, aNow + scLookPeriod);
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
    int lStatus = 0;
    pid_t lEnded = waitpid(mPid, &lStatus, WNOHANG);
    const bool lIsLate = lEnded == 0 && aNow >= mDeadline;
    if (lIsLate) {
        endGroup();
        lEnded = waitpid(mPid, &lStatus, 0);
    }
    if (lEnded == 0) {
        return std::nullopt;
    }
    // The group outlives its leader as long as it has members, and its number is not used again until then.
    const bool lHasLeft = !lIsLate && kill(-mPid, SIGKILL) == 0;
    mPid = 0;
    readOutput();
    if (lIsLate) {
        return "it still ran after " + std::to_string(mTimeout.count() / 1000) + " s, its timeout: it was ended" +
               quoteOutput();
    }
    if (WIFSIGNALED(lStatus)) {
        return std::string("it was ended by signal ") + std::to_string(WTERMSIG(lStatus)) + " (" +
               strsignal(WTERMSIG(lStatus)) + ")" + quoteOutput();
    }
    if (WEXITSTATUS(lStatus) != 0) {
        return "it ended with status " + std::to_string(WEXITSTATUS(lStatus)) + quoteOutput();
    }
    return lHasLeft ? "it left processes behind, which were ended" + quoteOutput() : "";
}
