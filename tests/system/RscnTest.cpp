#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

static std::string sRecord(unsigned aOccurrences, std::uint32_t aPage, const std::string& acrNames = "") {
    return "1/32 x" + std::to_string(aOccurrences) + " " + acrNames + rscnRecord(aPage);
}

TEST(Rscn, APageIsRecordedByteForByte) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({0x00A1B2C3})));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"1/32 x1 01000000c3b2a100"});
    EXPECT_EQ(lAgent.log().count("Got an RSCN event: datalength:8", "-I-"), 1u);
    EXPECT_EQ(lAgent.log().count("lPayloadLength = 8", "-I-"), 1u);
    EXPECT_EQ(lAgent.log().count("Processing Rscn Event Cat=1 SubCat=32", "-N-"), 1u);
}

TEST(Rscn, SevenBytesAreTooShort) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, bytesOf("61040008000102")));
    EXPECT_EQ(lAgent.log().count("Not enough data in RSCN Event 8 7", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Rscn, APayloadLengthOfZeroIsReportedAndIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, bytesOf("6104000000010203")));
    EXPECT_EQ(lAgent.log().count("Got an RSCN event: datalength:8", "-I-"), 1u);
    EXPECT_EQ(lAgent.log().count("No Payload in RSCN Event", "-N-"), 1u);
    EXPECT_TRUE(lAgent.log().containing("lPayloadLength").empty());
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Rscn, APayloadOfItsHeaderAloneHasNoPage) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const char* lpLength : {"0004", "0007", "0003", "0001"}) {
        lAgent.library().deliver(ZTSLibraryEvent::rscn(0, bytesOf(std::string("6104") + lpLength + "00010203")));
    }
    EXPECT_EQ(lAgent.log().count("lPayloadLength = 4"), 1u);
    EXPECT_TRUE(lAgent.log().containing("Processing Rscn Event").empty());
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Rscn, APartOfAPageBehindTheLastIsIgnored) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, bytesOf("6104000b 00010203 000405")));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(1, 0x00010203)});
}

TEST(Rscn, ThePayloadsOwnLengthDecidesNotTheNumberOfBytesDelivered) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    ZTSLibraryEvent lShort = ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203, 0x00040506}));
    lShort.mSize = 8;
    lAgent.library().deliver(lShort);
    ZTSLibraryEvent lLong = ZTSLibraryEvent::rscn(0, bytesOf("61040008 00070809 000A0B0C"));
    lAgent.library().deliver(lLong);
    EXPECT_EQ(lAgent.retrieve().texts(),
              (ZTCTexts{sRecord(1, 0x00010203), sRecord(1, 0x00040506), sRecord(1, 0x00070809)}));
}

TEST(Rscn, TheSamePageTwiceIsOneRecordAndTwoPagesAreTwo) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const ZTSLibraryEvent lOne = ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203}));
    lAgent.library().deliverAll({lOne, lOne});
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(2, 0x00010203)});
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203, 0x00010203, 0x00010204})));
    EXPECT_EQ(lAgent.retrieve().texts(), (ZTCTexts{sRecord(2, 0x00010203), sRecord(1, 0x00010204)}));
    lAgent.library().deliverAll({lOne, ZTSLibraryEvent::bare(0, 2, 1), lOne});
    EXPECT_EQ(lAgent.retrieve().texts(), (ZTCTexts{sRecord(1, 0x00010203), "2/1 x1 01000000", sRecord(1, 0x00010203)}));
}

TEST(Rscn, ThePageOfAnotherBoardIsARecordOfItsOwn) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    const ZTCBytes lPayload = rscnPayload({0x00010203});
    lAgent.library().deliverAll(
        {ZTSLibraryEvent::rscn(0, lPayload), ZTSLibraryEvent::rscn(1, lPayload), ZTSLibraryEvent::rscn(0, lPayload)});
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.texts(0), (ZTCTexts{sRecord(1, 0x00010203), sRecord(1, 0x00010203)}));
    EXPECT_EQ(lResponse.texts(1), ZTCTexts{sRecord(1, 0x00010203)});
}

TEST(Rscn, OnlyAPortAddressGetsTheNamesOfARegisteredTarget) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.registerTargets({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203}});
    lAgent.startScope();
    const std::string lNames = "names " + wwnText(makeWwn(gcRemotePort)) + " " + wwnText(makeWwn(gcRemoteNode)) + " ";
    lAgent.library().deliver(ZTSLibraryEvent::rscn(
        0, rscnPayload({0x00010203, 0x01010203, 0x02010203, 0x03010203, 0x00010204, 0x04010203})));
    EXPECT_EQ(lAgent.retrieve().texts(),
              (ZTCTexts{sRecord(1, 0x00010203, lNames), sRecord(1, 0x01010203), sRecord(1, 0x02010203),
                        sRecord(1, 0x03010203), sRecord(1, 0x00010204), sRecord(1, 0x04010203, lNames)}));
}

TEST(Rscn, APayloadFarLongerThanTheRegisteredSizeIsRecordedWhole) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    std::vector<std::uint32_t> lPages;
    ZTCTexts lExpected;
    for (std::uint32_t i = 0; i < 1000; ++i) {
        lPages.push_back(0x00100000 + i);
        lExpected.push_back(sRecord(1, lPages.back()));
    }
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload(lPages)));
    EXPECT_EQ(lAgent.retrieve().texts(), lExpected);
}

TEST(Rscn, AGenericEventOfTheRscnKindTakesTheSamePath) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 0x20, rscnPayload({0x00010203})));
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 1, 0x20));
    EXPECT_EQ(lAgent.log().count("Not enough data in RSCN Event 8 0", "-W-"), 1u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(1, 0x00010203)});
}

TEST(Rscn, AfterARetrievalTheSamePageStartsARecordOfItsOwn) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (int i = 0; i < 2; ++i) {
        lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})));
        EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{sRecord(1, 0x00010203)});
    }
}
