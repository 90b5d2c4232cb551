#include <gtest/gtest.h>

#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class PendingRecord : public ZTCTavikFixture {
protected:
    PendingRecord() { bringUp(2); }

    std::string droppedText(unsigned aBoard) const {
        return "-E- Dropping the pending scope record of board " + std::to_string(aBoard) +
               ": the board has no record list any more";
    }
};

}  // namespace

TEST_F(PendingRecord, ItsCapacityIsTheLimitOfTheStartCommand) {
    registerTargets({{makeWwn(1), makeWwn(2), 3}});
    const ZTCBytes lKnown = ZTCByteWriter().le32(0).wwn(makeWwn(2)).le32(0).bytes();
    const ZTCBytes lUnknown = ZTCByteWriter().le32(0).wwn(makeWwn(9)).le32(0).bytes();
    for (const unsigned lLimit : {0u, 77u, 0xFFFFFFFFu}) {
        startScope(lLimit);
        deliverScope(0, 4, 1, lKnown);
        EXPECT_EQ(lLimit, mSystem->pendingCapacity());
        deliverScope(0, 4, 1, lUnknown);
        EXPECT_EQ(lLimit, mSystem->pendingCapacity());
        deliverRscn(0, makeRscn({1}));
        EXPECT_EQ(lLimit, mSystem->pendingCapacity());
        deliverTemperature(0);
        EXPECT_EQ(lLimit, mSystem->pendingCapacity());
    }
}

TEST_F(PendingRecord, IsInNoListUntilAnotherOneTakesItsPlace) {
    mSystem->makePendingRecord(1, 8);
    EXPECT_TRUE(mSystem->hasPendingRecord());
    EXPECT_EQ(1u, mSystem->pendingBoard());
    EXPECT_EQ(0u, mSystem->recordListSize(1));
    mSystem->makePendingRecord(0, 4);
    EXPECT_EQ(1u, mSystem->recordListSize(1));
    EXPECT_EQ(0u, mSystem->recordListSize(0));
    EXPECT_EQ(0u, mSystem->pendingBoard());
    EXPECT_EQ("eeeeeeee", mSystem->pendingDataHex());
}

TEST_F(PendingRecord, IsFiledOnceWhenItIsFlushed) {
    mSystem->makePendingRecord(1, 8);
    mSystem->filePendingRecord();
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(1u, mSystem->recordListSize(1));
    mSystem->filePendingRecord();
    EXPECT_EQ(1u, mSystem->recordListSize(1));
    mSystem->makePendingRecord(1, 8);
    EXPECT_EQ(1u, mSystem->recordListSize(1));
}

TEST_F(PendingRecord, StartingAndAppendingAddToTheTotalAndCountingDoesNot) {
    mSystem->makePendingRecord(0, 20);
    EXPECT_EQ(20u, mSystem->getTotalEventDataSize());
    mSystem->countOnPendingRecord();
    EXPECT_EQ(20u, mSystem->getTotalEventDataSize());
    mSystem->appendToPendingRecord(bytesOf("0102030405060708"));
    EXPECT_EQ(28u, mSystem->getTotalEventDataSize());
    mSystem->makePendingRecord(1, 4);
    EXPECT_EQ(32u, mSystem->getTotalEventDataSize());
    mSystem->resetTotalEventDataSize();
    EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
    const ZTSScopeDataResponse lResponse = retrieve();
    EXPECT_EQ(std::vector<std::string>{"238/238 x3 " + std::string(40, 'e') + "0102030405060708"}, lResponse.texts(0));
    EXPECT_EQ(std::vector<std::string>{"238/238 x1 eeeeeeee"}, lResponse.texts(1));
}

TEST_F(PendingRecord, GrowsWhileItStaysStrictlyBelowTheLimit) {
    mSystem->makePendingRecord(0, 24);
    for (const unsigned lLimit : {25u, 31u, 32u, 33u, 4096u}) {
        mSystem->setMaxEventDataSize(lLimit);
        EXPECT_EQ(lLimit, mSystem->getMaxEventDataSize());
        EXPECT_EQ(24 + 8 < lLimit, mSystem->canAddToPendingRecord(8)) << lLimit;
        EXPECT_EQ(24 + 0 < lLimit, mSystem->canAddToPendingRecord(0)) << lLimit;
    }
}

TEST_F(PendingRecord, ALimitOfZeroLetsNothingIn) {
    mSystem->makePendingRecord(0, 0);
    mSystem->setMaxEventDataSize(0);
    EXPECT_FALSE(mSystem->canAddToPendingRecord(0));
    EXPECT_FALSE(mSystem->canAddToPendingRecord(4));
}

TEST_F(PendingRecord, TheLargestLimitAndTheLargestLengthDoNotOverflow) {
    mSystem->makePendingRecord(0, 24);
    mSystem->setMaxEventDataSize(0xFFFFFFFF);
    EXPECT_TRUE(mSystem->canAddToPendingRecord(8));
    EXPECT_TRUE(mSystem->canAddToPendingRecord(0xFFFFFFFF - 25));
    EXPECT_FALSE(mSystem->canAddToPendingRecord(0xFFFFFFFF - 24));
    EXPECT_FALSE(mSystem->canAddToPendingRecord(0xFFFFFFFF));
    mSystem->setMaxEventDataSize(16);
    EXPECT_FALSE(mSystem->canAddToPendingRecord(0xFFFFFFFF));
}

TEST_F(PendingRecord, WhoseBoardHasLostItsListIsReportedAndDroppedWhenItIsFlushed) {
    mSystem->makePendingRecord(1, 8);
    mSystem->exchangeRecordLists(1);
    mSystem->filePendingRecord();
    EXPECT_EQ(std::vector<std::string>{droppedText(1)}, mLog.texts());
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(0u, mSystem->recordListSize(0));
}

TEST_F(PendingRecord, WhoseBoardHasLostItsListIsReportedAndDroppedWhenAnEventTakesItsPlace) {
    mDoScopeCollection = true;
    mSystem->makePendingRecord(1, 8);
    mSystem->exchangeRecordLists(1);
    const ZTSDeliveredKind& lcrKind = kindNamed("plogi");
    deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mPayload);
    EXPECT_EQ((std::vector<std::string>{"-N- " + lcrKind.notice(), droppedText(1)}), mLog.texts());
    EXPECT_EQ(std::vector<std::string>{"1/1 x1 " + lcrKind.mRecordHex}, retrieveTexts());
}

TEST_F(PendingRecord, TheTotalLimitIsReachedAtExactlyItsValue) {
    mSystem->makePendingRecord(0, 262143);
    EXPECT_FALSE(mSystem->isTotalLimitOnScopeDataReached());
    EXPECT_TRUE(mLog.texts().empty());
    mSystem->makePendingRecord(0, 1);
    EXPECT_TRUE(mSystem->isTotalLimitOnScopeDataReached());
    EXPECT_EQ(std::vector<std::string>{"-N- Current size = 262144"}, mLog.texts());
    mSystem->makePendingRecord(0, 100);
    EXPECT_TRUE(mSystem->isTotalLimitOnScopeDataReached());
    EXPECT_TRUE(mLog.has("-N- Current size = 262244"));
    EXPECT_EQ(262144u, gcMaxScopeDataSize);
}
