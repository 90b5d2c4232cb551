#include "system/include/ProcessInstanceManager.h"

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <iostream>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"
#include "os/common/include/Descriptor.h"

namespace {

// A user who can open the file can hold its lock, and so pass a process off as an agent that runs.
constexpr ::mode_t scPidFileMode = 0600;

// A process that looks whether the lock is held takes it for a moment (see sLookUp): one refusal proves nothing.
constexpr int scLockTries = 10;
constexpr int scLockPauseMilliseconds = 10;

// Another round is needed only when somebody has replaced the file in between.
constexpr int scReplacedTries = 100;

constexpr int scPollMilliseconds = 20;

constexpr std::int32_t scNoPid = 0;    // the file is empty
constexpr std::int32_t scBadPid = -1;  // it holds something else than a process id

/// The process id that the text is, with blanks and line breaks around it allowed.
std::int32_t sParsePid(const char* apText) {
    const auto lIsBlank = [](char aCharacter) {
        return aCharacter == ' ' || aCharacter == '\t' || aCharacter == '\n' || aCharacter == '\r';
    };
    while (lIsBlank(*apText)) {
        ++apText;
    }
    if (*apText == '\0') {
        return scNoPid;
    }
    std::int64_t lPid = 0;
    for (; *apText >= '0' && *apText <= '9'; ++apText) {
        lPid = lPid * 10 + (*apText - '0');
        if (lPid > INT32_MAX) {
            return scBadPid;
        }
    }
    while (lIsBlank(*apText)) {
        ++apText;
    }
    return *apText == '\0' && lPid > 0 ? static_cast<std::int32_t>(lPid) : scBadPid;
}

/// Reads the process id from the descriptor, which is at the beginning of its file.
std::int32_t sReadPid(int aDescriptor) {
    char lText[64] = {};
    std::size_t lHad = 0;
    while (lHad < sizeof(lText)) {
        const ::ssize_t lCount = ClibRead(aDescriptor, lText + lHad, sizeof(lText) - lHad);
        if (lCount == -EINTR) {
            continue;
        }
        if (lCount <= 0) {
            break;
        }
        lHad += static_cast<std::size_t>(lCount);
    }
    if (lHad == sizeof(lText)) {
        return scBadPid;
    }
    return sParsePid(lText);
}

struct stat sRequireRegularFile(const char* apPath, int aDescriptor) {
    struct stat lStatus {};
    ClibFstat(aDescriptor, &lStatus);
    if (!S_ISREG(lStatus.st_mode)) {
        throwWith<ZTCInvalidEx>("The pid file '%s' is %s, not a regular file; it is left untouched", apPath,
                                ClibFileKind(lStatus.st_mode));
    }
    return lStatus;
}

bool sIsAtPath(const char* apPath, int aDescriptor) {
    struct stat lOfPath {};
    struct stat lOfFile {};
    ClibFstat(aDescriptor, &lOfFile);
    return ClibLstat(apPath, &lOfPath) && lOfPath.st_dev == lOfFile.st_dev && lOfPath.st_ino == lOfFile.st_ino;
}

struct ZTSHolder {
    bool mIsThere;
    std::int32_t mProcessId;  // above 0, scNoPid or scBadPid
    ::uid_t mFileOwner;
};

/// Whether the process belongs to the user; true where there is no such process any more.
bool sIsProcessOf(::uid_t aUser, std::int32_t aProcessId) {
    char lPath[64];
    ClibSprintf(lPath, sizeof(lPath), "/proc/%d", static_cast<int>(aProcessId));
    struct stat lStatus {};
    return !ClibLstat(lPath, &lStatus) || lStatus.st_uid == aUser;
}

/// Who holds the lock of the pid file.
ZTSHolder sLookUp(const char* apPath) {
    const ZTCDescriptor lFile(ClibTryOpen(apPath, O_RDONLY | O_NONBLOCK | O_NOFOLLOW));
    if (lFile.get() == -ENOENT) {
        return {false, scNoPid, 0};
    }
    if (lFile.get() < 0) {
        throwWith<ZTCClibOpenFailedEx>("Opening the pid file '%s' failed: %s", apPath,
                                       ZTCErrnoText(-lFile.get()).get());
    }
    const ::uid_t lOwner = sRequireRegularFile(apPath, lFile.get()).st_uid;
    if (ClibTryLock(lFile.get())) {
        return {false, scNoPid, lOwner};
    }
    return {true, sReadPid(lFile.get()), lOwner};
}

[[noreturn]] void sThrowNoStatus(const char* apPath, const char* apReason) {
    throwWith<ZTCClibGetProcStatusFailedEx>("No running process is named by the pid file '%s': %s", apPath, apReason);
}

}  // namespace

ZTCProcessInstanceManager::ZTCProcessInstanceManager(const ZTCString& acrPidFilePath,
                                                     std::chrono::milliseconds aKillTimeout)
    : mPidFilePath(acrPidFilePath), mKillTimeout(aKillTimeout) {}

ZTCProcessInstanceManager::~ZTCProcessInstanceManager() {
    ClibClose(mDescriptor);
}

