#include "sensor/store/src/TopologyBook.h"

#include <algorithm>

#include "sensor/topology/include/PatientReader.h"

/// While nothing changes, the time of the last scan is written this often. Scans that lie further apart belong to two
/// stretches.
static constexpr std::int64_t scScanWriteMicroseconds = 60'000'000;
static constexpr std::int64_t scScanPauseMicroseconds = 5 * scScanWriteMicroseconds;

void ZTCTopologyBook::clear() {
    mOpen.clear();
    mIsLoaded = false;
}

void ZTCTopologyBook::load() {
    if (mIsLoaded) {
        return;
    }
    ZTCStatement lRows(mrDatabase, "SELECT id, thing, key, body FROM topology WHERE timeTo IS NULL");
    lRows.query();
    while (lRows.step()) {
        const std::span<const std::uint8_t> lBody = lRows.blob(3);
        mOpen[{static_cast<ZTETopologyThing>(lRows.number(1)), lRows.text(2)}] = {
            .mId = lRows.number(0), .mBody = ZTCStoreBytes(lBody.begin(), lBody.end())};
    }
    mIsLoaded = true;
}

/// Whether a file of the thing did not answer, or so many files block that not everything was asked for.
static bool sIsUnread(const std::string& acrName, const ZTSTopology& acrTopology) {
    return acrTopology.mBlocked.size() >= gcMostBlockedFiles ||
           std::ranges::any_of(acrTopology.mBlocked, [lPart = "/" + acrName + "/"](const std::string& acrPath) {
               return acrPath.find(lPart) != std::string::npos;
           });
}

/// Values that could not be read stay as they were.
void ZTCTopologyBook::keepUnread(ZTSThing& arThing, const ZTSTopology& acrTopology) {
    const std::string lName = arThing.mKey.substr(0, arThing.mKey.find(' '));
    if (acrTopology.mBlocked.empty() || !sIsUnread(lName, acrTopology)) {
        return;
    }
    auto lFound = mOpen.find({arThing.mThing, arThing.mKey});
    if (lFound == mOpen.end() && arThing.mThing == ZTTT_RemotePort) {
        // Its WWPN is part of the key, and may be the value that could not be read.
        lFound = mOpen.lower_bound({ZTTT_RemotePort, lName + " "});
        if (lFound == mOpen.end() || !lFound->first.second.starts_with(lName + " ")) {
            return;
        }
        arThing.mKey = lFound->first.second;
    }
    if (lFound == mOpen.end()) {
        return;
    }
    ZTCThingValues lValues = readValues(arThing.mBody);
    for (auto& [lAttribute, lText] : readValues(lFound->second.mBody)) {
        if (isFromFile(lAttribute)) {
            lValues.try_emplace(lAttribute, lText);
        }
    }
    arThing.mBody = writeValues(lValues);
}

std::int64_t ZTCTopologyBook::insert(std::int64_t aTime, const ZTSThing& acrThing) {
    ZTCStatement(mrDatabase, "INSERT INTO topology(thing, key, body, timeFrom, timeTo) VALUES (?, ?, ?, ?, NULL)")
        .run(static_cast<int>(acrThing.mThing), acrThing.mKey, std::span<const std::uint8_t>(acrThing.mBody), aTime);
    return sqlite3_last_insert_rowid(mrDatabase.handle());
}

bool ZTCTopologyBook::note(std::int64_t aTime, const ZTSTopology& acrTopology, std::uint32_t aMostRows) {
    load();
    ++mCalls;
    std::uint32_t lRows = 0;
    ZTCStatement lEnd(mrDatabase, "UPDATE topology SET timeTo = max(timeFrom, ?) WHERE id = ?");
    bool lIsWhole = true;
    for (ZTSThing& lrThing : toThings(acrTopology)) {
        keepUnread(lrThing, acrTopology);
        Interval& lrOpen = mOpen[{lrThing.mThing, lrThing.mKey}];
        lrOpen.mSeenIn = mCalls;
        if (lrOpen.mId != 0 && lrOpen.mBody == lrThing.mBody) {
            continue;
        }
        if (lRows >= aMostRows) {
            lIsWhole = false;
            continue;
        }
        if (lrOpen.mId != 0) {
            lEnd.run(aTime, lrOpen.mId);
            ++lRows;
        }
        lrOpen.mId = insert(aTime, lrThing);
        lrOpen.mBody = std::move(lrThing.mBody);
        ++lRows;
    }
    for (auto lPlace = mOpen.begin(); lPlace != mOpen.end();) {
        const auto& [lThing, lrKey] = lPlace->first;
        const bool lIsNotStored = lPlace->second.mId == 0;
        const bool lMayBeThere = lThing == ZTTT_Mount && sIsUnread(lrKey, acrTopology);
        if (!lIsNotStored && (lPlace->second.mSeenIn == mCalls || lMayBeThere)) {
            ++lPlace;
            continue;
        }
        if (!lIsNotStored && lRows >= aMostRows) {
            lIsWhole = false;
            ++lPlace;
            continue;
        }
        if (!lIsNotStored) {
            lEnd.run(aTime, lPlace->second.mId);
            ++lRows;
        }
        lPlace = mOpen.erase(lPlace);
    }
    if (lIsWhole) {
        noteScan(aTime, acrTopology, lRows != 0);
    }
    return lIsWhole;
}

void ZTCTopologyBook::noteScan(std::int64_t aTime, const ZTSTopology& acrTopology, bool aHasChanged) {
    std::string lBlocked;
    for (const std::string& lrPath : acrTopology.mBlocked) {
        lBlocked += lrPath + "\n";
    }
    ZTCStatement lLast(mrDatabase, "SELECT id, timeTo, blocked FROM scan ORDER BY id DESC LIMIT 1");
    if (lLast.query().step()) {
        const std::int64_t lId = lLast.number(0);
        const std::int64_t lPassed = aTime - lLast.number(1);
        const bool lIsAlike = lLast.text(2) == lBlocked;
        lLast.reset();
        if (lIsAlike && lPassed >= 0 && lPassed < scScanPauseMicroseconds) {
            if (aHasChanged || lPassed >= scScanWriteMicroseconds) {
                ZTCStatement(mrDatabase, "UPDATE scan SET timeTo = ? WHERE id = ?").run(aTime, lId);
            }
            return;
        }
    }
    ZTCStatement(mrDatabase, "INSERT INTO scan(timeFrom, timeTo, blocked) VALUES (?, ?, ?)")
        .run(aTime, aTime, lBlocked);
}
