#include "sensor/client/src/RawFile.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "sensor/client/include/ClientErrors.h"

ZTCRawFile::ZTCRawFile(const std::string& acrPath) : mPath(acrPath) {
    if (!mPath.empty()) {
        mFile = ZTCFileDescriptor::open(mPath.c_str(), O_WRONLY | O_CREAT, 0666);
        if (!mFile.isOpen()) {
            throw ZTCSystemCallEx("cannot open " + mPath, errno);
        }
    }
}

void ZTCRawFile::write(const ZTCWireBytes& acrBytes) {
    if (!mFile.isOpen()) {
        return;
    }
    if (ftruncate(mFile.get(), 0) != 0 && errno != EINVAL) {
        throw ZTCSystemCallEx("cannot empty " + mPath, errno);
    }
    std::size_t lWritten = 0;
    while (lWritten < acrBytes.size()) {
        const ssize_t lCount = ::write(mFile.get(), acrBytes.data() + lWritten, acrBytes.size() - lWritten);
        if (lCount > 0) {
            lWritten += static_cast<std::size_t>(lCount);
        } else if (lCount == 0 || errno != EINTR) {
            throw ZTCSystemCallEx("cannot write " + mPath + ": " + std::to_string(lWritten) + " of " +
                                      std::to_string(acrBytes.size()) + " bytes written",
                                  lCount < 0 ? errno : ENOSPC);
        }
    }
}
