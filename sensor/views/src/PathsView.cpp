#include "sensor/views/include/PathsView.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"
#include "sensor/views/src/PageText.h"

using ZTCJson = nlohmann::ordered_json;

// ---- which units ----

ZTSPathsFilter readPathsFilter(const ZTSFilterTexts& acrTexts, const ZTCNameBook& acrNames, bool aIsTroubleOnly) {
    ZTSFilterTexts lPorts;
    lPorts.mPorts = acrTexts.mPorts;
    lPorts.mInitiators = acrTexts.mInitiators;
    lPorts.mNamePrefix = acrTexts.mNamePrefix;
    ZTSHistoryFilter lFilter = readFilter(lPorts, acrNames, {}, getHistoryTime(), 0);
    return {.mPorts = std::move(lFilter.mPorts),
            .mInitiators = std::move(lFilter.mInitiators),
            .mLuns = acrTexts.mLuns,
            .mIsTroubleOnly = aIsTroubleOnly};
}

template <class ZTCValue>
static bool sIsIn(const ZTCValue& acrValue, const std::vector<ZTCValue>& acrValues) {
    return std::ranges::find(acrValues, acrValue) != acrValues.end();
}

static bool sIsNamed(const ZTSSanLun& acrLun, const std::string& acrText) {
    return acrLun.mId == acrText || acrLun.mMultipath == acrText || acrLun.mMultipathDevice == acrText ||
           std::ranges::any_of(acrLun.mPaths, [&acrText](const ZTSSanPath& acrPath) {
               return acrPath.mDisk == acrText || std::to_string(acrPath.mLun) == acrText;
           });
}

bool matches(const ZTSSanLun& acrLun, const ZTSPathsFilter& acrFilter) {
    const auto lIsThrough = [&acrFilter](const ZTSSanPath& acrPath) {
        const bool lIsPort =
            acrFilter.mPorts.empty() || (acrPath.mRemotePort && sIsIn(acrPath.mRemotePort->mWwpn, acrFilter.mPorts));
        const bool lIsInitiator = acrFilter.mInitiators.empty() ||
                                  (acrPath.mInitiator.mWwpn && sIsIn(*acrPath.mInitiator.mWwpn, acrFilter.mInitiators));
        return lIsPort && lIsInitiator;
    };
    const auto lIsNamed = [&acrLun](const std::string& acrText) { return sIsNamed(acrLun, acrText); };
    return (!acrFilter.mIsTroubleOnly || acrLun.mRedundancy != ZTRD_Whole) &&
           std::ranges::any_of(acrLun.mPaths, lIsThrough) &&
           (acrFilter.mLuns.empty() || std::ranges::any_of(acrFilter.mLuns, lIsNamed));
}

// ---- text ----

/// "reduced" and "lost" with a mark; a whole one needs no word.
static std::string sDescribeRedundancy(const ZTSSanLun& acrLun) {
    std::string lCount = formatNumber(acrLun.mRunning) + " of " + formatNumber(acrLun.mExpected);
    switch (acrLun.mRedundancy) {
        case ZTRD_None:
            return lCount + " NO PATH";
        case ZTRD_Lost:
            return lCount + " LOST";
        case ZTRD_Reduced:
            return lCount + " REDUCED";
        case ZTRD_Unknown:
            return lCount + " known";
        default:
            return lCount;
    }
}

/// Each state of the path that is not as it should be: the link's, the remote port's, the device's.
static std::string sDescribeState(const ZTSSanPath& acrPath, bool aIsGone) {
    if (aIsGone) {
        return "gone";
    }
    if (acrPath.mInitiatorState && *acrPath.mInitiatorState != "Online") {
        return "link " + *acrPath.mInitiatorState;
    }
    if (acrPath.mRemotePortState && *acrPath.mRemotePortState != "Online") {
        return "port " + *acrPath.mRemotePortState;
    }
    return acrPath.mState.value_or("not known");
}

static void sAddOnce(std::vector<std::string>& arTexts, const std::string& acrText) {
    if (!sIsIn(acrText, arTexts)) {
        arTexts.push_back(acrText);
    }
}

