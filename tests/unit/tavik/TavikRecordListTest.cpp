#include "tavik/include/TavikRecordList.h"

#include <gtest/gtest.h>

#include "tests/unit/agentcommon/support/BufferBytes.h"

static ZTCPointer<ZTCTavikRecord> sMakeRecord(unsigned char aMark) {
    const ZTCPointer<ZTCScopeEvent> lEvent(new ZTCScopeEvent(1, 1));
    return ZTCPointer<ZTCTavikRecord>::make(ZTCPointer<ZTCScopeData>::make(lEvent, &aMark, 1u, 0u));
}

TEST(TavikRecordList, AnEmptyOneEncodesAsOneZero) {
    const ZTCTavikRecordList lList(7, nullptr);
    EXPECT_EQ("00000000", hexOf(encodingOf(lList)));
    EXPECT_EQ(0u, lList.size());
    EXPECT_EQ(7u, lList.getBoardId());
}

TEST(TavikRecordList, EncodesItsSizeThenEachRecordInTheOrderOfAdding) {
    ZTCTavikRecordList lList(0, nullptr);
    std::string lExpected = "00000003";
    for (const unsigned char lMark : std::initializer_list<unsigned char>{0x11, 0x22, 0x33}) {
        ZTCPointer<ZTCTavikRecord> lRecord = sMakeRecord(lMark);
        lList.addRecord(lRecord);
        lExpected += hexOf(encodingOf(*lRecord));
    }
    EXPECT_EQ(3u, lList.size());
    EXPECT_EQ(lExpected, hexOf(encodingOf(lList)));
}

TEST(TavikRecordList, IsWalkedInTheOrderOfAdding) {
    ZTCTavikRecordList lList(0, nullptr);
    ZTCPointer<ZTCTavikRecord> lFirst = sMakeRecord(1);
    ZTCPointer<ZTCTavikRecord> lSecond = sMakeRecord(2);
    lList.addRecord(lFirst);
    lList.addRecord(lSecond);
    std::vector<const ZTCTavikRecord*> lWalked;
    for (const ZTCPointer<ZTCTavikRecord>& lrRecord : lList) {
        lWalked.push_back(lrRecord.get());
    }
    EXPECT_EQ((std::vector<const ZTCTavikRecord*>{lFirst.get(), lSecond.get()}), lWalked);
}

TEST(TavikRecordList, ClearingReleasesTheRecordsAndKeepsTheBoard) {
    ZTCTavikRecordList lList(3, nullptr);
    ZTCPointer<ZTCTavikRecord> lRecord = sMakeRecord(1);
    lList.addRecord(lRecord);
    lList.clear();
    EXPECT_EQ(0u, lList.size());
    EXPECT_EQ("00000000", hexOf(encodingOf(lList)));
    EXPECT_EQ(3u, lList.getBoardId());
    EXPECT_EQ(1u, lRecord->getScopeData()->getEventDataSize()) << "another holder keeps its record";
}
