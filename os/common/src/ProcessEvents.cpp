#include "os/common/include/ProcessEvents.h"

#include <cerrno>
#include <climits>
#include <cstdint>
#include <new>

#include "os/common/include/Clib.h"

ZTCProcessEvent::ZTCProcessEvent() : mDescriptor(ClibEventFd()) {}

ZTCProcessEvent::~ZTCProcessEvent() {
    ClibClose(mDescriptor);
}

void ZTCProcessEvent::raise() noexcept {
    ClibRaiseEvent(mDescriptor);
}

bool ZTCProcessEvent::isRaised() const {
    return waitFor(0);
}

bool ZTCProcessEvent::waitFor(int aMilliseconds) const {
    const std::int64_t lDeadline = ClibMonotonicMilliseconds() + aMilliseconds;
    int lMilliseconds = aMilliseconds;
    for (;;) {
        struct pollfd lEvent = {mDescriptor, POLLIN, 0};
        const int lReady = ClibPoll(&lEvent, 1, lMilliseconds);
        if (lReady != -EINTR) {
            return lReady > 0;
        }
        if (aMilliseconds > 0) {
            const std::int64_t lLeft = lDeadline - ClibMonotonicMilliseconds();
            lMilliseconds = lLeft > 0 ? static_cast<int>(lLeft) : 0;
        }
    }
}

void ZTCProcessEvent::reset() noexcept {
    ClibResetEvent(mDescriptor);
}

// Both are never destroyed, and take no memory from the heap: they are what ends a process that has none left.

ZTCProcessEvent& getStopEvent() {
    alignas(ZTCProcessEvent) static unsigned char slStorage[sizeof(ZTCProcessEvent)];
    static ZTCProcessEvent& srEvent = *::new (slStorage) ZTCProcessEvent();
    return srEvent;
}

ZTCProcessEvent& getExitEvent() {
    alignas(ZTCProcessEvent) static unsigned char slStorage[sizeof(ZTCProcessEvent)];
    static ZTCProcessEvent& srEvent = *::new (slStorage) ZTCProcessEvent();
    return srEvent;
}
