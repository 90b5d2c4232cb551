/// How the wrappers of Clib.h report a failure: an exception whose text names the object and the system's reason.
#ifndef OS_COMMON_SRC_LINUX_CLIBFAILURE_H
#define OS_COMMON_SRC_LINUX_CLIBFAILURE_H

#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

/// Throws the exception with "DOING 'PATH' failed: REASON".
template <typename Exception>
[[noreturn]] void throwForPath(const char* apDoing, const char* apPath, int aErrno) {
    throwWith<Exception>("%s '%s' failed: %s", apDoing, apPath, ZTCErrnoText(aErrno).get());
}

/// The same with a descriptor or a process id.
template <typename Exception>
[[noreturn]] void throwForNumber(const char* apDoing, int aNumber, int aErrno) {
    throwWith<Exception>("%s %d failed: %s", apDoing, aNumber, ZTCErrnoText(aErrno).get());
}

#endif
