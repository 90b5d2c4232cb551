#include "libkpm/linux/src/HostWatcher.h"

#include <string>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/Losses.h"

ZTCLinuxHostWatcher::ZTCLinuxHostWatcher(const ZTCSysfs& acrSysfs, const ZTCLinuxDelivery& acrDelivery,
                                         ZTCLosses& arLosses)
    : mrSysfs(acrSysfs), mrDelivery(acrDelivery), mrLosses(arLosses), mRemotePorts(acrSysfs) {}

// ---- Hosts ----

void ZTCLinuxHostWatcher::look() {
    mRemotePorts.forget();
    // Left over from a look that ran out of memory.
    handleChanges();
    const std::optional<std::vector<ZTSLinuxHost>> lHosts = mrSysfs.readHosts();
    if (!lHosts) {
        // With descriptors or memory short, for one: the hosts have not left for that.
        mrLosses.count(ZTLO_Failure);
        mState.happen(ZTFH_Broken, "the class fc_host cannot be read from sysfs; hosts and links stay as they were");
        return;
    }
    mState.happen(ZTFH_Opened);
    takeIn(*lHosts);
    handleChanges();
    for (std::uint32_t lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
        lookAtLink(lBoard);
    }
}

void ZTCLinuxHostWatcher::takeIn(const std::vector<ZTSLinuxHost>& acrHosts) {
    // Everything that needs memory comes before the change is made.
    ZTCLinuxBoards lBoards = mBoards;
    const ZTCLinuxBoards::Changes lChanges = lBoards.update(acrHosts);
    mLinks.resize(lBoards.size());
    std::deque<Change> lPending = mChanges;
    const auto lAdd = [&](const std::vector<std::uint32_t>& acrBoards, ZTEBoardChange aWhat) {
        for (const std::uint32_t lBoard : acrBoards) {
            lPending.push_back({lBoard, aWhat});
        }
    };
    lAdd(lChanges.mLeft, ZTBC_Left);
    lAdd(lChanges.mArrived, ZTBC_Arrived);
    lAdd(lChanges.mRenamed, ZTBC_Renamed);
    for (const std::uint32_t lHost : lChanges.mHeldBack) {
        logLibraryLine(KPM_LOG_NOTICE, "host" + std::to_string(lHost) +
                                           " has no port name yet: it becomes a board when sysfs shows its name");
    }
    mVersion += lPending.size() == mChanges.size() ? 0 : 1;
    mChanges.swap(lPending);
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        std::swap(mBoards, lBoards);
    }
    mCount.store(mBoards.size(), std::memory_order_relaxed);
}

void ZTCLinuxHostWatcher::handleChanges() {
    while (!mChanges.empty()) {
        handle(mChanges.front());
        mChanges.pop_front();
    }
}

/// May be called again for a change whose line could not be made for want of memory. Delivering needs none.
void ZTCLinuxHostWatcher::handle(const Change& acrChange) {
    const ZTSLinuxBoard& lrBoard = mBoards.get(acrChange.mBoard);
    const std::string lName = "board " + std::to_string(acrChange.mBoard);
    const std::string lNames = "node " + formatName(lrBoard.mNodeName) + ", port " + formatName(lrBoard.mPortName);
    switch (acrChange.mWhat) {
        case ZTBC_Left:
            logLibraryLine(KPM_LOG_NOTICE, lName + ": its host is gone");
            noteLink(acrChange.mBoard, ZTLK_Down);
            return;
        case ZTBC_Renamed:
            logLibraryLine(KPM_LOG_NOTICE, lName + " has other names: " + lNames);
            return;
        case ZTBC_Arrived:
            break;
    }
    // Its host may have left again before this was handled.
    logLibraryLine(KPM_LOG_NOTICE,
                   lName + " is " + (lrBoard.mHost ? "host" + std::to_string(*lrBoard.mHost) : std::string("a host")) +
                       ", " + lNames);
    for (std::uint32_t lBoard = 0; lBoard < mBoards.size(); ++lBoard) {
        mrDelivery.deliverScope(lBoard, mBoards.get(lBoard).mPortName, gcLinuxAdapterArrival, nullptr, 0);
    }
}

std::optional<std::uint32_t> ZTCLinuxHostWatcher::findBoard(std::uint32_t aHost) {
    const std::optional<std::uint32_t> lBoard = mBoards.findHost(aHost);
    if (lBoard || mSearch == ZTHS_Used) {
        return lBoard;
    }
    // A host that has come since the last look; one look more is enough for any number of its messages.
    mSearch = ZTHS_Used;
    look();
    return mBoards.findHost(aHost);
}

// ---- Links ----

void ZTCLinuxHostWatcher::noteLinkMessage(std::uint32_t aBoard, std::optional<bool> aIsUp) {
    mRemotePorts.forget();
    if (aIsUp) {
        mLinks[aBoard].noteMessage(*aIsUp);
    }
    lookAtLink(aBoard);
}

void ZTCLinuxHostWatcher::forgetLinkMessages() {
    for (ZTCLinuxLinkState& lrLink : mLinks) {
        lrLink.forgetMessages();
    }
}

void ZTCLinuxHostWatcher::lookAtLink(std::uint32_t aBoard) {
    if (const std::optional<std::uint32_t> lHost = mBoards.get(aBoard).mHost) {
        noteLink(aBoard, mrSysfs.readPortState(*lHost));
    }
}

void ZTCLinuxHostWatcher::noteLink(std::uint32_t aBoard, ZTELinuxLink aState) {
    const ZTSLinuxBoard& lrBoard = mBoards.get(aBoard);
    ZTCLinuxLinkState lLink = mLinks[aBoard];
    const std::vector<ZTSLinuxLinkChange> lChanges = lLink.noteReading(aState);
    const bool lIsToRead = !lChanges.empty() && lrBoard.mHost;
    const std::uint32_t lPortId = lIsToRead ? mrSysfs.readPortId(*lrBoard.mHost) : 0;
    // Only now: what came before may run out of memory, what follows may not.
    mLinks[aBoard] = lLink;
    for (const ZTSLinuxLinkChange& lrChange : lChanges) {
        LINKINFO lInfo{};
        lInfo.a_linkEventTag = lrChange.mTag;
        lInfo.a_linkUp = lrChange.mUp;
        lInfo.a_linkDown = lrChange.mDown;
        lInfo.a_DID = lrChange.mIsUp ? lPortId : 0;
        lInfo.a_linkState = lrChange.mIsUp ? 1 : 0;
        lInfo.a_wwpName = lrBoard.mPortName;
        lInfo.a_wwnName = lrBoard.mNodeName;
        mrDelivery.deliverLink(aBoard, lInfo);
    }
}

// ---- From any thread ----

bool ZTCLinuxHostWatcher::isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mBoards.get(aBoard).hasName(acrPort);
}

void ZTCLinuxHostWatcher::copyNames(std::uint32_t aBoard, HBA_wwn& arNode, HBA_wwn& arPort) const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    arNode = mBoards.get(aBoard).mNodeName;
    arPort = mBoards.get(aBoard).mPortName;
}
