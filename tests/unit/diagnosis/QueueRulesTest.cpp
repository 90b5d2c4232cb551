#include <gmock/gmock.h>

#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

TEST(QueueRules, FourLunsOfOnePortAreThePort) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3}).mCount = 20000;
    const auto lFindings = lEvidence.find("port-overload");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre("20,000 QUEUE FULL answers on LUNs 0-3, seen by host7."));
    EXPECT_EQ(lFindings[0].mSubject, remoteName(1).toText());
    EXPECT_THAT(lFindings[0].mEpisodes, ElementsAre(1U));
    EXPECT_THAT(lFindings[0].mSeqs, ElementsAre(101U));
    EXPECT_THAT(lEvidence.find("lun-overload"), IsEmpty());
}

TEST(QueueRules, ThreeLunsOfOnePortAreTheLuns) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2});
    EXPECT_THAT(lEvidence.find("port-overload"), IsEmpty());
    const auto lFindings = lEvidence.find("lun-overload");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mAgainst, ElementsAre(HasSubstr("More than one LUN")));
}

TEST(QueueRules, LunsThatTwoInitiatorsSeeTogetherCountTogether) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1});
    lEvidence.addLuns("queue-full", 8, 130, 1, {2, 3});
    const auto lFindings = lEvidence.find("port-overload");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre(HasSubstr("seen by host7 and host8")));
    EXPECT_THAT(lFindings[0].mEpisodes, ElementsAre(1U, 2U));
}

TEST(QueueRules, LunsOfDifferentTimesDoNotAddUp) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1});
    lEvidence.addLuns("queue-full", 7, 161, 1, {2, 3});
    EXPECT_THAT(lEvidence.find("port-overload"), IsEmpty());
    EXPECT_THAT(lEvidence.find("lun-overload"), SizeIs(2));
    lEvidence.addLuns("queue-full", 7, 160, 1, {2, 3});
    EXPECT_THAT(lEvidence.find("port-overload"), SizeIs(1));
}

TEST(QueueRules, AnEpisodeThatLastsHoldsTogetherWhatComesWhileItLasts) {
    ZTCSampleEvidence lEvidence;
    ZTSEpisode& lrLong = lEvidence.addLuns("queue-full", 7, 100, 1, {0});
    lrLong.mLast = lrLong.mFirst + std::chrono::seconds(900);
    lEvidence.addLuns("queue-full", 7, 110, 1, {1});
    lEvidence.addLuns("queue-full", 7, 1000, 1, {2, 3});
    const auto lFindings = lEvidence.find("port-overload");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mEpisodes, ElementsAre(1U, 2U, 3U));
}

TEST(QueueRules, LunsOfDifferentPortsDoNotAddUp) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1});
    lEvidence.addLuns("queue-full", 7, 100, 4, {2, 3});
    EXPECT_THAT(lEvidence.find("port-overload"), IsEmpty());
}

TEST(QueueRules, AllLunsAreThePortAndUnnamedOnesAreNeither) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {}).mDetail.mLuns->mIsAll = true;
    lEvidence.addLuns("queue-full", 7, 100, 2, {});
    EXPECT_THAT(lEvidence.find("port-overload"), SizeIs(1));
    EXPECT_THAT(lEvidence.find("lun-overload"), IsEmpty());
}

TEST(QueueRules, OneLunBehindSeveralPortsOfANodeIsOneFinding) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addRemotePort(7, 2);
    lEvidence.addRemotePort(7, 3);
    lEvidence.addLuns("queue-full", 7, 100, 2, {5});
    lEvidence.addLuns("queue-full", 7, 100, 3, {5});
    const auto lFindings = lEvidence.find("lun-overload");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, testing::Contains(HasSubstr("behind 2 ports of one node")));
}

TEST(QueueRules, QueueDepthsOfTheTopologyAreShown) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addRemotePort(7, 1);
    for (unsigned lLun = 0; lLun < 6; ++lLun) {
        lEvidence.addPath(7, 1, lLun, 32);
    }
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});
    EXPECT_THAT(
        lEvidence.find("port-overload").at(0).mSeen,
        ElementsAre(HasSubstr("QUEUE FULL"), "Queue depth at host7: 32 for each of 4 LUNs, 128 commands in all."));
}

TEST(QueueRules, ChangesOfQueueDepthMeanwhileBelongToIt) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});
    lEvidence.addLuns("queue-depth", 7, 110, 1, {0}).mDetail.mReasons = {
        {.mValue = 8, .mExplanation = 0, .mCount = 1}, {.mValue = 16, .mExplanation = 0, .mCount = 1}};
    lEvidence.evidence().mEpisodes.back().mCount = 2;
    lEvidence.addLuns("queue-depth", 7, 500, 1, {0});  // much later
    lEvidence.addLuns("queue-depth", 7, 110, 2, {0});  // another port
    const ZTSFinding lFinding = lEvidence.find("port-overload").at(0);
    EXPECT_THAT(lFinding.mEpisodes, ElementsAre(1U, 2U));
    EXPECT_THAT(lFinding.mSeen, ElementsAre(HasSubstr("1 QUEUE FULL answer on"),
                                            "The driver changed queue depths 2 times, down to 8."));
}

TEST(QueueRules, ASilentInitiatorOfTheSamePortSpeaksAgainstOverload) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addInitiator(8, 1);
    lEvidence.addRemotePort(7, 1);
    lEvidence.addRemotePort(8, 1);
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});
    EXPECT_THAT(lEvidence.find("port-overload").at(0).mAgainst, ElementsAre(HasSubstr("host8 uses this port too")));
}
