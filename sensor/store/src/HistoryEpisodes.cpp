#include "sensor/store/src/HistoryImplementation.h"

#include <algorithm>
#include <limits>

#include "sensor/store/src/Counter.h"
#include "sensor/store/src/EpisodeBody.h"
#include "sensor/store/src/EpisodeBook.h"
#include "sensor/store/src/ReceivedTime.h"
#include "sensor/store/src/RecordWindow.h"

/// Episodes that one read transaction looks at, and chunks of records.
static constexpr std::uint64_t scPageEpisodes = 16384;
static constexpr std::uint64_t scPageChunks = 256;

/// Numbers of the names that are in the table. Absent: no names were given, so all match.
template <typename Table, typename Name>
static std::optional<std::vector<std::uint32_t>> sFindIds(const std::vector<ZTSFcName>& acrNames, const Table& acrTable,
                                                          Name aGetName) {
    if (acrNames.empty()) {
        return std::nullopt;
    }
    std::vector<std::uint32_t> lIds;
    for (const auto& [lId, lrEntry] : acrTable) {
        const std::optional<ZTSFcName> lName = aGetName(lrEntry);
        if (lName && std::ranges::find(acrNames, *lName) != acrNames.end()) {
            lIds.push_back(lId);
        }
    }
    return lIds;
}

ZTCFilterTest::ZTCFilterTest(const ZTSHistoryFilter& acrFilter, const ZTCNameTable& acrNames)
    : mKinds(acrFilter.mKinds),
      mPorts(sFindIds(acrFilter.mPorts, acrNames.getPorts(),
                      [](const ZTSRemotePort& acrPort) { return std::optional(acrPort.mWwpn); })),
      mInitiators(sFindIds(acrFilter.mInitiators, acrNames.getInitiators(),
                           [](const ZTSInitiator& acrInitiator) { return acrInitiator.mWwpn; })),
      mLuns(acrFilter.mLuns),
      mIsAllLuns(acrFilter.mIsAllLuns),
      mSince(acrFilter.mSince ? toMicroseconds(*acrFilter.mSince) : std::numeric_limits<std::int64_t>::min()),
      mUntil(acrFilter.mUntil ? toMicroseconds(*acrFilter.mUntil) : std::numeric_limits<std::int64_t>::max()) {}

bool ZTCFilterTest::matches(std::uint32_t aInitiator, ZTCKindKey aKind, std::uint32_t aPort) const {
    const auto lIsIn = [](const auto& acrList, auto aValue) {
        return std::ranges::find(acrList, aValue) != acrList.end();
    };
    return (mKinds.empty() || lIsIn(mKinds, aKind)) && (!mPorts || lIsIn(*mPorts, aPort)) &&
           (!mInitiators || lIsIn(*mInitiators, aInitiator));
}

bool ZTCFilterTest::matchesLuns(const std::optional<ZTSLunSet>& acrLuns) const {
    if (!hasLuns()) {
        return true;
    }
    if (!acrLuns) {
        return false;
    }
    return acrLuns->mIsAll || std::ranges::any_of(mLuns, [&](std::uint32_t aLun) {
               return std::ranges::binary_search(acrLuns->mNumbers, aLun);
           });
}

