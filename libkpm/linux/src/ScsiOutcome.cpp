#include "libkpm/linux/src/ScsiOutcome.h"

#include <cstddef>

static std::optional<std::uint64_t> sLoad(ZTCByteSpan aRecord, const ZTSTraceFieldPlace& acrPlace, std::endian aOrder) {
    return loadUnsigned(aRecord, acrPlace.mOffset, acrPlace.mSize, aOrder);
}

std::optional<std::uint32_t> getTraceRecordId(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout,
                                              std::endian aOrder) {
    const std::optional<std::uint64_t> lId = sLoad(aRecord, acrLayout.mType, aOrder);
    if (!lId) {
        return std::nullopt;
    }
    return static_cast<std::uint32_t>(*lId);
}

std::optional<ZTSScsiOutcome> parseScsiOutcome(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout,
                                               std::endian aOrder) {
    ZTSScsiOutcome lOutcome;
    bool lIsWhole = true;
    const auto lRead = [&](const ZTSTraceFieldPlace& acrPlace) {
        const std::optional<std::uint64_t> lValue = sLoad(aRecord, acrPlace, aOrder);
        lIsWhole = lIsWhole && lValue.has_value();
        return static_cast<std::uint32_t>(lValue.value_or(0));
    };
    lOutcome.mHost = lRead(acrLayout.mHost);
    lOutcome.mChannel = lRead(acrLayout.mChannel);
    lOutcome.mTarget = lRead(acrLayout.mTarget);
    lOutcome.mLun = lRead(acrLayout.mLun);
    lOutcome.mStatus = static_cast<std::uint8_t>(lRead(acrLayout.mResult));
    lOutcome.mOpcode = static_cast<std::uint8_t>(lRead(acrLayout.mOpcode));
    if (acrLayout.hasSense()) {
        lOutcome.mSenseKey = lRead(acrLayout.mSenseKey);
        lOutcome.mAsc = lRead(acrLayout.mAsc);
        lOutcome.mAscq = lRead(acrLayout.mAscq);
    }
    if (!lIsWhole) {
        return std::nullopt;
    }
    return lOutcome;
}

void readCommandTags(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout, ZTSCommandName& arCommand,
                     std::endian aOrder) {
    const std::optional<std::uint64_t> lDriver = sLoad(aRecord, acrLayout.mDriverTag, aOrder);
    const std::optional<std::uint64_t> lScheduler = sLoad(aRecord, acrLayout.mSchedulerTag, aOrder);
    if (lDriver && lScheduler) {
        arCommand.mDriverTag = static_cast<std::uint32_t>(*lDriver);
        arCommand.mSchedulerTag = static_cast<std::uint32_t>(*lScheduler);
    }
}

std::string makeHostFilter(const std::string& acrField, const std::vector<std::uint32_t>& acrHosts) {
    std::string lText;
    for (std::size_t lFirst = 0; lFirst < acrHosts.size();) {
        std::size_t lLast = lFirst;
        while (lLast + 1 < acrHosts.size() && acrHosts[lLast + 1] == acrHosts[lLast] + 1) {
            ++lLast;
        }
        lText += lText.empty() ? "" : " || ";
        if (lLast == lFirst) {
            lText += acrField + " == " + std::to_string(acrHosts[lFirst]);
        } else {
            lText += "(" + acrField + " >= " + std::to_string(acrHosts[lFirst]) + " && " + acrField +
                     " <= " + std::to_string(acrHosts[lLast]) + ")";
        }
        lFirst = lLast + 1;
    }
    return lText;
}

std::string makeScsiFilter(const std::vector<std::uint32_t>& acrHosts) {
    static_assert((ZTLSS_CheckCondition | ZTLSS_Busy | ZTLSS_TaskSetFull) == 42);
    // The kernel's filters can test bits, but not compare what a mask leaves.
    static const char* const spStatus = "result & 42";
    if (acrHosts.empty()) {
        return spStatus;
    }
    const std::string lFilter = std::string(spStatus) + " && (" + makeHostFilter("host_no", acrHosts) + ")";
    return lFilter.size() < gcScsiFilterLimit ? lFilter : spStatus;
}
