/// An open file descriptor that is closed with its owner.
#ifndef LIBKPM_COMMON_INCLUDE_DESCRIPTOR_H
#define LIBKPM_COMMON_INCLUDE_DESCRIPTOR_H

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

class ZTCLibraryDescriptor {
public:
    ZTCLibraryDescriptor() = default;
    explicit ZTCLibraryDescriptor(int aDescriptor) : mDescriptor(aDescriptor) {}
    ZTCLibraryDescriptor(ZTCLibraryDescriptor&& arOther) noexcept
        : mDescriptor(std::exchange(arOther.mDescriptor, -1)) {}
    ZTCLibraryDescriptor& operator=(ZTCLibraryDescriptor&& arOther) noexcept {
        std::swap(mDescriptor, arOther.mDescriptor);
        return *this;
    }
    ZTCLibraryDescriptor(const ZTCLibraryDescriptor&) = delete;
    ZTCLibraryDescriptor& operator=(const ZTCLibraryDescriptor&) = delete;
    ~ZTCLibraryDescriptor() {
        if (mDescriptor >= 0) {
            ::close(mDescriptor);
        }
    }

    int get() const { return mDescriptor; }
    bool isOpen() const { return mDescriptor >= 0; }

    /// Gives the descriptor to the caller, who has to close it.
    int release() { return std::exchange(mDescriptor, -1); }

private:
    int mDescriptor = -1;
};

/// Opens a file that is there, for this process alone and without waiting; a signal does not end the attempt. Not open,
/// with the reason in errno, where that cannot be done.
inline ZTCLibraryDescriptor openLibraryFile(const char* apPath, int aFlags) {
    int lFile = -1;
    do {
        lFile = ::open(apPath, aFlags | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    } while (lFile < 0 && errno == EINTR);
    return ZTCLibraryDescriptor(lFile);
}

#endif
