/// Counts per minute, per day and in total, of each initiator, kind and remote port: added up in memory, written at the
/// end of the transaction.
#ifndef SENSOR_STORE_SRC_COUNTBOOK_H
#define SENSOR_STORE_SRC_COUNTBOOK_H

#include <cstdint>
#include <unordered_map>
#include <utility>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/src/Database.h"

inline constexpr std::int64_t gcMinuteMicroseconds = 60'000'000;
inline constexpr std::int64_t gcDayMicroseconds = 86'400'000'000;

/// The number of the slot that a time is in; times before the epoch round down.
constexpr std::int64_t getSlot(std::int64_t aTime, std::int64_t aSlotMicroseconds) {
    const std::int64_t lQuotient = aTime / aSlotMicroseconds;
    return aTime % aSlotMicroseconds < 0 ? lQuotient - 1 : lQuotient;
}

/// The initiator, kind and remote port that a count is of.
struct ZTSCountKey {
    std::uint32_t mInitiator = 0;
    std::uint32_t mPort = 0;
    ZTCKindKey mKind = 0;

    auto operator<=>(const ZTSCountKey&) const = default;
};

/// What was counted in one slot.
struct ZTSSlotCount {
    std::uint64_t mCount = 0;
    std::uint64_t mSpread = 0;     ///< of records that began before the slot
    std::uint64_t mDaySpread = 0;  ///< of a minute: of records that began before its day
    std::int64_t mLast = 0;
};

/// Where the last record of a key was counted: the next one of the same minute needs no search.
struct ZTSCountPlace {
    ZTSSlotCount* mpCount = nullptr;
    std::int64_t mMinute = 0;
    std::uint64_t mSerial = 0;  ///< of the book's content
};

class ZTCCountBook {
public:
    explicit ZTCCountBook(ZTCDatabase& arDatabase);

    void clear();
    /// A record within one slot counts there; any other in the slot of its last time, marked as spread.
    /// @param arPlace  kept by the caller, one for each key
    void add(const ZTSCountKey& acrKey, ZTSCountPlace& arPlace, std::int64_t aBegin, std::int64_t aEnd,
             std::uint64_t aOccurrences);
    void flush();

private:
    struct SlotKey {
        std::int64_t mSlot = 0;
        ZTSCountKey mKey;

        auto operator<=>(const SlotKey&) const = default;
    };
    struct Hash {
        std::size_t operator()(const SlotKey& acrKey) const;
    };
    using Count = ZTSSlotCount;
    using Sorted = std::vector<std::pair<SlotKey, Count>>;

    static Sorted makeDays(const Sorted& acrMinutes);
    static void write(const Sorted& acrSlots, ZTCStatement& arStatement);

    std::unordered_map<SlotKey, Count, Hash> mMinutes;
    std::uint64_t mSerial = 1;  ///< places of earlier ones point to nothing
    ZTCStatement mAddMinute, mAddDay, mAddTotal;
};

#endif
