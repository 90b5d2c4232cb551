#include "sensor/views/include/DiffView.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <map>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"
#include "sensor/views/src/PageText.h"

using ZTCJson = nlohmann::ordered_json;

static constexpr std::array<const char*, ZTDF_Count> scWords{"link", "remote port", "LUN", "path"};

// ---- text ----

static std::string sNamePort(const ZTSDiffSubject& acrSubject, const ZTCNameBook& acrNames) {
    return acrSubject.mRemotePort ? acrNames.describe(*acrSubject.mRemotePort) : "an unknown port";
}

/// "array7 ctrl-B from host8"; of paths with how many LUNs, or which.
static std::string sName(const ZTSDiffSubject& acrSubject, const ZTCNameBook& acrNames, std::size_t aLuns) {
    std::string lInitiator = acrSubject.mInitiator ? acrNames.describe(*acrSubject.mInitiator) : "";
    switch (acrSubject.mThing) {
        case ZTDF_Link:
            return lInitiator;
        case ZTDF_RemotePort:
            return sNamePort(acrSubject, acrNames) + " from " + lInitiator;
        case ZTDF_Lun:
            return acrSubject.mLunName;
        default:
            return (aLuns == 1 ? acrSubject.mLunName : formatCount(aLuns, "LUN")) + " by " + lInitiator + ", " +
                   sNamePort(acrSubject, acrNames);
    }
}

/// Changes of one row: of paths those of all LUNs through the same ports.
struct ZTSDiffRow {
    const ZTSDiffChange* mpChange;
    std::size_t mCount;
};

static std::vector<ZTSDiffRow> sGroup(const std::vector<ZTSDiffChange>& acrChanges) {
    std::vector<ZTSDiffRow> lRows;
    std::map<std::string, std::size_t> lPlaces;
    for (const ZTSDiffChange& lrChange : acrChanges) {
        const ZTSDiffSubject& lrSubject = lrChange.mSubject;
        if (lrSubject.mThing != ZTDF_Path) {
            lRows.push_back({&lrChange, 1});
            continue;
        }
        const std::string lKey = lrSubject.mInitiator->mHost + "\n" +
                                 (lrSubject.mRemotePort ? lrSubject.mRemotePort->mWwpn.toText() : "") + "\n" +
                                 lrChange.mBefore.value_or("") + "\n" + lrChange.mAfter.value_or("");
        const auto [lPlace, lIsNew] = lPlaces.try_emplace(lKey, lRows.size());
        if (lIsNew) {
            lRows.push_back({&lrChange, 0});
        }
        ++lRows[lPlace->second].mCount;
    }
    return lRows;
}

static std::string sTimeOf(const ZTSDiffPoint& acrPoint) {
    return formatDateTime(acrPoint.mTime) + (acrPoint.mMark.empty() ? "" : "  mark \"" + acrPoint.mMark + "\"");
}

/// "12.5", and "0.02" where that would be 0.0.
static std::string sPerHour(std::uint64_t aCount, std::chrono::microseconds aSpan) {
    const double lHours = std::chrono::duration<double, std::ratio<3600>>(aSpan).count();
    const double lRate = static_cast<double>(aCount) / lHours;
    std::array<char, 32> lText;
    std::snprintf(lText.data(), lText.size(), aCount == 0 ? "%.0f" : lRate < 0.1 ? "%.2g" : "%.1f", lRate);
    return lText.data();
}

