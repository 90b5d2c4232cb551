#include "sensor/store/src/EpisodeBook.h"

#include <algorithm>

/// A growing episode is reported as changed at most once in this time.
static constexpr std::int64_t scUpdateMicroseconds = 60'000'000;

std::size_t ZTCEpisodeBook::Hash::operator()(const ZTSEpisodeKey& acrKey) const {
    std::uint64_t lHash = acrKey.mIdentity * 0x9E3779B97F4A7C15U;
    lHash ^= (static_cast<std::uint64_t>(acrKey.mInitiator) << 32 | acrKey.mPort) * 0xC2B2AE3D27D4EB4FU;
    lHash ^= (static_cast<std::uint64_t>(acrKey.mKind) << 1 | (acrKey.mIsMalformed ? 1U : 0U)) * 0x165667B19E3779F9U;
    return static_cast<std::size_t>(lHash ^ lHash >> 29);
}

ZTCEpisodeBook::ZTCEpisodeBook(ZTCDatabase& arDatabase, ZTSCounter& arCounter)
    : mrDatabase(arDatabase),
      mrCounter(arCounter),
      mInsert(arDatabase,
              "INSERT INTO episode(id, initiator, kind, port, phase, openSeq, updateSeq, closeSeq, changeTime, count, "
              "records, first, last, flags, identity, detail) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      mUpdate(arDatabase,
              "UPDATE episode SET phase = ?2, updateSeq = ?3, closeSeq = ?4, changeTime = ?5, count = ?6, "
              "records = ?7, first = ?8, last = ?9, flags = ?10, detail = ?11 WHERE id = ?1"),
      mGrow(arDatabase,
            "UPDATE episode SET count = ?2, records = ?3, first = ?4, last = ?5, flags = ?6, detail = ?7, "
            "changeTime = ?8 WHERE id = ?1"),
      mInsertChange(arDatabase, "INSERT INTO change(seq, episode) VALUES (?, ?)"),
      mDeleteChange(arDatabase, "DELETE FROM change WHERE seq = ?"),
      mInsertRecords(arDatabase, "INSERT INTO record(episode, ordinal, count, data) VALUES (?, ?, ?, ?)"),
      mDeleteRecords(arDatabase, "DELETE FROM record WHERE episode = ? AND ordinal = ?") {}

void ZTCEpisodeBook::load() {
    mOpen.clear();
    mClosed.clear();
    mDirty.clear();
    ZTCStatement lRows(mrDatabase,
                       "SELECT id, initiator, kind, port, openSeq, updateSeq, changeTime, count, records, first, last, "
                       "flags, identity, detail FROM episode WHERE phase < 2");
    ZTCStatement lChunks(mrDatabase, "SELECT ordinal, count FROM record WHERE episode = ? ORDER BY ordinal");
    lRows.query();
    while (lRows.step()) {
        auto lpEpisode = std::make_unique<Open>();
        lpEpisode->mId = lRows.number<std::uint64_t>(0);
        lpEpisode->mOpenSeq = lRows.number<std::uint64_t>(4);
        lpEpisode->mUpdateSeq = lpEpisode->mStoredUpdateSeq = lRows.number<std::uint64_t>(5);
        lpEpisode->mChangeTime = lRows.number(6);
        lpEpisode->mCount = lRows.number<std::uint64_t>(7);
        lpEpisode->mRecords = lRows.number<std::uint64_t>(8);
        lpEpisode->mFirst = lRows.number(9);
        lpEpisode->mLast = lRows.number(10);
        lpEpisode->mFlags = lRows.number<std::uint32_t>(11);
        lpEpisode->mKey = {.mInitiator = lRows.number<std::uint32_t>(1),
                           .mPort = lRows.number<std::uint32_t>(3),
                           .mKind = lRows.number<ZTCKindKey>(2),
                           .mIsMalformed = (lpEpisode->mFlags & gcEpisodeMalformed) != 0,
                           .mIdentity = lRows.number<std::uint64_t>(12)};
        lpEpisode->mIsStored = true;
        lpEpisode->mBody = ZTCEpisodeBody::decode(lRows.blob(13));
        lChunks.query(lpEpisode->mId);
        while (lChunks.step()) {
            lpEpisode->mWindow.noteStored(lChunks.number<std::uint64_t>(0), lChunks.number<std::uint64_t>(1));
        }
        mOpen[lpEpisode->mKey] = std::move(lpEpisode);
    }
}

