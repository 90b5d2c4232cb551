// What hung on the ports at a time: intervals, changes between scans, and what a scan that could not read everything
// leaves alone.
#include <algorithm>
#include <map>

#include "sensor/store/src/Database.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

constexpr std::int64_t scSecond = 1'000'000;
constexpr std::int64_t scWeek = 7 * 86'400 * scSecond;

ZTSFcName sWwn(const std::string& acrText) {
    return ZTSFcName::fromText(acrText);
}

/// One initiator, one remote port, one LUN with a disk, a multipath device and a mount.
ZTSTopology sTopology() {
    ZTSTopology lTopology;
    lTopology.mInitiators.push_back({.mHost = "host7",
                                     .mWwpn = sWwn("10:00:00:00:00:00:00:01"),
                                     .mWwnn = sWwn("20:00:00:00:00:00:00:01"),
                                     .mState = "Online",
                                     .mSpeed = "16 Gbit",
                                     .mSymbolicName = "a port, with \"quotes\"",
                                     .mFcId = 0x010100,
                                     .mFabric = sWwn("10:00:00:00:00:00:00:fa")});
    lTopology.mRemotePorts.push_back({.mName = "rport-7:0-3",
                                      .mHost = "host7",
                                      .mWwpn = sWwn("50:00:00:00:00:00:00:34"),
                                      .mState = "Online",
                                      .mRoles = "FCP Target",
                                      .mFcId = 0x010200,
                                      .mDevLossSeconds = 60});
    lTopology.mPaths.push_back({.mAddress = "7:0:3:12",
                                .mHost = "host7",
                                .mRemotePort = "rport-7:0-3",
                                .mLun = 12,
                                .mVendor = "ACME",
                                .mModel = "Array",
                                .mWwid = "naa.600a",
                                .mState = "running",
                                .mQueueDepth = 32,
                                .mDisk = "sdc",
                                .mHolders = {"dm-3", "dm-4"}});
    lTopology.mMappings["dm-3"] = {.mDevice = "dm-3", .mName = "mpatha", .mUuid = "mpath-600a", .mSlaves = {"sdc"}};
    lTopology.mMounts["dm-4"] = {"/srv/a b", "/srv/c"};
    return lTopology;
}

class TopologyHistoryTest : public ZTCStoreTest {
protected:
    bool note(std::int64_t aTime, const ZTSTopology& acrTopology, std::uint32_t aMost = gcMostTopologyRows) {
        bool lIsWhole = false;
        inTransaction([&] { lIsWhole = store().noteTopology(aTime, acrTopology, aMost); });
        return lIsWhole;
    }
    ZTSTopology at(std::int64_t aTime) { return history().readTopology(aTime).value().mTopology; }
    std::vector<ZTSTopologyChange> changesUpTo(std::int64_t aTo) { return history().readTopologyChanges(gcBase, aTo); }
};

}  // namespace

TEST_F(TopologyHistoryTest, WhatWasScannedIsReadBackWhole) {
    EXPECT_FALSE(history().readTopology(gcBase)) << "nothing was scanned yet";
    note(gcBase, sTopology());
    EXPECT_EQ(at(gcBase), sTopology());
    EXPECT_EQ(at(gcBase + scSecond), sTopology());
    EXPECT_FALSE(history().readTopology(gcBase - 1)) << "nothing is known of the time before";
    EXPECT_FALSE(history().readTopology(gcBase)->mIsStale);
    EXPECT_EQ(history().readTopology(gcBase)->mScanned, gcBase);
    EXPECT_TRUE(changesUpTo(gcBase + scWeek).empty()) << "what the first scan finds was there before";
}