/// Passing ones of all LUNs through the same ports, with the same states, are one.
static std::string sPassing(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, std::size_t aTableWidth) {
    if (acrDiff.mPassing.empty()) {
        return {};
    }
    static constexpr std::size_t scMostStates = 4;
    ZTCTextTable lTable({{.mpTitle = "IN BETWEEN"}, {.mpTitle = "NAME"}, {.mpTitle = "WAS", .mLeastWidth = 20}},
                        aTableWidth);
    std::map<std::string, std::pair<const ZTSDiffPassing*, std::size_t>> lPaths;
    const auto lStates = [&acrDiff](const ZTSDiffPassing& acrPassing) {
        std::string lText;
        for (std::size_t i = 0; i < std::min(acrPassing.mStates.size(), scMostStates); ++i) {
            const auto& [lTime, lState] = acrPassing.mStates[i];
            lText += (i == 0 ? "" : ", ") + lState + " " + formatShortTime(lTime, acrDiff.mTo.mTime);
        }
        const std::size_t lMore = acrPassing.mStates.size() - std::min(acrPassing.mStates.size(), scMostStates);
        return lMore == 0 ? lText : lText + " and " + formatNumber(lMore) + " more";
    };
    for (const ZTSDiffPassing& lrPassing : acrDiff.mPassing) {
        if (lrPassing.mSubject.mThing != ZTDF_Path) {
            lTable.addRow(
                {scWords.at(lrPassing.mSubject.mThing), sName(lrPassing.mSubject, acrNames, 1), lStates(lrPassing)});
        } else {
            auto& [lpFirst, lCount] = lPaths[sName(lrPassing.mSubject, acrNames, 2) + lStates(lrPassing)];
            lpFirst = lpFirst == nullptr ? &lrPassing : lpFirst;
            ++lCount;
        }
    }
    for (const auto& [lKey, lPath] : lPaths) {
        lTable.addRow(
            {scWords.at(ZTDF_Path), sName(lPath.first->mSubject, acrNames, lPath.second), lStates(*lPath.first)});
    }
    return "\n" + lTable.takeText();
}

/// Only what differs: every kind and port that had an event would fill pages.
static std::string sRates(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, std::size_t aTableWidth) {
    ZTCTextTable lTable({{.mpTitle = "EVENTS AN HOUR"},
                         {.mpTitle = "REMOTE PORT", .mLeastWidth = 16},
                         {.mpTitle = "BEFORE", .mIsRight = true},
                         {.mpTitle = "AFTER", .mIsRight = true},
                         {.mpTitle = "COUNTS", .mIsRight = true, .mDropOrder = 1}},
                        aTableWidth);
    for (const ZTSDiffRate& lrRate : acrDiff.mRates) {
        if (lrRate.mIsDifferent) {
            lTable.addRow({getKindName(lrRate.mKind), lrRate.mRemotePort ? acrNames.describe(*lrRate.mRemotePort) : "-",
                           sPerHour(lrRate.mBefore, acrDiff.mBeforeSpan), sPerHour(lrRate.mAfter, acrDiff.mAfterSpan),
                           formatNumber(lrRate.mBefore) + " -> " + formatNumber(lrRate.mAfter)});
        }
    }
    std::string lText = lTable.countRows() == 0 ? "" : "\n" + lTable.takeText();
    const std::size_t lOthers = acrDiff.mRates.size() - lTable.countRows();
    if (lOthers != 0) {
        lText += "\n" + formatCount(lOthers, "more rate") + (lOthers == 1 ? " does" : " do") +
                 " not differ: tavik --json diff\n";
    }
    return lText;
}

std::string formatDiff(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, std::size_t aTableWidth,
                       const ZTSTextStyle& acrStyle) {
    const auto lRates = std::ranges::count_if(acrDiff.mRates, &ZTSDiffRate::mIsDifferent);
    ZTCPageText lPage(acrStyle);
    lPage.add("from", sTimeOf(acrDiff.mFrom));
    lPage.add("to", sTimeOf(acrDiff.mTo));
    const std::vector<ZTSDiffRow> lRows = sGroup(acrDiff.mChanges);
    const std::string lWhat =
        formatCount(acrDiff.mChanges.size(), "state") + ", " + formatCount(static_cast<std::uint64_t>(lRates), "rate");
    lPage.add("diff",
              acrDiff.isSame() ? (acrDiff.mHasTopology ? "SAME" : "no rate of events differs") : "DIFFERENT: " + lWhat);
    if (!acrDiff.mHasTopology) {
        lPage.add("note", "the paths of both moments are not stored: nothing is known of them");
    }
    const auto lStretch = [&acrDiff](std::chrono::microseconds aSpan, ZTCHistoryTime aEnd) {
        return "of the " + formatSpan(aSpan) + " up to " + formatShortTime(aEnd, acrDiff.mTo.mTime);
    };
    lPage.add("rates", lStretch(acrDiff.mBeforeSpan, acrDiff.mBeforeEnd) + ", and " +
                           lStretch(acrDiff.mAfterSpan, acrDiff.mAfterEnd));
    std::string lText = lPage.take();
    if (!lRows.empty()) {
        ZTCTextTable lTable(
            {{.mpTitle = "WHAT"}, {.mpTitle = "NAME", .mLeastWidth = 24}, {.mpTitle = "BEFORE"}, {.mpTitle = "AFTER"}},
            aTableWidth);
        for (const ZTSDiffRow& lrRow : lRows) {
            lTable.addRow({scWords.at(lrRow.mpChange->mSubject.mThing),
                           sName(lrRow.mpChange->mSubject, acrNames, lrRow.mCount),
                           lrRow.mpChange->mBefore.value_or("-"), lrRow.mpChange->mAfter.value_or("-")});
        }
        lText += "\n" + lTable.takeText();
    }
    return lText + sPassing(acrDiff, acrNames, aTableWidth) + sRates(acrDiff, acrNames, aTableWidth);
}

