#include "sensor/client/include/TimeLimit.h"

#include <algorithm>
#include <climits>

int ZTCTimeLimit::remainingMilliseconds() const {
    const auto lLeft = std::chrono::ceil<std::chrono::milliseconds>(mEnd - std::chrono::steady_clock::now()).count();
    return static_cast<int>(std::clamp<long long>(lLeft, 0, INT_MAX));
}

std::string ZTCTimeLimit::describeSpan() const {
    const long long lMilliseconds = mSpan.count();
    std::string lText = std::to_string(lMilliseconds / 1000);
    if (lMilliseconds % 1000 != 0) {
        std::string lFraction = std::to_string(1000 + lMilliseconds % 1000).substr(1);
        lFraction.erase(lFraction.find_last_not_of('0') + 1);
        lText += "." + lFraction;
    }
    return lText + " s";
}
