#include "sensor/store/src/StoreImplementation.h"

#include <algorithm>

#include "sensor/store/src/DamageCheck.h"
#include "sensor/store/src/FrameTaker.h"
#include "sensor/store/src/Schema.h"
#include "sensor/store/src/StoreFile.h"

/// Frames whose numbers are remembered. Older ones have long been deleted from the spool.
static constexpr std::uint64_t scRememberedFrames = 65536;

/// The journal is moved to the database when it has reached this size, and is cut to it when it is empty again.
static constexpr std::uint64_t scJournalBytes = 4ULL * 1024 * 1024;

static ZTCDatabase sOpenDatabase(const std::string& acrPath) {
    createHistoryFile(acrPath);
    refuseForeignFile(acrPath);
    ZTCDatabase lDatabase(acrPath, ZTDA_ReadWrite);
    if (sqlite3_db_readonly(lDatabase.handle(), "main") != 0) {
        throw ZTCStoreNoRoomEx(acrPath + ": it can be read but not written: a read-only file system, or no rights");
    }
    refuseNewerSchema(lDatabase, getSchemaSteps());
    checkForDamage(lDatabase);
    // auto_vacuum has an effect only before the first page is written, which the change to WAL does.
    lDatabase.execute("PRAGMA auto_vacuum = INCREMENTAL");
    lDatabase.execute("PRAGMA journal_mode = WAL");
    lDatabase.execute("PRAGMA synchronous = FULL");
    lDatabase.execute("PRAGMA wal_autocheckpoint = 0");
    lDatabase.execute("PRAGMA cache_size = -4096");
    lDatabase.execute("PRAGMA temp_store = MEMORY");
    lDatabase.execute(("PRAGMA journal_size_limit = " + std::to_string(scJournalBytes)).c_str());
    int lPersist = 1;
    sqlite3_file_control(lDatabase.handle(), "main", SQLITE_FCNTL_PERSIST_WAL, &lPersist);
    migrateSchema(lDatabase, getSchemaSteps());
    return lDatabase;
}

ZTSOpenStore::ZTSOpenStore(const std::string& acrPath) : mDatabase(sOpenDatabase(acrPath)) {
    load();
}

void ZTSOpenStore::load() {
    mCounter = mStoredCounter = ZTSCounter::read(mDatabase);
    mNames.load();
    mEpisodes.load();
    mCounts.clear();
    mLedger.clear();
    mCoverage.load();
    mTopology.clear();
    mPortCounters.clear();
}

void ZTSOpenStore::flush() {
    mEpisodes.flush();
    mCounts.flush();
    mLedger.flush();
    if (mCounter != mStoredCounter) {
        mCounter.write(mDatabase);
        mStoredCounter = mCounter;
    }
}

ZTCStore::ZTCImplementation::ZTCImplementation(const std::string& acrStateDirectory, const ZTSStoreLimits& acrLimits,
                                               Report aReport)
    : mPath(getHistoryPath(acrStateDirectory)), mLimits(acrLimits), mReport(std::move(aReport)) {
    open();
}

/// Moves the journal into the database, which is then whole in one file: a copy of it, or damage to it, is seen as
/// such.
ZTCStore::ZTCImplementation::~ZTCImplementation() {
    if (mpOpen != nullptr && !mIsInTransaction && !mIsDamaged) {
        sqlite3_busy_timeout(mpOpen->mDatabase.handle(), 0);  // a reader that is at it now must not hold up the end
        sqlite3_wal_checkpoint_v2(mpOpen->mDatabase.handle(), nullptr, SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr);
    }
}

void ZTCStore::ZTCImplementation::open() {
    try {
        mpOpen.reset();
        mpOpen = std::make_unique<ZTSOpenStore>(mPath);
    } catch (const ZTCStoreDamagedEx& lrProblem) {
        const std::string lPlace = setDamagedFileAside(mPath);
        if (mReport) {
            mReport("history: the database is damaged: " + std::string(lrProblem.what()) + "; it is now " + lPlace +
                    ", and a new one is begun");
        }
        mpOpen = std::make_unique<ZTSOpenStore>(mPath);
    }
    mIsInTransaction = mNeedsLoad = mIsDamaged = false;
    mStoreId = mpOpen->mCounter.mStoreId;
    mpOpen->mEpisodes.setLimits(mLimits.mEpisodeGap.count(), mLimits.mRecordsPerEnd);
}

void ZTCStore::ZTCImplementation::reopen() {
    mpOpen.reset();
    mIsInTransaction = false;
    if (std::exchange(mIsDamaged, false)) {
        const std::string lPlace = setDamagedFileAside(mPath);
        if (mReport) {
            mReport("history: the damaged database is now " + lPlace + ", and a new one is begun");
        }
    }
    open();
}

void ZTCStore::ZTCImplementation::loadAgain() {
    if (mpOpen == nullptr) {
        open();  // an earlier attempt to open it failed
    }
    if (mNeedsLoad) {
        mpOpen->load();
        mNeedsLoad = false;
    }
}

