#include "os/common/include/Clib.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "common/include/ThrowWith.h"
#include "os/common/src/linux/ClibFailure.h"

// ---- Environment, memory and text ----

const char* ClibGetenv(const char* apName, char* apBuffer) {
    const char* lpValue = std::getenv(apName);
    if (lpValue != nullptr && apBuffer != nullptr) {
        std::memcpy(apBuffer, lpValue, std::strlen(lpValue) + 1);
    }
    return lpValue;
}

char* ClibStrcpy(char* apTo, std::size_t aSize, const char* apFrom) {
    const std::size_t lLength = std::strlen(apFrom);
    if (lLength >= aSize) {
        throwWith<ZTCInvalidEx>("A text of %zu characters does not fit into %zu bytes", lLength, aSize);
    }
    std::memcpy(apTo, apFrom, lLength + 1);
    return apTo;
}

int ClibStrcmp(const char* apLeft, const char* apRight) {
    return std::strcmp(apLeft, apRight);
}

int ClibSprintf(char* apBuffer, std::size_t aSize, const char* apFormat, ...) {
    if (aSize == 0) {
        return 0;
    }
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    const int lLength = std::vsnprintf(apBuffer, aSize, apFormat, lArguments);
    va_end(lArguments);
    if (lLength < 0) {
        apBuffer[0] = '\0';
        return 0;
    }
    const std::size_t lMost = aSize - 1;
    return static_cast<std::size_t>(lLength) < lMost ? lLength : static_cast<int>(lMost);
}

std::uint32_t ClibNtohl(std::uint32_t aNetworkOrder) {
    return ntohl(aNetworkOrder);
}

std::uint32_t ClibHtonl(std::uint32_t aHostOrder) {
    return htonl(aHostOrder);
}

void* ClibMemcpy(void* apTo, const void* apFrom, std::size_t aSize) {
    return aSize == 0 ? apTo : std::memcpy(apTo, apFrom, aSize);
}

void* ClibMemset(void* apTo, int aByte, std::size_t aSize) {
    return aSize == 0 ? apTo : std::memset(apTo, aByte, aSize);
}

// ---- Paths ----

void ClibMkdir(const char* apPath, int aMode) {
    if (::mkdir(apPath, static_cast<::mode_t>(aMode)) == 0) {
        return;
    }
    const int lError = errno;
    // A system call filter of a sandbox refuses by the mode alone (set-group-id), before the kernel looks at the path.
    struct ::stat lStatus;
    if (lError == EEXIST || (lError == EPERM && ::lstat(apPath, &lStatus) == 0)) {
        throwForPath<ZTCExistsEx>("Making the directory", apPath, EEXIST);
    }
    throwForPath<ZTCClibMkdirFailedEx>("Making the directory", apPath, lError);
}

void ClibMkfifo(const char* apPath, ::mode_t aMode) {
    if (::mkfifo(apPath, aMode) == 0) {
        return;
    }
    if (errno == EEXIST) {
        throwForPath<ZTCExistsEx>("Making the FIFO", apPath, EEXIST);
    }
    throwForPath<ZTCClibMkfifoFailedEx>("Making the FIFO", apPath, errno);
}

void ClibStat(const char* apPath, struct stat* apStatus) {
    if (::stat(apPath, apStatus) != 0) {
        throwForPath<ZTCClibStatFailedEx>("Getting the status of", apPath, errno);
    }
}

bool ClibLstat(const char* apPath, struct stat* apStatus) {
    if (::lstat(apPath, apStatus) == 0) {
        return true;
    }
    if (errno == ENOENT) {
        return false;
    }
    throwForPath<ZTCClibStatFailedEx>("Getting the status of", apPath, errno);
}

void ClibUtime(const char* apPath) {
    if (::utimensat(AT_FDCWD, apPath, nullptr, AT_SYMLINK_NOFOLLOW) != 0) {
        throwForPath<ZTCClibUtimeFailedEx>("Setting the times of", apPath, errno);
    }
}

bool ClibUnlink(const char* apPath) {
    if (::unlink(apPath) == 0) {
        return true;
    }
    if (errno == ENOENT) {
        return false;
    }
    throwForPath<ZTCClibUnlinkFailedEx>("Removing", apPath, errno);
}

const char* ClibFileKind(::mode_t aMode) {
    switch (aMode & S_IFMT) {
        case S_IFIFO:
            return "a FIFO";
        case S_IFREG:
            return "a regular file";
        case S_IFDIR:
            return "a directory";
        case S_IFLNK:
            return "a symbolic link";
        case S_IFSOCK:
            return "a socket";
        case S_IFCHR:
            return "a character device";
        case S_IFBLK:
            return "a block device";
        default:
            return "something unknown";
    }
}

ZTCErrnoText::ZTCErrnoText(int aErrno) {
    char lBuffer[sizeof(mText)];
    ClibSprintf(mText, sizeof(mText), "%s", ::strerror_r(aErrno, lBuffer, sizeof(lBuffer)));
}
