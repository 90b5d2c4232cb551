#include "sensor/link/include/Inheritance.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"

static std::string sTakeVariable(const char* apName) {
    const char* lpValue = std::getenv(apName);
    if (lpValue == nullptr || *lpValue == '\0') {
        throw ZTCBadInputEx(std::string(apName) + " is not set: a collector is started by tavik-sensor, not by hand");
    }
    std::string lValue(lpValue);
    unsetenv(apName);
    return lValue;
}

/// @param aKind  what st_mode must be of
static ZTCFileDescriptor sTakeDescriptor(const char* apName, mode_t aKind) {
    const std::string lText = sTakeVariable(apName);
    int lNumber = -1;
    const auto [lpEnd, lError] = std::from_chars(lText.data(), lText.data() + lText.size(), lNumber);
    const bool lIsNumber = lError == std::errc() && lpEnd == lText.data() + lText.size() && lNumber >= 3;
    struct stat lStatus {};
    if (lIsNumber && (fstat(lNumber, &lStatus) != 0 || fcntl(lNumber, F_SETFD, FD_CLOEXEC) != 0)) {
        const std::string lReason = std::strerror(errno);
        throw ZTCBadInputEx(std::string(apName) + " is \"" + lText + "\", which cannot be used: " + lReason);
    }
    if (!lIsNumber || (lStatus.st_mode & S_IFMT) != aKind) {
        throw ZTCBadInputEx(std::string(apName) + " is \"" + lText + "\", which is not an open descriptor of its kind");
    }
    return ZTCFileDescriptor(lNumber);
}

ZTSInheritance takeInheritance() {
    ZTSInheritance lTaken;
    lTaken.mLink = ZTCLink(sTakeDescriptor(gcLinkVariable, S_IFSOCK));
    lTaken.mControl = sTakeDescriptor(gcControlVariable, S_IFSOCK);
    lTaken.mSettings = sTakeDescriptor(gcSettingsVariable, S_IFREG);
    lTaken.mDirectory = sTakeVariable(gcDirectoryVariable);
    lTaken.mState = sTakeVariable(gcStateVariable);
    return lTaken;
}

std::string readWhole(const ZTCFileDescriptor& acrFile) {
    std::string lContent;
    char lChunk[4096];
    while (true) {
        const ssize_t lRead = pread(acrFile.get(), lChunk, sizeof(lChunk), static_cast<off_t>(lContent.size()));
        if (lRead > 0) {
            lContent.append(lChunk, static_cast<std::size_t>(lRead));
        } else if (lRead == 0) {
            return lContent;
        } else if (errno != EINTR) {
            throw ZTCSystemCallEx("cannot read descriptor " + std::to_string(acrFile.get()), errno);
        }
    }
}
