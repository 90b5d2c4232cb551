/// Waiting for events with a deadline: the only way in which tests let time pass.
#ifndef TESTS_SUPPORT_WAITING_H
#define TESTS_SUPPORT_WAITING_H

#include <chrono>
#include <functional>
#include <string>

/// How long a test waits for something that is bound to happen, before it gives up. Generous: nothing is measured with
/// it.
inline constexpr std::chrono::seconds gcTestPatience{20};

/// This time as it is on a machine that has nothing else to do; longer where others compete for the processors, or
/// where a sanitizer slows the programs down. For bounds that the agent promises.
std::chrono::milliseconds stretched(std::chrono::milliseconds aTime);

/// A point in time after which waiting is given up.
class ZTCDeadline {
public:
    explicit ZTCDeadline(std::chrono::milliseconds aPatience = gcTestPatience)
        : mEnd(std::chrono::steady_clock::now() + aPatience) {}

    bool isOver() const { return std::chrono::steady_clock::now() >= mEnd; }
    /// Milliseconds left, for poll(): 0 when the deadline is over.
    int remainingMilliseconds() const;

private:
    std::chrono::steady_clock::time_point mEnd;
};

/// Returns as soon as `acrCondition` yields true; throws std::runtime_error naming `acrWhat` when the deadline is over
/// first.
void waitUntil(const std::function<bool()>& acrCondition, const std::string& acrWhat,
               const ZTCDeadline& acrDeadline = ZTCDeadline());

#endif
