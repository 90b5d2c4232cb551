/// Threads of the scripted adapters' library that deliver the same events over and over.
#ifndef TESTS_SUPPORT_SCRIPTEDSTORM_H
#define TESTS_SUPPORT_SCRIPTEDSTORM_H

#include <atomic>
#include <cstdint>
#include <functional>
#include <thread>
#include <vector>

#include "tests/support/LibraryEvent.h"

/// Used by one thread at a time.
class ZTCScriptedStorm {
public:
    /// Returns whether the storm is to go on.
    using Deliver = std::function<bool(const ZTSLibraryEvent&)>;

    /// Starts so many threads. Each delivers the events `aRounds` times, or without end where that is 0. Thread t
    /// starts with event t. Throws std::runtime_error where a storm is under way.
    void start(unsigned aThreads, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents,
               const Deliver& acrDeliver);

    /// Makes the threads end after the callback that they are in. Does not wait.
    void requestStop() { mIsToStop = true; }

    /// Waits until the threads have ended. Returns the number of events that have been delivered.
    std::uint64_t join();

private:
    void run(unsigned aThread, std::uint64_t aRounds, const std::vector<ZTSLibraryEvent>& acrEvents,
             const Deliver& acrDeliver);

    std::vector<std::thread> mThreads;
    std::atomic<bool> mIsToStop{false};
    std::atomic<std::uint64_t> mDelivered{0};
};

#endif
