// Every event is counted on the page once, with its outcome.
#include <gtest/gtest.h>

#include <optional>

#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "tavik/include/TavikCore.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/StatusPageFixture.h"

namespace {

class StatusPageOutcomes : public ZTCStatusPageFixture {
protected:
    /// Expects that the event is counted once, in this row, with this outcome; with no reason it is consolidated.
    template <typename TDeliver>
    void expectOutcome(const std::string& acrKind, std::uint64_t aEvents, std::optional<ZTEStatusRefusal> aReason,
                       TDeliver aDeliver) {
        const ZTSStatusSnapshot lBefore = page();
        aDeliver();
        const ZTSStatusSnapshot lAfter = page();
        expectEquations(lAfter);
        for (std::size_t lBoard = 0; lBoard < lAfter.mBoards.size(); ++lBoard) {
            for (std::size_t lRow = 0; lRow < gcStatusRowsPerBoard; ++lRow) {
                const bool lIsIt = lBoard == 0 && acrKind == getStatusRowName(lRow);
                SCOPED_TRACE(getStatusRowName(lRow));
                expectAdded(lBefore.mBoards[lBoard].mRows[lRow], lAfter.mBoards[lBoard].mRows[lRow],
                            lIsIt ? aEvents : 0, aReason);
            }
        }
        expectAdded(lBefore.mUnknownBoards, lAfter.mUnknownBoards, acrKind == "unknown" ? aEvents : 0, aReason);
    }

    static void expectAdded(const ZTSStatusRowCopy& acrBefore, const ZTSStatusRowCopy& acrAfter, std::uint64_t aEvents,
                            std::optional<ZTEStatusRefusal> aReason) {
        EXPECT_EQ(acrAfter.mConsolidated, acrBefore.mConsolidated + (aReason ? 0 : aEvents));
        for (std::size_t lReason = 0; lReason < gcStatusRefusals; ++lReason) {
            EXPECT_EQ(acrAfter.mRefused[lReason], acrBefore.mRefused[lReason] + (aReason == lReason ? aEvents : 0))
                << gcStatusRefusalNames[lReason];
        }
    }
};

std::string sRowNameOf(const ZTSDeliveredKind& acrKind) {
    return findDeliveredKind(static_cast<std::uint8_t>(acrKind.mCategory),
                             static_cast<std::uint8_t>(acrKind.mSubcategory))
        ->mpName;
}

constexpr std::nullopt_t scConsolidated = std::nullopt;

}  // namespace

TEST_F(StatusPageOutcomes, WhatIsConsolidatedIsCountedOnceByKind) {
    collect(2);
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lName = sRowNameOf(lcrKind);
        const auto lDeliver = [&] { deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mPayload); };
        expectOutcome(lName, 1, scConsolidated, lDeliver);
        expectOutcome(lName, 1, scConsolidated, lDeliver);
    }
    expectOutcome("temperature", 1, scConsolidated, [] { deliverTemperature(0); });
    expectOutcome("link", 1, scConsolidated, [] { deliverLink(0, makeWwn(1)); });
    expectOutcome("rscn", 3, scConsolidated, [] { deliverRscn(0, makeRscn({1, 1, 2})); });
}

TEST_F(StatusPageOutcomes, CategoryAndSubcategoryCountByTheirLowBytesAsTheyAreProcessed) {
    collect();
    expectOutcome("bus-reset", 1, scConsolidated, [] { deliverScope(0, 0x104, 0x220, {}); });
}

TEST_F(StatusPageOutcomes, ATooShortEventIsCountedOnceByKind) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        SCOPED_TRACE(lcrKind.mpName);
        const std::string lName = sRowNameOf(lcrKind);
        expectOutcome(lName, 1, ZTSR_TooShort, [&] {
            deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, ZTCBytes(lcrKind.mMinimumLength - 1, 0));
        });
    }
}

TEST_F(StatusPageOutcomes, AnRscnWithoutAPageCountsOnceAsTooShort) {
    collect();
    expectOutcome("rscn", 1, ZTSR_TooShort, [] { deliverRscn(0, ZTCBytes(7, 0)); });
    expectOutcome("rscn", 1, ZTSR_TooShort, [] { deliverRscn(0, {}, 65535); });
    expectOutcome("rscn", 1, ZTSR_TooShort, [] { deliverRscn(0, makeRscn({7}, 0)); });
    expectOutcome("rscn", 1, ZTSR_TooShort, [] { deliverRscn(0, makeRscn({7}, 4)); });
    expectOutcome("rscn", 1, ZTSR_TooShort, [] { deliverRscn(0, makeRscn({7}, 7)); });
}

