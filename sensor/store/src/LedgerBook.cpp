#include "sensor/store/src/LedgerBook.h"

#include <vector>

/// Ended agents that are remembered, so that a page that is read again counts nothing twice.
static constexpr std::int64_t scRememberedAgents = 1000;

ZTCLedgerBook::ZTCLedgerBook(ZTCDatabase& arDatabase, ZTSCounter& arCounter, ZTCNameTable& arNames)
    : mrDatabase(arDatabase),
      mrCounter(arCounter),
      mrNames(arNames),
      mAddTaken(arDatabase,
                "INSERT INTO ledger(generation, initiator, kind, taken) VALUES (?, ?, ?, ?) "
                "ON CONFLICT DO UPDATE SET taken = taken + excluded.taken"),
      mSetCounts(arDatabase,
                 "INSERT INTO ledger(generation, initiator, kind, received, collectionOff, totalLimit, unknownBoard, "
                 "noList, tooShort, unknownKind, failed, consolidated, handedOver, held, dropped) "
                 "VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?) "
                 "ON CONFLICT DO UPDATE SET received = excluded.received, collectionOff = excluded.collectionOff, "
                 "totalLimit = excluded.totalLimit, unknownBoard = excluded.unknownBoard, noList = excluded.noList, "
                 "tooShort = excluded.tooShort, unknownKind = excluded.unknownKind, failed = excluded.failed, "
                 "consolidated = excluded.consolidated, handedOver = excluded.handedOver, held = excluded.held, "
                 "dropped = excluded.dropped") {}

void ZTCLedgerBook::clear() {
    mTaken.clear();
    mNoted.clear();
    mLastGeneration = {};
}

std::uint64_t ZTCLedgerBook::findOrAddGeneration(const std::string& acrName) {
    if (mLastGeneration.second != 0 && mLastGeneration.first == acrName) {
        return mLastGeneration.second;
    }
    ZTCStatement(mrDatabase, "INSERT INTO generation(name) VALUES (?) ON CONFLICT DO NOTHING").run(acrName);
    ZTCStatement lFind(mrDatabase, "SELECT id FROM generation WHERE name = ?");
    lFind.query(acrName).step();
    mLastGeneration = {acrName, lFind.number<std::uint64_t>(0)};
    return mLastGeneration.second;
}

bool ZTCLedgerBook::hasEnded(const std::string& acrName) {
    ZTCStatement lFind(mrDatabase, "SELECT ended FROM generation WHERE name = ?");
    return lFind.query(acrName).step() && lFind.number(0) != 0;
}

std::vector<ZTSPageCounts> ZTCLedgerBook::sumOthers(const std::string& acrName) {
    std::vector<ZTSPageCounts> lSums;
    ZTCStatement lRows(mrDatabase,
                       "SELECT initiator, kind, sum(received), sum(collectionOff), sum(totalLimit), sum(unknownBoard), "
                       "sum(noList), sum(tooShort), sum(unknownKind), sum(failed), sum(consolidated), sum(handedOver), "
                       "sum(held), sum(dropped) FROM ledger WHERE generation <> "
                       "ifnull((SELECT id FROM generation WHERE name = ?), -1) GROUP BY initiator, kind");
    lRows.query(acrName);
    while (lRows.step()) {
        const ZTSInitiator& lrInitiator = mrNames.getInitiator(lRows.number<std::uint32_t>(0));
        ZTSPageCounts& lrSum = lSums.emplace_back();
        lrSum.mWwpn = lrInitiator.mWwpn;
        lrSum.mWwnn = lrInitiator.mWwnn;
        lrSum.mKind = lRows.number<ZTCKindKey>(1);
        lrSum.mReceived = lRows.number<std::uint64_t>(2);
        for (int i = 0; i < ZTRF_Count; ++i) {
            lrSum.mRefused[static_cast<std::size_t>(i)] = lRows.number<std::uint64_t>(3 + i);
        }
        lrSum.mConsolidated = lRows.number<std::uint64_t>(10);
        lrSum.mHandedOver = lRows.number<std::uint64_t>(11);
        lrSum.mHeld = lRows.number<std::uint64_t>(12);
        lrSum.mDropped = lRows.number<std::uint64_t>(13);
    }
    return lSums;
}

