#include "sensor/client/include/RecordTable.h"

#include <gtest/gtest.h>

#include <sstream>

#include "sensor/client/include/ResponseDecoder.h"
#include "tests/unit/client/WireSamples.h"

TEST(RecordTable, ColumnsAreAlignedAndTotalsFollow) {
    const auto lKinds = makeSampleKinds();
    const ZTSResponse lResponse = decodeResponse(
        makeSampleResponse(1, {makeSampleList(gcSampleKey, {makeSampleRecord(1, 0x01, lKinds[0].mData, true, 12),
                                                            makeSampleRecord(8, 0x02, lKinds[17].mData, false, 3)})}));
    EXPECT_EQ(
        formatTable(lResponse),
        "INITIATOR                KIND   REMOTE PORT              COUNT  FIRST                       LAST             "
        "           DETAILS\n"
        "10:00:00:00:c9:00:00:01  plogi  50:06:01:60:3b:a0:12:34     12  2026-03-04 05:06:07.089012  2026-03-04 "
        "05:06:07.089012  nodeName=50:06:01:60:bb:a0:12:34\n"
        "10:00:00:00:c9:00:00:01  link   -                            3  2026-03-04 05:06:07.089012  2026-03-04 "
        "05:06:07.089012  -\n"
        "2 records, 15 occurrences from 1 initiator\n");
}

TEST(RecordTable, NoRecordsAreSaidSo) {
    EXPECT_EQ(formatTable(decodeResponse(makeSampleResponse(0, {})), false),
              "0 records, 0 occurrences from 0 initiators\n");
}

TEST(RecordTable, TheRegisteredNameWinsOverTheDataAndBothAreShown) {
    ZTSReceivedRecord lRecord;
    lRecord.mCategory = 1;
    lRecord.mSubcategory = 0x02;
    lRecord.mEventData = makeSampleKinds()[1].mData;
    EXPECT_EQ(formatRemotePort(lRecord), gcSamplePortText);
    lRecord.mNames = ZTSReceivedNames{ZTSFcName::fromText("0000000000000001"), {}};
    EXPECT_EQ(formatRemotePort(lRecord), "00:00:00:00:00:00:00:01");
    EXPECT_EQ(formatDetails(lRecord), std::string("portName=") + gcSamplePortText);
}

TEST(RecordTable, AKeyThatIsNoPairOfNamesIsShownWithoutControlCharacters) {
    const ZTSResponse lResponse =
        decodeResponse(makeSampleResponse(1, {makeSampleList("bad\n\x1b[2Jkey", {makeSampleRecord(8, 2, {})})}));
    EXPECT_NE(formatTable(lResponse).find("bad\\x0a\\x1b[2Jkey"), std::string::npos);
}

TEST(RecordTable, EqualEntriesAreCountedWhereverTheyStand) {
    ZTSReceivedRecord lRecord;
    lRecord.mCategory = 4;
    lRecord.mSubcategory = 0x08;
    ZTCByteWriter lWriter;
    lWriter.le32(1).wwn(makeWwn(gcSamplePort)).le32(7).le32(2).le32(7).le32(0xFFFFFFFF).le32(2).le32(7);
    lRecord.mEventData = lWriter.bytes();
    EXPECT_EQ(formatDetails(lRecord), "resets=[7*3 2*2 all]");
}