TEST_F(TopologyHistoryTest, AnEventOfLastWeekHasTheNamesOfLastWeek) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mPaths[0].mDisk = "sdd";  // renamed at a restart of the host
    lNow.mMappings["dm-3"].mSlaves = {"sdd"};
    lNow.mMappings["dm-3"].mName = "mpathb";
    lNow.mMounts.clear();
    note(gcBase + scWeek, lNow);
    EXPECT_EQ(at(gcBase + scWeek - 1), sTopology());
    EXPECT_EQ(at(gcBase + scWeek), lNow);
    closeStore();
    mHistory.reset();
    EXPECT_EQ(at(gcBase + 5), sTopology());
    EXPECT_EQ(changesUpTo(gcBase + scWeek), (std::vector<ZTSTopologyChange>{
                                                {gcBase + scWeek, ZTTT_Path, "7:0:3:12", "disk", "sdc", "sdd"},
                                                {gcBase + scWeek, ZTTT_Mapping, "dm-3", "name", "mpatha", "mpathb"},
                                                {gcBase + scWeek, ZTTT_Mapping, "dm-3", "slaves", "sdc", "sdd"},
                                                {gcBase + scWeek, ZTTT_Mount, "dm-4", "", "", std::nullopt},
                                            }));
}

TEST_F(TopologyHistoryTest, TheMostWaysToALunAreThoseThatWereThereAtOneTime) {
    using ZTCWays = std::map<std::string, ZTSLunWays>;
    const auto lMost = [this](std::int64_t aFrom, std::int64_t aTo) { return history().readMostWays(aFrom, aTo); };
    EXPECT_TRUE(lMost(0, gcBase).empty());
    // host8 sees the same port under another name.
    ZTSTopology lTwo = sTopology();
    lTwo.mRemotePorts.push_back(lTwo.mRemotePorts[0]);
    lTwo.mRemotePorts[1].mName = "rport-8:0-3";
    lTwo.mRemotePorts[1].mHost = "host8";
    lTwo.mPaths.push_back(lTwo.mPaths[0]);
    lTwo.mPaths[1].mAddress = "8:0:3:12";
    lTwo.mPaths[1].mHost = "host8";
    lTwo.mPaths[1].mRemotePort = "rport-8:0-3";
    ZTSTopology lOther = lTwo;
    lOther.mPaths.erase(lOther.mPaths.begin());
    note(gcBase, sTopology());
    note(gcBase + scSecond, lTwo);
    for (std::uint32_t lDepth = 31; lDepth > 28; --lDepth) {  // versions of a path that is there all the time
        lTwo.mPaths[0].mQueueDepth = lDepth;
        note(gcBase + (40 - lDepth) * scSecond, lTwo);
    }
    note(gcBase + 20 * scSecond, lOther);
    EXPECT_EQ(lMost(0, gcBase), (ZTCWays{{"naa.600a", {1, 1, 1}}}));
    EXPECT_EQ(lMost(0, gcBase + scWeek), (ZTCWays{{"naa.600a", {2, 2, 1}}}));
    EXPECT_EQ(lMost(gcBase + 20 * scSecond, gcBase + scWeek), (ZTCWays{{"naa.600a", {1, 1, 1}}}));
    note(gcBase + 30 * scSecond, sTopology());  // one path goes and the other comes: never three
    EXPECT_EQ(lMost(gcBase + 20 * scSecond, gcBase + scWeek), (ZTCWays{{"naa.600a", {1, 1, 1}}}));
}

TEST_F(TopologyHistoryTest, ALunThatIsRemappedKeepsItsAddressAndChangesItsWwid) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mPaths[0].mWwid = "naa.600b";
    note(gcBase + scSecond, lNow);
    EXPECT_EQ(
        changesUpTo(gcBase + scSecond),
        (std::vector<ZTSTopologyChange>{{gcBase + scSecond, ZTTT_Path, "7:0:3:12", "wwid", "naa.600a", "naa.600b"}}));
    EXPECT_EQ(at(gcBase).mPaths[0].mWwid, "naa.600a");
}

TEST_F(TopologyHistoryTest, AReplacedAdapterIsTheSameHostWithAnotherWwpn) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mInitiators[0].mWwpn = sWwn("10:00:00:00:00:00:00:99");
    note(gcBase + scSecond, lNow);
    EXPECT_EQ(changesUpTo(gcBase + scSecond),
              (std::vector<ZTSTopologyChange>{{gcBase + scSecond, ZTTT_Initiator, "host7", "wwpn",
                                               "10:00:00:00:00:00:00:01", "10:00:00:00:00:00:00:99"}}));
    EXPECT_EQ(at(gcBase).mInitiators[0].mWwpn, sWwn("10:00:00:00:00:00:00:01"));
}