void ZTCStore::ZTCImplementation::begin() {
    keepUp("begin", [&] {
        mpOpen->mDatabase.execute("BEGIN IMMEDIATE");
        mIsInTransaction = true;
        ++mSerial;
        mpOpen->mCounter.mRecordsPerEnd = mLimits.mRecordsPerEnd;
    });
}

void ZTCStore::ZTCImplementation::commit() {
    change("commit", [&] {
        mpOpen->flush();
        mpOpen->mDatabase.execute("COMMIT");
        mIsInTransaction = false;
    });
}

void ZTCStore::ZTCImplementation::rollBack() noexcept {
    if (mpOpen != nullptr) {
        mpOpen->mDatabase.rollBack();
    }
    mNeedsLoad = mNeedsLoad || mIsInTransaction;
    mIsInTransaction = false;
}

ZTSTakenIn ZTCStore::ZTCImplementation::takeIn(std::uint64_t aNumber, const std::string& acrGeneration,
                                               std::span<const std::uint8_t> aBody, bool aIsTorn, std::int64_t aNow) {
    ZTSOpenStore& lrOpen = *mpOpen;
    const bool lIsThere = lrOpen.mFindFrame.query(aNumber).step();
    lrOpen.mFindFrame.reset();
    if (lIsThere) {
        return {.mProblem = "frame " + std::to_string(aNumber) + " was taken in before"};
    }
    const std::uint64_t lGeneration = lrOpen.mLedger.findOrAddGeneration(acrGeneration);
    ZTCFrameTaker lTaker({lrOpen.mNames, lrOpen.mEpisodes, lrOpen.mCounts, lrOpen.mLedger}, mResolver, lGeneration,
                         aNow);
    std::size_t lUnreadBytes = 0;
    const std::optional<ZTCDecodeEx> lProblem = visitResponse(aBody, lTaker, lUnreadBytes);
    lTaker.finish();
    ZTSTakenIn lTaken = lTaker.getTakenIn();
    const std::string lFrame = "frame " + std::to_string(aNumber) + ": ";
    if (lProblem) {
        lTaken.mProblem = lFrame + lProblem->what();
    } else if (lTaker.getOutcome() != ZTRO_ScopeData) {
        lTaken.mProblem = lFrame + "the response holds no scope data";
    } else if (lUnreadBytes != 0) {
        lTaken.mProblem = lFrame + std::to_string(lUnreadBytes) + " bytes follow the last record";
    }
    lrOpen.mInsertFrame.run(aNumber, lGeneration, aNow, aBody.size(), lTaken.mRecords, lTaken.mOccurrences,
                            aIsTorn ? 1 : 0);
    if (aNumber > scRememberedFrames) {
        lrOpen.mDeleteFrames.run(aNumber - scRememberedFrames);
    }
    ZTSCounter& lrCounter = lrOpen.mCounter;
    lrCounter.mLastFrame = std::max(lrCounter.mLastFrame, aNumber);
    ++lrCounter.mRetrievals;
    lrCounter.mBytes += aBody.size();
    lrCounter.mRecords += lTaken.mRecords;
    lrCounter.mOccurrences += lTaken.mOccurrences;
    lrCounter.mLastRetrieval = aNow;
    lrCounter.mTornFrames += aIsTorn ? 1 : 0;
    return lTaken;
}

bool ZTCStore::ZTCImplementation::retireStep(std::int64_t aNow, std::chrono::steady_clock::time_point aSteadyNow) {
    begin();
    const bool lHasMore = change("retention", [&] { return mpOpen->mRetention.step(mLimits, aNow, aSteadyNow); });
    commit();
    const bool lHasPages = keepUp("vacuum", [&] { return mpOpen->mRetention.vacuumStep(); });
    return lHasMore || lHasPages;
}

void ZTCStore::ZTCImplementation::checkpoint() {
    if (getFileBytes(mPath + "-wal") < scJournalBytes) {
        return;
    }
    keepUp("checkpoint", [&] {
        const int lResult =
            sqlite3_wal_checkpoint_v2(mpOpen->mDatabase.handle(), nullptr, SQLITE_CHECKPOINT_PASSIVE, nullptr, nullptr);
        if (lResult != SQLITE_OK && (lResult & 0xFF) != SQLITE_BUSY && (lResult & 0xFF) != SQLITE_LOCKED) {
            ZTCDatabase::fail(mpOpen->mDatabase.handle(), lResult, mPath, "the journal cannot be moved");
        }
    });
}

bool ZTCStore::ZTCImplementation::hasFrame(std::uint64_t aNumber) {
    return look("hasFrame", [&] {
        if (aNumber + scRememberedFrames <= mpOpen->mCounter.mLastFrame) {
            return true;
        }
        const bool lIsThere = mpOpen->mFindFrame.query(aNumber).step();
        mpOpen->mFindFrame.reset();
        return lIsThere;
    });
}
