#include <gtest/gtest.h>

#include "common/include/Log.h"
#include "tavik/include/TavikCore.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

const char* const scPageNotice = "-N- Processing Rscn Event Cat=1 SubCat=32";

class Rscn : public ZTCTavikFixture {
protected:
    Rscn() { collect(2); }

    static std::string textOf(std::uint32_t aPage, unsigned aCount = 1, const std::string& acrNames = "") {
        return "1/32 x" + std::to_string(aCount) + " " + acrNames + ZTCByteWriter().le32(1).le32(aPage).hex();
    }
};

}  // namespace

TEST_F(Rscn, BelowEightBytesIsReportedAndDropped) {
    const ZTCBytes lWhole = makeRscn({0x010203});
    for (std::size_t lLength = 0; lLength < 8; ++lLength) {
        mLog.forget();
        deliverRscn(0, ZTCBytes(lWhole.begin(), lWhole.begin() + static_cast<std::ptrdiff_t>(lLength)));
        EXPECT_EQ(std::vector<std::string>{"-W- Not enough data in RSCN Event 8 " + std::to_string(lLength)},
                  mLog.texts());
    }
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(Rscn, NullDataWithALengthHaveNoData) {
    deliverRscn(0, {}, 65535);
    EXPECT_EQ(std::vector<std::string>{"-W- Not enough data in RSCN Event 8 0"}, mLog.texts());
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(Rscn, APayloadLengthOfZeroIsReportedAndDropped) {
    setLogCode(127);
    deliverRscn(0, makeRscn({0x010203}, 0));
    EXPECT_EQ((std::vector<std::string>{"-I- Got an RSCN event: datalength:8", "-N- No Payload in RSCN Event"}),
              mLog.texts());
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(Rscn, ThePayloadLengthDividedByFourLessTheHeaderIsTheNumberOfPages) {
    setLogCode(127);
    for (unsigned lPayloadLength = 1; lPayloadLength < 24; ++lPayloadLength) {
        SCOPED_TRACE(lPayloadLength);
        mLog.forget();
        deliverRscn(0, makeRscn({1, 2, 3, 4, 5}, lPayloadLength));
        const unsigned lPages = lPayloadLength < 4 ? 0 : lPayloadLength / 4 - 1;
        EXPECT_EQ(lPages, mLog.count(scPageNotice));
        EXPECT_TRUE(mLog.has("-I- lPayloadLength = " + std::to_string(lPayloadLength)));
        std::vector<std::string> lExpected;
        for (std::uint32_t lPage = 1; lPage <= lPages; ++lPage) {
            lExpected.push_back(textOf(lPage));
        }
        EXPECT_EQ(lExpected, retrieveTexts());
    }
}

TEST_F(Rscn, TheLargestPayloadIsReadWholeAndNotFurther) {
    setLogCode(0);
    std::vector<std::uint32_t> lPages;
    for (std::uint32_t lPage = 0; lPage < 16382; ++lPage) {
        lPages.push_back(0x00ABC000 + lPage);
    }
    deliverRscn(0, makeRscn(lPages, 65535));
    EXPECT_EQ(16382u * 8, mSystem->getTotalEventDataSize());
    const std::vector<std::string> lTexts = retrieveTexts();
    ASSERT_EQ(16382u, lTexts.size());
    EXPECT_EQ(textOf(lPages.front()), lTexts.front());
    EXPECT_EQ(textOf(lPages.back()), lTexts.back());
}

TEST_F(Rscn, ThePayloadsOwnLengthIsTrustedWhateverLengthGoesWithIt) {
    deliverRscn(0, makeRscn({1, 2, 3}), 8);
    EXPECT_EQ((std::vector<std::string>{textOf(1), textOf(2), textOf(3)}), retrieveTexts());
    deliverRscn(0, makeRscn({1, 2, 3}, 8), 0xFFFFFFFF);
    EXPECT_EQ(std::vector<std::string>{textOf(1)}, retrieveTexts());
}

TEST_F(Rscn, TheSamePageTwiceIsOneRecordWithTwoOccurrences) {
    deliverRscn(0, makeRscn({0x010203}));
    deliverRscn(0, makeRscn({0x010203}));
    EXPECT_EQ(8u, mSystem->getTotalEventDataSize());
    EXPECT_EQ(std::vector<std::string>{textOf(0x010203, 2)}, retrieveTexts());
    deliverRscn(0, makeRscn({0x010203, 0x010203, 0x010203}));
    EXPECT_EQ(std::vector<std::string>{textOf(0x010203, 3)}, retrieveTexts());
}

TEST_F(Rscn, EveryChangeOfThePageWordIsARecordOfItsOwn) {
    deliverRscn(0, makeRscn({0x00010203, 0x01010203, 0x04010203, 0x00010204, 0x00010203, 0x00010203, 0, 0}));
    EXPECT_EQ((std::vector<std::string>{textOf(0x00010203), textOf(0x01010203), textOf(0x04010203), textOf(0x00010204),
                                        textOf(0x00010203, 2), textOf(0, 2)}),
              retrieveTexts());
}

TEST_F(Rscn, AnotherBoardOrAnotherKindInBetweenStartsANewRecord) {
    deliverRscn(0, makeRscn({5}));
    deliverRscn(1, makeRscn({5}));
    deliverRscn(0, makeRscn({5}));
    deliverTemperature(0);
    deliverRscn(0, makeRscn({5}));
    const ZTSScopeDataResponse lResponse = retrieve();
    EXPECT_EQ((std::vector<std::string>{textOf(5), textOf(5), "8/4 x1 01000000", textOf(5)}), lResponse.texts(0));
    EXPECT_EQ(std::vector<std::string>{textOf(5)}, lResponse.texts(1));
}

TEST_F(Rscn, AfterARetrievalTheSamePageStartsANewRecord) {
    deliverRscn(0, makeRscn({5}));
    EXPECT_EQ(std::vector<std::string>{textOf(5)}, retrieveTexts());
    deliverRscn(0, makeRscn({5}));
    EXPECT_EQ(std::vector<std::string>{textOf(5)}, retrieveTexts());
}

TEST_F(Rscn, OnlyASinglePortsAddressGetsTheNamesOfItsTarget) {
    ASSERT_EQ(gcSuccessHex, registerTargets({{makeWwn(0x21), makeWwn(0x11), 0x010203},
                                             {makeWwn(0x22), makeWwn(0x12), 0x01010203},
                                             {makeWwn(0x23), makeWwn(0x13), 0x02010203},
                                             {makeWwn(0x24), makeWwn(0x14), 0}}));
    const std::string lNames = "names 00:00:00:00:00:00:00:11 00:00:00:00:00:00:00:21 ";
    deliverRscn(0, makeRscn({0x00010203, 0x01010203, 0x02010203, 0x03010203, 0x04010203, 0xFC010203, 0x00010204, 0}));
    EXPECT_EQ((std::vector<std::string>{textOf(0x00010203, 1, lNames), textOf(0x01010203), textOf(0x02010203),
                                        textOf(0x03010203), textOf(0x04010203, 1, lNames),
                                        textOf(0xFC010203, 1, lNames), textOf(0x00010204),
                                        textOf(0, 1, "names 00:00:00:00:00:00:00:14 00:00:00:00:00:00:00:24 ")}),
              retrieveTexts());
}

TEST_F(Rscn, TheLimitIsTestedOncePerRscn) {
    mSystem->makePendingRecord(0, 262143);
    deliverRscn(0, makeRscn({1, 2, 3}));
    EXPECT_EQ(262143u + 24, mSystem->getTotalEventDataSize());
    deliverRscn(0, makeRscn({4}));
    EXPECT_EQ(4u, retrieveTexts().size());
}

TEST_F(Rscn, ThroughTheGenericCallbackIsTreatedTheSame) {
    deliverScope(0, 1, 0x20, makeRscn({5, 6}));
    deliverRscn(0, makeRscn({6}));
    EXPECT_EQ((std::vector<std::string>{textOf(5), textOf(6, 2)}), retrieveTexts());
}

TEST_F(Rscn, APageThatFindsNoMemoryChangesNothing) {
    // Delivered by hand: nothing but the callback's own allocations may count.
    ZTCBytes lPayload = makeRscn({6});
    unsigned lFailures = 0;
    for (bool lFailed = true; lFailed;) {
        deliverRscn(0, makeRscn({5}));
        lFailed = failAllocation(lFailures + 1, [&lPayload] {
            ScopeCb_KpmRscn(0, lPayload.data(), static_cast<unsigned>(lPayload.size()));
        });
        deliverRscn(0, makeRscn({5}));
        EXPECT_EQ(lFailed ? std::vector<std::string>{textOf(5, 2)}
                          : (std::vector<std::string>{textOf(5), textOf(6), textOf(5)}),
                  retrieveTexts());
        lFailures += lFailed ? 1 : 0;
    }
    EXPECT_EQ(4u, lFailures);
}
