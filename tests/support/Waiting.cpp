#include "tests/support/Waiting.h"

#include <algorithm>
#include <cstdlib>
#include <stdexcept>
#include <thread>

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
static constexpr double scSanitizerFactor = 5;
#else
static constexpr double scSanitizerFactor = 1;
#endif

std::chrono::milliseconds stretched(std::chrono::milliseconds aTime) {
    double lLoad = 0;
    const double lProcessors = std::max(1u, std::thread::hardware_concurrency());
    const double lShare = getloadavg(&lLoad, 1) == 1 ? 1 + lLoad / lProcessors : 2;
    return std::chrono::milliseconds(
        static_cast<std::chrono::milliseconds::rep>(static_cast<double>(aTime.count()) * lShare * scSanitizerFactor));
}

int ZTCDeadline::remainingMilliseconds() const {
    const auto lLeft =
        std::chrono::duration_cast<std::chrono::milliseconds>(mEnd - std::chrono::steady_clock::now()).count();
    return lLeft > 0 ? static_cast<int>(lLeft) : 0;
}

void waitUntil(const std::function<bool()>& acrCondition, const std::string& acrWhat, const ZTCDeadline& acrDeadline) {
    while (!acrCondition()) {
        if (acrDeadline.isOver()) {
            throw std::runtime_error("waited in vain for " + acrWhat);
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}
