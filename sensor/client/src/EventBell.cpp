#include "sensor/client/include/EventBell.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

#include "sensor/client/include/ClientErrors.h"

ZTCEventBell::ZTCEventBell() : mDescriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (!mDescriptor.isOpen()) {
        throw ZTCSystemCallEx("cannot make an eventfd", errno);
    }
}

void ZTCEventBell::ring() const noexcept {
    const std::uint64_t lOne = 1;
    [[maybe_unused]] const ssize_t lWritten = write(mDescriptor.get(), &lOne, sizeof(lOne));
}

void ZTCEventBell::clear() const noexcept {
    std::uint64_t lCount = 0;
    [[maybe_unused]] const ssize_t lRead = read(mDescriptor.get(), &lCount, sizeof(lCount));
}
