/// An open file descriptor that is closed with its owner.
#ifndef LIBKPM_SIM_SRC_DESCRIPTOR_H
#define LIBKPM_SIM_SRC_DESCRIPTOR_H

#include <unistd.h>

#include <utility>

class ZTCSimDescriptor {
public:
    ZTCSimDescriptor() = default;
    explicit ZTCSimDescriptor(int aDescriptor) : mDescriptor(aDescriptor) {}
    ZTCSimDescriptor(ZTCSimDescriptor&& arOther) noexcept : mDescriptor(std::exchange(arOther.mDescriptor, -1)) {}
    ZTCSimDescriptor& operator=(ZTCSimDescriptor&& arOther) noexcept {
        std::swap(mDescriptor, arOther.mDescriptor);
        return *this;
    }
    ZTCSimDescriptor(const ZTCSimDescriptor&) = delete;
    ZTCSimDescriptor& operator=(const ZTCSimDescriptor&) = delete;
    ~ZTCSimDescriptor() {
        if (mDescriptor >= 0) {
            ::close(mDescriptor);
        }
    }

    int get() const { return mDescriptor; }
    bool isOpen() const { return mDescriptor >= 0; }

private:
    int mDescriptor = -1;
};

#endif
