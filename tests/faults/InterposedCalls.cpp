/// The operating-system calls of the agent and of the sensor's programs, but for those that fail only when they are
/// called wrongly. Each asks first whether it is to fail; otherwise it goes through.
#include <dirent.h>
#include <dlfcn.h>
#include <poll.h>
#include <pthread.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/types.h>
#include <sys/uio.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstddef>

#include "tests/faults/Interposer.h"

namespace {

template <typename Function>
Function* sNext(Function* /*apSame*/, const char* apName) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, apName));
}

/// Whether the planned failure is one that this file never has: any but EINTR where it is none in a file system, EAGAIN
/// where it is a regular one.
bool sIsOutOfQuestion(int aFile) noexcept {
    if (getPlannedErrno() == EINTR) {
        return false;
    }
    struct stat lStatus {};
    const int lErrno = errno;
    const bool lIsKnown = syscall(SYS_fstat, aFile, &lStatus) == 0;
    errno = lErrno;
    const bool lIsAnonymous = (lStatus.st_mode & static_cast<mode_t>(S_IFMT)) == 0;
    return lIsKnown && (lIsAnonymous || (S_ISREG(lStatus.st_mode) && getPlannedErrno() == EAGAIN));
}

}  // namespace

// The functions have names of their own here and those of the calls in the object file, so that they need not agree
// with the headers' declarations in every attribute.

