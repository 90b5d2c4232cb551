/// The state of one source of events, and what each state does with each thing that happens: one table for the watcher
/// and both feeds.
///
///     Idle      no FC host was found yet; nothing is opened
///     Working   open, and read when it is readable
///     Resting   open, but it was readable with nothing to read: left alone until the next look
///     NoRights  this host does not grant what the source needs; tried again
///     Failed    it cannot be opened for another reason, or was lost; tried again
///     Closed    the library is closing
#ifndef LIBKPM_LINUX_SRC_FEEDSTATE_H
#define LIBKPM_LINUX_SRC_FEEDSTATE_H

#include <atomic>
#include <cstdint>
#include <string>

enum ZTEFeedState : std::uint8_t { ZTFS_Idle, ZTFS_Working, ZTFS_Resting, ZTFS_NoRights, ZTFS_Failed, ZTFS_Closed };
inline constexpr std::size_t gcFeedStateCount = ZTFS_Closed + 1;

enum ZTEFeedHappening : std::uint8_t {
    ZTFH_HostFound,    ///< there is an FC host
    ZTFH_Opened,       ///< the source was opened
    ZTFH_NotGranted,   ///< opening was refused, or what was granted is gone
    ZTFH_Broken,       ///< opening failed otherwise, or an open source failed
    ZTFH_NothingRead,  ///< it was readable and there was nothing to read
    ZTFH_Look,         ///< a regular look is due
    ZTFH_Stop          ///< the library is closing
};
inline constexpr std::size_t gcFeedHappeningCount = ZTFH_Stop + 1;

enum ZTEFeedAction : std::uint8_t {
    ZTFA_None,
    ZTFA_Open,  ///< try to open the source, and say how that went: Opened, NotGranted or Broken
    ZTFA_Close  ///< close what is open
};

struct ZTSFeedStep {
    ZTEFeedState mNext;
    ZTEFeedAction mAction;
    bool mIsToTell = false;  ///< the new state is to be logged and reported to the agent
};

/// The table.
ZTSFeedStep getFeedStep(ZTEFeedState aState, ZTEFeedHappening aHappening);

/// What keeps a source from being opened.
struct ZTSFeedProblem {
    ZTEFeedHappening mHappening = ZTFH_Broken;  ///< NotGranted or Broken
    std::string mText;                          ///< the reason and what would help, in words
};

/// EPERM, EACCES and EROFS are what a host does not grant; every other error number is a failure.
ZTEFeedHappening judgeFeedError(int aError);

/// When a source that could not be opened is tried again: at the next look, then after two, four ... 32 more.
class ZTCRetryPause {
public:
    /// Called at each look. True: try now.
    bool isDue();

    /// The source works: the next failure is retried at once.
    void reset() { mLength = mLeft = 1; }

private:
    static constexpr unsigned scLongest = 32;

    unsigned mLength = 1;
    unsigned mLeft = 1;
};

/// A source's place in the table. Changed by the library's thread alone; the state may be read from any.
class ZTCFeedState {
public:
    /// Takes the step of the table; `acrReason` is the reason of a new state that is not Working. Returns what is to be
    /// done.
    ZTSFeedStep happen(ZTEFeedHappening aHappening, const std::string& acrReason = std::string());

    ZTEFeedState get() const { return mState.load(std::memory_order_relaxed); }
    bool isOpen() const { return get() == ZTFS_Working || get() == ZTFS_Resting; }

    /// Why it does not work; empty where it does. The library's thread alone.
    const std::string& getReason() const { return mReason; }

    /// Counts the reports that were due. The library's thread alone.
    std::uint64_t getChanges() const { return mChanges; }

private:
    std::atomic<ZTEFeedState> mState{ZTFS_Idle};
    std::string mReason;
    std::uint64_t mChanges = 0;
};

#endif
