/// A file descriptor that is closed with its owner. It can be moved, but not copied. -1: no descriptor.
#ifndef SENSOR_CLIENT_INCLUDE_FILEDESCRIPTOR_H
#define SENSOR_CLIENT_INCLUDE_FILEDESCRIPTOR_H

#include <utility>

class ZTCFileDescriptor {
public:
    ZTCFileDescriptor() = default;
    explicit ZTCFileDescriptor(int aDescriptor) : mDescriptor(aDescriptor) {}
    ZTCFileDescriptor(ZTCFileDescriptor&& aOther) noexcept : mDescriptor(std::exchange(aOther.mDescriptor, -1)) {}
    ZTCFileDescriptor& operator=(ZTCFileDescriptor&& aOther) noexcept {
        std::swap(mDescriptor, aOther.mDescriptor);
        return *this;
    }
    ZTCFileDescriptor(const ZTCFileDescriptor&) = delete;
    ZTCFileDescriptor& operator=(const ZTCFileDescriptor&) = delete;
    ~ZTCFileDescriptor() { reset(); }

    int get() const { return mDescriptor; }
    bool isOpen() const { return mDescriptor >= 0; }
    void reset() noexcept;

    /// Opens with O_CLOEXEC added, again after EINTR. Returns -1 in the result and leaves errno where that fails.
    static ZTCFileDescriptor open(const char* apPath, int aFlags, unsigned aMode = 0);

    /// Whether the path still leads to the file that is open here.
    bool isAtPath(const char* apPath) const;

private:
    int mDescriptor = -1;
};

#endif
