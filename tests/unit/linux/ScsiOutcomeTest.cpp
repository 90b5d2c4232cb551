// All records here are built by hand (KernelBytes.h).
#include "libkpm/linux/src/ScsiOutcome.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "tests/unit/linux/KernelBytes.h"

static ZTSScsiDoneLayout sLayout(bool aHasSense = true) {
    return std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(parseTraceFormat(doneFormat(aHasSense))));
}

TEST(ScsiOutcome, EveryFieldIsReadInBothByteOrders) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        const ZTCBytes lRecord = ZTSDoneRecord{.mHost = 3,
                                               .mChannel = 1,
                                               .mTarget = 70000,
                                               .mLun = 0x4001,
                                               .mResult = 0x000E0002,
                                               .mOpcode = 0x2A,
                                               .mSenseKey = 5,
                                               .mAsc = 0x21,
                                               .mAscq = 7,
                                               .mOrder = lOrder}
                                     .make();
        EXPECT_EQ(getTraceRecordId(lRecord, sLayout(), lOrder), gcDoneId);
        const auto lOutcome = parseScsiOutcome(lRecord, sLayout(), lOrder);
        ASSERT_TRUE(lOutcome.has_value());
        EXPECT_EQ(lOutcome->mHost, 3u);
        EXPECT_EQ(lOutcome->mChannel, 1u);
        EXPECT_EQ(lOutcome->mTarget, 70000u);
        EXPECT_EQ(lOutcome->mLun, 0x4001u);
        EXPECT_EQ(lOutcome->mStatus, 2u);
        EXPECT_EQ(lOutcome->mOpcode, 0x2Au);
        EXPECT_EQ(lOutcome->mSenseKey, 5u);
        EXPECT_EQ(lOutcome->mAsc, 0x21u);
        EXPECT_EQ(lOutcome->mAscq, 7u);
    }
}

TEST(ScsiOutcome, WithoutSenseDataTheyAreUnknownAndNotZero) {
    const auto lOutcome = parseScsiOutcome(ZTSDoneRecord{.mHasSense = false}.make(), sLayout(false));
    ASSERT_TRUE(lOutcome.has_value());
    EXPECT_EQ(lOutcome->mSenseKey, 0xFFFFFFFFu);
    EXPECT_EQ(lOutcome->mAsc, 0xFFFFFFFFu);
    EXPECT_EQ(lOutcome->mAscq, 0xFFFFFFFFu);
}

TEST(ScsiOutcome, ARecordThatEndsBeforeItsFieldsIsNone) {
    const ZTCBytes lRecord = ZTSDoneRecord{}.make();
    for (std::size_t lSize = 0; lSize < 63; ++lSize) {
        EXPECT_FALSE(parseScsiOutcome(ZTCByteSpan(lRecord).first(lSize), sLayout()).has_value()) << lSize;
    }
    EXPECT_TRUE(parseScsiOutcome(ZTCByteSpan(lRecord).first(63), sLayout()).has_value());
    EXPECT_FALSE(getTraceRecordId(ZTCByteSpan(lRecord).first(1), sLayout()).has_value());
}

TEST(ScsiOutcome, TheFilterNamesTheHostsAndJoinsTheirRuns) {
    EXPECT_EQ(makeScsiFilter({0}), "result & 42 && (host_no == 0)");
    EXPECT_EQ(makeScsiFilter({2, 5}), "result & 42 && (host_no == 2 || host_no == 5)");
    EXPECT_EQ(makeScsiFilter({1, 2, 3, 7}), "result & 42 && ((host_no >= 1 && host_no <= 3) || host_no == 7)");
    EXPECT_EQ(makeScsiFilter({4294967295}), "result & 42 && (host_no == 4294967295)");
}

TEST(ScsiOutcome, TheFilterPassesEveryStatusThatIsAnEventAndNoGoodOne) {
    for (const unsigned lStatus : {0x02u, 0x08u, 0x28u}) {
        EXPECT_NE(lStatus & 42u, 0u);
    }
    EXPECT_EQ(0x00u & 42u, 0u);
}

TEST(ScsiOutcome, AFilterTooLongForTheKernelLeavesTheHostsOut) {
    std::vector<std::uint32_t> lHosts;
    while (makeScsiFilter(lHosts).size() > 11 || lHosts.empty()) {
        ASSERT_LT(makeScsiFilter(lHosts).size(), gcScsiFilterLimit);
        lHosts.push_back(static_cast<std::uint32_t>(2 * lHosts.size()));
        ASSERT_LT(lHosts.size(), 1000u);
    }
    EXPECT_GT(lHosts.size(), 200u);
    EXPECT_EQ(makeScsiFilter(lHosts), "result & 42");
}

/// Hosts, none next to another, whose filter has exactly so many bytes.
static std::vector<std::uint32_t> sHostsFor(std::size_t aSize) {
    static constexpr std::size_t scAround = 13;  // "result & 42 && (" and ")", without one " || "
    static constexpr std::size_t scItem = 25;    // " || host_no == 2000000000"
    std::size_t lLeft = aSize - scAround;
    std::vector<std::uint32_t> lHosts;
    // Numbers of fewer digits make up for what is not a whole item.
    for (std::uint32_t lFirst = 100; lLeft % scItem != 0; lFirst += 2) {
        const std::size_t lFewer = std::min<std::size_t>(scItem - lLeft % scItem, 7);
        std::uint32_t lHost = lFirst;
        for (std::size_t lDigits = 3; lDigits < 10 - lFewer; ++lDigits) {
            lHost *= 10;
        }
        lHosts.push_back(lHost);
        lLeft -= scItem - lFewer;
    }
    for (std::uint32_t lHost = 2000000000; lLeft != 0; lHost += 2) {
        lHosts.push_back(lHost);
        lLeft -= scItem;
    }
    std::sort(lHosts.begin(), lHosts.end());
    return lHosts;
}

TEST(ScsiOutcome, AFilterOfExactlyTheKernelsLimitLeavesTheHostsOutAndOneByteLessNamesThem) {
    ASSERT_EQ(gcScsiFilterLimit, 4096u);
    EXPECT_EQ(makeScsiFilter(sHostsFor(4095)).size(), 4095u);
    EXPECT_EQ(makeScsiFilter(sHostsFor(4096)), "result & 42");
    EXPECT_EQ(makeScsiFilter(sHostsFor(4097)), "result & 42");
    // The numbers are counted right: a few bytes less, and the size is as asked for.
    EXPECT_EQ(makeScsiFilter(sHostsFor(4090)).size(), 4090u);
}

TEST(ScsiOutcome, TagsAreReadBothOrNotAtAll) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        const ZTCBytes lRecord = ZTSDoneRecord{.mDriverTag = 0xFFFFFFFF, .mSchedulerTag = 12, .mOrder = lOrder}.make();
        ZTSCommandName lCommand;
        readCommandTags(lRecord, sLayout(), lCommand, lOrder);
        EXPECT_EQ(lCommand.mDriverTag, 0xFFFFFFFFu);
        EXPECT_EQ(lCommand.mSchedulerTag, 12u);
        ZTSCommandName lShort;
        readCommandTags(ZTCByteSpan(lRecord).first(43), sLayout(), lShort, lOrder);
        EXPECT_EQ(lShort, ZTSCommandName{});
    }
}
