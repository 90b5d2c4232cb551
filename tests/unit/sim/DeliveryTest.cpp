#include "libkpm/sim/src/Delivery.h"

#include <gtest/gtest.h>

#include <cctype>
#include <cstring>
#include <ostream>
#include <set>
#include <string>
#include <vector>

#include "tests/unit/sim/Recorder.h"

static ZTSSimDelivery sMake(const std::string& acrLine, std::uint32_t aBoard = 0, std::uint64_t aOccurrence = 0,
                            std::uint32_t aLinkTag = 1) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    const ZTSSimEventLine lLine = parseSimEventLine(acrLine, lScenario);
    return makeSimDelivery(lScenario, std::get<ZTSSimEvent>(lLine), aBoard, aOccurrence, aLinkTag);
}

/// The bytes of words (eight hex digits: a number; sixteen: a name) in the order of the host.
static std::vector<std::uint8_t> sBytes(const std::vector<std::string>& acrWords) {
    std::vector<std::uint8_t> lBytes;
    for (const std::string& lrWord : acrWords) {
        const std::uint64_t lNumber = std::stoull(lrWord, nullptr, 16);
        if (lrWord.size() == 8) {
            const auto lShort = static_cast<std::uint32_t>(lNumber);
            const auto* lpPlace = reinterpret_cast<const std::uint8_t*>(&lShort);
            lBytes.insert(lBytes.end(), lpPlace, lpPlace + sizeof lShort);
        } else {
            for (int lShift = 56; lShift >= 0; lShift -= 8) {
                lBytes.push_back(static_cast<std::uint8_t>(lNumber >> lShift));
            }
        }
    }
    return lBytes;
}

struct ZTSExpectedPayload {
    const char* mpLine;
    unsigned mCategory;
    unsigned mSubcategory;
    std::vector<std::string> mWords;
};

/// For the list of tests: the line without what a test's name cannot hold.
static void PrintTo(const ZTSExpectedPayload& acrPayload, std::ostream* apStream) {
    for (const char* lpChar = acrPayload.mpLine; *lpChar != '\0'; ++lpChar) {
        *apStream << (std::isalnum(static_cast<unsigned char>(*lpChar)) != 0 ? *lpChar : '_');
    }
}

class DeliveryPayload : public testing::TestWithParam<ZTSExpectedPayload> {};

TEST_P(DeliveryPayload, IsTheKindsStructure) {
    const ZTSExpectedPayload& lrExpected = GetParam();
    const ZTSSimDelivery lDelivery = sMake(lrExpected.mpLine);
    EXPECT_EQ(lDelivery.mCategory, lrExpected.mCategory);
    EXPECT_EQ(lDelivery.mSubcategory, lrExpected.mSubcategory);
    EXPECT_EQ(lDelivery.mData, sBytes(lrExpected.mWords));
    EXPECT_EQ(lDelivery.mEventSize, 40 + lDelivery.mData.size());
    EXPECT_EQ(lDelivery.mIsPayloadNull, lrExpected.mWords.empty());
    EXPECT_FALSE(lDelivery.mIsDataNull);
    EXPECT_EQ(lDelivery.mToldBoard, 0u);
    EXPECT_EQ(lDelivery.mLocal.wwn[7], 1);
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, DeliveryPayload,
    testing::Values(
        ZTSExpectedPayload{"plogi version=5", 1, 0x01, {"00000005", "3000000000000101", "3000000000000181"}},
        ZTSExpectedPayload{
            "plogi portname=tape0 nodename=tape0", 1, 0x01, {"00000000", "3000000000000102", "3000000000000182"}},
        ZTSExpectedPayload{
            "prlo version=1 remoteport=40:00:00:00:00:00:00:07", 1, 0x02, {"00000001", "4000000000000007"}},
        ZTSExpectedPayload{"adisc port=tape0", 1, 0x04, {"00000000", "3000000000000102", "3000000000000182"}},
        ZTSExpectedPayload{"lsrjt command=1 reason=2 explanation=3",
                           1,
                           0x08,
                           {"00000000", "3000000000000101", "00000001", "00000002", "00000003"}},
        ZTSExpectedPayload{"logo payloadport=tape0", 1, 0x10, {"00000000", "3000000000000101", "3000000000000102"}},
        ZTSExpectedPayload{"fabric-busy", 2, 0x01, {}},
        ZTSExpectedPayload{"port-busy port=tape0", 2, 0x02, {"00000000", "3000000000000102"}},
        ZTSExpectedPayload{"fcp-read-check lun=all opcode=0x88 parameter=0x12345678",
                           2,
                           0x04,
                           {"00000000", "3000000000000101", "ffffffff", "00000088", "12345678"}},
        ZTSExpectedPayload{"queue-full lun=300", 4, 0x01, {"00000000", "3000000000000101", "0000012c"}},
        ZTSExpectedPayload{"device-busy lun=1", 4, 0x02, {"00000000", "3000000000000101", "00000001"}},
        ZTSExpectedPayload{
            "check-condition lun=1 opcode=2 sense=3 asc=4 ascq=unknown",
            4,
            0x04,
            {"00000000", "3000000000000101", "00000001", "00000002", "00000003", "00000004", "ffffffff"}},
        ZTSExpectedPayload{"lun-reset lun=2", 4, 0x08, {"00000000", "3000000000000101", "00000002"}},
        ZTSExpectedPayload{"target-reset lun=3", 4, 0x10, {"00000000", "3000000000000101", "00000003"}},
        ZTSExpectedPayload{"bus-reset", 4, 0x20, {}},
        ZTSExpectedPayload{"queue-depth lun=1 old=2 new=3",
                           4,
                           0x40,
                           {"00000000", "3000000000000101", "00000001", "00000002", "00000003"}},
        ZTSExpectedPayload{"port-interrupt", 8, 0x01, {}}, ZTSExpectedPayload{"adapter-arrival", 16, 0x01, {}}));

