/// The state of each kind on each board as a scenario plays it, and what is lost. Changes are reported to the agent.
#ifndef LIBKPM_SIM_SRC_SOURCES_H
#define LIBKPM_SIM_SRC_SOURCES_H

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "libkpm/sim/src/Scenario.h"

/// A KPM_STATE_..., and why it is so.
struct ZTSSimSource {
    std::uint32_t mState = KPM_STATE_WORKING;
    std::string mReason;

    bool operator==(const ZTSSimSource&) const = default;
};

/// All operations may be called from any thread. Reports of one kind on one board are made in the order of its changes.
class ZTCSimSources {
public:
    /// Every kind works on every board.
    explicit ZTCSimSources(std::size_t aBoards);

    /// Whether the kind works on this board. Takes no lock.
    bool isWorking(std::uint32_t aBoard, std::size_t aKind) const {
        return mAreWorking[aBoard * gcScopeEventKindCount + aKind].load(std::memory_order_relaxed);
    }

    ZTSSimSource get(std::uint32_t aBoard, std::size_t aKind) const;

    /// Puts the line's kinds on its boards into its state. Reports each change and returns their number.
    std::uint64_t change(const ZTSSimState& acrLine);

    /// Counts what the line loses, and reports the new total of its name.
    void lose(const ZTSSimLoss& acrLine);

private:
    std::vector<std::atomic<bool>> mAreWorking;  // by board and kind; written with mLock held

    mutable std::mutex mLock;

    // Guarded by mLock.
    std::vector<std::vector<ZTSSimSource>> mBoards;
    std::map<std::string, std::uint64_t> mLosses;
};

/// Reports a state that the kind is in on this board.
void reportSimSource(std::uint32_t aBoard, std::size_t aKind, const ZTSSimSource& acrSource);

/// The answer to the registration of a kind that is in this state.
ZTSSimAnswer answerSimSource(std::size_t aKind, std::uint32_t aState);

/// The state to report for a kind whose registration a line of the scenario answers like this.
ZTSSimSource describeSimAnswer(const ZTSSimAnswer& acrAnswer);

#endif
