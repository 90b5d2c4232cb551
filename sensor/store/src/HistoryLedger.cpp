#include "sensor/store/src/HistoryImplementation.h"

#include <algorithm>
#include <limits>
#include <map>

#include "sensor/store/src/Counter.h"

static std::int64_t sFrom(const std::optional<ZTCHistoryTime>& acrTime) {
    return acrTime ? toMicroseconds(*acrTime) : std::numeric_limits<std::int64_t>::min();
}

std::vector<ZTSLedgerRow> ZTCHistory::readLedger() const {
    mpImplementation->loadNames();
    std::map<std::pair<std::uint32_t, ZTCKindKey>, ZTSLedgerRow> lRows;
    const auto lFind = [&](const ZTCStatement& acrRow) -> ZTSLedgerRow& {
        const auto lInitiator = acrRow.number<std::uint32_t>(0);
        const auto lKind = acrRow.number<ZTCKindKey>(1);
        ZTSLedgerRow& lrRow = lRows[{lInitiator, lKind}];
        lrRow.mInitiator = mpImplementation->getInitiator(lInitiator);
        lrRow.mKind = lKind;
        return lrRow;
    };
    // Both tables have one row for each initiator, kind and agent or remote port, however long the history is. One
    // transaction reads both, so that the sums belong together.
    mpImplementation->mDatabase.readAsOne([&] {
        ZTCStatement lCounts(
            mpImplementation->mDatabase,
            "SELECT initiator, kind, received, collectionOff, totalLimit, unknownBoard, noList, "
            "tooShort, unknownKind, failed, consolidated, handedOver, held, dropped, lost FROM ledger");
        lCounts.query();
        while (lCounts.step()) {
            ZTSLedgerRow& lrRow = lFind(lCounts);
            lrRow.mReceived += lCounts.number<std::uint64_t>(2);
            for (int i = 0; i < ZTRF_Count; ++i) {
                lrRow.mRefused[static_cast<std::size_t>(i)] += lCounts.number<std::uint64_t>(3 + i);
            }
            lrRow.mConsolidated += lCounts.number<std::uint64_t>(10);
            lrRow.mHandedOver += lCounts.number<std::uint64_t>(11);
            lrRow.mHeld += lCounts.number<std::uint64_t>(12);
            lrRow.mDropped += lCounts.number<std::uint64_t>(13);
            lrRow.mLost += lCounts.number<std::uint64_t>(14);
        }
        ZTCStatement lTotals(mpImplementation->mDatabase,
                             "SELECT initiator, kind, taken - retired, retired FROM total");
        lTotals.query();
        while (lTotals.step()) {
            ZTSLedgerRow& lrRow = lFind(lTotals);
            lrRow.mStored += lTotals.number<std::uint64_t>(2);
            lrRow.mRetired += lTotals.number<std::uint64_t>(3);
        }
    });
    std::vector<ZTSLedgerRow> lLedger;
    for (auto& [lrKey, lrRow] : lRows) {
        lLedger.push_back(std::move(lrRow));
    }
    return lLedger;
}

std::vector<ZTSTotal> ZTCHistory::readTotals() const {
    mpImplementation->loadNames();
    std::vector<ZTSTotal> lTotals;
    ZTCStatement lRows(mpImplementation->mDatabase, "SELECT initiator, kind, port, taken, retired, last FROM total");
    lRows.query();
    while (lRows.step()) {
        lTotals.push_back({.mInitiator = mpImplementation->getInitiator(lRows.number<std::uint32_t>(0)),
                           .mKind = lRows.number<ZTCKindKey>(1),
                           .mRemotePort = mpImplementation->getPort(lRows.number<std::uint32_t>(2)),
                           .mOccurrences = lRows.number<std::uint64_t>(3),
                           .mRetired = lRows.number<std::uint64_t>(4),
                           .mLastEvent = fromMicroseconds(lRows.number(5))});
    }
    return lTotals;
}

std::vector<ZTSGap> ZTCHistory::readGaps(std::optional<ZTCHistoryTime> aSince) const {
    mpImplementation->loadNames();
    std::vector<ZTSGap> lGaps;
    ZTCStatement lRows(mpImplementation->mDatabase, HistoryQueries::gcGaps);
    lRows.query(sFrom(aSince));
    while (lRows.step()) {
        lGaps.push_back({.mSeq = lRows.number<std::uint64_t>(0),
                         .mFrom = fromMicroseconds(lRows.number(1)),
                         .mTo = fromMicroseconds(lRows.number(2)),
                         .mReason = lRows.text(3),
                         .mGeneration = lRows.text(4),
                         .mIsCountKnown = lRows.number(5) != 0,
                         .mCounts = {}});
    }
    ZTCStatement lCounts(mpImplementation->mDatabase, HistoryQueries::gcGapCounts);
    for (ZTSGap& lrGap : lGaps) {
        lCounts.query(lrGap.mSeq);
        while (lCounts.step()) {
            lrGap.mCounts.push_back({.mInitiator = mpImplementation->getInitiator(lCounts.number<std::uint32_t>(0)),
                                     .mKind = lCounts.number<ZTCKindKey>(1),
                                     .mHeld = lCounts.number<std::uint64_t>(2),
                                     .mHandedOver = lCounts.number<std::uint64_t>(3)});
        }
    }
    return lGaps;
}

