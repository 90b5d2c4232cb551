// All pages here are built by hand (KernelBytes.h).
#include "libkpm/linux/src/TracePage.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/unit/linux/KernelBytes.h"

static const ZTSTracePageLayout scLayout{8, 8, 16, 4096};

/// The lengths of all records, and whether the page parsed.
static std::string sRead(const ZTCBytes& acrPage, std::endian aOrder = std::endian::native) {
    ZTCTracePage lPage(acrPage, scLayout, aOrder);
    std::string lText;
    while (const auto lRecord = lPage.next()) {
        lText += std::to_string(lRecord->size()) + " ";
    }
    return lText + (lPage.isMalformed() ? "malformed" : "whole");
}

static const ZTCBytes scEight{1, 2, 3, 4, 5, 6, 7, 8};

TEST(TracePage, RecordsOfBothFormsAreReadInBothByteOrders) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        ZTCPageBuilder lBuilder(lOrder);
        lBuilder.addShort(scEight).addLong(ZTCBytes(200)).addShort(ZTCBytes(112)).addLong(scEight);
        EXPECT_EQ(sRead(lBuilder.make(), lOrder), "8 200 112 8 whole");
    }
}

TEST(TracePage, TheDataOfARecordAreItsOwn) {
    const ZTCBytes lPage = ZTCPageBuilder().addLong(ZTCBytes(12)).addShort(scEight).make();
    ZTCTracePage lReader(lPage, scLayout);
    lReader.next();
    const auto lRecord = lReader.next();
    ASSERT_TRUE(lRecord.has_value());
    EXPECT_EQ(ZTCBytes(lRecord->begin(), lRecord->end()), scEight);
    EXPECT_FALSE(lReader.next().has_value());
}

TEST(TracePage, TimesAndPaddingBetweenRecordsArePassedOver) {
    ZTCPageBuilder lBuilder;
    lBuilder.addWord(30, 5).addNumber(1);  // a time
    lBuilder.addShort(scEight);
    lBuilder.addWord(31, 5).addNumber(1);                             // a time stamp
    lBuilder.addWord(29, 1).addNumber(12).addNumber(0).addNumber(0);  // a discarded record of 8 bytes
    lBuilder.addShort(scEight);
    lBuilder.addWord(29, 0).addNumber(99).addShort(scEight);  // the rest is empty
    EXPECT_EQ(sRead(lBuilder.make()), "8 8 whole");
}

TEST(TracePage, AnEmptyPageHasNoRecords) {
    EXPECT_EQ(sRead(ZTCPageBuilder().make()), "whole");
}

TEST(TracePage, AMarkOfLostRecordsIsSeenAndIsNoLength) {
    const ZTCBytes lMarked = ZTCPageBuilder().addShort(scEight).make(gcMissedEvents | 1u << 30);
    EXPECT_EQ(sRead(lMarked), "8 whole");
    EXPECT_TRUE(ZTCTracePage(lMarked, scLayout).hasLossBefore());
    EXPECT_FALSE(ZTCTracePage(ZTCPageBuilder().addShort(scEight).make(), scLayout).hasLossBefore());
}

TEST(TracePage, ALengthPastThePageIsMalformed) {
    EXPECT_EQ(sRead(ZTCPageBuilder().makeWithLength(4081)), "malformed");
    EXPECT_EQ(sRead(ZTCPageBuilder().makeWithLength(0x7FFFFFFFFFFFFFF)), "malformed");
    EXPECT_EQ(sRead(ZTCPageBuilder().makeWithLength(~std::uint64_t{0})), "malformed");
}

TEST(TracePage, AFullPageIsReadToItsLastByte) {
    ZTCPageBuilder lBuilder;
    for (int lRecord = 0; lRecord < 255; ++lRecord) {
        lBuilder.addShort(ZTCBytes(12));
    }
    std::string lExpected;
    for (int lRecord = 0; lRecord < 255; ++lRecord) {
        lExpected += "12 ";
    }
    EXPECT_EQ(sRead(lBuilder.make()), lExpected + "whole");
}

