#include "sensor/store/src/HistoryImplementation.h"

#include <algorithm>
#include <limits>
#include <map>
#include <set>

#include "sensor/store/src/CountBook.h"
#include "sensor/store/src/Counter.h"

/// Rows that one read transaction looks at.
static constexpr std::size_t scPageRows = 16384;

static constexpr std::int64_t scMinutesADay = gcDayMicroseconds / gcMinuteMicroseconds;

bool ZTCHistory::ZTCImplementation::visitSlots(const char* apSql, std::int64_t aFirst, std::int64_t aEnd,
                                               const std::function<bool(const ZTSSlotRow&)>& acrVisitor) {
    ZTCStatement lRows(mDatabase, apSql);
    ZTSSlotRow lLast;
    lLast.mSlot = aFirst - 1;
    lLast.mInitiator = lLast.mPort = std::numeric_limits<std::uint32_t>::max();
    lLast.mKind = std::numeric_limits<ZTCKindKey>::max();
    std::vector<ZTSSlotRow> lPage(scPageRows);
    while (lPage.size() == scPageRows) {
        lPage.clear();
        lRows.query(lLast.mSlot, lLast.mInitiator, lLast.mKind, lLast.mPort, aEnd, scPageRows);
        while (lRows.step()) {
            lPage.push_back({.mSlot = lRows.number(0),
                             .mInitiator = lRows.number<std::uint32_t>(1),
                             .mKind = lRows.number<ZTCKindKey>(2),
                             .mPort = lRows.number<std::uint32_t>(3),
                             .mCount = lRows.number<std::uint64_t>(4),
                             .mSpread = lRows.number<std::uint64_t>(5),
                             .mLast = lRows.number(6)});
        }
        if (!lPage.empty()) {
            lLast = lPage.back();
        }
        if (!std::ranges::all_of(lPage, acrVisitor)) {
            return false;
        }
    }
    return true;
}

/// Slots that the filter's time touches: from the first to before the second.
static std::pair<std::int64_t, std::int64_t> sSlots(const ZTSHistoryFilter& acrFilter, std::int64_t aSlotMicroseconds) {
    static constexpr std::int64_t scFar = std::numeric_limits<std::int64_t>::max() / 4 / gcDayMicroseconds;
    return {acrFilter.mSince ? getSlot(toMicroseconds(*acrFilter.mSince), aSlotMicroseconds)
                             : -scFar * (gcDayMicroseconds / aSlotMicroseconds),
            acrFilter.mUntil ? getSlot(toMicroseconds(*acrFilter.mUntil), aSlotMicroseconds) + 1
                             : scFar * (gcDayMicroseconds / aSlotMicroseconds)};
}

std::vector<ZTSPortSummary> ZTCHistory::readPorts(const ZTSHistoryFilter& acrFilter) const {
    mpImplementation->loadNames();
    const ZTCFilterTest lTest(acrFilter, mpImplementation->mNames);
    struct Sum {
        std::map<ZTCKindKey, std::uint64_t> mCounts;
        std::set<std::uint32_t> mInitiators;
        std::int64_t mLast = std::numeric_limits<std::int64_t>::min();
    };
    std::map<std::uint32_t, Sum> lSums;
    const auto lAdd = [&](const ZTSSlotRow& acrRow) {
        if (acrRow.mPort != 0 && lTest.matches(acrRow.mInitiator, acrRow.mKind, acrRow.mPort)) {
            Sum& lrSum = lSums[acrRow.mPort];
            lrSum.mCounts[acrRow.mKind] += acrRow.mCount;
            lrSum.mInitiators.insert(acrRow.mInitiator);
            lrSum.mLast = std::max(lrSum.mLast, acrRow.mLast);
        }
        return true;
    };
    // Whole days from the table of days; the minutes before and behind them from that of minutes.
    const auto [lFirst, lEnd] = sSlots(acrFilter, gcMinuteMicroseconds);
    const std::int64_t lFirstDay = getSlot(lFirst + scMinutesADay - 1, scMinutesADay);
    const std::int64_t lEndDay = getSlot(lEnd, scMinutesADay);
    if (lFirstDay < lEndDay) {
        mpImplementation->visitSlots(HistoryQueries::gcMinutes, lFirst, lFirstDay * scMinutesADay, lAdd);
        mpImplementation->visitSlots(HistoryQueries::gcDays, lFirstDay, lEndDay, lAdd);
        mpImplementation->visitSlots(HistoryQueries::gcMinutes, lEndDay * scMinutesADay, lEnd, lAdd);
    } else {
        mpImplementation->visitSlots(HistoryQueries::gcMinutes, lFirst, lEnd, lAdd);
    }
    std::vector<ZTSPortSummary> lPorts;
    for (const auto& [lPort, lrSum] : lSums) {
        ZTSPortSummary lSummary;
        lSummary.mPort = mpImplementation->getPort(lPort).value_or(ZTSRemotePort{});
        for (const auto& [lKind, lCount] : lrSum.mCounts) {
            if (lCount != 0) {
                lSummary.mCounts.push_back({.mKind = lKind, .mOccurrences = lCount});
                lSummary.mOccurrences += lCount;
            }
        }
        for (const std::uint32_t lInitiator : lrSum.mInitiators) {
            lSummary.mInitiators.push_back(mpImplementation->getInitiator(lInitiator));
        }
        lSummary.mLastEvent = fromMicroseconds(lrSum.mLast);
        lPorts.push_back(std::move(lSummary));
    }
    std::ranges::stable_sort(lPorts, std::ranges::greater(), &ZTSPortSummary::mOccurrences);
    if (acrFilter.mLimit != 0 && lPorts.size() > acrFilter.mLimit) {
        lPorts.resize(acrFilter.mLimit);
    }
    return lPorts;
}

void ZTCHistory::ZTCImplementation::visitBuckets(const char* apSql, std::int64_t aSlotMicroseconds,
                                                 const ZTSHistoryFilter& acrFilter,
                                                 const std::function<bool(const ZTSBucket&)>& acrVisitor) {
    loadNames();
    const ZTCFilterTest lTest(acrFilter, mNames);
    const auto [lFirst, lEnd] = sSlots(acrFilter, aSlotMicroseconds);
    visitSlots(apSql, lFirst, lEnd, [&](const ZTSSlotRow& acrRow) {
        return !lTest.matches(acrRow.mInitiator, acrRow.mKind, acrRow.mPort) ||
               acrVisitor({.mFrom = fromMicroseconds(acrRow.mSlot * aSlotMicroseconds),
                           .mInitiator = getInitiator(acrRow.mInitiator),
                           .mKind = acrRow.mKind,
                           .mRemotePort = getPort(acrRow.mPort),
                           .mOccurrences = acrRow.mCount,
                           .mSpread = acrRow.mSpread,
                           .mLast = fromMicroseconds(acrRow.mLast)});
    });
}

void ZTCHistory::visitMinutes(const ZTSHistoryFilter& acrFilter,
                              const std::function<bool(const ZTSBucket&)>& acrVisitor) const {
    mpImplementation->visitBuckets(HistoryQueries::gcMinutes, gcMinuteMicroseconds, acrFilter, acrVisitor);
}

void ZTCHistory::visitDays(const ZTSHistoryFilter& acrFilter,
                           const std::function<bool(const ZTSBucket&)>& acrVisitor) const {
    mpImplementation->visitBuckets(HistoryQueries::gcDays, gcDayMicroseconds, acrFilter, acrVisitor);
}
