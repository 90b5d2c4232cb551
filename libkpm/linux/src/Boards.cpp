#include "libkpm/linux/src/Boards.h"

#include <algorithm>
#include <cstring>

bool isSameName(const HBA_wwn& acrOne, const HBA_wwn& acrOther) {
    return std::memcmp(acrOne.wwn, acrOther.wwn, sizeof acrOne.wwn) == 0;
}

bool isZeroName(const HBA_wwn& acrName) {
    return isSameName(acrName, HBA_wwn{});
}

/// Whether a board's host may be the one that was seen under its number: not where both have names that differ.
static bool sIsSamePort(const ZTSLinuxBoard& acrBoard, const ZTSLinuxHost& acrHost) {
    return isZeroName(acrBoard.mPortName) || isZeroName(acrHost.mPortName) ||
           isSameName(acrBoard.mPortName, acrHost.mPortName);
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

std::uint32_t ZTCLinuxBoards::place(const ZTSLinuxHost& acrHost) {
    if (!isZeroName(acrHost.mPortName)) {
        for (std::uint32_t lBoard = 0; lBoard < size(); ++lBoard) {
            if (!mBoards[lBoard].mHost && isSameName(mBoards[lBoard].mPortName, acrHost.mPortName)) {
                mBoards[lBoard].mHost = acrHost.mNumber;
                return lBoard;
            }
        }
    }
    mBoards.push_back({acrHost.mNodeName, acrHost.mPortName, acrHost.mNumber});
    return size() - 1;
}

ZTCLinuxBoards::Changes ZTCLinuxBoards::update(const std::vector<ZTSLinuxHost>& acrHosts) {
    Changes lChanges;
    for (std::uint32_t lBoard = 0; lBoard < size(); ++lBoard) {
        ZTSLinuxBoard& lrBoard = mBoards[lBoard];
        if (!lrBoard.mHost) {
            continue;
        }
        const auto lSeen = std::lower_bound(
            acrHosts.begin(), acrHosts.end(), *lrBoard.mHost,
            [](const ZTSLinuxHost& acrHost, std::uint32_t aNumber) { return acrHost.mNumber < aNumber; });
        if (lSeen == acrHosts.end() || lSeen->mNumber != *lrBoard.mHost || !sIsSamePort(lrBoard, *lSeen)) {
            lrBoard.mHost.reset();
            lChanges.mLeft.push_back(lBoard);
            continue;
        }
        // A name that could not be read at first.
        if (isZeroName(lrBoard.mPortName)) {
            lrBoard.mPortName = lSeen->mPortName;
        }
        if (isZeroName(lrBoard.mNodeName)) {
            lrBoard.mNodeName = lSeen->mNodeName;
        }
    }
    for (const ZTSLinuxHost& lrHost : acrHosts) {
        if (!findHost(lrHost.mNumber)) {
            lChanges.mArrived.push_back(place(lrHost));
        }
    }
    return lChanges;
}