TEST(Delivery, EveryScopeKindHasTheSizeOfItsStructure) {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        if (getSimKind(lKind).mDelivery == ZTSD_Scope) {
            const ZTSSimDelivery lDelivery = sMake(getSimKind(lKind).mpName);
            EXPECT_EQ(lDelivery.mData.size(), gcScopeEventKinds[lKind].mDataSize);
            EXPECT_EQ(lDelivery.mCategory, gcScopeEventKinds[lKind].mDeliveredCategory);
            EXPECT_EQ(lDelivery.mSubcategory, gcScopeEventKinds[lKind].mDeliveredSubcategory);
        }
    }
}

static LINKINFO sLinkInfo(const ZTSSimDelivery& acrDelivery) {
    LINKINFO lInfo{};
    EXPECT_EQ(acrDelivery.mData.size(), sizeof lInfo);
    std::memcpy(&lInfo, acrDelivery.mData.data(), std::min(sizeof lInfo, acrDelivery.mData.size()));
    return lInfo;
}

TEST(Delivery, LinkEventsGoDownAndUpByDefault) {
    const LINKINFO lDown = sLinkInfo(sMake("link", 1, 0, 3));
    EXPECT_EQ(lDown.a_linkEventTag, 3u);
    EXPECT_EQ(lDown.a_linkUp, 1u);
    EXPECT_EQ(lDown.a_linkDown, 2u);
    EXPECT_EQ(lDown.a_DID, 0u);
    EXPECT_EQ(lDown.a_wwpName.wwn[7], 0x02);
    EXPECT_EQ(lDown.a_wwnName.wwn[7], 0x82);
    const LINKINFO lUp = sLinkInfo(sMake("link", 1, 0, 4));
    EXPECT_EQ(lUp.a_linkUp, 2u);
    EXPECT_EQ(lUp.a_linkDown, 2u);
    EXPECT_EQ(lUp.a_DID, 0x020000u);
}

TEST(Delivery, EveryFieldOfALinkEventCanBeSet) {
    const LINKINFO lInfo =
        sLinkInfo(sMake("link tag=1 up=2 down=3 multi=4 did=5 topology=6 state=7 alpa=8 alpacount=9 alpamap=0a:0b "
                        "wwpn=40:00:00:00:00:00:00:0c wwnn=tape0"));
    EXPECT_EQ(lInfo.a_linkEventTag, 1u);
    EXPECT_EQ(lInfo.a_linkUp, 2u);
    EXPECT_EQ(lInfo.a_linkDown, 3u);
    EXPECT_EQ(lInfo.a_linkMulti, 4u);
    EXPECT_EQ(lInfo.a_DID, 5u);
    EXPECT_EQ(lInfo.a_topology, 6);
    EXPECT_EQ(lInfo.a_linkState, 7);
    EXPECT_EQ(lInfo.a_alpa, 8);
    EXPECT_EQ(lInfo.a_alpaCnt, 9);
    EXPECT_EQ(lInfo.a_alpaMap[0], 10);
    EXPECT_EQ(lInfo.a_alpaMap[1], 11);
    EXPECT_EQ(lInfo.a_alpaMap[2], 0);
    EXPECT_EQ(lInfo.a_wwpName.wwn[7], 0x0c);
    EXPECT_EQ(lInfo.a_wwnName.wwn[7], 0x82);
}

