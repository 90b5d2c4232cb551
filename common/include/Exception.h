/// The exception family.
///
/// Every failure that is reported to a caller is an object of this family: it owns a message text and carries a code.
/// All bases are virtual, so that an object holds one text and one code and can be caught by any of its bases.
/// Making, copying and asking an exception never allocates and never throws.

#ifndef COMMON_INCLUDE_EXCEPTION_H
#define COMMON_INCLUDE_EXCEPTION_H

#include <cstddef>

#include "common/include/ErrorCodes.h"

/// The root of the family.
class ZTCException {
public:
    /// Bytes of the message buffer, the terminating zero included. A longer text is cut.
    static constexpr std::size_t gcMessageCapacity = 512;

    /// Copies the text, so that the caller's buffer may die. A null text counts as an empty one.
    ZTCException(const char* apMessage, ZTError aError) noexcept;
    ZTCException(const ZTCException&) noexcept = default;
    ZTCException& operator=(const ZTCException&) noexcept = default;
    virtual ~ZTCException();

    /// The text; lives as long as the exception.
    const char* what() const noexcept { return mMessage; }

    /// The code.
    ZTError getError() const noexcept { return mError; }

private:
    char mMessage[gcMessageCapacity];
    ZTError mError;
};

/// Declares a class of the first row, directly under the root.
#define ZT_EXCEPTION_TYPE(aClassName, aMessage, aErrorCode)                                         \
    class aClassName : public virtual ZTCException {                                                \
    public:                                                                                         \
        explicit aClassName(const char* apMessage = aMessage, ZTError aError = aErrorCode) noexcept \
            : ZTCException(apMessage, aError) {}                                                    \
    }

/// Declares a class under one other class of the family.
#define ZT_EXCEPTION(aClassName, aBaseClass, aMessage, aErrorCode)                                  \
    class aClassName : public virtual aBaseClass {                                                  \
    public:                                                                                         \
        explicit aClassName(const char* apMessage = aMessage, ZTError aError = aErrorCode) noexcept \
            : ZTCException(apMessage, aError), aBaseClass(apMessage, aError) {}                     \
    }

/// Declares a class under another class and under ZTCHaltEx: the condition ends a thread or the process.
#define ZT_HALT_EXCEPTION(aClassName, aBaseClass, aMessage, aErrorCode)                                       \
    class aClassName : public virtual aBaseClass, public virtual ZTCHaltEx {                                  \
    public:                                                                                                   \
        explicit aClassName(const char* apMessage = aMessage, ZTError aError = aErrorCode) noexcept           \
            : ZTCException(apMessage, aError), aBaseClass(apMessage, aError), ZTCHaltEx(apMessage, aError) {} \
    }

/// Declares a class under another class and under ZTCClibEx: a failed call of the C library.
#define ZT_CLIB_EXCEPTION(aClassName, aBaseClass, aMessage, aErrorCode)                                       \
    class aClassName : public virtual aBaseClass, public virtual ZTCClibEx {                                  \
    public:                                                                                                   \
        explicit aClassName(const char* apMessage = aMessage, ZTError aError = aErrorCode) noexcept           \
            : ZTCException(apMessage, aError), aBaseClass(apMessage, aError), ZTCClibEx(apMessage, aError) {} \
    }

// The first row: caught, seldom thrown.
ZT_EXCEPTION_TYPE(ZTCGenericException, "Generic exception", gcErrGeneric);
ZT_EXCEPTION_TYPE(ZTCHaltEx, "Halt", gcErrHalt);
ZT_EXCEPTION_TYPE(ZTCOsException, "Operating system call failed", gcErrOs);
ZT_EXCEPTION_TYPE(ZTCOpsException, "Operation failed", gcErrOps);
ZT_EXCEPTION_TYPE(ZTCClibEx, "C library call failed", gcErrClib);

// Generic conditions.
ZT_HALT_EXCEPTION(ZTCNoMemoryEx, ZTCGenericException, "Out of Memory", gcErrNoMemory);
ZT_EXCEPTION(ZTCInvalidEx, ZTCGenericException, "Invalid", gcErrInvalid);
ZT_EXCEPTION(ZTCNotFoundEx, ZTCGenericException, "Not found", gcErrNotFound);
ZT_EXCEPTION(ZTCExistsEx, ZTCGenericException, "Already exists", gcErrExists);
ZT_EXCEPTION(ZTCNotImplementedEx, ZTCGenericException, "Not Implemented", gcErrNotImplemented);

