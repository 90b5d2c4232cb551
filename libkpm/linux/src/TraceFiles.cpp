#include "libkpm/linux/src/TraceFiles.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "libkpm/common/include/Descriptor.h"

static int sWrite(const std::string& acrPath, std::string_view aText, int aFlags) {
    const ZTCLibraryDescriptor lFile = openLibraryFile(acrPath.c_str(), O_WRONLY | aFlags);
    if (!lFile.isOpen()) {
        return errno;
    }
    ssize_t lWritten = -1;
    do {
        lWritten = ::write(lFile.get(), aText.data(), aText.size());
    } while (lWritten < 0 && errno == EINTR);
    if (lWritten < 0) {
        return errno;
    }
    return static_cast<std::size_t>(lWritten) == aText.size() ? 0 : EIO;
}

int ZTCTraceFiles::make(const std::string& acrPath) {
    return ::mkdir(acrPath.c_str(), 0700) == 0 ? 0 : errno;
}

int ZTCTraceFiles::remove(const std::string& acrPath) {
    return ::rmdir(acrPath.c_str()) == 0 ? 0 : errno;
}

int ZTCTraceFiles::write(const std::string& acrPath, std::string_view aText) {
    return sWrite(acrPath, aText, O_TRUNC);
}

int ZTCTraceFiles::append(const std::string& acrPath, std::string_view aText) {
    return sWrite(acrPath, aText, O_APPEND);
}
