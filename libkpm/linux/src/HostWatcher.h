/// Watches the FC hosts in sysfs: which there are, their names, and whether their links are up. Delivers link events
/// and adapter arrivals, and knows the boards and the names of remote ports for the feeds.
///
/// Used by the library's thread alone (and by start(), before there is one), save for the operations that say
/// otherwise. Where memory runs out in the middle of a change, the rest of the change is handled with the next look.
#ifndef LIBKPM_LINUX_SRC_HOSTWATCHER_H
#define LIBKPM_LINUX_SRC_HOSTWATCHER_H

#include <atomic>
#include <cstdint>
#include <deque>
#include <mutex>
#include <optional>
#include <vector>

#include "libkpm/common/include/Losses.h"
#include "libkpm/linux/src/Boards.h"
#include "libkpm/linux/src/Delivery.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/LinkState.h"
#include "libkpm/linux/src/Sysfs.h"

class ZTCLinuxHostWatcher {
public:
    /// All three outlive the watcher.
    ZTCLinuxHostWatcher(const ZTCSysfs& acrSysfs, const ZTCLinuxDelivery& acrDelivery, ZTCLosses& arLosses);

    /// Reads all hosts and their links.
    void look();

    /// A regular look has come: hosts that nobody has seen may be looked for again.
    void allowSearch() { mSearch = ZTHS_Allowed; }

    /// The board of a host. One that nobody has seen is looked for, once until the next regular look.
    std::optional<std::uint32_t> findBoard(std::uint32_t aHost);
    std::optional<std::uint32_t> findKnownBoard(std::uint32_t aHost) const { return mBoards.findHost(aHost); }

    /// A message reported a change of the board's link or port: its state is read again. `aIsUp`: whether the message
    /// said that the link went up; nothing where it did not say.
    void noteLinkMessage(std::uint32_t aBoard, std::optional<bool> aIsUp);

    /// To be called once all messages that were sent before the last look have been read.
    void forgetLinkMessages();

    /// A remote port's names may have changed.
    void forgetRemotePorts() { mRemotePorts.forget(); }

    /// The port name of a target; zero where it is not known.
    HBA_wwn findRemotePort(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget) {
        return mRemotePorts.find(aHost, aChannel, aTarget);
    }

    const ZTSLinuxBoard& getBoard(std::uint32_t aBoard) const { return mBoards.get(aBoard); }
    std::vector<std::uint32_t> getHosts() const { return mBoards.getHosts(); }

    /// Counts the looks that changed a board. The same number as before: nothing has changed.
    std::uint64_t getVersion() const { return mVersion; }

    /// Working, or Failed while the hosts cannot be read.
    const ZTCFeedState& getState() const { return mState; }

    // ---- From any thread ----

    std::uint32_t countBoards() const { return mCount.load(std::memory_order_relaxed); }
    bool isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const;
    void copyNames(std::uint32_t aBoard, HBA_wwn& arNode, HBA_wwn& arPort) const;

private:
    enum ZTEHostSearch : std::uint8_t { ZTHS_Allowed, ZTHS_Used };

    /// One board's change that is not yet reported and delivered.
    enum ZTEBoardChange : std::uint8_t { ZTBC_Left, ZTBC_Arrived, ZTBC_Renamed };
    struct Change {
        std::uint32_t mBoard;
        ZTEBoardChange mWhat;
    };

    void takeIn(const std::vector<ZTSLinuxHost>& acrHosts);
    void handleChanges();
    void handle(const Change& acrChange);
    void lookAtLink(std::uint32_t aBoard);
    void noteLink(std::uint32_t aBoard, ZTELinuxLink aState);

    // Constant after construction.
    const ZTCSysfs& mrSysfs;
    const ZTCLinuxDelivery& mrDelivery;

    // With synchronisation of their own.
    std::atomic<std::uint32_t> mCount{0};

    // Used by the library's thread alone.
    ZTCLosses& mrLosses;
    ZTCFeedState mState;
    ZTEHostSearch mSearch = ZTHS_Allowed;
    std::uint64_t mVersion = 0;
    std::vector<ZTCLinuxLinkState> mLinks;  // by board
    std::deque<Change> mChanges;            // of the boards, not yet handled
    ZTCLinuxRemotePorts mRemotePorts;

    mutable std::mutex mLock;
    ZTCLinuxBoards mBoards;  // written by the library's thread with mLock held; read by it without, by others with it
};

#endif