std::optional<ZTSEpisode> ZTCHistory::ZTCImplementation::readEpisode(const ZTCStatement& acrRow,
                                                                     const ZTCFilterTest* apTest) {
    const auto lInitiator = acrRow.number<std::uint32_t>(1);
    const auto lPort = acrRow.number<std::uint32_t>(3);
    ZTSEpisode lEpisode;
    lEpisode.mKind = acrRow.number<ZTCKindKey>(2);
    if (apTest != nullptr && !apTest->matches(lInitiator, lEpisode.mKind, lPort)) {
        return std::nullopt;
    }
    lEpisode.mEpisode = acrRow.number<std::uint64_t>(0);
    lEpisode.mPhase = static_cast<ZTEPhase>(acrRow.number(4));
    lEpisode.mSeq =
        std::max({acrRow.number<std::uint64_t>(5), acrRow.number<std::uint64_t>(6), acrRow.number<std::uint64_t>(7)});
    lEpisode.mCount = acrRow.number<std::uint64_t>(8);
    lEpisode.mRecords = acrRow.number<std::uint64_t>(9);
    lEpisode.mFirst = fromMicroseconds(acrRow.number(10));
    lEpisode.mLast = fromMicroseconds(acrRow.number(11));
    lEpisode.mHasClockFlag = (acrRow.number(12) & gcEpisodeClock) != 0;
    lEpisode.mIsMalformed = (acrRow.number(12) & gcEpisodeMalformed) != 0;
    const ZTSKindShape* const lpShape = findKindShape(lEpisode.mKind);
    if (lpShape != nullptr && !lEpisode.mIsMalformed) {
        lEpisode.mDetail =
            ZTCEpisodeBody::decode(acrRow.blob(14)).makeDetail(*lpShape, acrRow.number<std::uint64_t>(13));
    }
    if (apTest != nullptr && !apTest->matchesLuns(lEpisode.mDetail.mLuns)) {
        return std::nullopt;
    }
    lEpisode.mInitiator = getInitiator(lInitiator);
    lEpisode.mRemotePort = getPort(lPort);
    return lEpisode;
}

std::vector<ZTSEpisode> ZTCHistory::ZTCImplementation::readRange(std::uint64_t aFirst, std::uint64_t aEnd,
                                                                 const ZTCFilterTest& acrTest) {
    std::vector<ZTSEpisode> lPage;
    ZTCStatement lRows(mDatabase, HistoryQueries::gcEpisodeRange);
    lRows.query(aFirst, aEnd, acrTest.getSince(), acrTest.getUntil());
    while (lRows.step()) {
        if (std::optional<ZTSEpisode> lEpisode = readEpisode(lRows, &acrTest)) {
            lPage.push_back(std::move(*lEpisode));
        }
    }
    return lPage;
}

std::vector<ZTSEpisode> ZTCHistory::ZTCImplementation::readOpen(const ZTCFilterTest& acrTest) {
    std::vector<ZTSEpisode> lOpen;
    ZTCStatement lRows(mDatabase, HistoryQueries::gcOpenEpisodes);
    lRows.query();
    while (lRows.step()) {
        const bool lIsInTime = lRows.number(11) >= acrTest.getSince() && lRows.number(10) <= acrTest.getUntil();
        if (std::optional<ZTSEpisode> lEpisode = lIsInTime ? readEpisode(lRows, &acrTest) : std::nullopt) {
            lOpen.push_back(std::move(*lEpisode));
        }
    }
    std::ranges::sort(lOpen, {}, &ZTSEpisode::mEpisode);
    return lOpen;
}

/// Calls the visitor for each episode of the page that is new enough. Returns false where the visitor ended it.
static bool sVisitPage(std::vector<ZTSEpisode>& arPage, bool aIsRising, std::uint64_t aAfterSeq,
                       const std::function<bool(const ZTSEpisode&)>& acrVisitor) {
    if (!aIsRising) {
        std::ranges::reverse(arPage);
    }
    return std::ranges::all_of(
        arPage, [&](const ZTSEpisode& acrEpisode) { return acrEpisode.mSeq <= aAfterSeq || acrVisitor(acrEpisode); });
}

std::optional<std::uint64_t> ZTCHistory::ZTCImplementation::findFirst(const ZTSHistoryFilter& acrFilter) {
    ZTCStatement lFirst(mDatabase,
                        acrFilter.mSince ? HistoryQueries::gcFirstEpisodeSince : HistoryQueries::gcFirstEpisode);
    if (acrFilter.mSince) {
        lFirst.query(toMicroseconds(*acrFilter.mSince));
    }
    return lFirst.step() && !lFirst.isNull(0) ? std::optional(lFirst.number<std::uint64_t>(0)) : std::nullopt;
}

