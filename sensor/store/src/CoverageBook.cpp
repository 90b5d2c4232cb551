#include "sensor/store/src/CoverageBook.h"

#include <set>

void ZTCCoverageBook::load() {
    mOpen.clear();
    ZTCStatement lRows(mrDatabase, "SELECT id, initiator, kind, state FROM coverage WHERE timeTo IS NULL");
    lRows.query();
    while (lRows.step()) {
        mOpen[{lRows.number<std::uint32_t>(1), lRows.number<ZTCKindKey>(2)}] = {
            .mId = lRows.number(0), .mState = static_cast<ZTEKindState>(lRows.number(3))};
    }
}

void ZTCCoverageBook::endIntervals(std::int64_t aTime) {
    ZTCStatement(mrDatabase, "UPDATE coverage SET timeTo = max(timeFrom, ?) WHERE timeTo IS NULL").run(aTime);
    mOpen.clear();
}

void ZTCCoverageBook::beginRun(std::int64_t aNow) {
    ZTCStatement lLast(mrDatabase, "SELECT timeTo FROM run ORDER BY id DESC LIMIT 1");
    if (lLast.query().step()) {
        endIntervals(lLast.number(0));
        lLast.reset();
    }
    ZTCStatement(mrDatabase, "INSERT INTO run(timeFrom, timeTo, ended) VALUES (?, ?, 0)").run(aNow, aNow);
}

void ZTCCoverageBook::noteRunning(std::int64_t aNow) {
    ZTCStatement(mrDatabase, "UPDATE run SET timeTo = ? WHERE id = (SELECT max(id) FROM run) AND ended = 0").run(aNow);
}

void ZTCCoverageBook::endRun(std::int64_t aNow) {
    ZTCStatement(mrDatabase, "UPDATE run SET timeTo = ?, ended = 1 WHERE id = (SELECT max(id) FROM run)").run(aNow);
    endIntervals(aNow);
}

void ZTCCoverageBook::note(std::int64_t aNow, std::span<const ZTSKindStateNow> aStates) {
    ZTCStatement lEnd(mrDatabase, "UPDATE coverage SET timeTo = max(timeFrom, ?) WHERE id = ?");
    std::set<Key> lPresent;
    for (const ZTSKindStateNow& lrState : aStates) {
        const std::uint32_t lInitiator =
            mrNames.findOrAddInitiator({.mWwpn = lrState.mWwpn, .mWwnn = lrState.mWwnn, .mHost = {}});
        const Key lKey(lInitiator, lrState.mKind);
        lPresent.insert(lKey);
        const auto lFound = mOpen.find(lKey);
        if (lFound != mOpen.end() && lFound->second.mState == lrState.mState) {
            continue;
        }
        if (lFound != mOpen.end()) {
            lEnd.run(aNow, lFound->second.mId);
        }
        ZTCStatement(mrDatabase,
                     "INSERT INTO coverage(initiator, kind, state, timeFrom, timeTo) VALUES (?, ?, ?, ?, NULL)")
            .run(lInitiator, lrState.mKind, static_cast<int>(lrState.mState), aNow);
        mOpen[lKey] = {.mId = sqlite3_last_insert_rowid(mrDatabase.handle()), .mState = lrState.mState};
    }
    for (auto lPlace = mOpen.begin(); lPlace != mOpen.end();) {
        if (lPresent.contains(lPlace->first)) {
            ++lPlace;
        } else {
            lEnd.run(aNow, lPlace->second.mId);
            lPlace = mOpen.erase(lPlace);
        }
    }
}
