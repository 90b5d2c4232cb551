#include "sensor/store/src/CountBook.h"

#include <algorithm>

static constexpr const char* scAddMinute =
    "INSERT INTO minute(slot, initiator, kind, port, count, spread, last) VALUES (?, ?, ?, ?, ?, ?, ?) "
    "ON CONFLICT DO UPDATE SET count = count + excluded.count, spread = spread + excluded.spread, "
    "last = max(last, excluded.last)";
static constexpr const char* scAddDay =
    "INSERT INTO day(slot, initiator, kind, port, count, spread, last) VALUES (?, ?, ?, ?, ?, ?, ?) "
    "ON CONFLICT DO UPDATE SET count = count + excluded.count, spread = spread + excluded.spread, "
    "last = max(last, excluded.last)";
static constexpr const char* scAddTotal =
    "INSERT INTO total(initiator, kind, port, taken, retired, last) VALUES (?, ?, ?, ?, 0, ?) "
    "ON CONFLICT DO UPDATE SET taken = taken + excluded.taken, last = max(last, excluded.last)";

std::size_t ZTCCountBook::Hash::operator()(const SlotKey& acrKey) const {
    std::uint64_t lHash = static_cast<std::uint64_t>(acrKey.mSlot) * 0x9E3779B97F4A7C15U;
    lHash ^= (static_cast<std::uint64_t>(acrKey.mKey.mInitiator) << 32 | acrKey.mKey.mPort) * 0xC2B2AE3D27D4EB4FU;
    lHash ^= acrKey.mKey.mKind * 0x165667B19E3779F9U;
    return static_cast<std::size_t>(lHash ^ lHash >> 29);
}

ZTCCountBook::ZTCCountBook(ZTCDatabase& arDatabase)
    : mAddMinute(arDatabase, scAddMinute), mAddDay(arDatabase, scAddDay), mAddTotal(arDatabase, scAddTotal) {}

void ZTCCountBook::clear() {
    mMinutes.clear();
    ++mSerial;
}

void ZTCCountBook::add(const ZTSCountKey& acrKey, ZTSCountPlace& arPlace, std::int64_t aBegin, std::int64_t aEnd,
                       std::uint64_t aOccurrences) {
    const std::int64_t lMinute = getSlot(aEnd, gcMinuteMicroseconds);
    if (arPlace.mSerial != mSerial || arPlace.mMinute != lMinute) {
        const auto [lPlace, lIsNew] = mMinutes.try_emplace({.mSlot = lMinute, .mKey = acrKey});
        arPlace = {.mpCount = &lPlace->second, .mMinute = lMinute, .mSerial = mSerial};
        if (lIsNew) {
            lPlace->second.mLast = aEnd;
        }
    }
    Count& lrCount = *arPlace.mpCount;
    lrCount.mCount += aOccurrences;
    lrCount.mLast = std::max(lrCount.mLast, aEnd);
    if (aBegin != aEnd && getSlot(aBegin, gcMinuteMicroseconds) != lMinute) {
        lrCount.mSpread += aOccurrences;
        if (getSlot(aBegin, gcDayMicroseconds) != getSlot(aEnd, gcDayMicroseconds)) {
            lrCount.mDaySpread += aOccurrences;
        }
    }
}

/// Minutes lie within days, so the days are sums of them. The minutes are sorted.
ZTCCountBook::Sorted ZTCCountBook::makeDays(const Sorted& acrMinutes) {
    Sorted lDays = acrMinutes;
    for (auto& [lrKey, lrCount] : lDays) {
        lrKey.mSlot = getSlot(lrKey.mSlot, gcDayMicroseconds / gcMinuteMicroseconds);
        lrCount.mSpread = lrCount.mDaySpread;
    }
    std::ranges::sort(lDays, {}, [](const auto& acrEntry) { return acrEntry.first; });
    std::size_t lUsed = 0;
    for (const auto& [lrKey, lrCount] : lDays) {
        if (lUsed == 0 || lDays[lUsed - 1].first != lrKey) {
            lDays[lUsed++] = {lrKey, lrCount};
            continue;
        }
        Count& lrDay = lDays[lUsed - 1].second;
        lrDay.mCount += lrCount.mCount;
        lrDay.mSpread += lrCount.mSpread;
        lrDay.mLast = std::max(lrDay.mLast, lrCount.mLast);
    }
    lDays.resize(lUsed);
    return lDays;
}

void ZTCCountBook::write(const Sorted& acrSlots, ZTCStatement& arStatement) {
    for (const auto& [lrKey, lrCount] : acrSlots) {
        arStatement.run(lrKey.mSlot, lrKey.mKey.mInitiator, lrKey.mKey.mKind, lrKey.mKey.mPort, lrCount.mCount,
                        lrCount.mSpread, lrCount.mLast);
    }
}

void ZTCCountBook::flush() {
    Sorted lMinutes(mMinutes.begin(), mMinutes.end());
    std::ranges::sort(lMinutes, {}, [](const auto& acrEntry) { return acrEntry.first; });
    const Sorted lDays = makeDays(lMinutes);
    write(lMinutes, mAddMinute);
    write(lDays, mAddDay);
    // Every record is in exactly one day, so the days hold what the totals grow by.
    for (const auto& [lrKey, lrCount] : lDays) {
        mAddTotal.run(lrKey.mKey.mInitiator, lrKey.mKey.mKind, lrKey.mKey.mPort, lrCount.mCount, lrCount.mLast);
    }
    clear();
}
