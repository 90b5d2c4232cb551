/// A point on the monotonic clock until which something is waited for.
#ifndef SENSOR_CLIENT_INCLUDE_TIMELIMIT_H
#define SENSOR_CLIENT_INCLUDE_TIMELIMIT_H

#include <chrono>
#include <string>

class ZTCTimeLimit {
public:
    explicit ZTCTimeLimit(std::chrono::milliseconds aSpan)
        : mSpan(aSpan), mEnd(std::chrono::steady_clock::now() + aSpan) {}

    bool hasPassed() const { return std::chrono::steady_clock::now() >= mEnd; }

    /// What is left, rounded up to whole milliseconds and held within int: fit for poll(). 0 once it has passed.
    int remainingMilliseconds() const;

    /// The whole span as given, for people: "5 s", "0.25 s".
    std::string describeSpan() const;

private:
    std::chrono::milliseconds mSpan;
    std::chrono::steady_clock::time_point mEnd;
};

#endif
