/// An open file descriptor that is closed with its owner.
#ifndef LIBKPM_LINUX_SRC_DESCRIPTOR_H
#define LIBKPM_LINUX_SRC_DESCRIPTOR_H

#include <unistd.h>

#include <utility>

class ZTCLinuxDescriptor {
public:
    ZTCLinuxDescriptor() = default;
    explicit ZTCLinuxDescriptor(int aDescriptor) : mDescriptor(aDescriptor) {}
    ZTCLinuxDescriptor(ZTCLinuxDescriptor&& arOther) noexcept : mDescriptor(std::exchange(arOther.mDescriptor, -1)) {}
    ZTCLinuxDescriptor& operator=(ZTCLinuxDescriptor&& arOther) noexcept {
        std::swap(mDescriptor, arOther.mDescriptor);
        return *this;
    }
    ZTCLinuxDescriptor(const ZTCLinuxDescriptor&) = delete;
    ZTCLinuxDescriptor& operator=(const ZTCLinuxDescriptor&) = delete;
    ~ZTCLinuxDescriptor() {
        if (mDescriptor >= 0) {
            ::close(mDescriptor);
        }
    }

    int get() const { return mDescriptor; }
    bool isOpen() const { return mDescriptor >= 0; }

    /// Gives it to the caller, who closes it.
    int release() { return std::exchange(mDescriptor, -1); }

private:
    int mDescriptor = -1;
};

#endif