TEST_F(TopologyHistoryTest, ARemotePortNumberThatGoesToAnotherPortIsAnotherThing) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mRemotePorts[0].mWwpn = sWwn("50:00:00:00:00:00:00:35");
    note(gcBase + scSecond, lNow);
    EXPECT_EQ(changesUpTo(gcBase + scSecond),
              (std::vector<ZTSTopologyChange>{
                  {gcBase + scSecond, ZTTT_RemotePort, "rport-7:0-3 50:00:00:00:00:00:00:34", "", "", std::nullopt},
                  {gcBase + scSecond, ZTTT_RemotePort, "rport-7:0-3 50:00:00:00:00:00:00:35", "", std::nullopt, ""}}));
    EXPECT_EQ(at(gcBase + scSecond).mRemotePorts.size(), 1U);
}

TEST_F(TopologyHistoryTest, AScanWithBlockedFilesEndsNothingThatItCouldNotRead) {
    note(gcBase, sTopology());
    ZTSTopology lBlocked = sTopology();
    lBlocked.mBlocked = {"/sys/class/block/dm-4/dev", "/sys/class/fc_host/host7/port_state",
                         "/sys/class/fc_remote_ports/rport-7:0-3/port_name",
                         "/sys/class/scsi_device/7:0:3:12/device/wwid"};
    lBlocked.mInitiators[0].mState.reset();
    lBlocked.mRemotePorts[0].mWwpn.reset();
    lBlocked.mPaths[0].mWwid.reset();
    lBlocked.mPaths[0].mQueueDepth = 8;  // this file did answer
    lBlocked.mMounts.clear();
    note(gcBase + scSecond, lBlocked);
    ZTSTopology lExpected = sTopology();
    lExpected.mPaths[0].mQueueDepth = 8;
    lExpected.mBlocked = lBlocked.mBlocked;
    const ZTSStoredTopology lStored = history().readTopology(gcBase + scSecond).value();
    EXPECT_EQ(lStored.mTopology, lExpected);
    EXPECT_TRUE(lStored.mIsStale);
    EXPECT_FALSE(history().readTopology(gcBase)->mIsStale);
    EXPECT_EQ(changesUpTo(gcBase + scSecond).size(), 1U) << "the queue depth alone";

    // It answers again: what is gone now is gone.
    ZTSTopology lNow = sTopology();
    lNow.mInitiators[0].mState.reset();
    note(gcBase + 2 * scSecond, lNow);
    EXPECT_FALSE(at(gcBase + 2 * scSecond).mInitiators[0].mState);
    EXPECT_FALSE(history().readTopology(gcBase + 2 * scSecond)->mIsStale);
}

TEST_F(TopologyHistoryTest, AFileThatBlocksDoesNotKeepWhatOthersHaveLost) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mBlocked = {"/sys/class/fc_host/host8/port_state"};
    lNow.mInitiators[0].mFcId.reset();
    lNow.mPaths.clear();
    note(gcBase + scSecond, lNow);
    EXPECT_FALSE(at(gcBase + scSecond).mInitiators[0].mFcId);
    EXPECT_TRUE(at(gcBase + scSecond).mPaths.empty()) << "its directory is gone";
}

TEST_F(TopologyHistoryTest, ScansThatSeeTheSameWriteNoIntervals) {
    for (int i = 0; i < 50; ++i) {
        note(gcBase + i * 30 * scSecond, sTopology());
    }
    EXPECT_EQ(queryNumber(path(), "SELECT count(*) FROM topology"), 5);
    EXPECT_EQ(queryNumber(path(), "SELECT count(*) FROM scan"), 1);
    EXPECT_GE(history().readTopology(gcBase + scWeek)->mScanned, gcBase + 48 * 30 * scSecond);
    note(gcBase + scWeek, sTopology());
    EXPECT_EQ(queryNumber(path(), "SELECT count(*) FROM scan"), 2) << "nothing was scanned for a week";
    EXPECT_LT(history().readTopology(gcBase + scWeek - 1)->mScanned, gcBase + 60 * 30 * scSecond);
}

