#include "sensor/views/include/SanFacts.h"

#include <gmock/gmock.h>

#include "tests/unit/views/SanSamples.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

/// The troubles by kind, the worst first.
static std::vector<ZTESanTrouble> sKinds(const ZTSSanFacts& acrFacts) {
    std::vector<ZTESanTrouble> lKinds;
    for (const ZTSSanTrouble& lrTrouble : acrFacts.mTroubles) {
        lKinds.push_back(lrTrouble.mKind);
    }
    return lKinds;
}

TEST(SanFacts, AHostWithoutFibreChannelHasNoTrouble) {
    const ZTSSanFacts lFacts = findSanFacts({});
    EXPECT_THAT(lFacts.mLuns, IsEmpty());
    EXPECT_THAT(lFacts.mTroubles, IsEmpty());
    EXPECT_EQ(lFacts.getWorst(), std::nullopt);
}

TEST(SanFacts, ALargeHealthyHostHasAllItsPathsAndNoTrouble) {
    const ZTSSanFacts lFacts = findSanFacts(makeSan({.mHosts = 8, .mPortsOfAHost = 8, .mLuns = 200}));
    ASSERT_THAT(lFacts.mLuns, SizeIs(200));
    for (const ZTSSanLun& lrLun : lFacts.mLuns) {
        EXPECT_THAT(lrLun.mPaths, SizeIs(64));
        EXPECT_EQ(lrLun.mRunning, 64U);
        EXPECT_EQ(lrLun.mExpected, 64U);
        EXPECT_EQ(lrLun.mRedundancy, ZTRD_Whole);
    }
    EXPECT_THAT(lFacts.mTroubles, IsEmpty());
}

TEST(SanFacts, ALunKnowsItsDisksItsMultipathDeviceAndItsMounts) {
    const ZTSSanFacts lFacts = findSanFacts(makeSan({}));
    const ZTSSanLun& lrLun = lFacts.mLuns.at(0);
    EXPECT_EQ(lrLun.mWwid, "naa.000");
    EXPECT_EQ(lrLun.mMultipath, "mpath0");
    EXPECT_EQ(lrLun.mMultipathDevice, "dm-0");
    EXPECT_THAT(lrLun.mMounts, ElementsAre("/data/0"));
    const ZTSSanPath& lrPath = lrLun.mPaths.at(0);
    EXPECT_EQ(lrPath.mAddress, "7:0:0:0");
    EXPECT_EQ(lrPath.mInitiator.mWwpn.value().toText(), "10:00:00:00:00:00:00:07");
    EXPECT_EQ(lrPath.mRemotePort.value().mWwpn.toText(), "50:06:01:60:00:00:00:00");
    EXPECT_EQ(lrPath.mDisk, "sd0-7-0");
    EXPECT_EQ(lrPath.mHealth, ZTPH_Running);
}

TEST(SanFacts, ARemotePortThatIsAwayIsOneTroubleForAllItsLuns) {
    ZTSTopology lNow = makeSan({});
    losePort(lNow, "rport-8:0-1");
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_PathLost));
    const ZTSSanTrouble& lrTrouble = lFacts.mTroubles[0];
    EXPECT_EQ(lrTrouble.mSeverity, ZTSS_Warning);
    EXPECT_EQ(lrTrouble.mState, "Blocked");
    EXPECT_EQ(lrTrouble.mInitiators.at(0).mHost, "host8");
    EXPECT_EQ(lrTrouble.mRemotePorts.at(0).mWwpn.toText(), "50:06:01:60:00:00:01:01");
    EXPECT_EQ(lrTrouble.mOtherPorts, 3U);
    EXPECT_THAT(lrTrouble.mLuns, SizeIs(4));
    EXPECT_EQ(lFacts.mLuns[0].mRedundancy, ZTRD_Reduced);
    EXPECT_EQ(lFacts.mLuns[0].mRunning, 7U);
    EXPECT_EQ(lFacts.mLuns[0].mExpected, 8U);
}

