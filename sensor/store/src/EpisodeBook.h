/// The open episodes: records are added in memory, and what changed is written at the end of the transaction.
#ifndef SENSOR_STORE_SRC_EPISODEBOOK_H
#define SENSOR_STORE_SRC_EPISODEBOOK_H

#include <cstdint>
#include <functional>
#include <memory>
#include <unordered_map>
#include <vector>

#include "sensor/client/include/RecordView.h"
#include "sensor/store/src/CountBook.h"
#include "sensor/store/src/Counter.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/EpisodeBody.h"
#include "sensor/store/src/RecordWindow.h"

/// Flags of an episode in the database.
inline constexpr std::uint32_t gcEpisodeClock = 1;      ///< a record's last time lies before its first
inline constexpr std::uint32_t gcEpisodeMalformed = 2;  ///< the data do not fit the kind's layout

/// What makes events alike.
struct ZTSEpisodeKey {
    std::uint32_t mInitiator = 0;
    std::uint32_t mPort = 0;
    ZTCKindKey mKind = 0;
    bool mIsMalformed = false;
    std::uint64_t mIdentity = 0;

    bool operator==(const ZTSEpisodeKey&) const = default;
};

class ZTCEpisodeBook {
public:
    /// Whether nothing is held for an initiator (its number in the name table) and kind.
    using NothingHeld = std::function<bool(std::uint32_t aInitiator, ZTCKindKey aKind)>;

    ZTCEpisodeBook(ZTCDatabase& arDatabase, ZTSCounter& arCounter);

    /// Forgets everything and reads the open episodes.
    void load();

    void setLimits(std::int64_t aGapMicroseconds, std::uint32_t aRecordsPerEnd);

    /// Adds a record to the open episode of its key, or opens one. `apShape` is null for data that do not fit. Times
    /// are in microseconds since the epoch. Returns the place of the key's counts, good until the next call.
    ZTSCountPlace& add(const ZTSEpisodeKey& acrKey, const ZTSKindShape* apShape, const ZTSRecordView& acrRecord,
                       std::int64_t aBegin, std::int64_t aEnd, std::int64_t aNow);

    /// Returns how many were closed. After the clock was set back, an episode's last event may lie far ahead of it.
    /// Such an episode is closed when the gap has passed since that was first seen.
    std::size_t close(std::int64_t aNow, const NothingHeld& acrNothingHeld);

    void flush();

    std::size_t size() const { return mOpen.size(); }

private:
    struct Open {
        ZTSEpisodeKey mKey;
        std::uint64_t mId = 0;
        std::uint64_t mOpenSeq = 0;
        std::uint64_t mUpdateSeq = 0;
        std::uint64_t mCloseSeq = 0;
        std::uint64_t mStoredUpdateSeq = 0;
        std::int64_t mChangeTime = 0;
        std::uint64_t mCount = 0;
        std::uint64_t mRecords = 0;
        std::int64_t mFirst = 0;
        std::int64_t mLast = 0;
        std::int64_t mAheadSince = 0;  ///< when the clock was first seen behind the last event; 0: it is not
        std::uint32_t mFlags = 0;
        bool mIsStored = false;
        bool mIsDirty = false;
        ZTSCountPlace mCountPlace;
        ZTCEpisodeBody mBody;
        ZTCRecordWindow mWindow;
    };
    struct Hash {
        std::size_t operator()(const ZTSEpisodeKey& acrKey) const;
    };
    using Map = std::unordered_map<ZTSEpisodeKey, std::unique_ptr<Open>, Hash>;

    Open& open(const ZTSEpisodeKey& acrKey, std::int64_t aBegin, std::int64_t aEnd, std::int64_t aNow);
    Map::iterator closeAt(Map::iterator aPlace);
    void noteGrowth(Open& arEpisode, std::int64_t aNow);
    void markDirty(Open& arEpisode);
    void write(Open& arEpisode);
    void writeRecords(Open& arEpisode);

    ZTCDatabase& mrDatabase;
    ZTSCounter& mrCounter;
    std::int64_t mGap = 60'000'000;
    std::uint32_t mRecordsPerEnd = 100;
    Map mOpen;
    std::vector<std::unique_ptr<Open>> mClosed;  ///< in this transaction
    std::vector<Open*> mDirty;
    ZTCStoreBytes mDetail;
    ZTCStatement mInsert, mUpdate, mGrow, mInsertChange, mDeleteChange, mInsertRecords, mDeleteRecords;
};

#endif
