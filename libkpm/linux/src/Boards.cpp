#include "libkpm/linux/src/Boards.h"

#include <algorithm>
#include <utility>

bool ZTSLinuxBoard::hasName(const HBA_wwn& acrPort) const {
    return isSameName(mPortName, acrPort) ||
           std::any_of(mFormerNames.begin(), mFormerNames.end(),
                       [&](const HBA_wwn& acrName) { return isSameName(acrName, acrPort); });
}

std::optional<std::uint32_t> ZTCLinuxBoards::findHost(std::uint32_t aNumber) const {
    for (std::uint32_t lBoard = 0; lBoard < size(); ++lBoard) {
        if (mBoards[lBoard].mHost == aNumber) {
            return lBoard;
        }
    }
    return std::nullopt;
}

std::vector<std::uint32_t> ZTCLinuxBoards::getHosts() const {
    std::vector<std::uint32_t> lHosts;
    for (const ZTSLinuxBoard& lrBoard : mBoards) {
        if (lrBoard.mHost) {
            lHosts.push_back(*lrBoard.mHost);
        }
    }
    std::sort(lHosts.begin(), lHosts.end());
    return lHosts;
}

bool ZTCLinuxBoards::isAnotherBoards(const HBA_wwn& acrName, std::uint32_t aBoard) const {
    for (std::uint32_t lOther = 0; lOther < size(); ++lOther) {
        if (lOther != aBoard && isSameName(mBoards[lOther].mPortName, acrName)) {
            return true;
        }
    }
    return false;
}

/// Finds out what became of a board's host. False: it is gone.
bool ZTCLinuxBoards::follow(std::uint32_t aBoard, const std::vector<ZTSLinuxHost>& acrHosts, Changes& arChanges) {
    ZTSLinuxBoard& lrBoard = mBoards[aBoard];
    const auto lSeen =
        std::lower_bound(acrHosts.begin(), acrHosts.end(), *lrBoard.mHost,
                         [](const ZTSLinuxHost& acrHost, std::uint32_t aNumber) { return acrHost.mNumber < aNumber; });
    if (lSeen == acrHosts.end() || lSeen->mNumber != *lrBoard.mHost) {
        return false;
    }
    // A name that cannot be read for a moment changes nothing.
    if (isName(lSeen->mPortName) && !isSameName(lrBoard.mPortName, lSeen->mPortName)) {
        if (isAnotherBoards(lSeen->mPortName, aBoard)) {
            // The drivers were loaded anew and the hosts have other numbers now.
            return false;
        }
        const HBA_wwn lFormer = std::exchange(lrBoard.mPortName, lSeen->mPortName);
        if (!lrBoard.hasName(lFormer)) {
            lrBoard.mFormerNames.push_back(lFormer);
        }
        arChanges.mRenamed.push_back(aBoard);
    }
    if (isName(lSeen->mNodeName)) {
        lrBoard.mNodeName = lSeen->mNodeName;
    }
    return true;
}

std::uint32_t ZTCLinuxBoards::place(const ZTSLinuxHost& acrHost) {
    for (std::uint32_t lBoard = 0; lBoard < size(); ++lBoard) {
        if (!mBoards[lBoard].mHost && isSameName(mBoards[lBoard].mPortName, acrHost.mPortName)) {
            mBoards[lBoard].mHost = acrHost.mNumber;
            return lBoard;
        }
    }
    mBoards.push_back({acrHost.mNodeName, acrHost.mPortName, acrHost.mNumber, {}});
    return size() - 1;
}

ZTCLinuxBoards::Changes ZTCLinuxBoards::update(const std::vector<ZTSLinuxHost>& acrHosts) {
    Changes lChanges;
    for (std::uint32_t lBoard = 0; lBoard < size(); ++lBoard) {
        if (mBoards[lBoard].mHost && !follow(lBoard, acrHosts, lChanges)) {
            mBoards[lBoard].mHost.reset();
            lChanges.mLeft.push_back(lBoard);
        }
    }
    std::vector<std::uint32_t> lHeldBack;
    for (const ZTSLinuxHost& lrHost : acrHosts) {
        if (findHost(lrHost.mNumber)) {
            continue;
        }
        if (isName(lrHost.mPortName)) {
            lChanges.mArrived.push_back(place(lrHost));
            continue;
        }
        lHeldBack.push_back(lrHost.mNumber);
        if (!std::binary_search(mHeldBack.begin(), mHeldBack.end(), lrHost.mNumber)) {
            lChanges.mHeldBack.push_back(lrHost.mNumber);
        }
    }
    mHeldBack = std::move(lHeldBack);
    return lChanges;
}