void ZTCEpisodeBook::setLimits(std::int64_t aGapMicroseconds, std::uint32_t aRecordsPerEnd) {
    mGap = aGapMicroseconds;
    mRecordsPerEnd = aRecordsPerEnd;
}

void ZTCEpisodeBook::markDirty(Open& arEpisode) {
    if (!arEpisode.mIsDirty) {
        mDirty.push_back(&arEpisode);
        arEpisode.mIsDirty = true;
    }
}

ZTCEpisodeBook::Open& ZTCEpisodeBook::open(const ZTSEpisodeKey& acrKey, std::int64_t aBegin, std::int64_t aEnd,
                                           std::int64_t aNow) {
    std::unique_ptr<Open>& lrpEpisode = mOpen[acrKey];
    lrpEpisode = std::make_unique<Open>();
    lrpEpisode->mKey = acrKey;
    lrpEpisode->mId = mrCounter.mNextEpisode++;
    lrpEpisode->mOpenSeq = mrCounter.mNextSeq++;
    lrpEpisode->mChangeTime = aNow;
    lrpEpisode->mFirst = aBegin;
    lrpEpisode->mLast = aEnd;
    lrpEpisode->mFlags = acrKey.mIsMalformed ? gcEpisodeMalformed : 0;
    return *lrpEpisode;
}

/// Takes it out of the open ones; it is written at the end of the transaction. Returns the next place.
ZTCEpisodeBook::Map::iterator ZTCEpisodeBook::closeAt(Map::iterator aPlace) {
    aPlace->second->mCloseSeq = mrCounter.mNextSeq++;
    markDirty(*aPlace->second);
    mClosed.push_back(std::move(aPlace->second));
    return mOpen.erase(aPlace);
}

void ZTCEpisodeBook::noteGrowth(Open& arEpisode, std::int64_t aNow) {
    if (aNow < arEpisode.mChangeTime) {
        arEpisode.mChangeTime = aNow;  // the clock was set back
    } else if (aNow - arEpisode.mChangeTime >= scUpdateMicroseconds) {
        arEpisode.mUpdateSeq = mrCounter.mNextSeq++;
        arEpisode.mChangeTime = aNow;
    }
}

ZTSCountPlace& ZTCEpisodeBook::add(const ZTSEpisodeKey& acrKey, const ZTSKindShape* apShape,
                                   const ZTSRecordView& acrRecord, std::int64_t aBegin, std::int64_t aEnd,
                                   std::int64_t aNow) {
    auto lPlace = mOpen.find(acrKey);
    if (lPlace != mOpen.end() && aBegin - lPlace->second->mLast > mGap) {
        closeAt(lPlace);
        lPlace = mOpen.end();
    }
    Open* lpEpisode;
    if (lPlace == mOpen.end()) {
        lpEpisode = &open(acrKey, aBegin, aEnd, aNow);
    } else {
        lpEpisode = lPlace->second.get();
        lpEpisode->mFirst = std::min(lpEpisode->mFirst, aBegin);
        lpEpisode->mLast = std::max(lpEpisode->mLast, aEnd);
        noteGrowth(*lpEpisode, aNow);
    }
    markDirty(*lpEpisode);
    lpEpisode->mAheadSince = 0;
    lpEpisode->mCount += acrRecord.mOccurrences;
    if (aEnd < aBegin) {
        lpEpisode->mFlags |= gcEpisodeClock;
    }
    if (apShape != nullptr) {
        lpEpisode->mBody.add(*apShape, acrRecord.mEventData);
    }
    lpEpisode->mWindow.add(lpEpisode->mRecords++, mrCounter.mNextSeq++, acrRecord.mBytes, mRecordsPerEnd);
    return lpEpisode->mCountPlace;
}

