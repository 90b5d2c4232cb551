#include "sensor/client/include/FileDescriptor.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

void ZTCFileDescriptor::reset() noexcept {
    if (mDescriptor >= 0) {
        close(mDescriptor);
        mDescriptor = -1;
    }
}

ZTCFileDescriptor ZTCFileDescriptor::open(const char* apPath, int aFlags, unsigned aMode) {
    int lDescriptor;
    do {
        lDescriptor = ::open(apPath, aFlags | O_CLOEXEC, aMode);
    } while (lDescriptor < 0 && errno == EINTR);
    return ZTCFileDescriptor(lDescriptor);
}

bool ZTCFileDescriptor::isAtPath(const char* apPath) const {
    struct stat lHere {};
    struct stat lThere {};
    return mDescriptor >= 0 && fstat(mDescriptor, &lHere) == 0 && stat(apPath, &lThere) == 0 &&
           lHere.st_dev == lThere.st_dev && lHere.st_ino == lThere.st_ino;
}