TEST(SanFacts, APortWhosePathsTheKernelHasRemovedIsMeasuredByEarlier) {
    const ZTSTopology lBefore = makeSan({});
    ZTSTopology lNow = lBefore;
    removePort(lNow, "rport-8:0-1");
    const ZTSSanFacts lFacts = findSanFacts(lNow, {.mEarlier = {lBefore}});
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_PathLost));
    EXPECT_EQ(lFacts.mTroubles[0].mState, "Not Present");
    EXPECT_THAT(lFacts.mTroubles[0].mLuns, SizeIs(4));
    EXPECT_EQ(lFacts.mLuns[0].mExpected, 8U);
    EXPECT_EQ(lFacts.mLuns[0].mRunning, 7U);
}

TEST(SanFacts, APortThatWasAwayAllTheTimeIsOnlyANotice) {
    ZTSTopology lNow = makeSan({});
    removePort(lNow, "rport-8:0-1");
    const ZTSSanFacts lFacts = findSanFacts(lNow, {.mEarlier = {lNow}});
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_PathLost));
    EXPECT_EQ(lFacts.getWorst(), ZTSS_Notice);
    EXPECT_EQ(lFacts.mLuns[0].mRedundancy, ZTRD_Whole);
}

TEST(SanFacts, TheSamePortMissedByTwoInitiatorsIsOneTrouble) {
    ZTSTopology lNow = makeSan({.mIsOneFabric = true});
    losePort(lNow, "rport-7:0-2");
    losePort(lNow, "rport-8:0-2");
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_PathLost));
    EXPECT_THAT(lFacts.mTroubles[0].mInitiators, SizeIs(2));
    EXPECT_THAT(lFacts.mTroubles[0].mLuns, SizeIs(4));
}

TEST(SanFacts, ALinkThatIsDownExplainsItsPortsAndLeavesOneInitiator) {
    ZTSTopology lNow = makeSan({});
    lNow.mInitiators.at(1).mState = "Linkdown";
    for (ZTSTopologyRemotePort& lrPort : lNow.mRemotePorts) {
        if (lrPort.mHost == "host8") {
            losePort(lNow, lrPort.mName);
        }
    }
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    EXPECT_THAT(sKinds(lFacts), ElementsAre(ZTST_RedundancyLost, ZTST_LinkDown));
    EXPECT_EQ(lFacts.countLuns(ZTRD_Lost), 4U);
    EXPECT_EQ(lFacts.mLuns[0].mRunning, 4U);
    EXPECT_EQ(lFacts.mTroubles[1].mState, "Linkdown");
    EXPECT_EQ(lFacts.getWorst(), ZTSS_Warning);
}

TEST(SanFacts, APortWithoutACableIsOnlyANotice) {
    ZTSTopology lNow = makeSan({});
    lNow.mInitiators.push_back({.mHost = "host9", .mState = "Linkdown"});
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    EXPECT_THAT(sKinds(lFacts), ElementsAre(ZTST_LinkDown));
    EXPECT_EQ(lFacts.getWorst(), ZTSS_Notice);
    // It had a link an hour ago: now it is a loss, even if no unit needs it.
    ZTSTopology lBefore = lNow;
    lBefore.mInitiators.back().mState = "Online";
    EXPECT_EQ(findSanFacts(lNow, {.mEarlier = {lBefore}}).getWorst(), ZTSS_Warning);
}

TEST(SanFacts, ALunWithoutARunningPathIsCritical) {
    ZTSTopology lNow = makeSan({});
    for (ZTSTopologyPath& lrPath : lNow.mPaths) {
        if (lrPath.mWwid == "naa.002") {
            lrPath.mState = "offline";
        }
    }
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_LunWithoutPath));
    EXPECT_THAT(lFacts.mTroubles[0].mLuns, ElementsAre(2U));
    EXPECT_EQ(lFacts.getWorst(), ZTSS_Critical);
}

