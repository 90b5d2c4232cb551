#include "sensor/store/src/CountBook.h"

#include <algorithm>
#include <vector>

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
    mDays.clear();
}

void ZTCCountBook::addTo(Slots& arSlots, std::int64_t aLength, const ZTSCountKey& acrKey, std::int64_t aBegin,
                         std::int64_t aEnd, std::uint64_t aOccurrences) {
    const std::int64_t lSlot = getSlot(aEnd, aLength);
    const auto [lPlace, lIsNew] = arSlots.try_emplace({.mSlot = lSlot, .mKey = acrKey});
    Count& lrCount = lPlace->second;
    lrCount.mCount += aOccurrences;
    if (getSlot(aBegin, aLength) != lSlot) {
        lrCount.mSpread += aOccurrences;
    }
    lrCount.mLast = lIsNew ? aEnd : std::max(lrCount.mLast, aEnd);
}

void ZTCCountBook::add(const ZTSCountKey& acrKey, std::int64_t aBegin, std::int64_t aEnd, std::uint64_t aOccurrences) {
    addTo(mMinutes, gcMinuteMicroseconds, acrKey, aBegin, aEnd, aOccurrences);
    addTo(mDays, gcDayMicroseconds, acrKey, aBegin, aEnd, aOccurrences);
}

void ZTCCountBook::flushSlots(Slots& arSlots, ZTCStatement& arStatement) {
    std::vector<std::pair<SlotKey, Count>> lSorted(arSlots.begin(), arSlots.end());
    std::ranges::sort(lSorted, {}, [](const auto& acrEntry) { return acrEntry.first; });
    for (const auto& [lrKey, lrCount] : lSorted) {
        arStatement.run(lrKey.mSlot, lrKey.mKey.mInitiator, lrKey.mKey.mKind, lrKey.mKey.mPort, lrCount.mCount,
                        lrCount.mSpread, lrCount.mLast);
    }
    arSlots.clear();
}

void ZTCCountBook::flush() {
    // Every record is in exactly one day, so the days hold what the totals grow by.
    for (const auto& [lrKey, lrCount] : mDays) {
        mAddTotal.run(lrKey.mKey.mInitiator, lrKey.mKey.mKind, lrKey.mKey.mPort, lrCount.mCount, lrCount.mLast);
    }
    flushSlots(mMinutes, mAddMinute);
    flushSlots(mDays, mAddDay);
}