static std::string sJoin(const std::vector<std::string>& acrTexts, const char* apBetween) {
    std::string lText;
    for (const std::string& lrText : acrTexts) {
        lText += (lText.empty() ? "" : apBetween) + lrText;
    }
    return lText.empty() ? "-" : lText;
}

static std::string sDescribePort(const ZTSSanPath& acrPath, const ZTCNameBook& acrNames) {
    return acrPath.mRemotePort ? acrNames.describe(*acrPath.mRemotePort) : acrPath.mRemotePortName;
}

static ZTCTextTable sMakeTable(std::size_t aWidth) {
    return ZTCTextTable({{.mpTitle = " "},
                         {.mpTitle = "LUN", .mLeastWidth = 12},
                         {.mpTitle = "NO", .mIsRight = true, .mDropOrder = 2},
                         {.mpTitle = "PATHS"},
                         {.mpTitle = "MOUNT", .mLeastWidth = 8},
                         {.mpTitle = "INITIATOR", .mLeastWidth = 11},
                         {.mpTitle = "DISK", .mDropOrder = 1, .mLeastWidth = 5},
                         {.mpTitle = "REMOTE PORT", .mLeastWidth = 16}},
                        aWidth);
}

static void sAddLun(ZTCTextTable& arTable, const ZTSSanLun& acrLun, const ZTCNameBook& acrNames) {
    std::vector<std::string> lNumbers;
    std::vector<std::string> lDisks;
    std::vector<std::string> lInitiators;
    std::vector<std::string> lPorts;
    for (const ZTSSanPath& lrPath : acrLun.mPaths) {
        sAddOnce(lNumbers, std::to_string(lrPath.mLun));
        sAddOnce(lInitiators, acrNames.describe(lrPath.mInitiator));
        sAddOnce(lPorts, sDescribePort(lrPath, acrNames));
        if (lrPath.mDisk) {
            lDisks.push_back(*lrPath.mDisk);
        }
    }
    arTable.addRow({acrLun.mRedundancy >= ZTRD_Reduced ? "!" : "", describeLun(acrLun), sJoin(lNumbers, ","),
                    sDescribeRedundancy(acrLun), sJoin(acrLun.mMounts, ","), sJoin(lInitiators, ","),
                    sJoin(lDisks, ","), sJoin(lPorts, ",")});
}

static void sAddPath(ZTCTextTable& arTable, const ZTSSanPath& acrPath, bool aIsGone, const ZTCNameBook& acrNames) {
    arTable.addRow({acrPath.mHealth == ZTPH_Down ? "!" : "", " " + acrPath.mAddress, std::to_string(acrPath.mLun),
                    sDescribeState(acrPath, aIsGone), "", acrNames.describe(acrPath.mInitiator),
                    acrPath.mDisk.value_or("-"), sDescribePort(acrPath, acrNames)});
}

std::string formatPaths(const ZTSSanView& acrView, const ZTSPathsRequest& acrRequest, const ZTCNameBook& acrNames,
                        std::size_t aTableWidth, const ZTSTextStyle& acrStyle) {
    ZTCTextTable lTable = sMakeTable(aTableWidth);
    for (const ZTSSanLun& lrLun : acrView.mFacts.mLuns) {
        if (!matches(lrLun, acrRequest.mFilter)) {
            continue;
        }
        sAddLun(lTable, lrLun, acrNames);
        for (const ZTSSanPath& lrPath : lrLun.mPaths) {
            if (acrRequest.mIsEachPath || lrPath.mHealth != ZTPH_Running) {
                sAddPath(lTable, lrPath, lrLun.mIsGone, acrNames);
            }
        }
    }
    std::string lText = lTable.countRows() != 0             ? lTable.takeText() + "\n"
                        : acrRequest.mFilter.mIsTroubleOnly ? "Every LUN runs on all its paths.\n\n"
                        : acrView.mFacts.mLuns.empty()      ? ""
                                                            : "No LUN matches.\n\n";
    ZTCPageText lPage(acrStyle);
    lPage.add("paths", summarizePaths(acrView.mFacts));
    lPage.add("as of", formatDateTime(acrView.mScanned) +
                           (acrView.mIsStale ? "; " + formatCount(acrView.mFacts.mBlocked, "file") +
                                                   " did not answer then: of them earlier values are shown"
                                             : ""));
    const std::vector<ZTSTroubleText> lTroubles = describeSanTroubles(acrView.mFacts, acrNames, acrRequest.mTime);
    lPage.add("SAN", lTroubles.empty() ? "no trouble"
                                       : formatCount(lTroubles.size(), "trouble") + " or notice" +
                                             (lTroubles.size() == 1 ? "" : "s"));
    lPage.addNumbered(lTroubles, 0);
    return lText + lPage.take();
}

