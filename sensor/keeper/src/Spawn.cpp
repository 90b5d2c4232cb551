#include "sensor/keeper/include/Spawn.h"

#include <fcntl.h>
#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "sensor/client/include/ClientErrors.h"

/// The kernel takes capabilities in two words of 32.
struct ZTSCapabilities {
    __user_cap_header_struct mHeader{.version = _LINUX_CAPABILITY_VERSION_3, .pid = 0};
    __user_cap_data_struct mData[_LINUX_CAPABILITY_U32S_3] = {};

    bool get() { return syscall(SYS_capget, &mHeader, mData) == 0; }
    bool set() { return syscall(SYS_capset, &mHeader, mData) == 0; }
};

/// No capability, and none to be gained by executing: not by a file's, not by being root.
static bool sDropAll() {
    ZTSCapabilities lNone;
    return prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_CLEAR_ALL, 0, 0, 0) == 0 && lNone.set() &&
           prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0;
}

/// A program that is no root's keeps what is in the ambient set.
static bool sPassOn() {
    if (geteuid() == 0) {
        return true;
    }
    ZTSCapabilities lOwn;
    if (!lOwn.get()) {
        return false;
    }
    for (__user_cap_data_struct& lrWord : lOwn.mData) {
        lrWord.inheritable = lrWord.permitted;
    }
    if (!lOwn.set()) {
        return false;
    }
    for (unsigned i = 0; i < 32 * _LINUX_CAPABILITY_U32S_3; ++i) {
        const bool lHasIt = (lOwn.mData[i / 32].permitted >> (i % 32) & 1U) != 0;
        if (lHasIt && prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_RAISE, i, 0, 0) != 0) {
            return false;
        }
    }
    return true;
}

static std::vector<char*> sPointersTo(const std::vector<std::string>& acrTexts) {
    std::vector<char*> lPointers;
    for (const std::string& lcrText : acrTexts) {
        lPointers.push_back(const_cast<char*>(lcrText.c_str()));
    }
    lPointers.push_back(nullptr);
    return lPointers;
}

/// In the new process. Returns only where something failed; errno says why.
static void sExecute(const ZTSSpawn& acrSpawn, char* const* appArguments, char* const* appEnvironment) {
    sigset_t lNone;
    sigemptyset(&lNone);
    const int lNull = open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (setpgid(0, 0) != 0 || sigprocmask(SIG_SETMASK, &lNone, nullptr) != 0 || lNull < 0 ||
        dup2(lNull, STDIN_FILENO) < 0 || (!acrSpawn.mHasOutput && dup2(STDERR_FILENO, STDOUT_FILENO) < 0)) {
        return;
    }
    for (const int lDescriptor : acrSpawn.mDescriptors) {
        if (fcntl(lDescriptor, F_SETFD, 0) != 0) {
            return;
        }
    }
    if (acrSpawn.mPrivilege == ZTPV_None ? sDropAll() : sPassOn()) {
        execve(acrSpawn.mProgram.c_str(), appArguments, appEnvironment);
    }
}

ZTSProcess spawn(const ZTSSpawn& acrSpawn) {
    std::vector<std::string> lArguments{acrSpawn.mProgram};
    lArguments.insert(lArguments.end(), acrSpawn.mArguments.begin(), acrSpawn.mArguments.end());
    const std::vector<char*> lArgumentPointers = sPointersTo(lArguments);
    const std::vector<char*> lEnvironmentPointers = sPointersTo(acrSpawn.mEnvironment);

    // Closed by a successful exec; carries errno otherwise.
    int lEnds[2];
    if (pipe2(lEnds, O_CLOEXEC) != 0) {
        throw ZTCSystemCallEx("cannot start " + acrSpawn.mProgram, errno);
    }
    ZTCFileDescriptor lReadEnd(lEnds[0]);
    ZTCFileDescriptor lWriteEnd(lEnds[1]);
    ZTSProcess lProcess;
    lProcess.mPid = fork();
    if (lProcess.mPid == 0) {
        sExecute(acrSpawn, lArgumentPointers.data(), lEnvironmentPointers.data());
        const int lErrno = errno;
        const ssize_t lWritten = write(lWriteEnd.get(), &lErrno, sizeof(lErrno));
        _exit(lWritten == sizeof(lErrno) ? 127 : 126);
    }
    if (lProcess.mPid < 0) {
        throw ZTCSystemCallEx("cannot start " + acrSpawn.mProgram, errno);
    }
    lWriteEnd.reset();
    int lErrno = 0;
    ssize_t lRead;
    do {
        lRead = read(lReadEnd.get(), &lErrno, sizeof(lErrno));
    } while (lRead < 0 && errno == EINTR);
    if (lRead == 0) {
        lProcess.mPidFd = openPidFd(lProcess.mPid);
        if (lProcess.isThere()) {
            return lProcess;
        }
        lErrno = errno;
    } else if (lRead < 0) {
        lErrno = errno;
    }
    // Where it has ended by itself this changes nothing. Otherwise it runs, and cannot be watched.
    kill(lProcess.mPid, SIGKILL);
    while (waitpid(lProcess.mPid, nullptr, 0) < 0 && errno == EINTR) {
    }
    throw ZTCSystemCallEx("cannot start " + acrSpawn.mProgram, lErrno);
}

void keepCapabilitiesForOthers() {
    if (geteuid() == 0) {
        return;
    }
    ZTSCapabilities lOwn;
    bool lIsDone = prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_CLEAR_ALL, 0, 0, 0) == 0 && lOwn.get();
    for (__user_cap_data_struct& lrWord : lOwn.mData) {
        lrWord.effective = 0;
    }
    lIsDone = lIsDone && lOwn.set();
    if (!lIsDone) {
        throw ZTCSystemCallEx("cannot give up the effective capabilities", errno);
    }
}

ZTCFileDescriptor openPidFd(pid_t aPid) {
    return ZTCFileDescriptor(static_cast<int>(syscall(SYS_pidfd_open, aPid, 0)));  // always close-on-exec
}

void sendSignal(const ZTCFileDescriptor& acrPidFd, int aSignal) {
    if (acrPidFd.isOpen()) {
        syscall(SYS_pidfd_send_signal, acrPidFd.get(), aSignal, nullptr, 0);
    }
}

int reap(const ZTSProcess& acrProcess) {
    int lStatus = 0;
    while (waitpid(acrProcess.mPid, &lStatus, 0) < 0 && errno == EINTR) {
    }
    return lStatus;
}