TEST(Delivery, RawDataOfALinkEventAreFilledUp) {
    const ZTSSimDelivery lDelivery = sMake("link data=ff");
    EXPECT_EQ(lDelivery.mData.size(), sizeof(LINKINFO));
    EXPECT_EQ(lDelivery.mData[0], 0xff);
    EXPECT_EQ(lDelivery.mData[1], 0);
}

TEST(Delivery, AnRscnStandsAsOnTheWire) {
    const ZTSSimDelivery lDelivery = sMake("rscn pages=port:0x010203,area:0x0a0b0c");
    EXPECT_EQ(lDelivery.mData, (std::vector<std::uint8_t>{0x61, 4, 0, 12, 0, 1, 2, 3, 1, 0x0a, 0x0b, 0x0c}));
    EXPECT_EQ(lDelivery.mLength, 12u);
    EXPECT_EQ(countSimPages(lDelivery), 2u);
}

TEST(Delivery, AnRscnWithoutPagesNamesItsRemotePort) {
    EXPECT_EQ(sMake("rscn port=disk0,tape0", 0, 1).mData, (std::vector<std::uint8_t>{0x61, 4, 0, 8, 0, 4, 5, 6}));
}

TEST(Delivery, AnRscnsHeaderCanBeSet) {
    const ZTSSimDelivery lDelivery = sMake("rscn command=1 pagelength=2 payloadlength=0 pages=none");
    EXPECT_EQ(lDelivery.mData, (std::vector<std::uint8_t>{1, 2, 0, 0}));
    EXPECT_EQ(countSimPages(lDelivery), 0u);
}

TEST(Delivery, AnRscnIsBackedByAsManyBytesAsItStates) {
    const ZTSSimDelivery lDelivery = sMake("rscn payloadlength=0xFFFF");
    EXPECT_EQ(lDelivery.mLength, 8u);
    EXPECT_EQ(lDelivery.mData.size(), 65535u);
    EXPECT_EQ(countSimPages(lDelivery), 16382u);
}

TEST(Delivery, TheLengthOfAnRscnCanBeShortOrLong) {
    EXPECT_EQ(sMake("rscn length=7").mLength, 7u);
    EXPECT_EQ(countSimPages(sMake("rscn length=7")), 0u);
    const ZTSSimDelivery lLong = sMake("rscn length=100");
    EXPECT_EQ(lLong.mLength, 100u);
    EXPECT_EQ(lLong.mData.size(), 100u);
    EXPECT_EQ(countSimPages(lLong), 1u);
}

TEST(Delivery, TemperatureHoldsItsTwoValues) {
    EXPECT_EQ(sMake("temperature first=7 second=8").mData, sBytes({"00000007", "00000008"}));
}

TEST(Delivery, ValuesOfAListComeOneAfterTheOther) {
    EXPECT_EQ(sMake("queue-full lun=1,2,3 port=disk0,tape0", 0, 4).mData,
              sBytes({"00000000", "3000000000000101", "00000002"}));
    EXPECT_EQ(sMake("queue-full lun=1,2,3 port=disk0,tape0", 0, 5).mData,
              sBytes({"00000000", "3000000000000102", "00000003"}));
}

TEST(Delivery, TheCallbackCanBeToldOtherThings) {
    const ZTSSimDelivery lDelivery =
        sMake("plogi as=77 category=300 subcategory=0xFFFFFFFF local=40:00:00:00:00:00:00:09", 1);
    EXPECT_EQ(lDelivery.mBoard, 1u);
    EXPECT_EQ(lDelivery.mToldBoard, 77u);
    EXPECT_EQ(lDelivery.mCategory, 300u);
    EXPECT_EQ(lDelivery.mSubcategory, 0xFFFFFFFFu);
    EXPECT_EQ(lDelivery.mLocal.wwn[7], 9);
}