std::size_t ZTCEpisodeBook::close(std::int64_t aNow, const NothingHeld& acrNothingHeld) {
    std::size_t lCount = 0;
    for (auto lPlace = mOpen.begin(); lPlace != mOpen.end();) {
        Open& lrEpisode = *lPlace->second;
        const bool lIsAhead = lrEpisode.mLast - aNow > mGap;
        if (!lIsAhead) {
            lrEpisode.mAheadSince = 0;
        } else if (lrEpisode.mAheadSince == 0 || aNow < lrEpisode.mAheadSince) {
            lrEpisode.mAheadSince = aNow;
        }
        const std::int64_t lQuietSince = lIsAhead ? lrEpisode.mAheadSince : lrEpisode.mLast;
        if (aNow - lQuietSince > mGap && acrNothingHeld(lrEpisode.mKey.mInitiator, lrEpisode.mKey.mKind)) {
            lPlace = closeAt(lPlace);
            ++lCount;
        } else {
            ++lPlace;
        }
    }
    return lCount;
}

void ZTCEpisodeBook::flush() {
    for (Open* const lpEpisode : mDirty) {
        write(*lpEpisode);
        writeRecords(*lpEpisode);
        lpEpisode->mIsDirty = false;
    }
    mDirty.clear();
    mClosed.clear();
}

void ZTCEpisodeBook::write(Open& arEpisode) {
    mDetail.clear();
    arEpisode.mBody.encode(mDetail);
    const int lPhase = arEpisode.mCloseSeq != 0 ? ZTP_Closed : arEpisode.mUpdateSeq != 0 ? ZTP_Update : ZTP_Open;
    const std::span<const std::uint8_t> lDetail(mDetail);
    const bool lHasSamePhase = arEpisode.mCloseSeq == 0 && arEpisode.mUpdateSeq == arEpisode.mStoredUpdateSeq;
    if (arEpisode.mIsStored && lHasSamePhase) {
        // The phase is in an index, whose entry SQLite would write anew for the same value.
        mGrow.run(arEpisode.mId, arEpisode.mCount, arEpisode.mRecords, arEpisode.mFirst, arEpisode.mLast,
                  arEpisode.mFlags, lDetail, arEpisode.mChangeTime);
    } else if (arEpisode.mIsStored) {
        mUpdate.run(arEpisode.mId, lPhase, arEpisode.mUpdateSeq, arEpisode.mCloseSeq, arEpisode.mChangeTime,
                    arEpisode.mCount, arEpisode.mRecords, arEpisode.mFirst, arEpisode.mLast, arEpisode.mFlags, lDetail);
    } else {
        mInsert.run(arEpisode.mId, arEpisode.mKey.mInitiator, arEpisode.mKey.mKind, arEpisode.mKey.mPort, lPhase,
                    arEpisode.mOpenSeq, arEpisode.mUpdateSeq, arEpisode.mCloseSeq, arEpisode.mChangeTime,
                    arEpisode.mCount, arEpisode.mRecords, arEpisode.mFirst, arEpisode.mLast, arEpisode.mFlags,
                    arEpisode.mKey.mIdentity, lDetail);
        mInsertChange.run(arEpisode.mOpenSeq, arEpisode.mId);
        arEpisode.mIsStored = true;
    }
    if (arEpisode.mUpdateSeq != arEpisode.mStoredUpdateSeq) {
        if (arEpisode.mStoredUpdateSeq != 0) {
            mDeleteChange.run(arEpisode.mStoredUpdateSeq);
        }
        mInsertChange.run(arEpisode.mUpdateSeq, arEpisode.mId);
        arEpisode.mStoredUpdateSeq = arEpisode.mUpdateSeq;
    }
    if (arEpisode.mCloseSeq != 0) {
        mInsertChange.run(arEpisode.mCloseSeq, arEpisode.mId);
    }
}

void ZTCEpisodeBook::writeRecords(Open& arEpisode) {
    arEpisode.mWindow.flush(
        arEpisode.mRecords, mRecordsPerEnd,
        [&](std::uint64_t aOrdinal, std::size_t aCount, const ZTCStoreBytes& acrChunk) {
            mInsertRecords.run(arEpisode.mId, aOrdinal, aCount, std::span<const std::uint8_t>(acrChunk));
        },
        [&](std::uint64_t aOrdinal) { mDeleteRecords.run(arEpisode.mId, aOrdinal); });
}