TEST(SanFacts, LunsThatVanishedWithTheirPortsAreWithoutAPath) {
    const ZTSTopology lBefore = makeSan({.mHosts = 1, .mPortsOfAHost = 2, .mLuns = 3});
    ZTSTopology lNow = lBefore;
    removePort(lNow, "rport-7:0-0");
    removePort(lNow, "rport-7:0-1");
    const ZTSSanFacts lFacts = findSanFacts(lNow, {.mEarlier = {lBefore}});
    EXPECT_THAT(sKinds(lFacts), ElementsAre(ZTST_LunWithoutPath, ZTST_PathLost, ZTST_PathLost));
    ASSERT_THAT(lFacts.mLuns, SizeIs(3));
    EXPECT_TRUE(lFacts.mLuns[0].mIsGone);
    EXPECT_EQ(lFacts.mLuns[0].mRedundancy, ZTRD_None);
    EXPECT_THAT(lFacts.mLuns[0].mPaths, SizeIs(2));
}

TEST(SanFacts, ALunThatWasUnmappedWhileItsPortsStayedIsNoTrouble) {
    const ZTSTopology lBefore = makeSan({});
    ZTSTopology lNow = lBefore;
    std::erase_if(lNow.mPaths, [](const ZTSTopologyPath& acrPath) { return acrPath.mWwid == "naa.001"; });
    const ZTSSanFacts lFacts = findSanFacts(lNow, {.mEarlier = {lBefore}});
    EXPECT_THAT(lFacts.mTroubles, IsEmpty());
    EXPECT_THAT(lFacts.mLuns, SizeIs(3));
}

TEST(SanFacts, TheLastPathIsRedundancyLost) {
    ZTSTopology lNow = makeSan({.mHosts = 1, .mPortsOfAHost = 2, .mLuns = 2});
    losePort(lNow, "rport-7:0-1");
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    EXPECT_THAT(sKinds(lFacts), ElementsAre(ZTST_RedundancyLost, ZTST_PathLost));
    EXPECT_EQ(lFacts.mLuns[0].mRedundancy, ZTRD_Lost);
}

TEST(SanFacts, ASingleInitiatorWithASinglePathByDesignIsNoTrouble) {
    EXPECT_THAT(findSanFacts(makeSan({.mHosts = 1, .mPortsOfAHost = 1})).mTroubles, IsEmpty());
    EXPECT_THAT(findSanFacts(makeSan({.mHosts = 1, .mPortsOfAHost = 4})).mTroubles, IsEmpty());
}

TEST(SanFacts, ADeviceThatIsOfflineIsReducedRedundancyWithoutAPortToBlame) {
    ZTSTopology lNow = makeSan({});
    lNow.mPaths.at(0).mState = "offline";
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_RedundancyReduced));
    EXPECT_THAT(lFacts.mTroubles[0].mLuns, ElementsAre(0U));
}

TEST(SanFacts, AnInitiatorWithoutAPathIsATroubleWhereOthersHaveSome) {
    ZTSTopology lNow = makeSan({});
    lNow.mInitiators.push_back({.mHost = "host9", .mState = "Online"});
    EXPECT_THAT(sKinds(findSanFacts(lNow)), ElementsAre(ZTST_InitiatorWithoutPath));
    // It sees initiators alone: it serves as a target, and needs no path.
    lNow.mRemotePorts.push_back({.mName = "rport-9:0-0",
                                 .mHost = "host9",
                                 .mWwpn = lNow.mInitiators[0].mWwpn,
                                 .mWwnn = {},
                                 .mState = "Online",
                                 .mRoles = "FCP Initiator"});
    EXPECT_THAT(findSanFacts(lNow).mTroubles, IsEmpty());
    // Where no initiator has a path nothing is set up yet.
    lNow.mRemotePorts.back().mRoles = "FCP Target";
    lNow.mPaths.clear();
    EXPECT_THAT(sKinds(findSanFacts(lNow)), testing::Each(ZTST_UselessPort));
}