bool ZTCProcessInstanceManager::isAnInstanceRunning() {
    if (mIsLocked) {
        return false;
    }
    const char* lpPath = mPidFilePath.get();
    int lLockTries = 0;
    for (int lReplacedTries = 0; lReplacedTries < scReplacedTries;) {
        ZTCDescriptor lFile(ClibOpen(lpPath, O_RDWR | O_CREAT | O_NONBLOCK | O_NOFOLLOW, scPidFileMode));
        const struct stat lStatus = sRequireRegularFile(lpPath, lFile.get());
        if (!ClibTryLock(lFile.get())) {
            if (++lLockTries < scLockTries) {
                ClibSleep(scLockPauseMilliseconds);
                continue;
            }
            const std::int32_t lProcessId = sReadPid(lFile.get());
            mProcessId = lProcessId > 0 ? lProcessId : -1;
            return true;
        }
        if (sIsAtPath(lpPath, lFile.get())) {
            if (lStatus.st_uid != ::geteuid()) {
                // Left by another user's run. `-s` stops a process only if it belongs to the file's owner.
                ClibTryGive(lFile.get(), ::geteuid());
            }
            if ((lStatus.st_mode & 07777 & ~scPidFileMode) != 0) {
                ClibTrySetMode(lFile.get(), scPidFileMode);
            }
            ClibFtruncate(lFile.get(), 0);
            mDescriptor = lFile.release();
            mIsLocked = true;
            mProcessId = -1;
            return false;
        }
        ++lReplacedTries;
    }
    throwWith<ZTCClibLockFailedEx>("Locking the pid file '%s' failed: it was replaced %d times", lpPath,
                                   scReplacedTries);
}

void ZTCProcessInstanceManager::markAsRunning() {
    if (isAnInstanceRunning()) {
        throwWith<ZTCExistsEx>("The pid file '%s' is locked by another process", mPidFilePath.get());
    }
    char lPid[32];
    const int lLength = ClibSprintf(lPid, sizeof(lPid), "%d\n", static_cast<int>(::getpid()));
    try {
        ClibFtruncate(mDescriptor, 0);
        ClibPwriteAll(mDescriptor, lPid, static_cast<std::size_t>(lLength), 0);
    } catch (const ZTCClibEx& acrException) {
        throwWith<ZTCClibWriteFailedEx>("Writing the pid file '%s' failed: %s", mPidFilePath.get(),
                                        acrException.what());
    }
    mProcessId = static_cast<std::int32_t>(::getpid());
    allowLogRotation(true);
}

void ZTCProcessInstanceManager::killRunningInstance() {
    const char* lpPath = mPidFilePath.get();
    const std::int64_t lDeadline = ClibMonotonicMilliseconds() + mKillTimeout.count();
    std::int32_t lAsked = 0;
    for (;;) {
        const ZTSHolder lHolder = sLookUp(lpPath);
        if (lAsked == 0 && !lHolder.mIsThere) {
            std::cout << "No running instance is named by '" << lpPath << "'" << std::endl;
            return;
        }
        const bool lHasGivenUp = !lHolder.mIsThere || lHolder.mProcessId != lAsked;
        if (lAsked != 0 && lHasGivenUp && !ClibIsProcessAlive(lAsked)) {
            std::cout << "Stopped the running instance, process " << lAsked << std::endl;
            return;
        }
        // A user who can write the file must not get another user's process ended by it.
        if (lAsked == 0 && lHolder.mProcessId > 0 && !sIsProcessOf(lHolder.mFileOwner, lHolder.mProcessId)) {
            std::cout << "The pid file '" << lpPath << "' names process " << lHolder.mProcessId
                      << ", which is not its owner's; nothing is stopped" << std::endl;
            return;
        }
        if (lAsked == 0 && lHolder.mProcessId > 0 && ClibKill(lHolder.mProcessId, SIGTERM)) {
            lAsked = lHolder.mProcessId;
        }
        if (ClibMonotonicMilliseconds() >= lDeadline) {
            break;
        }
        ClibSleep(scPollMilliseconds);
    }
    if (lAsked != 0) {
        std::cout << "Asked the running instance, process " << lAsked << ", to stop; it has not ended within "
                  << mKillTimeout.count() << " ms" << std::endl;
    } else {
        std::cout << "The pid file '" << lpPath << "' is locked, but named no process within " << mKillTimeout.count()
                  << " ms" << std::endl;
    }
}

void ZTCProcessInstanceManager::exitInstanceManagement() {
    if (!mIsLocked) {
        return;
    }
    // The next agent may run from here on: what comes to be logged belongs at the end of its file.
    allowLogRotation(false);
    // The lock is given up last: the next holder then finds that the file is not at its path any more.
    const ZTCDescriptor lFile(mDescriptor);
    mDescriptor = -1;
    mIsLocked = false;
    if (sIsAtPath(mPidFilePath.get(), lFile.get())) {
        ClibUnlink(mPidFilePath.get());
    } else {
        ZT_LOG_WARN("The pid file '%s' is gone or another's; nothing is removed", mPidFilePath.get());
    }
}

void ZTCProcessInstanceManager::getProcStatus(const ZTCString& acrPidFilePath) const {
    const char* lpPath = acrPidFilePath.get();
    const ZTCDescriptor lFile(ClibTryOpen(lpPath, O_RDONLY | O_NONBLOCK));
    if (lFile.get() < 0) {
        sThrowNoStatus(lpPath, ZTCErrnoText(-lFile.get()).get());
    }
    std::int32_t lProcessId = scBadPid;
    try {
        lProcessId = sReadPid(lFile.get());
    } catch (const ZTCClibReadFailedEx& acrException) {
        sThrowNoStatus(lpPath, acrException.what());
    }
    if (lProcessId == scNoPid) {
        sThrowNoStatus(lpPath, "it is empty");
    }
    if (lProcessId == scBadPid) {
        sThrowNoStatus(lpPath, "it holds no decimal process id above 0");
    }
    if (!ClibIsProcessAlive(lProcessId)) {
        char lReason[64];
        ClibSprintf(lReason, sizeof(lReason), "process %d is gone", lProcessId);
        sThrowNoStatus(lpPath, lReason);
    }
}
