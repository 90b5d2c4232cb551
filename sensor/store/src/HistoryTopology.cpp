#include <algorithm>
#include <limits>
#include <map>
#include <set>

#include "sensor/store/src/CountBook.h"
#include "sensor/store/src/HistoryImplementation.h"
#include "sensor/store/src/ThingBody.h"

/// A version of a thing, as a row of the table holds it.
struct ZTSThingRow {
    std::int64_t mId = 0;
    ZTSThing mThing;
    std::int64_t mFrom = 0;
    std::optional<std::int64_t> mTo;
};

static ZTSThingRow sReadRow(const ZTCStatement& acrRow) {
    const std::span<const std::uint8_t> lBody = acrRow.blob(3);
    return {.mId = acrRow.number(0),
            .mThing = {.mThing = static_cast<ZTETopologyThing>(acrRow.number(1)),
                       .mKey = acrRow.text(2),
                       .mBody = ZTCStoreBytes(lBody.begin(), lBody.end())},
            .mFrom = acrRow.number(4),
            .mTo = acrRow.isNull(5) ? std::nullopt : std::optional(acrRow.number(5))};
}

static std::vector<std::string> sLines(const std::string& acrText) {
    std::vector<std::string> lLines;
    for (std::size_t lBegin = 0, lEnd; (lEnd = acrText.find('\n', lBegin)) != std::string::npos; lBegin = lEnd + 1) {
        lLines.push_back(acrText.substr(lBegin, lEnd - lBegin));
    }
    return lLines;
}

/// The scan that a time belongs to. False: there was none by then.
static bool sReadScan(ZTCDatabase& arDatabase, std::int64_t aTime, ZTSStoredTopology& arStored) {
    ZTCStatement lScan(arDatabase, HistoryQueries::gcScan);
    if (!lScan.query(aTime).step()) {
        return false;
    }
    arStored.mScanned = std::min(lScan.number(0), aTime);
    arStored.mTopology.mBlocked = sLines(lScan.text(1));
    arStored.mIsStale = !arStored.mTopology.mBlocked.empty();
    return true;
}

std::optional<ZTSStoredTopology> ZTCHistory::readTopology(std::int64_t aTime) const {
    ZTCDatabase& lrDatabase = mpImplementation->mDatabase;
    ZTSStoredTopology lStored;
    // One transaction for all, so that a thing that changes meanwhile is seen exactly once.
    bool lHasScan = false;
    lrDatabase.readAsOne([&] {
        lHasScan = sReadScan(lrDatabase, aTime, lStored);
        if (!lHasScan) {
            return;
        }
        for (const char* const lpSql : {HistoryQueries::gcOpenThings, HistoryQueries::gcEndedThings}) {
            ZTCStatement lRows(lrDatabase, lpSql);
            lRows.query(aTime);
            while (lRows.step()) {
                addThing(lStored.mTopology, static_cast<ZTETopologyThing>(lRows.number(1)), lRows.text(2),
                         lRows.blob(3));
            }
        }
    });
    if (!lHasScan) {
        return std::nullopt;
    }
    sortTopology(lStored.mTopology);
    return lStored;
}

void ZTCHistory::advanceTopology(ZTSStoredTopology& arStored, std::int64_t aFrom, std::int64_t aTo) const {
    ZTCDatabase& lrDatabase = mpImplementation->mDatabase;
    bool lIsNew = false;
    std::size_t lRowCount = 0;
    lrDatabase.readAsOne([&] {
        sReadScan(lrDatabase, aTo, arStored);
        // First all that ended meanwhile, then all that began and is still there: of several versions one is left.
        ZTCStatement lEnded(lrDatabase, HistoryQueries::gcThingsEnded);
        lEnded.query(aFrom, aTo, gcMostTopologyVersions);
        while (lEnded.step()) {
            ++lRowCount;
            removeThing(arStored.mTopology, static_cast<ZTETopologyThing>(lEnded.number(1)), lEnded.text(2));
        }
        ZTCStatement lBegun(lrDatabase, HistoryQueries::gcThingsBegun);
        lBegun.query(aFrom, aTo, gcMostTopologyVersions);
        while (lBegun.step()) {
            ++lRowCount;
            if (lBegun.isNull(5) || lBegun.number(5) > aTo) {
                addThing(arStored.mTopology, static_cast<ZTETopologyThing>(lBegun.number(1)), lBegun.text(2),
                         lBegun.blob(3));
                lIsNew = true;
            }
        }
    });
    if (lRowCount >= gcMostTopologyVersions) {
        arStored = readTopology(aTo).value_or(ZTSStoredTopology());  // not all changes were looked at
    } else if (lIsNew) {
        sortTopology(arStored.mTopology);
    }
}

/// As changes show lists: the database has line breaks.
static std::string sShown(std::string aText) {
    for (std::size_t lAt = 0; (lAt = aText.find('\n', lAt)) != std::string::npos; lAt += 2) {
        aText.replace(lAt, 1, ", ");
    }
    return aText;
}

