#include "tavik/include/TavikEventCatalogue.h"

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tavik/include/ScopeEventSubType.h"
#include "tests/support/EventKinds.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/TestLog.h"

namespace {

class TavikEventCatalogue : public testing::Test {
protected:
    TavikEventCatalogue() : mLog(mDirectory.path("log")) {}

    ZTCTemporaryDirectory mDirectory;
    ZTCTestLog mLog;
};

}  // namespace

TEST_F(TavikEventCatalogue, ListsTheTwentyKindsInTheirOrder) {
    const ZTCTavikEventCatalogue lCatalogue;
    ASSERT_EQ(20u, lCatalogue.getAll().size());
    std::size_t lRow = 0;
    for (const ZTCPointer<ZTCScopeEvent>& lrEvent : lCatalogue.getAll()) {
        const ZTSTestKind& lcrKind = gcTestKinds[lRow++];
        SCOPED_TRACE(lcrKind.mpName);
        EXPECT_EQ(lcrKind.mRegisteredCategory, lrEvent->getCategory());
        EXPECT_EQ(lcrKind.mRegisteredSubcategory, lrEvent->getSubcategory());
        const auto lcKeyForm =
            static_cast<unsigned short>(lcrKind.mRegisteredCategory << 8 | lcrKind.mRegisteredSubcategory);
        EXPECT_EQ(lcKeyForm, lrEvent->getKeyForm());
        EXPECT_EQ(lrEvent.get(), lCatalogue.get(lcKeyForm).get());
    }
}

TEST_F(TavikEventCatalogue, EachKindIsOfTheClassOfItsName) {
    const ZTCTavikEventCatalogue lCatalogue;
    EXPECT_NE(nullptr, dynamic_cast<ZTCElsPlogiScopeEvent*>(lCatalogue.get(0x0101).get()));
    EXPECT_NE(nullptr, dynamic_cast<ZTCElsRscnScopeEvent*>(lCatalogue.get(0x0002).get()));
    EXPECT_NE(nullptr, dynamic_cast<ZTCScsiVarquedepthScopeEvent*>(lCatalogue.get(0x0440).get()));
    EXPECT_NE(nullptr, dynamic_cast<ZTCBoardLinkatteScopeEvent*>(lCatalogue.get(0x0001).get()));
    EXPECT_NE(nullptr, dynamic_cast<ZTCBoardTemperatureScopeEvent*>(lCatalogue.get(0x0020).get()));
    EXPECT_NE(nullptr, dynamic_cast<ZTCAdapterArrivalScopeEvent*>(lCatalogue.get(0x1001).get()));
}

TEST_F(TavikEventCatalogue, SaysEachKindAtInfoLevelInOrder) {
    std::vector<std::string> lExpected;
    for (const ZTSTestKind& lcrKind : gcTestKinds) {
        lExpected.push_back("-I- Inserting " + std::string(lcrKind.mpClassName) + " ScopeEvent into Events Catalogue");
    }
    setLogCode(ZTLL_Info);
    const ZTCTavikEventCatalogue lCatalogue;
    EXPECT_EQ(lExpected, mLog.texts());
}

TEST_F(TavikEventCatalogue, SaysEachKindBeforeItIsInserted) {
    setLogCode(255);
    ZTCTavikEventCatalogue();
    std::vector<std::string> lFirst;
    std::vector<std::string> lSecond;
    for (const ZTSLogLine& lcrLine : mLog.lines()) {
        if (lcrLine.mMark == "-I-") {
            lFirst.push_back(lcrLine.mText);
        } else if (lcrLine.mFunction == "insertIntoCatalogue" && lcrLine.mText == "Entered") {
            lSecond.push_back(lcrLine.mText);
            EXPECT_EQ(lFirst.size(), lSecond.size());
        }
    }
    EXPECT_EQ(20u, lSecond.size());
}

