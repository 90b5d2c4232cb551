/// Pauses before a process is started again: each is twice the one before, up to a longest.
#ifndef SENSOR_KEEPER_INCLUDE_BACKOFF_H
#define SENSOR_KEEPER_INCLUDE_BACKOFF_H

#include <chrono>

class ZTCBackOff {
public:
    ZTCBackOff(std::chrono::seconds aFirst, std::chrono::seconds aMost) : mFirst(aFirst), mMost(aMost), mNext(aFirst) {}

    /// The pause to make now.
    std::chrono::seconds take();
    void reset() { mNext = mFirst; }

private:
    std::chrono::seconds mFirst;
    std::chrono::seconds mMost;
    std::chrono::seconds mNext;
};

#endif
