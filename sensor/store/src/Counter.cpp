#include "sensor/store/src/Counter.h"

ZTSCounter ZTSCounter::read(ZTCDatabase& arDatabase) {
    ZTCStatement lRow(arDatabase,
                      "SELECT storeId, nextSeq, nextEpisode, lastFrame, recordsPerEnd, retrievals, bytes, records, "
                      "occurrences, lastRetrieval, tornFrames, gaps FROM counter WHERE id = 1");
    if (!lRow.query().step()) {
        throw ZTCStoreDamagedEx(arDatabase.getPath() + ": its counters are missing");
    }
    ZTSCounter lCounter;
    lCounter.mStoreId = lRow.text(0);
    lCounter.mNextSeq = lRow.number<std::uint64_t>(1);
    lCounter.mNextEpisode = lRow.number<std::uint64_t>(2);
    lCounter.mLastFrame = lRow.number<std::uint64_t>(3);
    lCounter.mRecordsPerEnd = lRow.number<std::uint64_t>(4);
    lCounter.mRetrievals = lRow.number<std::uint64_t>(5);
    lCounter.mBytes = lRow.number<std::uint64_t>(6);
    lCounter.mRecords = lRow.number<std::uint64_t>(7);
    lCounter.mOccurrences = lRow.number<std::uint64_t>(8);
    if (!lRow.isNull(9)) {
        lCounter.mLastRetrieval = lRow.number(9);
    }
    lCounter.mTornFrames = lRow.number<std::uint64_t>(10);
    lCounter.mGaps = lRow.number<std::uint64_t>(11);
    return lCounter;
}

void ZTSCounter::write(ZTCDatabase& arDatabase) const {
    ZTCStatement(arDatabase,
                 "UPDATE counter SET nextSeq = ?, nextEpisode = ?, lastFrame = ?, recordsPerEnd = ?, retrievals = ?, "
                 "bytes = ?, records = ?, occurrences = ?, lastRetrieval = ?, tornFrames = ?, gaps = ? WHERE id = 1")
        .run(mNextSeq, mNextEpisode, mLastFrame, mRecordsPerEnd, mRetrievals, mBytes, mRecords, mOccurrences,
             mLastRetrieval, mTornFrames, mGaps);
}