TEST_F(TopologyHistoryTest, ALargeFirstScanIsWrittenInBoundedTransactions) {
    ZTSTopology lLarge = sTopology();
    lLarge.mPaths.clear();
    for (int i = 0; i < 500; ++i) {
        lLarge.mPaths.push_back(
            {.mAddress = "7:0:3:" + std::to_string(i), .mHost = "host7", .mRemotePort = "rport-7:0-3"});
    }
    std::ranges::sort(lLarge.mPaths, {}, &ZTSTopologyPath::mAddress);
    int lCalls = 1;
    while (!note(gcBase, lLarge, 100)) {
        EXPECT_FALSE(history().readTopology(gcBase)) << "half a topology is none";
        ASSERT_LT(++lCalls, 10);
    }
    EXPECT_EQ(lCalls, 6);
    EXPECT_EQ(at(gcBase), lLarge);
    ZTSTopology lLess = lLarge;
    lLess.mPaths.resize(1);
    int lSteps = 1;
    while (!note(gcBase + scSecond, lLess, 100)) {
        ASSERT_LT(++lSteps, 10);
    }
    EXPECT_EQ(lSteps, 5);
    EXPECT_EQ(at(gcBase + scSecond), lLess);
    EXPECT_EQ(at(gcBase), lLarge);
}

TEST_F(TopologyHistoryTest, ATransactionThatIsRolledBackLeavesNoTrace) {
    note(gcBase, sTopology());
    ZTSTopology lNow = sTopology();
    lNow.mPaths.clear();
    {
        const ZTCStoreTransaction lTransaction = store().begin();
        store().noteTopology(gcBase + scSecond, lNow);
    }
    EXPECT_EQ(at(gcBase + scSecond), sTopology());
    note(gcBase + 2 * scSecond, lNow);
    EXPECT_EQ(at(gcBase + 2 * scSecond), lNow);
    expectIntegrity(path());
}

TEST_F(TopologyHistoryTest, AThingThatGoesAndComesBackIsThereTwice) {
    note(gcBase, sTopology());
    ZTSTopology lGone = sTopology();
    lGone.mPaths.clear();
    note(gcBase + scSecond, lGone);
    note(gcBase + 2 * scSecond, sTopology());
    EXPECT_EQ(changesUpTo(gcBase + 2 * scSecond),
              (std::vector<ZTSTopologyChange>{{gcBase + scSecond, ZTTT_Path, "7:0:3:12", "", "", std::nullopt},
                                              {gcBase + 2 * scSecond, ZTTT_Path, "7:0:3:12", "", std::nullopt, ""}}));
    EXPECT_EQ(history().readTopologyChanges(gcBase + scSecond, gcBase + scWeek).size(), 1U) << "only what came later";
    EXPECT_TRUE(at(gcBase + scSecond).mPaths.empty());
    EXPECT_EQ(at(gcBase + 2 * scSecond), sTopology());
}

TEST_F(TopologyHistoryTest, StepsThroughTimeLeadWhereAReadingOfThatTimeLeads) {
    ZTSTopology lNow = sTopology();
    for (int i = 0; i < 40; ++i) {
        // Things change, go, come back, and come back changed.
        lNow.mPaths = i % 3 == 0 ? std::vector<ZTSTopologyPath>() : sTopology().mPaths;
        if (!lNow.mPaths.empty()) {
            lNow.mPaths[0].mQueueDepth = static_cast<std::uint32_t>(i);
        }
        lNow.mRemotePorts[0].mWwpn = i % 5 < 3 ? sWwn("50:00:00:00:00:00:00:34") : sWwn("50:00:00:00:00:00:00:35");
        lNow.mInitiators[0].mState = i % 2 == 0 ? "Online" : "Linkdown";
        lNow.mMappings = i % 4 == 0 ? decltype(lNow.mMappings)() : sTopology().mMappings;
        lNow.mMounts = i % 7 == 0 ? decltype(lNow.mMounts)() : sTopology().mMounts;
        note(gcBase + i * scSecond, lNow);
    }
    for (const int lStep : {1, 2, 7, 39}) {
        ZTSStoredTopology lStored = history().readTopology(gcBase).value();
        for (int i = lStep; i < 40; i += lStep) {
            history().advanceTopology(lStored, gcBase + (i - lStep) * scSecond, gcBase + i * scSecond);
            ASSERT_EQ(lStored.mTopology, at(gcBase + i * scSecond)) << lStep << " " << i;
        }
    }
}

