/// An eventfd by which one thread wakes another that polls.
#ifndef SENSOR_CLIENT_INCLUDE_EVENTBELL_H
#define SENSOR_CLIENT_INCLUDE_EVENTBELL_H

#include "sensor/client/include/FileDescriptor.h"

/// Any thread may use it.
class ZTCEventBell {
public:
    /// Throws ZTCSystemCallEx where there is no descriptor left.
    ZTCEventBell();

    /// Makes the descriptor readable. Never waits.
    void ring() const noexcept;
    /// Makes the descriptor unreadable until the next ring(). Never waits.
    void clear() const noexcept;
    /// To be polled for POLLIN.
    int getDescriptor() const { return mDescriptor.get(); }

private:
    ZTCFileDescriptor mDescriptor;
};

#endif
