#include "sensor/collector/include/LossWindow.h"

#include <algorithm>

using std::chrono::hours;

static constexpr hours scWindow{24};

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

/// Adds what the second map has more of.
static void sAddGrowth(std::map<std::string, std::uint64_t>& arSum, const std::map<std::string, std::uint64_t>& acrOld,
                       const std::map<std::string, std::uint64_t>& acrNew) {
    for (const auto& [lrName, lCount] : acrNew) {
        const auto lpOld = acrOld.find(lrName);
        const std::uint64_t lOld = lpOld == acrOld.end() ? 0 : lpOld->second;
        arSum[lrName] += lCount > lOld ? lCount - lOld : 0;
    }
}

void ZTCLossWindow::forgetOld(ZTCHistoryTime aNow) {
    while (!mHours.empty() && mHours.front().mBegin + hours(1) < aNow - scWindow) {
        mHours.pop_front();
    }
}

void ZTCLossWindow::note(const ZTSStatusSnapshot& acrPage, ZTCHistoryTime aNow) {
    const ZTSCounts lNow = countAll(acrPage);
    if (acrPage.mStartId != mGeneration) {
        mGeneration = acrPage.mStartId;
        mLast = fromMicroseconds(acrPage.mStartTime) < mBegin ? lNow : ZTSCounts{};
    }
    forgetOld(aNow);
    if (mHours.empty() || aNow >= mHours.back().mBegin + hours(1)) {
        mHours.push_back({aNow, {}});
    }
    ZTSCounts& lrSum = mHours.back().mCounts;
    sAddGrowth(lrSum.mRefused, mLast.mRefused, lNow.mRefused);
    sAddGrowth(lrSum.mLibrary, mLast.mLibrary, lNow.mLibrary);
    lrSum.mDropped += lNow.mDropped > mLast.mDropped ? lNow.mDropped - mLast.mDropped : 0;
    mLast = lNow;
}

ZTSLosses ZTCLossWindow::get(ZTCHistoryTime aNow) {
    forgetOld(aNow);
    ZTSLosses lLosses;
    lLosses.mSince = std::max(mBegin, aNow - scWindow);
    for (const char* lpName : gcStatusRefusalNames) {
        lLosses.mRefused[lpName] = 0;
    }
    for (const ZTSHour& lrHour : mHours) {
        sAddGrowth(lLosses.mRefused, {}, lrHour.mCounts.mRefused);
        sAddGrowth(lLosses.mLibrary, {}, lrHour.mCounts.mLibrary);
        lLosses.mDropped += lrHour.mCounts.mDropped;
    }
    return lLosses;
}