void ZTCLedgerBook::addTaken(std::uint64_t aGeneration, std::uint32_t aInitiator, ZTCKindKey aKind,
                             std::uint64_t aOccurrences) {
    mTaken[{aGeneration, aInitiator, aKind}] += aOccurrences;
}

static bool sIsSame(const ZTSPageCounts& acrOne, const ZTSPageCounts& acrOther) {
    return acrOne.mReceived == acrOther.mReceived && acrOne.mRefused == acrOther.mRefused &&
           acrOne.mConsolidated == acrOther.mConsolidated && acrOne.mHandedOver == acrOther.mHandedOver &&
           acrOne.mHeld == acrOther.mHeld && acrOne.mDropped == acrOther.mDropped;
}

void ZTCLedgerBook::note(const std::string& acrGeneration, std::span<const ZTSPageCounts> aCounts) {
    if (hasEnded(acrGeneration)) {
        return;
    }
    const std::uint64_t lGeneration = findOrAddGeneration(acrGeneration);
    for (const ZTSPageCounts& lrCounts : aCounts) {
        const std::uint32_t lInitiator =
            mrNames.findOrAddInitiator({.mWwpn = lrCounts.mWwpn, .mWwnn = lrCounts.mWwnn, .mHost = {}});
        const auto [lPlace, lIsNew] = mNoted.try_emplace({lGeneration, lInitiator, lrCounts.mKind}, lrCounts);
        if (!lIsNew && sIsSame(lPlace->second, lrCounts)) {
            continue;
        }
        lPlace->second = lrCounts;
        const auto& lrRefused = lrCounts.mRefused;
        mSetCounts.run(lGeneration, lInitiator, lrCounts.mKind, lrCounts.mReceived, lrRefused[ZTRF_CollectionOff],
                       lrRefused[ZTRF_TotalLimit], lrRefused[ZTRF_UnknownBoard], lrRefused[ZTRF_NoList],
                       lrRefused[ZTRF_TooShort], lrRefused[ZTRF_UnknownKind], lrRefused[ZTRF_Failed],
                       lrCounts.mConsolidated, lrCounts.mHandedOver, lrCounts.mHeld, lrCounts.mDropped);
    }
}

void ZTCLedgerBook::flush() {
    for (const auto& [lrKey, lCount] : mTaken) {
        const auto& [lGeneration, lInitiator, lKind] = lrKey;
        mAddTaken.run(lGeneration, lInitiator, lKind, lCount);
    }
    mTaken.clear();
}

bool ZTCLedgerBook::endAgent(const std::string& acrGeneration, std::int64_t aFrom, std::int64_t aTo, bool aIsVanished,
                             const std::string& acrReason, bool aHasLastPage) {
    if (hasEnded(acrGeneration)) {
        return false;
    }
    flush();
    const std::uint64_t lGeneration = findOrAddGeneration(acrGeneration);
    // The last known page can be older than the last frame: the agent's page goes with the power. What was taken had
    // been handed over, and of what was held then it is the first.
    ZTCStatement(mrDatabase,
                 "UPDATE ledger SET received = received + max(0, taken + lost - handedOver - held), "
                 "consolidated = consolidated + max(0, taken + lost - handedOver - held), "
                 "held = max(0, held - (taken + lost - handedOver)), handedOver = taken + lost "
                 "WHERE generation = ? AND taken + lost > handedOver")
        .run(lGeneration);
    std::vector<Missing> lMissing;
    ZTCStatement lRows(mrDatabase,
                       "SELECT initiator, kind, held, handedOver - taken - lost FROM ledger "
                       "WHERE generation = ?");
    lRows.query(lGeneration);
    while (lRows.step()) {
        const Missing lRow = {.mInitiator = lRows.number<std::uint32_t>(0),
                              .mKind = lRows.number<ZTCKindKey>(1),
                              .mHeld = lRows.number<std::uint64_t>(2),
                              .mHandedOver = lRows.number<std::uint64_t>(3)};
        if (lRow.mHeld != 0 || lRow.mHandedOver != 0) {
            lMissing.push_back(lRow);
        }
    }
    bool lIsWritten = false;
    if (aIsVanished || !lMissing.empty()) {
        lIsWritten = writeGap(aFrom, aTo, acrReason, acrGeneration, aHasLastPage, lMissing);
    }
    ZTCStatement(mrDatabase,
                 "INSERT INTO ledger SELECT 0, initiator, kind, received, collectionOff, totalLimit, unknownBoard, "
                 "noList, tooShort, unknownKind, failed, consolidated, handedOver, 0, dropped, taken, lost "
                 "FROM ledger WHERE generation = ? "
                 "ON CONFLICT DO UPDATE SET received = received + excluded.received, "
                 "collectionOff = collectionOff + excluded.collectionOff, "
                 "totalLimit = totalLimit + excluded.totalLimit, "
                 "unknownBoard = unknownBoard + excluded.unknownBoard, noList = noList + excluded.noList, "
                 "tooShort = tooShort + excluded.tooShort, unknownKind = unknownKind + excluded.unknownKind, "
                 "failed = failed + excluded.failed, consolidated = consolidated + excluded.consolidated, "
                 "handedOver = handedOver + excluded.handedOver, dropped = dropped + excluded.dropped, "
                 "taken = taken + excluded.taken, lost = lost + excluded.lost")
        .run(lGeneration);
    ZTCStatement(mrDatabase, "DELETE FROM ledger WHERE generation = ?").run(lGeneration);
    ZTCStatement(mrDatabase, "UPDATE generation SET ended = 1 WHERE id = ?").run(lGeneration);
    ZTCStatement(mrDatabase, "DELETE FROM generation WHERE ended = 1 AND id <= ?")
        .run(static_cast<std::int64_t>(lGeneration) - scRememberedAgents);
    mNoted.clear();
    return lIsWritten;
}