// Conditions that end the agent or one of its threads.
ZT_HALT_EXCEPTION(ZTCExitConditionEx, ZTCGenericException, "Exit condition", gcErrStop);
ZT_HALT_EXCEPTION(ZTCShutDownEx, ZTCGenericException, "Shutting down Tavik", gcErrStop);
ZT_HALT_EXCEPTION(ZTCQuitThreadEx, ZTCGenericException, "Quit thread", gcErrQuitThread);

// Operations.
ZT_EXCEPTION(ZTCHeartbeatFailedEx, ZTCOpsException, "", gcErrHeartbeatFailed);

// Threads and waits. ZTCTimeOutEx is the ordinary end of a timed wait.
ZT_EXCEPTION(ZTCTimeOutEx, ZTCOsException, "Timed out", gcErrOsTimeOut);
ZT_EXCEPTION(ZTCOsMutexEx, ZTCOsException, "Mutex operation failed", gcErrOsMutex);
ZT_EXCEPTION(ZTCOsConditionalEx, ZTCOsException, "Conditional operation failed", gcErrOsConditional);
ZT_EXCEPTION(ZTCOsThreadEx, ZTCOsException, "Thread operation failed", gcErrOsThread);

// Failed calls of the C library.
ZT_EXCEPTION(ZTCClibStatFailedEx, ZTCClibEx, "stat failed", gcErrClibStat);
ZT_EXCEPTION(ZTCClibUtimeFailedEx, ZTCClibEx, "utime failed", gcErrClibUtime);
ZT_EXCEPTION(ZTCClibGetProcStatusFailedEx, ZTCClibEx, "Getting the process status failed", gcErrClibGetProcStatus);
ZT_EXCEPTION(ZTCClibOpenFailedEx, ZTCClibEx, "open failed", gcErrClibOpen);
ZT_EXCEPTION(ZTCClibCloseFailedEx, ZTCClibEx, "close failed", gcErrClibClose);
ZT_EXCEPTION(ZTCClibReadFailedEx, ZTCClibEx, "read failed", gcErrClibRead);
ZT_EXCEPTION(ZTCClibWriteFailedEx, ZTCClibEx, "write failed", gcErrClibWrite);
ZT_EXCEPTION(ZTCClibMkfifoFailedEx, ZTCClibEx, "mkfifo failed", gcErrClibMkfifo);
ZT_EXCEPTION(ZTCClibMkdirFailedEx, ZTCClibEx, "mkdir failed", gcErrClibMkdir);
ZT_EXCEPTION(ZTCClibUnlinkFailedEx, ZTCClibEx, "unlink failed", gcErrClibUnlink);
ZT_EXCEPTION(ZTCClibLockFailedEx, ZTCClibEx, "flock failed", gcErrClibLock);
ZT_EXCEPTION(ZTCClibForkFailedEx, ZTCClibEx, "fork failed", gcErrClibFork);
ZT_EXCEPTION(ZTCClibPollFailedEx, ZTCClibEx, "poll failed", gcErrClibPoll);
ZT_EXCEPTION(ZTCClibSignalFailedEx, ZTCClibEx, "Signal set-up failed", gcErrClibSignal);
ZT_EXCEPTION(ZTCClibKillFailedEx, ZTCClibEx, "kill failed", gcErrClibKill);
ZT_EXCEPTION(ZTCClibEventFailedEx, ZTCClibEx, "Event descriptor failed", gcErrClibEvent);
ZT_EXCEPTION(ZTCClibDupFailedEx, ZTCClibEx, "dup failed", gcErrClibDup);
ZT_EXCEPTION(ZTCClibTruncateFailedEx, ZTCClibEx, "ftruncate failed", gcErrClibTruncate);
ZT_EXCEPTION(ZTCClibSessionFailedEx, ZTCClibEx, "setsid failed", gcErrClibSession);

#endif
