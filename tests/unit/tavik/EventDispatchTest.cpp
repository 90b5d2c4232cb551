#include <gtest/gtest.h>

#include <algorithm>
#include <array>

#include "common/include/Log.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class EventDispatch : public ZTCTavikFixture {
protected:
    static const ZTSDeliveredKind* findKind(unsigned aCategory, unsigned aSubcategory) {
        const auto lFound = std::find_if(allKinds().begin(), allKinds().end(), [&](const ZTSDeliveredKind& acrKind) {
            return acrKind.mCategory == aCategory && acrKind.mSubcategory == aSubcategory;
        });
        return lFound != allKinds().end() ? &*lFound : nullptr;
    }

    /// What is logged of a pair that has no kind.
    static std::string unknownText(unsigned aCategory, unsigned aSubcategory) {
        const std::string lCategory = std::to_string(aCategory);
        const std::string lSubcategory = std::to_string(aSubcategory);
        switch (aCategory) {
            case 1:
                return "-N- Unknown ELS Event subcategory = " + lSubcategory + ", ignored";
            case 2:
                return "-N- Unknown Fabric Event subcategory=" + lSubcategory + ", ignored";
            case 4:
                return "-N- Unknown Scsi Event subcategory = " + lSubcategory + ", ignored";
            case 8:
                return "-N- Unknown Board Evt catgory=8 subcatgory=" + lSubcategory + " ignored";
            case 16:
                return "-N- Unknown Adapter Evt catgory=16 subcatgory=" + lSubcategory + " ignored";
            default:
                return "-N- Unknown Category = " + lCategory + " SubCategory = " + lSubcategory + ", ignored";
        }
    }

    static bool isRscn(unsigned aCategory, unsigned aSubcategory) { return aCategory == 1 && aSubcategory == 0x20; }

    /// What becomes of four events of one pair: without data, with a byte less than its kind needs, with what it needs,
    /// and with more.
    struct ZTSExpectation {
        ZTCBytes mPayload;
        std::array<std::string, 4> mTexts;
        std::array<std::size_t, 4> mBytes{};  ///< that each adds to the total
        std::string mRecord;                  ///< the one record of all four; empty: none
    };

    static ZTSExpectation expectationOf(unsigned aCategory, unsigned aSubcategory) {
        const std::string lWithout = textWithoutData(aCategory, aSubcategory);
        if (isRscn(aCategory, aSubcategory)) {
            const std::string lNotice = "-N- Processing Rscn Event Cat=1 SubCat=32";
            return {makeRscn({0x00010203}),
                    {lWithout, "-W- Not enough data in RSCN Event 8 7", lNotice, lNotice},
                    {0, 0, 8, 0},
                    "x2 0100000003020100"};
        }
        const ZTSDeliveredKind* const lpKind = findKind(aCategory, aSubcategory);
        if (lpKind == nullptr) {
            return {ZTCBytes(40, 0x5A), {lWithout, lWithout, lWithout, lWithout}, {}, ""};
        }
        const std::string lNotice = "-N- " + lpKind->notice();
        if (lpKind->mMinimumLength == 0) {
            return {
                {}, {lNotice, lNotice, lNotice, lNotice}, {lpKind->mRecordSize, 0, 0, 0}, "x4 " + lpKind->mRecordHex};
        }
        return {lpKind->mPayload,
                {lWithout, "-W- " + lpKind->tooShort(lpKind->mMinimumLength - 1), lNotice, lNotice},
                {0, 0, lpKind->mRecordSize, lpKind->mAppendedSize},
                "x2 " + lpKind->mRecordHex + lpKind->mAppendedHex};
    }

    static ZTCBytes shorter(ZTCBytes aData) {
        if (!aData.empty()) {
            aData.pop_back();
        }
        return aData;
    }
    static ZTCBytes longer(ZTCBytes aData) {
        aData.insert(aData.end(), 7, 0xCC);
        return aData;
    }

    /// The one line that an event without data leaves.
    static std::string textWithoutData(unsigned aCategory, unsigned aSubcategory) {
        if (isRscn(aCategory, aSubcategory)) {
            return "-W- Not enough data in RSCN Event 8 0";
        }
        const ZTSDeliveredKind* const lpKind = findKind(aCategory, aSubcategory);
        if (lpKind == nullptr) {
            return unknownText(aCategory, aSubcategory);
        }
        return lpKind->mMinimumLength == 0 ? "-N- " + lpKind->notice() : "-W- " + lpKind->tooShort(0);
    }
};

}  // namespace

