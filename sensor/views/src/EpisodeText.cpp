#include "sensor/views/include/EpisodeText.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "sensor/client/include/RecordTable.h"
#include "sensor/views/include/EpisodePlace.h"
#include "sensor/views/include/TimeText.h"

static std::string sHex(std::uint32_t aValue, int aDigits) {
    std::array<char, 16> lText{};
    std::snprintf(lText.data(), lText.size(), "%0*x", aDigits, static_cast<unsigned>(aValue));
    return lText.data();
}

/// Two digits, or "?" for a value that was not known.
static std::string sCode(std::uint32_t aValue) {
    return aValue == 0xFFFFFFFFU ? "?" : sHex(aValue, 2);
}

static std::string sCodes(const std::vector<std::uint32_t>& acrCodes) {
    std::string lText;
    for (const std::uint32_t lCode : acrCodes) {
        lText += (lText.empty() ? "" : ",") + sCode(lCode);
    }
    return lText;
}

std::string formatLuns(const ZTSLunSet& acrLuns) {
    std::string lText = acrLuns.mIsAll ? "all" : "";
    if (!acrLuns.mNumbers.empty()) {
        lText += (lText.empty() ? "" : " and ") + formatRanges(acrLuns.mNumbers);
    }
    return lText + (acrLuns.mHasMore ? " and more" : "");
}

static std::string sReason(const ZTSEpisode& acrEpisode, const ZTSReasonCount& acrReason) {
    const std::string lKind = getKindName(acrEpisode.mKind);
    const std::string lValue = lKind == "lsrjt" ? sHex(acrReason.mValue, 2) + "/" + sHex(acrReason.mExplanation, 2)
                               : lKind == "queue-depth" ? std::to_string(acrReason.mValue)
                                                        : sHex(acrReason.mValue, 8);
    return lValue + (acrReason.mCount > 1 ? "*" + formatNumber(acrReason.mCount) : "");
}

/// The name of an episode's reasons, by kind.
static const char* sReasonsName(const ZTSEpisode& acrEpisode) {
    const std::string lKind = getKindName(acrEpisode.mKind);
    return lKind == "lsrjt" ? "reasons " : lKind == "queue-depth" ? "depths " : "parameters ";
}

std::string formatDetail(const ZTSEpisode& acrEpisode) {
    static constexpr std::array<const char*, 4> scFormats{"port ", "area ", "domain ", "fabric "};
    static constexpr std::size_t scMostReasons = 4;
    const ZTSEpisodeDetail& lrDetail = acrEpisode.mDetail;
    std::string lText;
    const auto lAdd = [&lText](const std::string& acrPart) { lText += (lText.empty() ? "" : "; ") + acrPart; };
    if (lrDetail.mLuns && !formatLuns(*lrDetail.mLuns).empty()) {
        const bool lIsOne = !lrDetail.mLuns->mIsAll && lrDetail.mLuns->mNumbers.size() == 1;
        lAdd((lIsOne ? "LUN " : "LUNs ") + formatLuns(*lrDetail.mLuns));
    }
    if (lrDetail.mSenseKey || lrDetail.mAsc) {
        lAdd("sense " + sCode(lrDetail.mSenseKey.value_or(0xFFFFFFFFU)) + ", ASC " +
             sCode(lrDetail.mAsc.value_or(0xFFFFFFFFU)) +
             (lrDetail.mAscqs.empty() ? "" : ", ASCQ " + sCodes(lrDetail.mAscqs)));
    }
    if (!lrDetail.mCommandCodes.empty()) {
        lAdd("commands " + sCodes(lrDetail.mCommandCodes));
    }
    if (lrDetail.mPage) {
        lAdd(scFormats.at(*lrDetail.mPage >> 24 & 3) + sHex(*lrDetail.mPage & 0xFFFFFFU, 6));
    }
    if (lrDetail.mOriginalCommand) {
        lAdd("ELS " + sCode(*lrDetail.mOriginalCommand));
    }
    if (lrDetail.mOpCode) {
        lAdd("command " + sCode(*lrDetail.mOpCode));
    }
    if (lrDetail.mPayloadPortName &&
        !(acrEpisode.mRemotePort && *lrDetail.mPayloadPortName == acrEpisode.mRemotePort->mWwpn)) {
        lAdd("of " + lrDetail.mPayloadPortName->toText());
    }
    std::string lReasons;
    for (std::size_t i = 0; i < std::min(lrDetail.mReasons.size(), scMostReasons); ++i) {
        lReasons += (lReasons.empty() ? "" : " ") + sReason(acrEpisode, lrDetail.mReasons[i]);
    }
    if (!lReasons.empty()) {
        lAdd(sReasonsName(acrEpisode) + lReasons + (lrDetail.mReasons.size() > scMostReasons ? " ..." : ""));
    }
    if (acrEpisode.mHasClockFlag) {
        lAdd("the clock was set back meanwhile");
    }
    if (acrEpisode.mIsMalformed) {
        lAdd("data of another layout");
    }
    return lText;
}

std::string describePort(const std::optional<ZTSRemotePort>& acrPort, const ZTCNameBook& acrNames) {
    return acrPort ? acrNames.describe(*acrPort) : "-";
}

