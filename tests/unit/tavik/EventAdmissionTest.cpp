#include <gtest/gtest.h>

#include "common/include/Log.h"
#include "tavik/include/TavikCore.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

const char* const scOffText = "-N- Ignoring the event as Scope data Collection is not enabled.";
const char* const scLimitText = "-N- Ignoring the event as the limit on the total Event Data";

class EventAdmission : public ZTCTavikFixture {
protected:
    void deliverPlogi(unsigned aBoard, const ZTSDeliveryShape& acrShape = {}) {
        deliverScope(aBoard, 1, 1, kindNamed("plogi").mPayload, acrShape);
    }

    /// One event through each of the four callbacks.
    void deliverOneOfEach(unsigned aBoard) {
        deliverPlogi(aBoard);
        deliverTemperature(aBoard);
        deliverLink(aBoard, makeWwn(1));
        deliverRscn(aBoard, makeRscn({1}));
    }

    std::string badListText(unsigned aBoard, const std::string& acrWwn, unsigned aCategory, unsigned aSubcategory) {
        return "-E- Bad boardid " + std::to_string(aBoard) + " in event has been recieved. Event: wwn " + acrWwn +
               "; cat " + std::to_string(aCategory) + "; subcat " + std::to_string(aSubcategory) + ".  Skip event!";
    }

    const std::string mPlogiText = "1/1 x1 " + kindNamed("plogi").mRecordHex;
};

}  // namespace

TEST_F(EventAdmission, WithCollectionOffEveryCallbackDropsItsEventAfterTheNotice) {
    bringUp();
    deliverOneOfEach(0);
    EXPECT_EQ(std::vector<std::string>(4, scOffText), mLog.texts());
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
}

TEST_F(EventAdmission, AnEventIsAdmittedOneByteBelowTheTotalLimitAndMayPassIt) {
    collect();
    mSystem->makePendingRecord(0, 262143);
    deliverPlogi(0);
    EXPECT_EQ(262163u, mSystem->getTotalEventDataSize());
    EXPECT_EQ(mPlogiText, retrieveTexts().at(1));
}

TEST_F(EventAdmission, AnAppendMayPassTheTotalLimitAndIsTheLastThingAdmitted) {
    const ZTSDeliveredKind& lcrKind = kindNamed("lsrjt");
    const auto lcRecord = static_cast<unsigned>(lcrKind.mRecordSize);
    for (const unsigned lTotal : {262143u, 262144u}) {
        SCOPED_TRACE(lTotal);
        mSystem->getProtocolHandler() != nullptr ? startScope() : collect();
        mSystem->makePendingRecord(0, lTotal - lcRecord);
        for (unsigned lEvent = 0; lEvent < 3; ++lEvent) {
            deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mPayload);
        }
        const bool lIsAppended = lTotal == 262143;
        EXPECT_EQ(lIsAppended ? 262151u : 262144u, mSystem->getTotalEventDataSize());
        EXPECT_EQ(lIsAppended ? "1/8 x2 " + lcrKind.mRecordHex + lcrKind.mAppendedHex : "1/8 x1 " + lcrKind.mRecordHex,
                  retrieveTexts().at(1));
    }
}

TEST_F(EventAdmission, AnEventThatIsOnlyCountedLeavesTheTotalBelowItsLimit) {
    collect();
    mSystem->makePendingRecord(0, 262143 - 4);
    for (unsigned lEvent = 0; lEvent < 5; ++lEvent) {
        deliverTemperature(0);
    }
    EXPECT_EQ(262143u, mSystem->getTotalEventDataSize());
    EXPECT_EQ("8/4 x5 01000000", retrieveTexts().at(1));
}

TEST_F(EventAdmission, AtTheTotalLimitEveryCallbackDropsItsEventAfterTwoNotices) {
    collect();
    mSystem->makePendingRecord(0, 262144);
    deliverOneOfEach(0);
    std::vector<std::string> lExpected;
    for (unsigned lEvent = 0; lEvent < 4; ++lEvent) {
        lExpected.emplace_back("-N- Current size = 262144");
        lExpected.emplace_back(scLimitText);
    }
    EXPECT_EQ(lExpected, mLog.texts());
    EXPECT_EQ(1u, retrieveTexts().size());
}