TEST_F(EventDispatch, EachOfThe65536PairsLeavesItsOneLineWithoutData) {
    collect();
    std::vector<std::string> lExpected;
    lExpected.reserve(65536);
    for (unsigned lCategory = 0; lCategory < 256; ++lCategory) {
        for (unsigned lSubcategory = 0; lSubcategory < 256; ++lSubcategory) {
            deliverNullEvent(0, lCategory, lSubcategory);
            lExpected.push_back(textWithoutData(lCategory, lSubcategory));
        }
    }
    const std::vector<std::string> lTexts = mLog.texts();
    ASSERT_EQ(lExpected.size(), lTexts.size());
    for (std::size_t lPair = 0; lPair < lExpected.size(); ++lPair) {
        ASSERT_EQ(lExpected[lPair], lTexts[lPair]) << "category " << lPair / 256 << " subcategory " << lPair % 256;
    }
}

TEST_F(EventDispatch, EachOfThe65536PairsLeavesItsLineAndItsBytesAtEveryLength) {
    collect();
    for (unsigned lCategory = 0; lCategory < 256; ++lCategory) {
        const ZTCTestLog lLog(mDirectory.path("log of category " + std::to_string(lCategory)));
        std::vector<std::string> lTexts;
        std::vector<std::string> lRecords;
        std::size_t lTotal = 0;
        for (unsigned lSubcategory = 0; lSubcategory < 256; ++lSubcategory) {
            const ZTSExpectation lExpected = expectationOf(lCategory, lSubcategory);
            const std::string lPair = std::to_string(lCategory) + "/" + std::to_string(lSubcategory);
            unsigned lLength = 0;
            for (const ZTCBytes& lcrData :
                 {ZTCBytes{}, shorter(lExpected.mPayload), lExpected.mPayload, longer(lExpected.mPayload)}) {
                deliverScope(0, lCategory, lSubcategory, lcrData);
                lTexts.push_back(lExpected.mTexts.at(lLength));
                lTotal += lExpected.mBytes.at(lLength);
                ASSERT_EQ(lTotal, mSystem->getTotalEventDataSize()) << lPair << " with " << lcrData.size() << " bytes";
                ++lLength;
            }
            if (!lExpected.mRecord.empty()) {
                lRecords.push_back(lPair + " " + lExpected.mRecord);
            }
        }
        ASSERT_EQ(lTexts, lLog.texts());
        setLogCode(0);
        ASSERT_EQ(lRecords, retrieveTexts());
    }
}

TEST_F(EventDispatch, ValuesAbove255RouteByTheirLowEightBits) {
    collect();
    std::vector<std::string> lExpectedTexts;
    std::vector<std::string> lExpectedRecords;
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        deliverScope(0, 0xABCDE000 + lcrKind.mCategory, 0x00000100 + lcrKind.mSubcategory, lcrKind.mPayload);
        lExpectedTexts.push_back("-N- " + lcrKind.notice());
        lExpectedRecords.push_back(std::to_string(lcrKind.mCategory) + "/" + std::to_string(lcrKind.mSubcategory) +
                                   " x1 " + lcrKind.mRecordHex);
    }
    deliverScope(0, 0x0101, 0xFF20, makeRscn({0x00010203}));
    lExpectedTexts.emplace_back("-N- Processing Rscn Event Cat=1 SubCat=32");
    lExpectedRecords.emplace_back("1/32 x1 0100000003020100");
    deliverScope(0, 0x0100, 0x0100, {});
    lExpectedTexts.emplace_back("-N- Unknown Category = 0 SubCategory = 0, ignored");
    EXPECT_EQ(lExpectedTexts, mLog.texts());
    EXPECT_EQ(lExpectedRecords, retrieveTexts());
}

TEST_F(EventDispatch, AKindOneByteTooShortIsReportedWithBothLengthsAndMakesNothing) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        SCOPED_TRACE(lcrKind.mpName);
        mLog.forget();
        for (std::size_t lLength = 0; lLength < lcrKind.mMinimumLength; ++lLength) {
            mLog.forget();
            deliverScope(
                0, lcrKind.mCategory, lcrKind.mSubcategory,
                ZTCBytes(lcrKind.mPayload.begin(), lcrKind.mPayload.begin() + static_cast<std::ptrdiff_t>(lLength)));
            ASSERT_EQ(std::vector<std::string>{"-W- " + lcrKind.tooShort(lLength)}, mLog.texts());
        }
    }
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
    EXPECT_TRUE(retrieveTexts().empty());
}