// ---- JSON ----

template <class ZTCValue>
static ZTCJson sValue(const std::optional<ZTCValue>& acrValue) {
    return acrValue ? ZTCJson(*acrValue) : ZTCJson(nullptr);
}

static ZTCJson sPath(const ZTSSanPath& acrPath, const ZTCNameBook& acrNames) {
    return {{"address", acrPath.mAddress},
            {"running", acrPath.mHealth == ZTPH_Unknown ? ZTCJson(nullptr) : ZTCJson(acrPath.mHealth == ZTPH_Running)},
            {"state", sValue(acrPath.mState)},
            {"lun", acrPath.mLun},
            {"initiator", toJson(acrPath.mInitiator)},
            {"initiatorState", sValue(acrPath.mInitiatorState)},
            {"remotePort", toJson(acrPath.mRemotePort, acrNames)},
            {"remotePortState", sValue(acrPath.mRemotePortState)},
            {"disk", sValue(acrPath.mDisk)},
            {"queueDepth", sValue(acrPath.mQueueDepth)}};
}

static ZTCJson sLun(const ZTSSanLun& acrLun, const ZTCNameBook& acrNames) {
    ZTCJson lPaths = ZTCJson::array();
    for (const ZTSSanPath& lrPath : acrLun.mPaths) {
        lPaths.push_back(sPath(lrPath, acrNames));
    }
    return {{"id", acrLun.mId},
            {"wwid", sValue(acrLun.mWwid)},
            {"vendor", sValue(acrLun.mVendor)},
            {"model", sValue(acrLun.mModel)},
            {"multipath", sValue(acrLun.mMultipath)},
            {"multipathDevice", sValue(acrLun.mMultipathDevice)},
            {"mounts", acrLun.mMounts},
            {"redundancy", getRedundancyName(acrLun.mRedundancy)},
            {"running", acrLun.mRunning},
            {"expected", acrLun.mExpected},
            {"gone", acrLun.mIsGone},
            {"paths", std::move(lPaths)}};
}

ZTCJson makePathsDocument(const ZTSSanView* apView, const ZTSPathsRequest& acrRequest, const ZTCNameBook& acrNames,
                          const std::string& acrHost, const std::string& acrStoreId) {
    ZTCJson lDocument = beginDocument("paths", acrHost, acrStoreId);
    lDocument["time"] = toRfc3339(acrRequest.mTime);
    lDocument["scanned"] = apView != nullptr ? ZTCJson(toRfc3339(apView->mScanned)) : ZTCJson(nullptr);
    lDocument["stale"] = apView != nullptr ? ZTCJson(apView->mIsStale) : ZTCJson(nullptr);
    if (apView == nullptr) {
        lDocument["luns"] = nullptr;
        lDocument["troubles"] = nullptr;
        return lDocument;
    }
    lDocument["luns"] = ZTCJson::array();
    for (const ZTSSanLun& lrLun : apView->mFacts.mLuns) {
        if (matches(lrLun, acrRequest.mFilter)) {
            lDocument["luns"].push_back(sLun(lrLun, acrNames));
        }
    }
    lDocument["troubles"] = ZTCJson::array();
    for (const ZTSTroubleText& lrTrouble : describeSanTroubles(apView->mFacts, acrNames, acrRequest.mTime)) {
        lDocument["troubles"].push_back(toJson(lrTrouble));
    }
    return lDocument;
}