TEST(SanFacts, AnOnlineTargetPortWithoutAPathIsOnlyANotice) {
    ZTSTopology lNow = makeSan({});
    lNow.mRemotePorts.push_back(lNow.mRemotePorts[0]);
    lNow.mRemotePorts.back().mName = "rport-7:0-9";
    lNow.mRemotePorts.back().mWwpn = ZTSFcName::fromText("50:06:01:60:00:00:00:99");
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_UselessPort));
    EXPECT_EQ(lFacts.getWorst(), ZTSS_Notice);
    // Other hosts' initiators in the same zone are not expected to contribute a path.
    lNow.mRemotePorts.back().mRoles = "FCP Initiator";
    EXPECT_THAT(findSanFacts(lNow).mTroubles, IsEmpty());
}

TEST(SanFacts, APortThatKeepsChangingItsStateIsFlapping) {
    const ZTSTopology lNow = makeSan({});
    ZTSSanPast lPast;
    lPast.mStates["rport-7:0-1"] = {.mChanges = gcFlappingChanges - 1};
    EXPECT_THAT(findSanFacts(lNow, lPast).mTroubles, IsEmpty());
    lPast.mStates["rport-7:0-1"].mChanges = gcFlappingChanges;
    const ZTSSanFacts lFacts = findSanFacts(lNow, lPast);
    ASSERT_THAT(sKinds(lFacts), ElementsAre(ZTST_Flapping));
    EXPECT_EQ(lFacts.mTroubles[0].mChanges, gcFlappingChanges);
    // A link that goes and comes takes its ports along.
    lPast.mStates["host7"].mChanges = 7;
    const ZTSSanFacts lLink = findSanFacts(lNow, lPast);
    ASSERT_THAT(sKinds(lLink), ElementsAre(ZTST_Flapping));
    EXPECT_THAT(lLink.mTroubles[0].mRemotePorts, IsEmpty());
}

TEST(SanFacts, WhatTheKernelDoesNotSayIsUnknownAndNoTrouble) {
    ZTSTopology lNow = makeSan({});
    lNow.mInitiators[0].mState.reset();
    lNow.mRemotePorts[0].mState.reset();
    lNow.mPaths[0].mState.reset();
    lNow.mBlocked = {"/sys/class/scsi_device/7:0:0:0/device/state"};
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    EXPECT_THAT(lFacts.mTroubles, IsEmpty());
    EXPECT_EQ(lFacts.mBlocked, 1U);
    EXPECT_EQ(lFacts.mLuns[0].mRedundancy, ZTRD_Unknown);
    EXPECT_EQ(lFacts.mLuns[0].mRunning, 7U);
    EXPECT_EQ(lFacts.mLuns[1].mRedundancy, ZTRD_Whole);
}

TEST(SanFacts, AReplacedAdapterHasAsManyPathsAsTheOneBefore) {
    const ZTSTopology lBefore = makeSan({});
    const ZTSTopology lNow = makeSan({.mFirstHost = 17});
    EXPECT_THAT(findSanFacts(lNow, {.mEarlier = {lBefore}}).mTroubles, IsEmpty());
}

TEST(SanFacts, PathsWithoutAWwidAreUnitsOfTheirOwn) {
    ZTSTopology lNow = makeSan({.mHosts = 1, .mPortsOfAHost = 2, .mLuns = 1});
    for (ZTSTopologyPath& lrPath : lNow.mPaths) {
        lrPath.mWwid.reset();
    }
    const ZTSSanFacts lFacts = findSanFacts(lNow);
    ASSERT_THAT(lFacts.mLuns, SizeIs(2));
    EXPECT_EQ(lFacts.mLuns[0].mId, "7:0:0:0");
    EXPECT_EQ(lFacts.mLuns[0].mWwid, std::nullopt);
}