/// What differs between two versions of a thing.
static void sCompare(const ZTSThingRow& acrBefore, const ZTSThingRow& acrAfter,
                     std::vector<ZTSTopologyChange>& arChanges) {
    const ZTCThingValues lBefore = readValues(acrBefore.mThing.mBody);
    const ZTCThingValues lAfter = readValues(acrAfter.mThing.mBody);
    std::set<std::uint64_t> lAttributes;
    for (const ZTCThingValues* const lpValues : {&lBefore, &lAfter}) {
        for (const auto& [lAttribute, lrText] : *lpValues) {
            lAttributes.insert(lAttribute);
        }
    }
    const auto lFind = [](const ZTCThingValues& acrValues, std::uint64_t aAttribute) {
        const auto lFound = acrValues.find(aAttribute);
        return lFound == acrValues.end() ? std::nullopt : std::optional(sShown(lFound->second));
    };
    for (const std::uint64_t lAttribute : lAttributes) {
        ZTSTopologyChange lChange{.mTime = acrAfter.mFrom,
                                  .mThing = acrAfter.mThing.mThing,
                                  .mKey = acrAfter.mThing.mKey,
                                  .mAttribute = getAttributeName(lAttribute),
                                  .mBefore = lFind(lBefore, lAttribute),
                                  .mAfter = lFind(lAfter, lAttribute)};
        if (lChange.mBefore != lChange.mAfter && !lChange.mAttribute.empty()) {
            arChanges.push_back(std::move(lChange));
        }
    }
}

std::vector<ZTSTopologyChange> ZTCHistory::readTopologyChanges(std::int64_t aFrom, std::int64_t aTo) const {
    ZTCDatabase& lrDatabase = mpImplementation->mDatabase;
    // Things that the very first scan found are no changes: they were there before.
    ZTCStatement lFirstScan(lrDatabase, HistoryQueries::gcFirstScan);
    const std::int64_t lFirst = lFirstScan.query().step() ? lFirstScan.number(0) : 0;
    lFirstScan.reset();

    // By thing and begin: two versions, one of which begins when the other ends, stand side by side.
    std::map<std::pair<ZTETopologyThing, std::string>, std::map<std::int64_t, ZTSThingRow>> lThings;
    lrDatabase.readAsOne([&] {
        for (const char* const lpSql : {HistoryQueries::gcThingsBegun, HistoryQueries::gcThingsEnded}) {
            ZTCStatement lRows(lrDatabase, lpSql);
            lRows.query(aFrom, aTo, gcMostTopologyVersions);
            while (lRows.step()) {
                ZTSThingRow lRow = sReadRow(lRows);
                const std::int64_t lFrom = lRow.mFrom;
                auto& lrVersions = lThings[{lRow.mThing.mThing, lRow.mThing.mKey}];
                // Two versions with one begin: the clock was set back, and the earlier row lasted for no time.
                const auto lKnown = lrVersions.find(lFrom);
                if (lKnown == lrVersions.end() || lKnown->second.mId < lRow.mId) {
                    lrVersions.insert_or_assign(lFrom, std::move(lRow));
                }
            }
        }
    });

    const auto lIsWithin = [&](std::int64_t aTime) { return aTime > aFrom && aTime <= aTo; };
    std::vector<ZTSTopologyChange> lChanges;
    for (const auto& [lrKey, lrVersions] : lThings) {
        const ZTSThingRow* lpBefore = nullptr;
        const auto lVanish = [&, &lrName = lrKey](const ZTSThingRow& acrRow) {
            if (acrRow.mTo && lIsWithin(*acrRow.mTo)) {
                lChanges.push_back({.mTime = *acrRow.mTo,
                                    .mThing = lrName.first,
                                    .mKey = lrName.second,
                                    .mAttribute = {},
                                    .mBefore = std::string(),
                                    .mAfter = std::nullopt});
            }
        };
        for (const auto& [lFrom, lrRow] : lrVersions) {
            if (lpBefore != nullptr && lpBefore->mTo == lFrom) {
                sCompare(*lpBefore, lrRow, lChanges);
            } else {
                if (lpBefore != nullptr) {
                    lVanish(*lpBefore);
                }
                if (lIsWithin(lFrom) && lFrom != lFirst) {
                    lChanges.push_back({.mTime = lFrom,
                                        .mThing = lrKey.first,
                                        .mKey = lrKey.second,
                                        .mAttribute = {},
                                        .mBefore = std::nullopt,
                                        .mAfter = std::string()});
                }
            }
            lpBefore = &lrRow;
        }
        if (lpBefore != nullptr) {
            lVanish(*lpBefore);
        }
    }
    std::ranges::stable_sort(lChanges, {}, &ZTSTopologyChange::mTime);
    return lChanges;
}