ZTCTextTable makeEpisodeTable(std::size_t aWidth) {
    return {{{.mpTitle = "EPISODE", .mIsRight = true},
             {.mpTitle = "LAST"},
             {.mpTitle = "STATE", .mDropOrder = 3, .mReserved = std::string_view("closed").size()},
             {.mpTitle = "COUNT", .mIsRight = true},
             {.mpTitle = "KIND"},
             {.mpTitle = "INITIATOR", .mDropOrder = 2},
             {.mpTitle = "REMOTE PORT", .mDropOrder = 1},
             {.mpTitle = "DETAIL", .mDropOrder = 4, .mLeastWidth = 12}},
            aWidth};
}

/// What an episode holds, the disks behind its LUNs, how many ports an area or domain has, and the ports' counters.
static std::string sDetailWithNames(const ZTSEpisode& acrEpisode, const ZTSPlace& acrPlace,
                                    const ZTCNameBook& acrNames) {
    std::string lText = formatDetail(acrEpisode);
    const std::string lDevices = formatDevices(acrPlace.mDevices);
    lText += lDevices.empty() ? "" : (lText.empty() ? "" : "; ") + lDevices;
    if (acrPlace.mAffected) {
        lText += "; " + std::to_string(acrPlace.mAffected->size()) +
                 (acrPlace.mAffected->size() == 1 ? " known port" : " known ports");
    }
    const std::string lCounters = formatCounters(countersBeside(acrEpisode, acrNames));
    lText += lCounters.empty() ? "" : (lText.empty() ? "" : "; ") + lCounters;
    return lText;
}

void addRow(ZTCTextTable& arTable, const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
    const ZTSPlace lPlace = findPlace(acrEpisode, acrNames);
    arTable.addRow({std::to_string(acrEpisode.mEpisode), formatShortTime(acrEpisode.mLast, aNow),
                    acrEpisode.isOpen() ? "open" : "closed", formatNumber(acrEpisode.mCount),
                    getKindName(acrEpisode.mKind), acrNames.describe(lPlace.mInitiator),
                    describePort(lPlace.mRemotePort, acrNames), sDetailWithNames(acrEpisode, lPlace, acrNames)});
}

ZTCTextTable makeRecordTable(std::size_t aWidth) {
    return {{{.mpTitle = "SEQ", .mIsRight = true},
             {.mpTitle = "EPISODE", .mIsRight = true, .mDropOrder = 1},
             {.mpTitle = "COUNT", .mIsRight = true},
             {.mpTitle = "FIRST"},
             {.mpTitle = "LAST", .mDropOrder = 4},
             {.mpTitle = "KIND"},
             {.mpTitle = "INITIATOR", .mDropOrder = 3},
             {.mpTitle = "REMOTE PORT", .mDropOrder = 2},
             {.mpTitle = "DETAIL", .mDropOrder = 5, .mLeastWidth = 12}},
            aWidth};
}

void addRow(ZTCTextTable& arTable, const ZTSStoredRecord& acrRecord, const ZTCNameBook& acrNames) {
    arTable.addRow({std::to_string(acrRecord.mSeq), std::to_string(acrRecord.mEpisode),
                    formatNumber(acrRecord.mRecord.mOccurrences), acrRecord.mRecord.mBegin.toText(),
                    acrRecord.mRecord.mEnd.toText(), getKindName(acrRecord.mKind),
                    acrNames.describe(acrRecord.mInitiator), describePort(acrRecord.mRemotePort, acrNames),
                    formatDetails(acrRecord.mRecord)});
}

ZTCTextTable makePortTable(std::size_t aWidth) {
    return {{{.mpTitle = "REMOTE PORT"},
             {.mpTitle = "NAME", .mDropOrder = 2},
             {.mpTitle = "STATE", .mDropOrder = 4},
             {.mpTitle = "COUNT", .mIsRight = true},
             {.mpTitle = "LAST"},
             {.mpTitle = "INITIATORS", .mDropOrder = 1},
             {.mpTitle = "KINDS", .mDropOrder = 3, .mLeastWidth = 16}},
            aWidth};
}

void addRow(ZTCTextTable& arTable, const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames, ZTCHistoryTime aNow) {
    const ZTSPortView lView = findPortView(acrPort, acrNames);
    std::string lInitiators;
    for (const ZTSInitiator& lrInitiator : lView.mInitiators) {
        lInitiators += (lInitiators.empty() ? "" : ",") + acrNames.describe(lrInitiator);
    }
    std::vector<ZTSPortSummary::Count> lCounts = acrPort.mCounts;
    std::stable_sort(lCounts.begin(), lCounts.end(), [](const auto& acrLeft, const auto& acrRight) {
        return acrLeft.mOccurrences > acrRight.mOccurrences;
    });
    std::string lKinds;
    for (const ZTSPortSummary::Count& lrCount : lCounts) {
        lKinds += (lKinds.empty() ? "" : ", ") + getKindName(lrCount.mKind) + " " + formatNumber(lrCount.mOccurrences);
    }
    const std::string lCounters = formatCounters(countersOf(acrPort.mPort, acrNames, aNow));
    lKinds += lCounters.empty() ? "" : (lKinds.empty() ? "" : "; ") + lCounters;
    const std::string lName = acrNames.findName(acrPort.mPort.mWwpn, acrPort.mPort.mWwnn);
    arTable.addRow({acrPort.mPort.mWwpn.toText(), lName.empty() ? "-" : lName,
                    lView.mState.empty() ? "-" : lView.mState, formatNumber(acrPort.mOccurrences),
                    formatShortTime(acrPort.mLastEvent, aNow), lInitiators, lKinds});
}