TEST_F(EventAdmission, ARetrievalAdmitsEventsAgain) {
    collect();
    mSystem->makePendingRecord(0, 300000);
    deliverPlogi(0);
    retrieve();
    deliverPlogi(0);
    EXPECT_EQ(std::vector<std::string>{mPlogiText}, retrieveTexts());
}

TEST_F(EventAdmission, AnUnknownBoardIsReportedInTheWordsOfTheCallbackAndTheGenericOneUsesTheLinkOnes) {
    collect(2);
    deliverOneOfEach(2);
    EXPECT_EQ((std::vector<std::string>{"-N- Ignoring the KpmLink event callback as boardid 2 is bad",
                                        "-N- Ignoring the KpmTemp event callback as boardid 2 is bad",
                                        "-N- Ignoring the KpmLink event callback as boardid 2 is bad",
                                        "-N- Ignoring the KpmRscn event callback as boardid 2 is bad"}),
              mLog.texts());
    mLog.forget();
    deliverPlogi(0xFFFFFFFF);
    EXPECT_EQ(std::vector<std::string>{"-N- Ignoring the KpmLink event callback as boardid -1 is bad"}, mLog.texts());
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(EventAdmission, CollectionIsTestedBeforeTheLimitAndTheLimitBeforeTheBoard) {
    collect();
    mSystem->makePendingRecord(0, 262144);
    deliverPlogi(7);
    EXPECT_EQ((std::vector<std::string>{"-N- Current size = 262144", scLimitText}), mLog.texts());
    mLog.forget();
    mDoScopeCollection = false;
    deliverPlogi(7);
    EXPECT_EQ(std::vector<std::string>{scOffText}, mLog.texts());
}

TEST_F(EventAdmission, ABoardWithoutAListIsReportedWithTheEventsName) {
    collect(2);
    mSystem->exchangeRecordLists(1);
    ZTSDeliveryShape lShape;
    lShape.mPort = makeWwn(0x1122334455667788);
    deliverPlogi(1, lShape);
    deliverTemperature(1);
    deliverLink(1, makeWwn(0x99AABBCCDDEEFF00));
    deliverNullLink(1);
    deliverRscn(1, makeRscn({1}));
    const std::string lInitiator = wwnText(ZTCAdaptersLibraryDouble::portName(1));
    EXPECT_EQ(
        (std::vector<std::string>{badListText(1, "11:22:33:44:55:66:77:88", 1, 1), badListText(1, lInitiator, 8, 4),
                                  badListText(1, "99:aa:bb:cc:dd:ee:ff:00", 8, 2),
                                  badListText(1, "00:00:00:00:00:00:00:00", 8, 2), badListText(1, lInitiator, 1, 32)}),
        mLog.texts());
    EXPECT_EQ(".//TavikCore", mLog.lines().at(0).mLabel);
    EXPECT_EQ("sProcessScopeEvent", mLog.lines().at(0).mFunction);
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(EventAdmission, TemperatureAndLinkAreCollectedAsBoardEventsWithoutData) {
    collect();
    deliverTemperature(0);
    deliverLink(0, makeWwn(1));
    deliverNullLink(0);
    EXPECT_EQ((std::vector<std::string>{"8/4 x1 01000000", "8/2 x2 01000000"}), retrieveTexts());
}

TEST_F(EventAdmission, ANullEventANullPayloadAndNullDataHaveNoData) {
    collect();
    deliverNullEvent(0, 1, 1);
    ZTSDeliveryShape lNoPayload;
    lNoPayload.mHasPayload = false;
    lNoPayload.mSize = 4096;
    deliverPlogi(0, lNoPayload);
    ZTSDeliveryShape lNoData;
    lNoData.mHasData = false;
    lNoData.mSize = 4096;
    deliverPlogi(0, lNoData);
    EXPECT_EQ(std::vector<std::string>(3, "-W- Not enough data in ELS PLOGI Event 20 0"), mLog.texts());
    deliverNullEvent(0, 16, 1);
    deliverScope(0, 16, 1, {}, lNoPayload);
    deliverScope(0, 16, 1, {}, lNoData);
    EXPECT_EQ(std::vector<std::string>{"16/1 x3 01000000"}, retrieveTexts());
}

TEST_F(EventAdmission, ASizeBelowTheHeaderCountsAsTheHeader) {
    collect();
    for (const std::uint64_t lSize : {0ull, 1ull, 39ull, 40ull, 0x100000000ull, 0xFFFFFFFF00000027ull}) {
        mLog.forget();
        ZTSDeliveryShape lShape;
        lShape.mSize = lSize;
        deliverPlogi(0, lShape);
        EXPECT_EQ(std::vector<std::string>{"-W- Not enough data in ELS PLOGI Event 20 0"}, mLog.texts()) << lSize;
    }
    EXPECT_FALSE(mSystem->hasPendingRecord());
}

TEST_F(EventAdmission, OnlyTheLow32BitsOfTheSizeCount) {
    collect();
    ZTSDeliveryShape lShape;
    lShape.mSize = 0xABCDEF0100000000 + 59;
    deliverPlogi(0, lShape);
    EXPECT_EQ(std::vector<std::string>{"-W- Not enough data in ELS PLOGI Event 20 19"}, mLog.texts());
    lShape.mSize = 0xABCDEF0100000000 + 60;
    deliverPlogi(0, lShape);
    EXPECT_EQ(std::vector<std::string>{mPlogiText}, retrieveTexts());
}

TEST_F(EventAdmission, AnythingMayStandAtAnyAddress) {
    collect();
    ZTSDeliveryShape lShape;
    lShape.mIsMisaligned = true;
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mPayload, lShape);
        deliverScope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mPayload, lShape);
    }
    std::vector<std::string> lExpected;
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        lExpected.push_back(std::to_string(lcrKind.mCategory) + "/" + std::to_string(lcrKind.mSubcategory) + " x2 " +
                            lcrKind.mRecordHex + lcrKind.mAppendedHex);
    }
    EXPECT_EQ(lExpected, retrieveTexts());
}

