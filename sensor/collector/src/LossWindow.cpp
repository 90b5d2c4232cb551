#include "sensor/collector/include/LossWindow.h"

#include <algorithm>
#include <nlohmann/json.hpp>

using std::chrono::hours;
using std::chrono::minutes;
using ZTCJson = nlohmann::json;

static constexpr hours scWindow{24};
/// Older losses are kept by the hour.
static constexpr hours scFineWindow{1};
static constexpr hours scWidestSlot{1};

ZTCLossWindow::ZTSCounts ZTCLossWindow::countAll(const ZTSStatusSnapshot& acrPage) {
    ZTSCounts lCounts;
    const auto lAdd = [&lCounts](const ZTSStatusRowCopy& acrRow) {
        for (std::size_t i = 0; i < acrRow.mRefused.size(); ++i) {
            lCounts.mRefused[gcStatusRefusalNames[i]] += acrRow.mRefused[i];
        }
        lCounts.mDropped += acrRow.mDropped;
    };
    lAdd(acrPage.mUnknownBoards);
    for (const ZTSStatusBoardCopy& lrBoard : acrPage.mBoards) {
        std::ranges::for_each(lrBoard.mRows, lAdd);
    }
    for (const ZTSStatusLossCopy& lrLoss : acrPage.mLosses) {
        lCounts.mLibrary[lrLoss.mName] += lrLoss.mTotal;
    }
    return lCounts;
}

static std::uint64_t sGrowth(std::uint64_t aOld, std::uint64_t aNew) {
    return aNew > aOld ? aNew - aOld : 0;
}

using ZTCNamedCounts = std::map<std::string, std::uint64_t>;

/// Adds what the second map has more of.
static void sAddGrowth(ZTCNamedCounts& arSum, const ZTCNamedCounts& acrOld, const ZTCNamedCounts& acrNew) {
    for (const auto& [lrName, lCount] : acrNew) {
        const auto lpOld = acrOld.find(lrName);
        if (const std::uint64_t lGrowth = sGrowth(lpOld == acrOld.end() ? 0 : lpOld->second, lCount)) {
            arSum[lrName] += lGrowth;
        }
    }
}

void ZTCLossWindow::addGrowth(ZTSCounts& arSum, const ZTSCounts& acrOld, const ZTSCounts& acrNew) {
    sAddGrowth(arSum.mRefused, acrOld.mRefused, acrNew.mRefused);
    sAddGrowth(arSum.mLibrary, acrOld.mLibrary, acrNew.mLibrary);
    arSum.mDropped += sGrowth(acrOld.mDropped, acrNew.mDropped);
}

/// Drops slots that are too old, and merges old ones into slots of an hour.
void ZTCLossWindow::tidy(ZTCHistoryTime aNow) {
    std::vector<ZTSSlot> lSlots;
    for (ZTSSlot& lrSlot : mSlots) {
        // The clock was set back: what lies in its future is as of now.
        lrSlot.mBegin = std::min(lrSlot.mBegin, aNow);
        lrSlot.mEnd = std::min(lrSlot.mEnd, aNow);
        const bool lIsCoarse = lrSlot.mEnd < aNow - scFineWindow;
        if (!lSlots.empty() && lIsCoarse && lrSlot.mEnd - lSlots.back().mBegin < scWidestSlot) {
            lSlots.back().mEnd = lrSlot.mEnd;
            addGrowth(lSlots.back().mCounts, {}, lrSlot.mCounts);
        } else {
            lSlots.push_back(std::move(lrSlot));
        }
    }
    std::erase_if(lSlots, [aNow](const ZTSSlot& acrSlot) { return acrSlot.mEnd < aNow - scWindow; });
    mSlots = std::move(lSlots);
}