/// A call that tells its error through errno.
#define ZT_INTERPOSE(CALL, RESULT, FAILED, PARAMETERS, ARGUMENTS)              \
    extern "C" RESULT sFaulty_##CALL PARAMETERS __asm__(#CALL);                \
    RESULT sFaulty_##CALL PARAMETERS {                                         \
        static auto* const spNext = sNext(&sFaulty_##CALL, #CALL);             \
        const ZTSFault lFault = takeFault(#CALL, __builtin_return_address(0)); \
        if (lFault.mFires) {                                                   \
            errno = lFault.mErrno;                                             \
            return FAILED;                                                     \
        }                                                                      \
        return spNext ARGUMENTS;                                               \
    }

/// A call whose result is its error.
#define ZT_INTERPOSE_THREAD_CALL(CALL, PARAMETERS, ARGUMENTS)                  \
    extern "C" int sFaulty_##CALL PARAMETERS __asm__(#CALL);                   \
    int sFaulty_##CALL PARAMETERS {                                            \
        static auto* const spNext = sNext(&sFaulty_##CALL, #CALL);             \
        const ZTSFault lFault = takeFault(#CALL, __builtin_return_address(0)); \
        return lFault.mFires ? lFault.mErrno : spNext ARGUMENTS;               \
    }

/// A call that moves aSize bytes of a file, and may move fewer. Counters and the like fail in no other way than by a
/// signal in between, and know no part of what they move.
#define ZT_INTERPOSE_TRANSFER(CALL, PARAMETERS, ARGUMENTS)                                                            \
    extern "C" ssize_t sFaulty_##CALL PARAMETERS __asm__(#CALL);                                                      \
    ssize_t sFaulty_##CALL PARAMETERS {                                                                               \
        static auto* const spNext = sNext(&sFaulty_##CALL, #CALL);                                                    \
        const ZTSFault lFault = sIsOutOfQuestion(aFile) ? ZTSFault{} : takeFault(#CALL, __builtin_return_address(0)); \
        if (lFault.mFires && lFault.mErrno != 0) {                                                                    \
            errno = lFault.mErrno;                                                                                    \
            return -1;                                                                                                \
        }                                                                                                             \
        if (lFault.mFires && lFault.mCount < aSize) {                                                                 \
            aSize = lFault.mCount;                                                                                    \
        }                                                                                                             \
        return spNext ARGUMENTS;                                                                                      \
    }

using ZTPThreadProcedure = void* (*)(void*);

// clang-format off
ZT_INTERPOSE(dlopen, void*, nullptr, (const char* apPath, int aMode), (apPath, aMode))
ZT_INTERPOSE(accept4, int, -1, (int aSocket, struct sockaddr* apAddress, socklen_t* apSize, int aFlags), (aSocket, apAddress, apSize, aFlags))
ZT_INTERPOSE(dup2, int, -1, (int aFrom, int aTo), (aFrom, aTo))
ZT_INTERPOSE(eventfd, int, -1, (unsigned aValue, int aFlags), (aValue, aFlags))
ZT_INTERPOSE(fallocate, int, -1, (int aFile, int aMode, off_t aFrom, off_t aSize), (aFile, aMode, aFrom, aSize))
ZT_INTERPOSE(flock, int, -1, (int aFile, int aOperation), (aFile, aOperation))
ZT_INTERPOSE(fork, pid_t, -1, (), ())
ZT_INTERPOSE(fstat, int, -1, (int aFile, struct stat* apStatus), (aFile, apStatus))
ZT_INTERPOSE(fsync, int, -1, (int aFile), (aFile))
ZT_INTERPOSE(ftruncate, int, -1, (int aFile, off_t aSize), (aFile, aSize))
ZT_INTERPOSE(futimens, int, -1, (int aFile, const struct timespec* apTimes), (aFile, apTimes))
ZT_INTERPOSE(getcwd, char*, nullptr, (char* apPath, std::size_t aSize), (apPath, aSize))
ZT_INTERPOSE(ioctl, int, -1, (int aFile, unsigned long aRequest, void* apArgument), (aFile, aRequest, apArgument))
ZT_INTERPOSE(kill, int, -1, (pid_t aProcess, int aSignal), (aProcess, aSignal))
ZT_INTERPOSE(lstat, int, -1, (const char* apPath, struct stat* apStatus), (apPath, apStatus))
ZT_INTERPOSE(mkdir, int, -1, (const char* apPath, mode_t aMode), (apPath, aMode))
ZT_INTERPOSE(mkfifo, int, -1, (const char* apPath, mode_t aMode), (apPath, aMode))
ZT_INTERPOSE(open, int, -1, (const char* apPath, int aFlags, mode_t aMode), (apPath, aFlags, aMode))
ZT_INTERPOSE(opendir, DIR*, nullptr, (const char* apPath), (apPath))
ZT_INTERPOSE(pipe2, int, -1, (int* apEnds, int aFlags), (apEnds, aFlags))
ZT_INTERPOSE(poll, int, -1, (struct pollfd* apFiles, nfds_t aNumber, int aTime), (apFiles, aNumber, aTime))
ZT_INTERPOSE(recvmsg, ssize_t, -1, (int aSocket, struct msghdr* apMessage, int aFlags), (aSocket, apMessage, aFlags))
ZT_INTERPOSE(rename, int, -1, (const char* apFrom, const char* apTo), (apFrom, apTo))
ZT_INTERPOSE(sendmsg, ssize_t, -1, (int aSocket, const struct msghdr* apMessage, int aFlags), (aSocket, apMessage, aFlags))
ZT_INTERPOSE(setsid, pid_t, -1, (), ())
ZT_INTERPOSE(signalfd, int, -1, (int aFile, const sigset_t* apSignals, int aFlags), (aFile, apSignals, aFlags))
ZT_INTERPOSE(socketpair, int, -1, (int aFamily, int aType, int aProtocol, int* apEnds), (aFamily, aType, aProtocol, apEnds))
ZT_INTERPOSE(splice, ssize_t, -1, (int aFrom, off_t* apFrom, int aTo, off_t* apTo, std::size_t aSize, unsigned aFlags), (aFrom, apFrom, aTo, apTo, aSize, aFlags))
ZT_INTERPOSE(stat, int, -1, (const char* apPath, struct stat* apStatus), (apPath, apStatus))
ZT_INTERPOSE(tee, ssize_t, -1, (int aFrom, int aTo, std::size_t aSize, unsigned aFlags), (aFrom, aTo, aSize, aFlags))
ZT_INTERPOSE(timerfd_settime, int, -1, (int aTimer, int aFlags, const struct itimerspec* apNew, struct itimerspec* apOld), (aTimer, aFlags, apNew, apOld))
ZT_INTERPOSE(unlink, int, -1, (const char* apPath), (apPath))
ZT_INTERPOSE(utimensat, int, -1, (int aDirectory, const char* apPath, const struct timespec* apTimes, int aFlags), (aDirectory, apPath, apTimes, aFlags))

ZT_INTERPOSE_TRANSFER(pread, (int aFile, void* apTo, std::size_t aSize, off_t aFrom), (aFile, apTo, aSize, aFrom))
ZT_INTERPOSE_TRANSFER(pwrite, (int aFile, const void* apFrom, std::size_t aSize, off_t aTo), (aFile, apFrom, aSize, aTo))
ZT_INTERPOSE_TRANSFER(read, (int aFile, void* apTo, std::size_t aSize), (aFile, apTo, aSize))
ZT_INTERPOSE_TRANSFER(write, (int aFile, const void* apFrom, std::size_t aSize), (aFile, apFrom, aSize))

ZT_INTERPOSE_THREAD_CALL(pthread_cond_init, (pthread_cond_t* apCondition, const pthread_condattr_t* apAttributes), (apCondition, apAttributes))
ZT_INTERPOSE_THREAD_CALL(pthread_cond_timedwait, (pthread_cond_t* apCondition, pthread_mutex_t* apMutex, const struct timespec* apEnd), (apCondition, apMutex, apEnd))
ZT_INTERPOSE_THREAD_CALL(pthread_condattr_init, (pthread_condattr_t* apAttributes), (apAttributes))
ZT_INTERPOSE_THREAD_CALL(pthread_condattr_setclock, (pthread_condattr_t* apAttributes, clockid_t aClock), (apAttributes, aClock))
ZT_INTERPOSE_THREAD_CALL(pthread_create, (pthread_t* apThread, const pthread_attr_t* apAttributes, ZTPThreadProcedure apProcedure, void* apArgument), (apThread, apAttributes, apProcedure, apArgument))
ZT_INTERPOSE_THREAD_CALL(pthread_mutex_init, (pthread_mutex_t* apMutex, const pthread_mutexattr_t* apAttributes), (apMutex, apAttributes))
ZT_INTERPOSE_THREAD_CALL(pthread_mutexattr_init, (pthread_mutexattr_t* apAttributes), (apAttributes))
ZT_INTERPOSE_THREAD_CALL(pthread_mutexattr_settype, (pthread_mutexattr_t* apAttributes, int aType), (apAttributes, aType))
// clang-format on

// Those that fit none of the forms.

extern "C" int sFaulty_close(int aFile) __asm__("close");
int sFaulty_close(int aFile) {
    static auto* const spNext = sNext(&sFaulty_close, "close");
    const ZTSFault lFault = takeFault("close", __builtin_return_address(0));
    // A close that fails has closed all the same.
    const int lResult = spNext(aFile);
    if (lFault.mFires) {
        errno = lFault.mErrno;
        return -1;
    }
    return lResult;
}

extern "C" int sFaulty_fcntl(int aFile, int aCommand, ...) __asm__("fcntl");
int sFaulty_fcntl(int aFile, int aCommand, ...) {
    static auto* const spNext = sNext(&sFaulty_fcntl, "fcntl");
    std::va_list lArguments;
    va_start(lArguments, aCommand);
    void* const lpArgument = va_arg(lArguments, void*);
    va_end(lArguments);
    const ZTSFault lFault = takeFault("fcntl", __builtin_return_address(0));
    if (lFault.mFires) {
        errno = lFault.mErrno;
        return -1;
    }
    return spNext(aFile, aCommand, lpArgument);
}

extern "C" ssize_t sFaulty_writev(int aFile, const struct iovec* apParts, int aNumber) __asm__("writev");
ssize_t sFaulty_writev(int aFile, const struct iovec* apParts, int aNumber) {
    static auto* const spNext = sNext(&sFaulty_writev, "writev");
    const ZTSFault lFault = takeFault("writev", __builtin_return_address(0));
    if (lFault.mFires && lFault.mErrno != 0) {
        errno = lFault.mErrno;
        return -1;
    }
    if (lFault.mFires) {
        const struct iovec lPart = {apParts->iov_base,
                                    lFault.mCount < apParts->iov_len ? lFault.mCount : apParts->iov_len};
        return spNext(aFile, &lPart, 1);
    }
    return spNext(aFile, apParts, aNumber);
}
