/// Reports to the agent the state of each kind's source on each board: when a board is found, and after each change.
/// Registrations get their answers from the same states.
#ifndef LIBKPM_LINUX_SRC_SOURCEREPORTS_H
#define LIBKPM_LINUX_SRC_SOURCEREPORTS_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/KindSources.h"

/// The state of one kind's source, as libkpm.h has it, and why it is so.
struct ZTSSourceReport {
    std::uint32_t mState = 0;  ///< KPM_STATE_..., 0: nothing was reported yet
    std::string mReason{};

    bool operator==(const ZTSSourceReport&) const = default;
};

/// One report a kind, in the order of gcScopeEventKinds.
using ZTCSourceRow = std::array<ZTSSourceReport, gcLinuxKindCount>;

/// The report of a feed in this state. A source that waits for its first look counts as failed.
ZTSSourceReport makeSourceReport(ZTEFeedState aState, const std::string& acrReason);

/// Used by one thread at a time, save for getState.
class ZTCSourceReports {
public:
    /// Counts of changes of everything that reports are made of.
    using Moment = std::array<std::uint64_t, 4>;

    /// Whether anything has changed since `note`.
    bool isNew(const Moment& acrMoment) const { return acrMoment != mMoment; }
    void note(const Moment& acrMoment) { mMoment = acrMoment; }

    /// Reports what differs from the board's last row.
    void update(std::uint32_t aBoard, const ZTCSourceRow& acrRow);

    /// The state that was reported last (KPM_STATE_...); 0: none was. From any thread.
    std::uint32_t getState(std::uint32_t aBoard, std::size_t aKind) const;

private:
    Moment mMoment{};

    mutable std::mutex mLock;
    std::vector<ZTCSourceRow> mRows;  // by board, as reported last; written with mLock held, read by others with it
};

#endif
