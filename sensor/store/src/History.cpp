#include "sensor/store/include/History.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "sensor/store/src/Counter.h"
#include "sensor/store/src/HistoryImplementation.h"
#include "sensor/store/src/Schema.h"
#include "sensor/store/src/StoreFile.h"

static ZTCDatabase sOpenDatabase(const std::string& acrPath) {
    struct stat lStatus {};
    if (stat(acrPath.c_str(), &lStatus) != 0) {
        if (errno == ENOENT) {
            throw ZTCNoHistoryEx(acrPath + ": there is no history yet: no sensor has run with this state directory");
        }
        throw ZTCStoreEx(acrPath + ": the history cannot be read: " + std::strerror(errno) +
                         (errno == EACCES ? "; ask with sudo, or as a user of the sensor's group" : ""));
    }
    ZTCDatabase lDatabase(acrPath, ZTDA_ReadOnly);
    checkSchema(lDatabase, getSchemaSteps());
    return lDatabase;
}

ZTCHistory::ZTCImplementation::ZTCImplementation(const std::string& acrStateDirectory)
    : mDatabase(sOpenDatabase(getHistoryPath(acrStateDirectory))), mStoreId(ZTSCounter::read(mDatabase).mStoreId) {
    loadNames();
}

const ZTSInitiator& ZTCHistory::ZTCImplementation::getInitiator(std::uint32_t aId) {
    if (!mNames.getInitiators().contains(aId)) {
        loadNames();
    }
    return mNames.getInitiator(aId);
}

std::optional<ZTSRemotePort> ZTCHistory::ZTCImplementation::getPort(std::uint32_t aId) {
    if (aId != 0 && !mNames.getPorts().contains(aId)) {
        loadNames();
    }
    return mNames.getPort(aId);
}

ZTCHistory::ZTCHistory(const std::string& acrStateDirectory)
    : mpImplementation(std::make_unique<ZTCImplementation>(acrStateDirectory)) {}

ZTCHistory::~ZTCHistory() = default;

void ZTCHistory::readAsOne(const std::function<void()>& acrRead) const {
    mpImplementation->mDatabase.readAsOne(acrRead);
}

const std::string& ZTCHistory::getStoreId() const {
    return mpImplementation->mStoreId;
}

void ZTCHistory::visitEpisodes(const ZTSHistoryFilter& acrFilter,
                               const std::function<bool(const ZTSEpisode&)>& acrVisitor) const {
    mpImplementation->loadNames();
    if (acrFilter.mLimit == 0) {
        mpImplementation->visitPages(acrFilter, true, acrVisitor);
        return;
    }
    std::vector<ZTSEpisode> lNewest;
    mpImplementation->visitPages(acrFilter, false, [&](const ZTSEpisode& acrEpisode) {
        lNewest.push_back(acrEpisode);
        return lNewest.size() < acrFilter.mLimit;
    });
    std::all_of(lNewest.rbegin(), lNewest.rend(), acrVisitor);
}

std::vector<ZTSEpisode> ZTCHistory::readEpisodes(const ZTSHistoryFilter& acrFilter) const {
    std::vector<ZTSEpisode> lEpisodes;
    visitEpisodes(acrFilter, [&](const ZTSEpisode& acrEpisode) {
        lEpisodes.push_back(acrEpisode);
        return true;
    });
    return lEpisodes;
}

std::optional<ZTSEpisode> ZTCHistory::findEpisode(std::uint64_t aEpisode) const {
    ZTCStatement lRow(mpImplementation->mDatabase, HistoryQueries::gcEpisode);
    return lRow.query(aEpisode).step() ? mpImplementation->readEpisode(lRow, nullptr) : std::nullopt;
}

std::optional<ZTSEpisode> ZTCHistory::findEpisodeBySeq(std::uint64_t aSeq) const {
    ZTCStatement lRow(mpImplementation->mDatabase, HistoryQueries::gcChangedEpisode);
    if (!lRow.query(aSeq).step()) {
        return std::nullopt;
    }
    const auto lEpisode = lRow.number<std::uint64_t>(0);
    lRow.reset();
    return findEpisode(lEpisode);
}

