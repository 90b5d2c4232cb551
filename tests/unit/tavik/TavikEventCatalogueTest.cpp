#include "tavik/include/TavikEventCatalogue.h"

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "tavik/include/ScopeEventSubType.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/TestLog.h"

namespace {

struct ZTSCatalogueRow {
    const char* mpName;
    unsigned mCategory;
    unsigned mSubcategory;
    unsigned mKeyForm;
};

const ZTSCatalogueRow gcRows[] = {
    {"ElsPlogi", 1, 0x01, 0x0101},          {"ElsPrlo", 1, 0x02, 0x0102},
    {"ElsAdisc", 1, 0x04, 0x0104},          {"ElsLsrjt", 1, 0x08, 0x0108},
    {"ElsLogo", 1, 0x10, 0x0110},           {"ElsRscn", 0, 0x02, 0x0002},
    {"FabricFbsy", 2, 0x01, 0x0201},        {"FabricPbsy", 2, 0x02, 0x0202},
    {"FabricFcprdchkerr", 2, 0x04, 0x0204}, {"ScsiQfull", 4, 0x01, 0x0401},
    {"ScsiDevbsy", 4, 0x02, 0x0402},        {"ScsiCheckcondition", 4, 0x04, 0x0404},
    {"ScsiLunreset", 4, 0x08, 0x0408},      {"ScsiTgtreset", 4, 0x10, 0x0410},
    {"ScsiBusreset", 4, 0x20, 0x0420},      {"ScsiVarquedepth", 4, 0x40, 0x0440},
    {"BoardPortinterr", 8, 0x01, 0x0801},   {"BoardLinkatte", 0, 0x01, 0x0001},
    {"BoardTemperature", 0, 0x20, 0x0020},  {"AdapterArrival", 16, 0x01, 0x1001},
};

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
        SCOPED_TRACE(gcRows[lRow].mpName);
        EXPECT_EQ(gcRows[lRow].mCategory, lrEvent->getCategory());
        EXPECT_EQ(gcRows[lRow].mSubcategory, lrEvent->getSubcategory());
        EXPECT_EQ(gcRows[lRow].mKeyForm, lrEvent->getKeyForm());
        EXPECT_EQ(lrEvent.get(), lCatalogue.get(static_cast<unsigned short>(gcRows[lRow].mKeyForm)).get());
        ++lRow;
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
    for (const ZTSCatalogueRow& lcrRow : gcRows) {
        lExpected.push_back("-I- Inserting " + std::string(lcrRow.mpName) + " ScopeEvent into Events Catalogue");
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

TEST_F(TavikEventCatalogue, AgreesWithTheTableThatToolsRead) {
    const ZTCTavikEventCatalogue lCatalogue;
    ASSERT_EQ(gcScopeEventKinds.size(), lCatalogue.getAll().size());
    auto lKind = gcScopeEventKinds.begin();
    for (const ZTCPointer<ZTCScopeEvent>& lrEvent : lCatalogue.getAll()) {
        EXPECT_EQ(lKind->mRegisteredCategory, lrEvent->getCategory()) << lKind->mpName;
        EXPECT_EQ(lKind->mRegisteredSubcategory, lrEvent->getSubcategory()) << lKind->mpName;
        ++lKind;
    }
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