/// The ways to one logical unit while time passes.
class ZTCWaysCounter {
public:
    void add(const std::string& acrInitiator, const std::string& acrRemotePort) {
        ++mPaths;
        ++mInitiators[acrInitiator];
        ++mRemotePorts[acrRemotePort];
        mMost.raise({.mPaths = mPaths, .mInitiators = mInitiators.size(), .mRemotePorts = mRemotePorts.size()});
    }
    void remove(const std::string& acrInitiator, const std::string& acrRemotePort) {
        --mPaths;
        sTakeOne(mInitiators, acrInitiator);
        sTakeOne(mRemotePorts, acrRemotePort);
    }
    const ZTSLunWays& getMost() const { return mMost; }

private:
    static void sTakeOne(std::map<std::string, std::size_t>& arCounts, const std::string& acrKey) {
        const auto lFound = arCounts.find(acrKey);
        if (lFound != arCounts.end() && --lFound->second == 0) {
            arCounts.erase(lFound);
        }
    }

    std::size_t mPaths = 0;
    std::map<std::string, std::size_t> mInitiators;
    std::map<std::string, std::size_t> mRemotePorts;
    ZTSLunWays mMost;
};

/// Most ended versions that are read for it: the newest.
static constexpr std::uint64_t scMostEndedPaths = 20000;

/// A path that begins or ends.
struct ZTSPathTurn {
    std::int64_t mTime;
    bool mBegins;  ///< at one time, what ends comes first: a version follows the one before it
    std::size_t mPath;

    auto operator<=>(const ZTSPathTurn&) const = default;
};

std::map<std::string, ZTSLunWays> ZTCHistory::readMostWays(std::int64_t aFrom, std::int64_t aTo) const {
    ZTCDatabase& lrDatabase = mpImplementation->mDatabase;
    // Ports that had the same name count as one. So too few ways may be expected, but never too many.
    std::map<std::string, std::string> lPortNames;
    ZTSTopology lVersions;
    std::vector<ZTSPathTurn> lTurns;
    const auto lRead = [&](ZTCStatement& arRows) {
        while (arRows.step()) {
            const auto lThing = static_cast<ZTETopologyThing>(arRows.number(1));
            const std::string lKey = arRows.text(2);
            if (lThing == ZTTT_RemotePort) {
                const std::size_t lBlank = lKey.find(' ');
                lPortNames.emplace(lKey.substr(0, lBlank), lBlank == std::string::npos ? lKey : lKey.substr(lBlank));
            } else if (lThing == ZTTT_Path) {
                const std::int64_t lBegin = std::max(arRows.number(4), aFrom);
                const std::int64_t lEnd = arRows.isNull(5) ? aTo + 1 : arRows.number(5);
                if (lEnd > lBegin) {
                    addThing(lVersions, lThing, lKey, arRows.blob(3));
                    lTurns.push_back({lBegin, true, lVersions.mPaths.size() - 1});
                    lTurns.push_back({lEnd, false, lVersions.mPaths.size() - 1});
                }
            }
        }
    };
    ZTCStatement lOpen(lrDatabase, HistoryQueries::gcOpenThings);
    lOpen.query(aTo);
    lRead(lOpen);
    ZTCStatement lEnded(lrDatabase, HistoryQueries::gcThingsLately);
    lEnded.query(aFrom, aTo, scMostEndedPaths);
    lRead(lEnded);

    std::ranges::sort(lTurns);
    std::map<std::string, ZTCWaysCounter> lLuns;
    for (const ZTSPathTurn& lrTurn : lTurns) {
        const ZTSTopologyPath& lrPath = lVersions.mPaths[lrTurn.mPath];
        if (!lrPath.mWwid) {
            continue;
        }
        const auto lPort = lPortNames.find(lrPath.mRemotePort);
        const std::string& lrPort = lPort == lPortNames.end() ? lrPath.mRemotePort : lPort->second;
        ZTCWaysCounter& lrLun = lLuns[*lrPath.mWwid];
        if (lrTurn.mBegins) {
            lrLun.add(lrPath.mHost, lrPort);
        } else {
            lrLun.remove(lrPath.mHost, lrPort);
        }
    }
    std::map<std::string, ZTSLunWays> lMost;
    for (const auto& [lWwid, lLun] : lLuns) {
        lMost.emplace(lWwid, lLun.getMost());
    }
    return lMost;
}

std::vector<ZTSCounterSample> ZTCHistory::readCounters(std::int64_t aFrom, std::int64_t aTo, std::size_t aMost) const {
    mpImplementation->loadNames();
    std::vector<ZTSCounterSample> lSamples;
    ZTCStatement lRows(mpImplementation->mDatabase, HistoryQueries::gcCounters);
    lRows.query(getSlot(aFrom, gcMinuteMicroseconds), getSlot(aTo, gcMinuteMicroseconds), aMost);
    while (lRows.step()) {
        const std::optional<ZTSFcName>& lrInitiator =
            mpImplementation->getInitiator(lRows.number<std::uint32_t>(1)).mWwpn;
        if (!lrInitiator) {
            continue;
        }
        const std::optional<ZTSRemotePort> lPort = mpImplementation->getPort(lRows.number<std::uint32_t>(2));
        lSamples.push_back({.mMinute = lRows.number(0) * gcMinuteMicroseconds,
                            .mInitiator = *lrInitiator,
                            .mRemotePort = lPort ? std::optional(lPort->mWwpn) : std::nullopt,
                            .mCounter = lRows.text(3),
                            .mDifference = lRows.number<std::uint64_t>(4)});
    }
    return lSamples;
}