// ---- JSON ----

static ZTCJson sSubject(const ZTSDiffSubject& acrSubject, const ZTCNameBook& acrNames) {
    const auto lText = [](const std::string& acrText) { return acrText.empty() ? ZTCJson(nullptr) : ZTCJson(acrText); };
    return {{"what", getDiffThingName(acrSubject.mThing)},
            {"initiator", acrSubject.mInitiator ? toJson(*acrSubject.mInitiator) : ZTCJson(nullptr)},
            {"remotePort", toJson(acrSubject.mRemotePort, acrNames)},
            {"lun", lText(acrSubject.mLun)},
            {"lunName", lText(acrSubject.mLunName)}};
}

static ZTCJson sPoint(const ZTSDiffPoint& acrPoint) {
    return {{"time", toRfc3339(acrPoint.mTime)},
            {"mark", acrPoint.mMark.empty() ? ZTCJson(nullptr) : ZTCJson(acrPoint.mMark)}};
}

ZTCJson makeDiffDocument(const ZTSDiff& acrDiff, const ZTCNameBook& acrNames, const std::string& acrHost,
                         const std::string& acrStoreId) {
    const auto lState = [](const std::optional<std::string>& acrState) {
        return acrState ? ZTCJson(*acrState) : ZTCJson(nullptr);
    };
    const auto lSeconds = [](std::chrono::microseconds aSpan) {
        return std::chrono::duration_cast<std::chrono::seconds>(aSpan).count();
    };
    ZTCJson lDocument = beginDocument("diff", acrHost, acrStoreId);
    lDocument["from"] = sPoint(acrDiff.mFrom);
    lDocument["to"] = sPoint(acrDiff.mTo);
    lDocument["same"] = acrDiff.isSame() ? acrDiff.mHasTopology ? ZTCJson(true) : ZTCJson(nullptr) : ZTCJson(false);
    lDocument["changes"] = acrDiff.mHasTopology ? ZTCJson::array() : ZTCJson(nullptr);
    for (const ZTSDiffChange& lrChange : acrDiff.mChanges) {
        ZTCJson lChange = sSubject(lrChange.mSubject, acrNames);
        lChange["before"] = lState(lrChange.mBefore);
        lChange["after"] = lState(lrChange.mAfter);
        lDocument["changes"].push_back(std::move(lChange));
    }
    lDocument["passing"] = acrDiff.mHasTopology ? ZTCJson::array() : ZTCJson(nullptr);
    for (const ZTSDiffPassing& lrPassing : acrDiff.mPassing) {
        ZTCJson lPassing = sSubject(lrPassing.mSubject, acrNames);
        lPassing["states"] = ZTCJson::array();
        for (const auto& [lTime, lName] : lrPassing.mStates) {
            lPassing["states"].push_back({{"time", toRfc3339(lTime)}, {"state", lName}});
        }
        lDocument["passing"].push_back(std::move(lPassing));
    }
    lDocument["secondsBefore"] = lSeconds(acrDiff.mBeforeSpan);
    lDocument["secondsAfter"] = lSeconds(acrDiff.mAfterSpan);
    lDocument["endBefore"] = toRfc3339(acrDiff.mBeforeEnd);
    lDocument["endAfter"] = toRfc3339(acrDiff.mAfterEnd);
    lDocument["rates"] = ZTCJson::array();
    for (const ZTSDiffRate& lrRate : acrDiff.mRates) {
        lDocument["rates"].push_back({{"kind", getKindName(lrRate.mKind)},
                                      {"remotePort", toJson(lrRate.mRemotePort, acrNames)},
                                      {"before", lrRate.mBefore},
                                      {"after", lrRate.mAfter},
                                      {"different", lrRate.mIsDifferent}});
    }
    return lDocument;
}