std::vector<ZTSRun> ZTCHistory::readRuns(std::optional<ZTCHistoryTime> aSince) const {
    std::vector<ZTSRun> lRuns;
    ZTCStatement lRows(mpImplementation->mDatabase, HistoryQueries::gcRuns);
    lRows.query(sFrom(aSince));
    while (lRows.step()) {
        lRuns.push_back({.mFrom = fromMicroseconds(lRows.number(0)),
                         .mTo = fromMicroseconds(lRows.number(1)),
                         .mIsOpen = lRows.number(2) == 0});
    }
    return lRuns;
}

std::vector<ZTSCoverage> ZTCHistory::readCoverage(std::optional<ZTCHistoryTime> aSince,
                                                  std::optional<ZTCHistoryTime> aUntil) const {
    mpImplementation->loadNames();
    std::vector<ZTSCoverage> lIntervals;
    const std::int64_t lUntil = aUntil ? toMicroseconds(*aUntil) : std::numeric_limits<std::int64_t>::max();
    const std::int64_t lLastSeen =
        mpImplementation->mDatabase.readNumber("SELECT timeTo FROM run ORDER BY id DESC LIMIT 1");
    const auto lRead = [&](ZTCStatement& arRows) {
        while (arRows.step()) {
            const bool lIsOpen = arRows.isNull(4);
            const std::int64_t lFrom = arRows.number(3);
            const std::int64_t lTo = lIsOpen ? std::max(lFrom, lLastSeen) : arRows.number(4);
            if (lFrom <= lUntil && lTo >= sFrom(aSince)) {
                lIntervals.push_back({.mInitiator = mpImplementation->getInitiator(arRows.number<std::uint32_t>(0)),
                                      .mKind = arRows.number<ZTCKindKey>(1),
                                      .mState = static_cast<ZTEKindState>(arRows.number(2)),
                                      .mFrom = fromMicroseconds(lFrom),
                                      .mTo = fromMicroseconds(lTo),
                                      .mIsOpen = lIsOpen});
            }
        }
    };
    ZTCStatement lEnded(mpImplementation->mDatabase, HistoryQueries::gcEndedCoverage);
    lRead(lEnded.query(sFrom(aSince)));
    ZTCStatement lOpen(mpImplementation->mDatabase, HistoryQueries::gcOpenCoverage);
    lRead(lOpen.query());
    std::ranges::stable_sort(lIntervals, {}, &ZTSCoverage::mFrom);
    return lIntervals;
}

std::vector<ZTSMark> ZTCHistory::readMarks() const {
    std::vector<ZTSMark> lMarks;
    ZTCStatement lRows(mpImplementation->mDatabase, "SELECT name, time FROM mark");
    lRows.query();
    while (lRows.step()) {
        lMarks.push_back({.mName = lRows.text(0), .mTime = fromMicroseconds(lRows.number(1))});
    }
    std::ranges::stable_sort(lMarks, {}, &ZTSMark::mTime);
    return lMarks;
}

ZTSRetrievalTotals ZTCHistory::readRetrievalTotals() const {
    const ZTSCounter lCounter = ZTSCounter::read(mpImplementation->mDatabase);
    return {.mRetrievals = lCounter.mRetrievals,
            .mBytes = lCounter.mBytes,
            .mRecords = lCounter.mRecords,
            .mOccurrences = lCounter.mOccurrences,
            .mLast = lCounter.mLastRetrieval ? std::optional(fromMicroseconds(*lCounter.mLastRetrieval)) : std::nullopt,
            .mTornFrames = lCounter.mTornFrames,
            .mGaps = lCounter.mGaps};
}

std::string ZTCHistory::getValue(const std::string& acrName) const {
    ZTCStatement lRow(mpImplementation->mDatabase, "SELECT value FROM value WHERE name = ?");
    return lRow.query(acrName).step() ? lRow.text(0) : std::string();
}

std::vector<ZTSInitiator> ZTCHistory::readInitiators() const {
    mpImplementation->loadNames();
    std::vector<ZTSInitiator> lInitiators;
    for (const auto& [lId, lrInitiator] : mpImplementation->mNames.getInitiators()) {
        lInitiators.push_back(lrInitiator);
    }
    return lInitiators;
}

std::vector<ZTSRemotePort> ZTCHistory::readRemotePorts() const {
    mpImplementation->loadNames();
    std::vector<ZTSRemotePort> lPorts;
    for (const auto& [lId, lrPort] : mpImplementation->mNames.getPorts()) {
        lPorts.push_back(lrPort);
    }
    return lPorts;
}
