#include "tests/support/SettableClock.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <stdexcept>

ZTCSettableClock::ZTCSettableClock(const std::string& acrPath) : mPath(acrPath) {
    const int lFile = open(acrPath.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
    if (lFile < 0 || ftruncate(lFile, sizeof(std::int64_t)) != 0) {
        throw std::runtime_error("cannot make " + acrPath);
    }
    mpMapped = mmap(nullptr, sizeof(std::int64_t), PROT_READ | PROT_WRITE, MAP_SHARED, lFile, 0);
    close(lFile);
    if (mpMapped == MAP_FAILED) {
        throw std::runtime_error("cannot map " + acrPath);
    }
}

ZTCSettableClock::~ZTCSettableClock() {
    munmap(mpMapped, sizeof(std::int64_t));
}

std::map<std::string, std::string> ZTCSettableClock::getEnvironment() const {
    return {{"LD_PRELOAD", TAVIK_SETTABLE_CLOCK_SHIM}, {gcSettableClockVariable, mPath}};
}

void ZTCSettableClock::setAhead(std::chrono::seconds aTime) {
    std::atomic_ref(*static_cast<std::int64_t*>(mpMapped)).store(aTime.count());
}