TEST_F(TopologyHistoryTest, CountersAreKeptAMinuteAndPort) {
    const ZTSFcName lInitiator = sWwn("10:00:00:00:00:00:00:01");
    const ZTSFcName lPort = sWwn("50:00:00:00:00:00:00:34");
    const std::int64_t lMinute = gcBase - gcBase % (60 * scSecond);
    const std::vector<ZTSCounterSample> lSamples = {
        {lMinute, lInitiator, std::nullopt, "invalid_crc_count", 4},
        {lMinute, lInitiator, lPort, "fpin_cn", 2},
        {lMinute + 60 * scSecond, lInitiator, std::nullopt, "link_failure_count", 1}};
    inTransaction([&] { store().noteCounters(lSamples); });
    inTransaction([&] {
        store().noteCounters(
            std::vector<ZTSCounterSample>{{lMinute + 60 * scSecond, lInitiator, std::nullopt, "lip_count", 0}});
    });
    EXPECT_EQ(history().readCounters(lMinute, lMinute + 90 * scSecond, 100), lSamples) << "zero is no row";
    EXPECT_EQ(history().readCounters(lMinute + 59 * scSecond, lMinute + 59 * scSecond, 100).size(), 2U);
    EXPECT_EQ(history().readCounters(lMinute, lMinute + 90 * scSecond, 1).size(), 1U);
    inTransaction([&] { store().noteCounters(std::span(lSamples).first(1)); });
    EXPECT_EQ(history().readCounters(lMinute, lMinute, 1)[0].mDifference, 8U);
}

TEST_F(TopologyHistoryTest, RetentionTakesWhatEndedLongAgoAndNeverWhatStillHolds) {
    mLimits.mDays = 3;
    mLimits.mStepRows = 8;
    const ZTSFcName lInitiator = sWwn("10:00:00:00:00:00:00:01");
    for (int lDay = 0; lDay < 6; ++lDay) {
        ZTSTopology lNow = sTopology();
        lNow.mPaths[0].mQueueDepth = static_cast<std::uint32_t>(lDay);
        note(gcBase + lDay * gcDay, lNow);
        inTransaction([&] {
            store().noteCounters(
                std::vector<ZTSCounterSample>{{gcBase + lDay * gcDay, lInitiator, std::nullopt, "lip_count", 1}});
        });
    }
    const std::int64_t lNow = gcBase + 6 * gcDay;
    auto lSteady = std::chrono::steady_clock::time_point(std::chrono::hours(1000));
    for (int lHour = 0; lHour < 12; ++lHour, lSteady += std::chrono::hours(1)) {
        for (int lSteps = 0; store().retireStep(fromMicroseconds(lNow + lHour), lSteady); ++lSteps) {
            ASSERT_LT(lSteps, 100);
        }
    }
    EXPECT_EQ(history().readCounters(0, lNow, 100).size(), 3U);
    EXPECT_EQ(queryNumber(path(), "SELECT count(*) FROM topology WHERE timeTo IS NULL"), 5);
    EXPECT_EQ(queryNumber(path(), "SELECT count(*) FROM topology WHERE timeTo IS NOT NULL"), 3);
    EXPECT_EQ(at(lNow).mPaths[0].mQueueDepth, 5U);
    EXPECT_EQ(at(lNow).mInitiators, sTopology().mInitiators) << "its interval began long ago and is still open";
}

TEST_F(TopologyHistoryTest, DamagedBytesOfAThingAreNoticed) {
    note(gcBase, sTopology());
    closeStore();
    {
        ZTCDatabase lDatabase(path(), ZTDA_ReadWrite);
        lDatabase.execute("UPDATE topology SET body = x'0CFF01'");
    }
    EXPECT_THROW(at(gcBase), ZTCStoreDamagedEx);
}