bool ZTCLossWindow::note(const ZTSStatusSnapshot& acrPage, ZTCHistoryTime aNow) {
    ZTSCounts lNow = countAll(acrPage);
    if (acrPage.mStartId != mGeneration) {
        mGeneration = acrPage.mStartId;
        mLast = fromMicroseconds(acrPage.mStartTime) < mBegin ? lNow : ZTSCounts{};
    }
    ZTSCounts lGrowth;
    addGrowth(lGrowth, mLast, lNow);
    mLast = std::move(lNow);
    if (lGrowth == ZTSCounts{}) {
        return false;
    }
    tidy(aNow);
    if (mSlots.empty() || aNow - mSlots.back().mBegin >= minutes(1)) {
        mSlots.push_back({.mBegin = aNow, .mEnd = aNow, .mCounts = {}});
    }
    mSlots.back().mEnd = aNow;
    addGrowth(mSlots.back().mCounts, {}, lGrowth);
    return true;
}

ZTSLosses ZTCLossWindow::get(ZTCHistoryTime aNow, ZTCHistoryTime aSince) {
    tidy(aNow);
    ZTSLosses lLosses;
    lLosses.mSince = std::max({mBegin, aNow - scWindow, aSince});
    ZTSCounts lSum;
    for (const ZTSSlot& lrSlot : mSlots) {
        if (lrSlot.mEnd >= lLosses.mSince) {
            addGrowth(lSum, {}, lrSlot.mCounts);
        }
    }
    for (const char* lpName : gcStatusRefusalNames) {
        lLosses.mRefused[lpName] = lSum.mRefused[lpName];
    }
    lLosses.mDropped = lSum.mDropped;
    lLosses.mLibrary = std::move(lSum.mLibrary);
    return lLosses;
}

// ---- as text ----

template <typename T>
static ZTCJson sCountsToJson(const T& acrCounts) {
    return {{"refused", acrCounts.mRefused}, {"dropped", acrCounts.mDropped}, {"library", acrCounts.mLibrary}};
}

/// Throws for any other JSON, as the next two.
template <typename T>
static T sCountsFromJson(const ZTCJson& acrJson) {
    T lCounts;
    acrJson.at("refused").get_to(lCounts.mRefused);
    acrJson.at("dropped").get_to(lCounts.mDropped);
    acrJson.at("library").get_to(lCounts.mLibrary);
    return lCounts;
}

static ZTCHistoryTime sTimeFromJson(const ZTCJson& acrJson, const char* apName) {
    return fromMicroseconds(acrJson.at(apName).get<std::int64_t>());
}

std::string ZTCLossWindow::toText() const {
    ZTCJson lText{{"begin", toMicroseconds(mBegin)},
                  {"generation", mGeneration},
                  {"last", sCountsToJson(mLast)},
                  {"slots", ZTCJson::array()}};
    for (const ZTSSlot& lrSlot : mSlots) {
        ZTCJson lSlot = sCountsToJson(lrSlot.mCounts);
        lSlot["begin"] = toMicroseconds(lrSlot.mBegin);
        lSlot["end"] = toMicroseconds(lrSlot.mEnd);
        lText["slots"].push_back(std::move(lSlot));
    }
    return lText.dump(-1, ' ', false, ZTCJson::error_handler_t::replace);
}

bool ZTCLossWindow::restore(const std::string& acrText) {
    try {
        const ZTCJson lText = ZTCJson::parse(acrText);
        ZTCLossWindow lWindow(sTimeFromJson(lText, "begin"));
        lText.at("generation").get_to(lWindow.mGeneration);
        lWindow.mLast = sCountsFromJson<ZTSCounts>(lText.at("last"));
        for (const ZTCJson& lrSlot : lText.at("slots")) {
            lWindow.mSlots.push_back({.mBegin = sTimeFromJson(lrSlot, "begin"),
                                      .mEnd = sTimeFromJson(lrSlot, "end"),
                                      .mCounts = sCountsFromJson<ZTSCounts>(lrSlot)});
        }
        *this = std::move(lWindow);
        return true;
    } catch (const ZTCJson::exception&) {
        return false;
    }
}