void ZTCHistory::ZTCImplementation::visitPages(const ZTSHistoryFilter& acrFilter, bool aIsRising,
                                               const std::function<bool(const ZTSEpisode&)>& acrVisitor) {
    const ZTCFilterTest lTest(acrFilter, mNames);
    if (acrFilter.mIsOpenOnly) {
        std::vector<ZTSEpisode> lOpen = readOpen(lTest);
        sVisitPage(lOpen, aIsRising, acrFilter.mAfterSeq, acrVisitor);
        return;
    }
    const std::optional<std::uint64_t> lFirst = findFirst(acrFilter);
    if (!lFirst) {
        return;
    }
    const std::uint64_t lBegin = *lFirst;
    const auto lEnd = static_cast<std::uint64_t>(mDatabase.readNumber(HistoryQueries::gcLastEpisode)) + 1;
    for (std::uint64_t lDone = 0; lBegin + lDone < lEnd; lDone += scPageEpisodes) {
        const std::uint64_t lSize = std::min(scPageEpisodes, lEnd - lBegin - lDone);
        const std::uint64_t lPageBegin = aIsRising ? lBegin + lDone : lEnd - lDone - lSize;
        std::vector<ZTSEpisode> lPage = readRange(lPageBegin, lPageBegin + lSize, lTest);
        if (!sVisitPage(lPage, aIsRising, acrFilter.mAfterSeq, acrVisitor)) {
            return;
        }
    }
}

std::vector<ZTSStoredRecord> ZTCHistory::ZTCImplementation::readRecords(const ZTSEpisode& acrEpisode,
                                                                        const ZTSHistoryFilter& acrFilter,
                                                                        const ZTCFilterTest& acrTest) {
    const std::uint64_t lPerEnd = ZTSCounter::read(mDatabase).mRecordsPerEnd;
    const ZTSKindShape* const lpShape = acrEpisode.mIsMalformed ? nullptr : findKindShape(acrEpisode.mKind);
    std::vector<ZTSStoredRecord> lRecords;
    ZTCStatement lRows(mDatabase, HistoryQueries::gcRecords);
    std::uint64_t lNext = 0;
    for (std::uint64_t lCount = scPageChunks; lCount == scPageChunks;) {
        lCount = 0;
        lRows.query(acrEpisode.mEpisode, lNext, scPageChunks);
        while (lRows.step()) {
            ++lCount;
            auto lOrdinal = lRows.number<std::uint64_t>(0);
            visitChunk(lRows.blob(1), [&](std::uint64_t aSeq, const ZTSRecordView& acrRecord) {
                const std::uint64_t lPlace = lOrdinal++;
                const std::int64_t lBegin = toMicroseconds(acrRecord.mBegin);
                const std::int64_t lEnd = toMicroseconds(acrRecord.mEnd);
                if ((lPlace >= lPerEnd && lPlace + lPerEnd < acrEpisode.mRecords) || aSeq <= acrFilter.mAfterSeq ||
                    lEnd < acrTest.getSince() || lBegin > acrTest.getUntil()) {
                    return;
                }
                if (lpShape != nullptr && acrTest.hasLuns()) {
                    ZTCEpisodeBody lBody;
                    lBody.add(*lpShape, acrRecord.mEventData);
                    if (!acrTest.matchesLuns(lBody.makeDetail(*lpShape, 0).mLuns)) {
                        return;
                    }
                }
                lRecords.push_back({.mSeq = aSeq,
                                    .mEpisode = acrEpisode.mEpisode,
                                    .mOrdinal = lPlace,
                                    .mKind = acrEpisode.mKind,
                                    .mInitiator = acrEpisode.mInitiator,
                                    .mRemotePort = acrEpisode.mRemotePort,
                                    .mHasClockFlag = lEnd < lBegin,
                                    .mRecord = acrRecord.toRecord()});
            });
            lNext = lOrdinal;
        }
    }
    return lRecords;
}
