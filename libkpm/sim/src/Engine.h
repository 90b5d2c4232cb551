/// Plays one scenario: answers the entry points' questions, keeps the registrations, and delivers the events of the
/// schedule from threads of its own.
///
/// Threads. One thread, the timer, delivers the lines without threads=, changes the number of boards and the states of
/// kinds, and reports losses. Each line with threads= and each storm has threads of its own. start() starts all of
/// them, and they wait for the begin of the schedule. They have ended when stop() returns. inject() delivers on the
/// thread that calls it. No lock is held while a callback runs.
#ifndef LIBKPM_SIM_SRC_ENGINE_H
#define LIBKPM_SIM_SRC_ENGINE_H

#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <variant>
#include <vector>

#include "libkpm/common/include/RegistrationDesk.h"
#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/Delivery.h"
#include "libkpm/sim/src/Scenario.h"
#include "libkpm/sim/src/Sources.h"

enum ZTESimSchedule : std::uint8_t { ZTSSC_Waiting, ZTSSC_Running, ZTSSC_Done };

struct ZTSSimStatus {
    std::uint64_t mDelivered = 0;  ///< callbacks that have returned
    std::uint64_t mDropped = 0;    ///< events that nothing was registered for, that have no source, or do not work now
    std::uint64_t mPages = 0;      ///< pages of the RSCNs among the delivered
    std::array<std::uint64_t, gcSimKindCount> mDeliveredByKind{};
    std::size_t mRegistered = 0;
    std::uint32_t mAdapters = 0;
    ZTESimSchedule mSchedule = ZTSSC_Waiting;
};

/// All operations but start and stop may be called from any thread.
class ZTCSimEngine : public ZTCRegistrationDesk {
public:
    explicit ZTCSimEngine(ZTSSimScenario aScenario);
    ~ZTCSimEngine() override;

    /// Reports the states that the scenario begins with, and starts the threads. Throws std::system_error or
    /// std::bad_alloc, with none left running.
    void start();

    /// Asks the threads and inject() to end after the callback they are in. Does not wait.
    void requestStop();

    /// Ends and joins the threads. Not to be called from a callback. More than once does no harm.
    void stop();

    const ZTSSimScenario& getScenario() const { return mScenario; }

    std::uint32_t getNumberOfAdapters() const override { return mCount.load(std::memory_order_relaxed); }

    /// Plays all occurrences of a line now. Returns how many callbacks there were, or how many reports to the agent.
    /// Ends early when the engine stops.
    std::uint64_t inject(const ZTSSimEventLine& acrLine);

    ZTSSimStatus getStatus() const;

private:
    using Clock = std::chrono::steady_clock;

    /// A share of a line's occurrences: aFirst, aFirst + aStride, ... below aEnd; aEnd 0: without end.
    struct Share {
        std::variant<const ZTSSimCountChange*, const ZTSSimEvent*, const ZTSSimStorm*, const ZTSSimState*,
                     const ZTSSimLoss*>
            mLine;
        std::uint64_t mNext = 0;
        std::uint64_t mStride = 1;
        std::uint64_t mEnd = 1;

        std::uint64_t getDueTime() const;
        bool isLast() const { return mEnd != 0 && mEnd - mNext <= mStride; }
    };
    using Lane = std::vector<Share>;

    std::vector<Lane> makeLanes() const;
    void runLane(Lane aLane);
    bool waitUntil(std::uint64_t aMilliseconds);
    void startClock();
    std::uint64_t play(const Share& acrShare);
    std::uint64_t deliverToBoards(const ZTSSimEvent& acrEvent, std::uint64_t aOccurrence);
    bool deliver(const ZTSSimDelivery& acrDelivery);
    std::optional<ZTSSimAnswer> findAnswer(ZTESimOperation aOperation, std::optional<std::size_t> aKind,
                                           std::uint32_t aBoard);

    std::uint32_t getNumberOfBoardsEver() const override;
    std::uint32_t answerAdapterInfo(std::uint32_t aBoard, ZTSBoardNames& arNames) override;
    bool isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const override;
    std::optional<std::size_t> findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const override;
    ZTSRegistrationAnswer answerRegistration(std::uint32_t aBoard, std::size_t aKind) override;
    void noteRegistration(std::uint32_t aBoard, std::size_t aKind) override;
    std::uint32_t answerUnregistration(std::uint32_t aBoard, std::size_t aKind) override;

    // Constant after construction.
    const ZTSSimScenario mScenario;

    // With synchronisation of their own.
    ZTCSimSources mSources;
    std::atomic<std::uint32_t> mCount;
    std::atomic<bool> mIsStopping{false};
    std::vector<std::atomic<std::uint32_t>> mLinkTags;  // by board; only counted, no other data depend on their order
    std::array<std::atomic<std::uint64_t>, gcSimKindCount> mDeliveredByKind{};
    std::atomic<std::uint64_t> mDropped{0};
    std::atomic<std::uint64_t> mPages{0};
    std::atomic<Clock::rep> mStartTime{0};  // since the clock's epoch; 0: not started. Written with mLock held.

    // Used by start() and stop() alone.
    std::vector<std::thread> mThreads;

    mutable std::mutex mLock;
    std::condition_variable mWake;  // with mLock: the clock starts, or the engine stops

    // Guarded by mLock.
    std::size_t mLanesLeft = 0;
    std::vector<std::uint64_t> mAnswerUses;
};

#endif