TEST_F(EventAdmission, EveryCallbackTracesItsCall) {
    bringUp();
    setLogCode(ZTLL_Debug);
    ZTSDeliveryShape lShape;
    lShape.mPort = makeWwn(0x1122334455667788);
    deliverScope(3, 4, 64, {}, lShape);
    deliverTemperature(4);
    deliverLink(5, makeWwn(1));
    deliverRscn(6, makeRscn({1}));
    for (const char* lpText :
         {"-T- Invoking Generic callback with boardId: 3, hba wwn: 11:22:33:44:55:66:77:88, Cat: 4, subCat: 64",
          "-T- Invoking TEMPERATURE callback with boardId: 4", "-T- Invoking LINK callback with boardId: 5",
          "-T- Invoking RSCN callback with boardId: 6"}) {
        EXPECT_TRUE(mLog.has(lpText)) << lpText;
    }
    EXPECT_EQ(mLog.count("-T- Entered"), mLog.count("-T- Left"));
    unsigned lCallbacksLeft = 0;
    for (const ZTSLogLine& lcrLine : mLog.lines()) {
        lCallbacksLeft += lcrLine.mText == "Left" && lcrLine.mFunction.starts_with("ScopeCb_") ? 1 : 0;
    }
    EXPECT_EQ(4u, lCallbacksLeft);
}

TEST_F(EventAdmission, NoFailureLeavesACallbackAndEachIsReported) {
    collect();
    // Delivered by hand: nothing but the callbacks' own allocations may count.
    static LINKINFO slLink{};
    static ZTCBytes slRscn = makeRscn({7});
    const auto lDeliveries = {+[] { ScopeCb_Generic(0, HBA_wwn{}, 2, 1, nullptr, nullptr); },
                              +[] { ScopeCb_KpmTemp(0, 41, 42); }, +[] { ScopeCb_KpmLink(0, &slLink); },
                              +[] { ScopeCb_KpmRscn(0, slRscn.data(), static_cast<unsigned>(slRscn.size())); }};
    for (const auto& lcpDeliver : lDeliveries) {
        unsigned lFailures = 0;
        for (unsigned lNth = 1;; ++lNth) {
            retrieve();
            mLog.forget();
            bool lFailed = false;
            ASSERT_NO_THROW(lFailed = failAllocation(lNth, lcpDeliver));
            EXPECT_EQ(lFailed ? 1u : 0u, mLog.count("-E- Error: Out of Memory, processing event callback"));
            EXPECT_EQ(!lFailed, mSystem->hasPendingRecord());
            EXPECT_EQ(lFailed, mSystem->getTotalEventDataSize() == 0);
            if (!lFailed) {
                break;
            }
            ++lFailures;
        }
        EXPECT_LT(2u, lFailures);
    }
}