TEST_F(TavikEventCatalogue, HasASubcategoryForEveryBitOfTheFiveMasks) {
    EXPECT_EQ(0x1Fu, ZT_ELS_SUBCATEGORY_VALID_MASK);
    EXPECT_EQ(0x07u, ZT_FABRIC_SUBCATEGORY_MASK);
    EXPECT_EQ(0x7Fu, ZT_SCSI_SUBCATEGORY_VALID_MASK);
    EXPECT_EQ(0x01u, ZT_BOARD_SUBCATEGORY_VALID_MASK);
    EXPECT_EQ(0x01u, ZT_ADAPTER_SUBCATEGORY_VALID_MASK);
    std::map<unsigned, unsigned> lSubcategories;
    const ZTCTavikEventCatalogue lCatalogue;
    for (const ZTCPointer<ZTCScopeEvent>& lcrKind : lCatalogue.getAll()) {
        lSubcategories[lcrKind->getCategory()] |= lcrKind->getSubcategory();
    }
    EXPECT_EQ(ZT_ELS_SUBCATEGORY_VALID_MASK, lSubcategories[ZT_REG_ELS_EVENT]);
    EXPECT_EQ(ZT_FABRIC_SUBCATEGORY_MASK, lSubcategories[ZT_REG_FABRIC_EVENT]);
    EXPECT_EQ(ZT_SCSI_SUBCATEGORY_VALID_MASK, lSubcategories[ZT_REG_SCSI_EVENT]);
    EXPECT_EQ(ZT_BOARD_SUBCATEGORY_VALID_MASK, lSubcategories[ZT_REG_BOARD_EVENT]);
    EXPECT_EQ(ZT_ADAPTER_SUBCATEGORY_VALID_MASK, lSubcategories[ZT_REG_ADAPTER_EVENT]);
}

TEST_F(TavikEventCatalogue, SaysNothingAtTheDefaultLogCode) {
    const ZTCTavikEventCatalogue lCatalogue;
    EXPECT_TRUE(mLog.texts().empty());
}

TEST_F(TavikEventCatalogue, EveryOtherKeyIsNotFound) {
    const ZTCTavikEventCatalogue lCatalogue;
    setLogCode(0);
    unsigned lFound = 0;
    for (unsigned lKeyForm = 0; lKeyForm < 65536; ++lKeyForm) {
        try {
            lCatalogue.get(static_cast<unsigned short>(lKeyForm));
            ++lFound;
        } catch (const ZTCNotFoundEx& lcrException) {
            ASSERT_STREQ("No element for the key exists in map", lcrException.what());
        }
    }
    EXPECT_EQ(20u, lFound);
    EXPECT_THROW(lCatalogue.get(0x0100), ZTCNotFoundEx);
}

TEST_F(TavikEventCatalogue, ADuplicateIsRefusedAndStandsInTheListAlone) {
    ZTCTavikEventCatalogue lCatalogue;
    const ZTCPointer<ZTCScopeEvent> lDuplicate(new ZTCScopeEvent(1, 1));
    try {
        lCatalogue.insertIntoCatalogue(lDuplicate);
        ADD_FAILURE() << "no exception";
    } catch (const ZTCExistsEx& lcrException) {
        EXPECT_STREQ("Element already exists in map.. can't insert", lcrException.what());
        EXPECT_EQ(10u, lcrException.getError());
    }
    EXPECT_EQ(21u, lCatalogue.getAll().size());
    EXPECT_NE(lDuplicate.get(), lCatalogue.get(0x0101).get());
}

TEST_F(TavikEventCatalogue, TakesAFurtherKind) {
    ZTCTavikEventCatalogue lCatalogue;
    const ZTCPointer<ZTCScopeEvent> lEvent(new ZTCScopeEvent(32, 1));
    lCatalogue.insertIntoCatalogue(lEvent);
    EXPECT_EQ(lEvent.get(), lCatalogue.get(0x2001).get());
    EXPECT_EQ(21u, lCatalogue.getAll().size());
    EXPECT_EQ(25u, MAX_SCOPE_EVENTS);
}