bool ZTCLedgerBook::noteGap(const ZTSGap& acrGap) {
    flush();
    std::vector<Missing> lMissing;
    for (const ZTSGapCount& lrCount : acrGap.mCounts) {
        lMissing.push_back({.mInitiator = mrNames.findOrAddInitiator(lrCount.mInitiator),
                            .mKind = lrCount.mKind,
                            .mHeld = lrCount.mHeld,
                            .mHandedOver = lrCount.mHandedOver});
    }
    return writeGap(toMicroseconds(acrGap.mFrom), toMicroseconds(acrGap.mTo), acrGap.mReason, acrGap.mGeneration,
                    acrGap.mIsCountKnown, lMissing);
}

bool ZTCLedgerBook::writeGap(std::int64_t aFrom, std::int64_t aTo, const std::string& acrReason,
                             const std::string& acrGeneration, bool aIsCountKnown, std::span<const Missing> aMissing) {
    const std::uint64_t lSeq = mrCounter.mNextSeq;
    ZTCStatement(mrDatabase,
                 "INSERT INTO gap(seq, timeFrom, timeTo, reason, generation, isCountKnown) VALUES (?, ?, ?, ?, ?, ?) "
                 "ON CONFLICT DO NOTHING")
        .run(lSeq, aFrom, aTo, acrReason, acrGeneration, aIsCountKnown ? 1 : 0);
    if (mrDatabase.countChangedRows() == 0) {
        return false;
    }
    ++mrCounter.mNextSeq;
    ++mrCounter.mGaps;
    // What was lost on its way counts for the agent that handed it over, until that ends.
    const std::uint64_t lGeneration =
        acrGeneration.empty() || hasEnded(acrGeneration) ? 0 : findOrAddGeneration(acrGeneration);
    ZTCStatement lAddCount(mrDatabase,
                           "INSERT INTO gapCount(gap, initiator, kind, held, handedOver) VALUES (?, ?, ?, ?, ?) "
                           "ON CONFLICT DO UPDATE SET held = held + excluded.held, "
                           "handedOver = handedOver + excluded.handedOver");
    ZTCStatement lAddLost(mrDatabase,
                          "INSERT INTO ledger(generation, initiator, kind, lost) VALUES (?, ?, ?, ?) "
                          "ON CONFLICT DO UPDATE SET lost = lost + excluded.lost");
    for (const Missing& lrMissing : aMissing) {
        lAddCount.run(lSeq, lrMissing.mInitiator, lrMissing.mKind, lrMissing.mHeld, lrMissing.mHandedOver);
        if (lrMissing.mHandedOver != 0) {
            lAddLost.run(lGeneration, lrMissing.mInitiator, lrMissing.mKind, lrMissing.mHandedOver);
        }
    }
    return true;
}
