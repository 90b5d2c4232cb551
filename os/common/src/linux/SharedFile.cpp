#include "os/common/include/SharedFile.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>

#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

namespace {

constexpr char scNewSuffix[] = ".new";
constexpr ::mode_t scMode = S_IRUSR | S_IWUSR;

[[noreturn]] void sThrowFailed(const char* apWhat, const char* apPath, int aErrno) {
    throwWith<ZTCClibWriteFailedEx>("%s '%s' failed: %s", apWhat, apPath, ZTCErrnoText(aErrno).get());
}

}  // namespace

ZTCSharedFile::~ZTCSharedFile() {
    if (mpMapped != nullptr) {
        ::munmap(mpMapped, mSize);
    }
    ClibClose(mDescriptor);
}

void ZTCSharedFile::make(const char* apPath, std::size_t aSize) {
    mPath = ZTCString(apPath);
    mNewPath = mPath + ZTCString(scNewSuffix);
    ClibUnlink(mNewPath.get());
    mDescriptor = ClibOpen(mNewPath.get(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW, scMode);
    try {
        // Whatever the umask is.
        if (::fchmod(mDescriptor, scMode) != 0) {
            sThrowFailed("Setting the mode of", mNewPath.get(), errno);
        }
        map(aSize);
    } catch (...) {
        drop();
        throw;
    }
}

void ZTCSharedFile::publish() {
    if (std::rename(mNewPath.get(), mPath.get()) != 0) {
        const int lErrno = errno;
        drop();
        sThrowFailed("Renaming a file to", mPath.get(), lErrno);
    }
}

void ZTCSharedFile::grow(std::size_t aSize) {
    map(aSize);
}

void ZTCSharedFile::map(std::size_t aSize) {
    if (const int lError = ::posix_fallocate(mDescriptor, 0, static_cast<::off_t>(aSize)); lError != 0) {
        sThrowFailed("Reserving room for", mPath.get(), lError);
    }
    void* lpMapped = ::mmap(nullptr, aSize, PROT_READ | PROT_WRITE, MAP_SHARED, mDescriptor, 0);
    if (lpMapped == MAP_FAILED) {
        sThrowFailed("Mapping", mPath.get(), errno);
    }
    if (mpMapped != nullptr) {
        ::munmap(mpMapped, mSize);
    }
    mpMapped = lpMapped;
    mSize = aSize;
}

/// Gives up a file that has no name of its own yet.
void ZTCSharedFile::drop() noexcept {
    if (mpMapped != nullptr) {
        ::munmap(mpMapped, mSize);
        mpMapped = nullptr;
    }
    ClibClose(mDescriptor);
    mDescriptor = -1;
    static_cast<void>(std::remove(mNewPath.get()));
}
