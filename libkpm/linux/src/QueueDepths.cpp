#include "libkpm/linux/src/QueueDepths.h"

#include <algorithm>
#include <limits>
#include <set>
#include <string>

#include "libkpm/linux/src/KindSources.h"

void ZTCLinuxQueueDepths::look(Clock::time_point aNow) {
    if (!mSweep.empty()) {
        return;
    }
    const std::optional<std::vector<std::string>> lNames = mrSysfs.listClass("scsi_device");
    if (!lNames) {
        return;  // as with the hosts: what cannot be listed has not left
    }
    std::set<ZTSLinuxLunName> lThere;
    for (const std::string& lrName : *lNames) {
        const std::optional<ZTSLinuxLunName> lLun = parseSysfsLunName(lrName);
        if (lLun && mrWatcher.findKnownBoard(lLun->mHost)) {
            lThere.insert(*lLun);
        }
    }
    std::erase_if(mDepths, [&](const auto& acrEntry) { return !lThere.contains(acrEntry.first); });
    mSweep.assign(lThere.begin(), lThere.end());
    mNextSlice = aNow;
}

void ZTCLinuxQueueDepths::noteQueueFull(const ZTSLinuxLunName& acrLun, Clock::time_point aNow) {
    // In a storm, once for all that come before it is read.
    mSoon.try_emplace(acrLun, aNow + scSoon);
}

void ZTCLinuxQueueDepths::serve(Clock::time_point aNow) {
    for (auto lEntry = mSoon.begin(); lEntry != mSoon.end();) {
        if (lEntry->second > aNow) {
            ++lEntry;
            continue;
        }
        const ZTSLinuxLunName lLun = lEntry->first;
        lEntry = mSoon.erase(lEntry);
        read(lLun);
    }
    if (mSweep.empty() || mNextSlice > aNow) {
        return;
    }
    mNextSlice = aNow + scPause;
    for (std::size_t lCount = 0; lCount < scLunsInARound && !mSweep.empty(); ++lCount) {
        const ZTSLinuxLunName lLun = mSweep.back();
        mSweep.pop_back();
        read(lLun);
    }
}

std::optional<ZTCLinuxQueueDepths::Clock::time_point> ZTCLinuxQueueDepths::getNextTime() const {
    std::optional<Clock::time_point> lNext;
    if (!mSweep.empty()) {
        lNext = mNextSlice;
    }
    for (const auto& [lrLun, lrTime] : mSoon) {
        lNext = std::min(lNext.value_or(lrTime), lrTime);
    }
    return lNext;
}

void ZTCLinuxQueueDepths::read(const ZTSLinuxLunName& acrLun) {
    const std::optional<std::uint32_t> lBoard = mrWatcher.findKnownBoard(acrLun.mHost);
    const std::optional<std::string> lText =
        mrSysfs.readAttribute("scsi_device/" + formatSysfsLunName(acrLun) + "/device/queue_depth");
    const std::optional<std::int64_t> lDepth = lText ? parseSysfsNumber(*lText) : std::nullopt;
    if (!lBoard || !lDepth || *lDepth < 0 || *lDepth > std::numeric_limits<std::uint32_t>::max()) {
        return;
    }
    const auto lNew = static_cast<std::uint32_t>(*lDepth);
    const auto [lKnown, lIsFirst] = mDepths.try_emplace(acrLun, lNew);
    if (lIsFirst || lKnown->second == lNew) {
        return;
    }
    zt_scsi_varquedepth_v0 lData{};
    lData.zt_varquedepth_rport = mrWatcher.findRemotePort(acrLun.mHost, acrLun.mChannel, acrLun.mTarget);
    // A LUN that the event has no room for is one that is not known.
    lData.zt_varquedepth_lun =
        static_cast<std::uint32_t>(std::min<std::uint64_t>(acrLun.mLun, std::numeric_limits<std::uint32_t>::max()));
    lData.zt_varquedepth_oldval = lKnown->second;
    lData.zt_varquedepth_newval = lNew;
    lKnown->second = lNew;
    mrDelivery.deliverScope(*lBoard, mrWatcher.getBoard(*lBoard).mPortName, gcLinuxQueueDepth, &lData, sizeof lData);
}