TEST_F(StatusPageOutcomes, APairOutsideOfTheKindsIsCountedInTheOtherRow) {
    collect();
    for (const unsigned lCategory : {1u, 2u, 4u, 8u, 16u, 32u, 0u, 3u}) {
        SCOPED_TRACE(lCategory);
        expectOutcome("other", 1, ZTSR_UnknownKind, [&] { deliverScope(0, lCategory, 0x80, ZTCBytes(64, 0)); });
    }
}

TEST_F(StatusPageOutcomes, AnEventIsRefusedOnceWhileCollectionIsOff) {
    bringUp();
    expectOutcome("temperature", 1, ZTSR_CollectionOff, [] { deliverTemperature(0); });
    expectOutcome("link", 1, ZTSR_CollectionOff, [] { deliverLink(0, makeWwn(1)); });
    expectOutcome("queue-full", 1, ZTSR_CollectionOff, [] { deliverScope(0, 4, 1, ZTCBytes(16, 0)); });
    expectOutcome("other", 1, ZTSR_CollectionOff, [] { deliverScope(0, 4, 0x80, {}); });
    expectOutcome("rscn", 1, ZTSR_CollectionOff, [] { deliverRscn(0, makeRscn({1, 2, 3})); });
    expectOutcome("unknown", 1, ZTSR_CollectionOff, [] { deliverTemperature(1); });
}

TEST_F(StatusPageOutcomes, AnEventIsRefusedOnceForTheTotalLimit) {
    collect();
    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
    expectOutcome("temperature", 1, ZTSR_TotalLimit, [] { deliverTemperature(0); });
    expectOutcome("rscn", 1, ZTSR_TotalLimit, [] { deliverRscn(0, makeRscn({1, 2, 3})); });
    EXPECT_EQ(gcMaxScopeDataSize, page().mHeldBytes);
    retrieve();
    expectOutcome("temperature", 1, scConsolidated, [] { deliverTemperature(0); });
}

TEST_F(StatusPageOutcomes, EventsOfUnknownBoardsShareARow) {
    collect();
    for (const unsigned lBoard : {1u, 2u, 0xFFFFFFFFu}) {
        expectOutcome("unknown", 1, ZTSR_UnknownBoard, [&] { deliverTemperature(lBoard); });
        expectOutcome("unknown", 1, ZTSR_UnknownBoard, [&] { deliverRscn(lBoard, makeRscn({1, 2})); });
    }
}

TEST_F(StatusPageOutcomes, ABoardThatHasLeftHasNoList) {
    collect();
    mSystem->exchangeRecordLists(0);
    expectOutcome("temperature", 1, ZTSR_NoList, [] { deliverTemperature(0); });
    expectOutcome("other", 1, ZTSR_NoList, [] { deliverScope(0, 4, 0x80, {}); });
    expectOutcome("rscn", 1, ZTSR_NoList, [] { deliverRscn(0, makeRscn({1, 2, 3})); });
}

TEST_F(StatusPageOutcomes, AnEventThatFindsNoMemoryFailsAndTheNextOneCounts) {
    collect();
    deliverTemperature(0);
    retrieve();
    expectOutcome("temperature", 1, ZTSR_Failed,
                  [] { ASSERT_TRUE(failAllocation(1, [] { ScopeCb_KpmTemp(0, 1, 2); })); });
    expectOutcome("temperature", 1, scConsolidated, [] { deliverTemperature(0); });
}

TEST_F(StatusPageOutcomes, ThePagesBehindOneThatFindsNoMemoryFailWithIt) {
    collect();
    setLogCode(0);
    deliverRscn(0, makeRscn({1}));
    const ZTCBytes lPayload = makeRscn({2, 3, 4, 5});
    const std::uint64_t lBefore = row(0, "rscn").mConsolidated;
    std::uint64_t lDelivered = 0;
    std::set<std::uint64_t> lConsolidated;
    const unsigned lFailures = failEachAllocation(
        [&] {
            ++lDelivered;
            ScopeCb_KpmRscn(0, const_cast<unsigned char*>(lPayload.data()), static_cast<unsigned>(lPayload.size()));
        },
        [&] {
            const ZTSStatusRowCopy lRow = row(0, "rscn");
            EXPECT_EQ(4 * lDelivered, lRow.mConsolidated - lBefore + lRow.mRefused[ZTSR_Failed]);
            lConsolidated.insert((lRow.mConsolidated - lBefore) % 4);
        });
    EXPECT_LE(4u, lFailures) << "each page allocates";
    EXPECT_LT(1u, lConsolidated.size()) << "some failures came after the first page";
}