void ZTCHistory::visitChanges(const ZTSHistoryFilter& acrFilter,
                              const std::function<bool(const ZTSEpisode&)>& acrVisitor) const {
    static constexpr std::size_t scPageRows = 2048;
    static constexpr int scSeqColumn = 15;
    mpImplementation->loadNames();
    const ZTCFilterTest lTest(acrFilter, mpImplementation->mNames);
    ZTCStatement lRows(mpImplementation->mDatabase, HistoryQueries::gcChanges);
    std::uint64_t lAfter = acrFilter.mAfterSeq;
    std::uint64_t lVisited = 0;
    for (std::size_t lCount = scPageRows; lCount == scPageRows;) {
        lCount = 0;
        std::vector<ZTSEpisode> lPage;
        lRows.query(lAfter, scPageRows);
        while (lRows.step()) {
            ++lCount;
            lAfter = lRows.number<std::uint64_t>(scSeqColumn);
            const bool lIsInTime = lRows.number(11) >= lTest.getSince() && lRows.number(10) <= lTest.getUntil();
            if (std::optional<ZTSEpisode> lEpisode =
                    lIsInTime ? mpImplementation->readEpisode(lRows, &lTest) : std::nullopt) {
                lEpisode->mPhase = lAfter == lRows.number<std::uint64_t>(7)   ? ZTP_Closed
                                   : lAfter == lRows.number<std::uint64_t>(6) ? ZTP_Update
                                                                              : ZTP_Open;
                lEpisode->mSeq = lAfter;
                lPage.push_back(std::move(*lEpisode));
            }
        }
        for (const ZTSEpisode& lrEpisode : lPage) {
            if (!acrVisitor(lrEpisode) || ++lVisited == acrFilter.mLimit) {
                return;
            }
        }
    }
}

std::uint64_t ZTCHistory::getLastSeq() const {
    return ZTSCounter::read(mpImplementation->mDatabase).mNextSeq - 1;
}

void ZTCHistory::visitRecords(const ZTSHistoryFilter& acrFilter,
                              const std::function<bool(const ZTSStoredRecord&)>& acrVisitor) const {
    mpImplementation->loadNames();
    const ZTCFilterTest lTest(acrFilter, mpImplementation->mNames);
    ZTSHistoryFilter lEpisodes = acrFilter;
    lEpisodes.mAfterSeq = 0;
    if (acrFilter.mLimit == 0) {
        mpImplementation->visitPages(lEpisodes, true, [&](const ZTSEpisode& acrEpisode) {
            return std::ranges::all_of(mpImplementation->readRecords(acrEpisode, acrFilter, lTest), acrVisitor);
        });
        return;
    }
    std::vector<ZTSStoredRecord> lNewest;
    mpImplementation->visitPages(lEpisodes, false, [&](const ZTSEpisode& acrEpisode) {
        const std::vector<ZTSStoredRecord> lRecords = mpImplementation->readRecords(acrEpisode, acrFilter, lTest);
        for (auto lPlace = lRecords.rbegin(); lPlace != lRecords.rend() && lNewest.size() < acrFilter.mLimit;
             ++lPlace) {
            lNewest.push_back(*lPlace);
        }
        return lNewest.size() < acrFilter.mLimit;
    });
    std::all_of(lNewest.rbegin(), lNewest.rend(), acrVisitor);
}

std::vector<std::string> ZTCHistory::getQueries() {
    using namespace HistoryQueries;
    return {gcEpisodeRange, gcOpenEpisodes,  gcEpisode,      gcChanges,     gcChangedEpisode, gcFirstEpisodeSince,
            gcFirstEpisode, gcLastEpisode,   gcRecords,      gcMinutes,     gcDays,           gcGaps,
            gcGapCounts,    gcEndedCoverage, gcOpenCoverage, gcRuns,        gcScan,           gcFirstScan,
            gcOpenThings,   gcEndedThings,   gcThingsBegun,  gcThingsEnded, gcThingsLately,   gcCounters};
}