TEST(TracePage, AReadThatIsShorterThanThePageIsReadAsFarAsItGoes) {
    const ZTCBytes lPage = ZTCPageBuilder().addShort(scEight).make();
    for (std::size_t lSize = 0; lSize < 28; ++lSize) {
        const ZTCBytes lCut(lPage.begin(), lPage.begin() + static_cast<std::ptrdiff_t>(lSize));
        EXPECT_EQ(sRead(lCut), "malformed") << lSize;
    }
    EXPECT_EQ(sRead(ZTCBytes(lPage.begin(), lPage.begin() + 28)), "8 whole");
}

TEST(TracePage, ARecordThatIsCutAnywhereIsMalformedAndThoseBeforeItAreServed) {
    const ZTCBytes lWhole = ZTCPageBuilder().addShort(scEight).addLong(ZTCBytes(20)).make();
    for (std::uint64_t lLength = 13; lLength < 12 + 28; ++lLength) {
        ZTCBytes lPage = lWhole;
        lPage[8] = static_cast<std::uint8_t>(lLength);
        if (std::endian::native == std::endian::little) {
            EXPECT_EQ(sRead(lPage), "8 malformed") << lLength;
        }
    }
}

TEST(TracePage, ALengthWordThatDoesNotCountItselfOrLeadsOutIsMalformed) {
    for (const std::uint32_t lLength : {0u, 1u, 3u, 4096u, 0xFFFFFFFFu}) {
        for (const std::uint32_t lType : {0u, 29u}) {
            ZTCPageBuilder lBuilder;
            lBuilder.addWord(lType, 1).addNumber(lLength).addNumber(0);
            EXPECT_EQ(sRead(lBuilder.make()), "malformed") << lType << " " << lLength;
        }
    }
}

TEST(TracePage, AnyBytesAtAllEndWithoutReadingPastThePage) {
    std::uint32_t lState = 1;
    for (int lRound = 0; lRound < 2000; ++lRound) {
        ZTCBytes lPage(4096);
        for (std::uint8_t& lrByte : lPage) {
            lState = lState * 1664525 + 1013904223;
            lrByte = static_cast<std::uint8_t>(lState >> 24);
        }
        lPage[9] = static_cast<std::uint8_t>(lRound % 17);
        lPage[10] = lPage[11] = lPage[12] = lPage[13] = lPage[14] = lPage[15] = 0;
        ZTCTracePage lReader(lPage, scLayout);
        std::size_t lBytes = 0;
        while (const auto lRecord = lReader.next()) {
            lBytes += lRecord->size();
        }
        EXPECT_LE(lBytes, 4080u);
    }
}

TEST(TracePage, RecordsHaveTheTimeThatTheirWordsAddUpTo) {
    static constexpr ZTSTracePageLayout scTimed{8, 8, 16, 4096, {0, 8}};
    static constexpr std::uint64_t scPage = 123456789;  // the builder's
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        ZTCPageBuilder lBuilder(lOrder);
        lBuilder.addShort(scEight);            // 17 later
        lBuilder.addWord(30, 5).addNumber(2);  // 2 * 2^27 + 5 later
        lBuilder.addLong(scEight);             // 17 later
        lBuilder.addWord(31, 7).addNumber(3);  // now 3 * 2^27 + 7
        lBuilder.addShort(scEight);            // 17 later
        const ZTCBytes lBytes = lBuilder.make();
        ZTCTracePage lPage(lBytes, scTimed, lOrder);
        ASSERT_TRUE(lPage.next().has_value());
        EXPECT_EQ(lPage.getTime(), scPage + 17);
        ASSERT_TRUE(lPage.next().has_value());
        EXPECT_EQ(lPage.getTime(), scPage + 17 + (std::uint64_t{2} << 27) + 5 + 17);
        ASSERT_TRUE(lPage.next().has_value());
        EXPECT_EQ(lPage.getTime(), (std::uint64_t{3} << 27) + 7 + 17);
    }
    const ZTCBytes lUntimed = ZTCPageBuilder().addShort(scEight).make();
    ZTCTracePage lPage(lUntimed, scLayout);
    lPage.next();
    EXPECT_EQ(lPage.getTime(), 0u);
}
