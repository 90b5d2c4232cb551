#include "tests/support/Waiting.h"

#include <stdexcept>
#include <thread>

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
