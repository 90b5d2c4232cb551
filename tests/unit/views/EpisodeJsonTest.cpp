#include "sensor/views/include/EpisodeJson.h"

#include <gmock/gmock.h>

#include "sensor/views/include/EpisodeText.h"
#include "tests/unit/views/ViewSamples.h"

using testing::HasSubstr;
using ZTCJson = nlohmann::ordered_json;

class EpisodeJson : public LocalTime {
protected:
    EpisodeJson() { mNames.addName(wwnOf("50:06:01:60:3b:a0:12:34"), "array7 ctrl-A"); }

    ZTCNameBook mNames;
};

TEST_F(EpisodeJson, AnEpisodeHasTheMembersThatEveryOutputShares) {
    EXPECT_EQ(toJson(makeQueueFullEpisode(), mNames).dump(),
              R"({"seq":41,"episode":12,"phase":"closed","kind":"queue-full",)"
              R"("initiator":{"wwpn":"10:00:00:00:c9:00:00:01","wwnn":"20:00:00:00:c9:00:00:01","host":"host7"},)"
              R"("remotePort":{"wwpn":"50:06:01:60:3b:a0:12:34","wwnn":null,"fcId":"010200","name":"array7 ctrl-A",)"
              R"("rport":null},)"
              R"("count":20000,"first":"2026-11-21T09:58:03.555216+01:00","last":"2026-11-21T09:58:40.000000+01:00",)"
              R"("luns":{"all":false,"numbers":[0,1,40]},"devices":null,"detail":{}})");
}

TEST_F(EpisodeJson, SenseDataStandInTheDetail) {
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    lEpisode.mKind = *findKind("check-condition");
    lEpisode.mDetail.mSenseKey = 6;
    lEpisode.mDetail.mAsc = 41;
    lEpisode.mDetail.mAscqs = {0};
    lEpisode.mDetail.mCommandCodes = {40};
    EXPECT_EQ(toJson(lEpisode, mNames)["detail"].dump(), R"({"senseKey":6,"asc":41,"ascqs":[0],"commandCodes":[40]})");
    EXPECT_EQ(formatDetail(lEpisode), "LUNs 0,1,40; sense 06, ASC 29, ASCQ 00; commands 28");
    lEpisode.mDetail.mAsc = 0xFFFFFFFF;
    EXPECT_EQ(toJson(lEpisode, mNames)["detail"]["asc"], nullptr);
    EXPECT_THAT(formatDetail(lEpisode), HasSubstr("ASC ?"));
}

TEST_F(EpisodeJson, WhatIsNotKnownIsNull) {
    ZTSEpisode lEpisode;
    lEpisode.mKind = *findKind("link");
    const ZTCJson lJson = toJson(lEpisode, mNames);
    EXPECT_EQ(lJson["remotePort"], nullptr);
    EXPECT_EQ(lJson["luns"], nullptr);
    EXPECT_EQ(lJson["initiator"]["wwpn"], nullptr);
    EXPECT_EQ(lJson["initiator"]["host"], nullptr);
    EXPECT_EQ(formatDetail(lEpisode), "");
}

TEST_F(EpisodeJson, ReasonsBearTheNamesOfTheirKind) {
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    lEpisode.mDetail.mLuns.reset();
    lEpisode.mKind = *findKind("lsrjt");
    lEpisode.mDetail.mOriginalCommand = 3;
    lEpisode.mDetail.mReasons = {{.mValue = 9, .mExplanation = 0x2a, .mCount = 2}};
    EXPECT_EQ(toJson(lEpisode, mNames)["detail"].dump(),
              R"({"originalCommand":3,"reasons":[{"reasonCode":9,"explanation":42,"count":2}]})");
    EXPECT_EQ(formatDetail(lEpisode), "ELS 03; reasons 09/2a*2");
    lEpisode.mDetail.mOriginalCommand.reset();
    lEpisode.mKind = *findKind("queue-depth");
    EXPECT_EQ(toJson(lEpisode, mNames)["detail"].dump(), R"({"reasons":[{"depth":9,"count":2}]})");
}

TEST_F(EpisodeJson, AnRscnSaysWhatItsAddressMeans) {
    ZTSEpisode lEpisode;
    lEpisode.mKind = *findKind("rscn");
    lEpisode.mDetail.mPage = 0x02010200;
    EXPECT_EQ(toJson(lEpisode, mNames)["detail"].dump(), R"({"addressFormat":"domain","address":"010200"})");
    EXPECT_EQ(formatDetail(lEpisode), "domain 010200");
}

TEST_F(EpisodeJson, RowsOfTablesNamePortsAndAdapters) {
    ZTCTextTable lTable = makeEpisodeTable(0);
    addRow(lTable, makeQueueFullEpisode(), mNames, timeOf("2026-11-21T10:04:12+01:00"));
    EXPECT_EQ(lTable.takeText(),
              "EPISODE  LAST      STATE    COUNT  KIND        INITIATOR  REMOTE PORT    DETAIL\n"
              "     12  09:58:40  closed  20,000  queue-full  host7      array7 ctrl-A  LUNs 0,1,40\n");
}

TEST_F(EpisodeJson, ARecordHasItsFieldsByName) {
    ZTSStoredRecord lRecord;
    lRecord.mSeq = 5;
    lRecord.mEpisode = 2;
    lRecord.mKind = *findKind("link");
    lRecord.mRecord.mOccurrences = 3;
    lRecord.mRecord.mCategory = 8;
    lRecord.mRecord.mSubcategory = 2;
    lRecord.mRecord.mEventData = {1, 0, 0, 0};
    lRecord.mRecord.mBegin.mEpochSeconds = 1795251852;
    lRecord.mRecord.mBegin.mMilliseconds = 7;
    lRecord.mRecord.mBegin.mMicroseconds = 8;
    const ZTCJson lJson = toJson(lRecord, mNames);
    EXPECT_EQ(lJson["seq"], 5);
    EXPECT_EQ(lJson["count"], 3);
    EXPECT_EQ(lJson["first"], "2026-11-21T10:04:12.007008+01:00");
    EXPECT_EQ(lJson["data"]["version"], 1);
    EXPECT_EQ(lJson["dataHex"], "01000000");
}

TEST_F(EpisodeJson, APortsRowCountsByKindWithTheMostFirst) {
    ZTSPortSummary lPort;
    lPort.mPort = *makeQueueFullEpisode().mRemotePort;
    lPort.mCounts = {{*findKind("logo"), 4}, {*findKind("queue-full"), 20000}};
    lPort.mInitiators = {makeQueueFullEpisode().mInitiator};
    lPort.mOccurrences = 20004;
    lPort.mLastEvent = timeOf("2026-11-20T09:58:40+01:00");
    const ZTCJson lJson = toJson(lPort, mNames);
    EXPECT_EQ(lJson["remotePort"]["name"], "array7 ctrl-A");
    EXPECT_EQ(lJson["kinds"].dump(), R"({"logo":4,"queue-full":20000})");
    EXPECT_EQ(lJson["count"], 20004);
    EXPECT_EQ(lJson["state"], nullptr);
    ZTCTextTable lTable = makePortTable(0);
    addRow(lTable, lPort, mNames, timeOf("2026-11-21T10:04:12+01:00"));
    EXPECT_THAT(
        lTable.takeText(),
        HasSubstr("50:06:01:60:3b:a0:12:34  array7 ctrl-A  -      20,004  20 Nov 09:58  host7       queue-full 20,000, "
                  "logo 4\n"));
}