TEST(Delivery, DataCanBeRawShortLongOrMissing) {
    EXPECT_EQ(sMake("plogi data=0102").mData, (std::vector<std::uint8_t>{1, 2}));
    EXPECT_EQ(sMake("plogi data=0102").mEventSize, 42u);
    EXPECT_EQ(sMake("plogi length=19").mEventSize, 59u);
    EXPECT_EQ(sMake("plogi length=19").mData.size(), 19u);
    EXPECT_EQ(sMake("plogi length=30").mData.size(), 30u);
    EXPECT_TRUE(sMake("plogi data=null").mIsDataNull);
    EXPECT_EQ(sMake("plogi data=null").mEventSize, 60u);
    EXPECT_FALSE(sMake("plogi data=null").mIsPayloadNull);
    EXPECT_TRUE(sMake("plogi payload=null").mIsPayloadNull);
    EXPECT_FALSE(sMake("bus-reset length=3").mIsPayloadNull);
}

TEST(Delivery, AClaimedSizeIsBackedByBytes) {
    const ZTSSimDelivery lDelivery = sMake("plogi size=0x1000003E8");
    EXPECT_EQ(lDelivery.mEventSize, 0x1000003E8u);
    EXPECT_EQ(lDelivery.mData.size(), 960u);
    EXPECT_EQ(sMake("plogi size=39").mData.size(), 20u);
}

static ZTSSimStorm sStorm(const std::string& acrFields) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    return std::get<ZTSSimStorm>(parseSimEventLine("storm count=2000 " + acrFields, lScenario));
}

static std::vector<std::vector<std::uint8_t>> sStormData(const std::string& acrFields) {
    const ZTSSimScenario lScenario = readScenario(gcTwoAdapters);
    const ZTSSimStorm lStorm = sStorm(acrFields);
    std::vector<std::vector<std::uint8_t>> lData;
    for (std::uint64_t lNumber = 0; lNumber < lStorm.mCount; ++lNumber) {
        const ZTSSimEvent lEvent = drawSimEvent(lStorm, lNumber);
        lData.push_back(makeSimDelivery(lScenario, lEvent, lEvent.mBoards.mBoards.at(0), 0, 1).mData);
    }
    return lData;
}

TEST(Delivery, AStormDependsOnItsSeedAlone) {
    EXPECT_EQ(sStormData("seed=5 threads=1"), sStormData("seed=5 threads=9"));
    EXPECT_NE(sStormData("seed=5"), sStormData("seed=6"));
}

TEST(Delivery, AStormMixesAllKindsBoardsPortsAndLuns) {
    std::set<std::size_t> lKinds;
    std::set<std::uint32_t> lBoards;
    std::set<std::string> lPorts;
    std::set<std::size_t> lPages;
    std::set<std::vector<std::uint8_t>> lLuns;
    const ZTSSimStorm lStorm = sStorm("lun=3,all");
    for (std::uint64_t lNumber = 0; lNumber < lStorm.mCount; ++lNumber) {
        const ZTSSimEvent lEvent = drawSimEvent(lStorm, lNumber);
        lKinds.insert(lEvent.mKind);
        lBoards.insert(lEvent.mBoards.mBoards.at(0));
        lPorts.insert(lEvent.mPorts.at(0).mName);
        if (lEvent.mPages) {
            lPages.insert(lEvent.mPages->size());
        }
        for (const ZTSSimSetting& lrSetting : lEvent.mSettings) {
            if (std::string(lrSetting.mpField->mpName) == "lun") {
                lLuns.insert(lrSetting.mValues.at(0));
            }
        }
    }
    EXPECT_EQ(lKinds.size(), gcSimKindCount);
    EXPECT_EQ(lBoards, (std::set<std::uint32_t>{0, 1}));
    EXPECT_EQ(lPorts, (std::set<std::string>{"disk0", "tape0"}));
    EXPECT_EQ(lPages, (std::set<std::size_t>{1, 2, 3, 4}));
    EXPECT_EQ(lLuns, (std::set<std::vector<std::uint8_t>>{{3, 0, 0, 0}, {255, 255, 255, 255}}));
}

TEST(Delivery, AStormKeepsToItsKinds) {
    const ZTSSimStorm lStorm = sStorm("kind=prlo");
    for (std::uint64_t lNumber = 0; lNumber < 100; ++lNumber) {
        EXPECT_EQ(drawSimEvent(lStorm, lNumber).mKind, findKindIndex("prlo"));
    }
}
