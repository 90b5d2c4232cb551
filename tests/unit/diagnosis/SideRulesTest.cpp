#include <gmock/gmock.h>

#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

/// Two initiators that are both logged in to port 1.
static ZTCSampleEvidence sTwoUsers() {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addInitiator(8, 2);
    lEvidence.addRemotePort(7, 1);
    lEvidence.addRemotePort(8, 1);
    return lEvidence;
}

TEST(SideRules, TroubleAtTwoInitiatorsIsTheTarget) {
    ZTCSampleEvidence lEvidence = sTwoUsers();
    lEvidence.add("port-busy", 7, 100, 1);
    lEvidence.addLuns("lun-reset", 8, 120, 1, {0});
    const auto lFindings = lEvidence.find("target-side");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre("1 lun-reset and 1 port-busy at host7 and host8."));
    EXPECT_THAT(lEvidence.find("one-path"), IsEmpty());
}

TEST(SideRules, TroubleAtTwoInitiatorsAtDifferentTimesIsNotTheTarget) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("port-busy", 7, 100, 1);
    lEvidence.add("port-busy", 8, 161, 1);
    EXPECT_THAT(lEvidence.find("target-side"), IsEmpty());
}

TEST(SideRules, TroubleAtOneOfTwoInitiatorsIsItsPath) {
    ZTCSampleEvidence lEvidence = sTwoUsers();
    lEvidence.add("fcp-read-check", 7, 100, 1);
    const auto lFindings = lEvidence.find("one-path");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre(HasSubstr("host8 uses the same port and had none of it")));
    EXPECT_THAT(lEvidence.find("target-side"), IsEmpty());
}

TEST(SideRules, WithoutAnotherUserOfThePortNothingIsKnownOfThePath) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addInitiator(8, 1);
    lEvidence.addRemotePort(7, 1);
    lEvidence.addRemotePort(8, 2);
    lEvidence.add("fcp-read-check", 7, 100, 1);
    EXPECT_THAT(lEvidence.find("one-path"), IsEmpty());
}

TEST(SideRules, SilenceOfAnInitiatorThatIsNotHeardProvesNothing) {
    ZTCSampleEvidence lEvidence = sTwoUsers();
    lEvidence.add("fcp-read-check", 7, 100, 1);
    lEvidence.hide(8, "fcp-read-check");
    EXPECT_THAT(lEvidence.find("one-path"), IsEmpty());
}

TEST(SideRules, OrdinaryCheckConditionsAreNoTroubleOfASide) {
    ZTCSampleEvidence lEvidence = sTwoUsers();
    lEvidence.addSense(7, 100, 1, 0x6, 0x29, 0);
    lEvidence.addSense(8, 100, 1, 0x6, 0x29, 0);
    EXPECT_THAT(lEvidence.find("target-side"), IsEmpty());
    lEvidence.addSense(7, 100, 1, 0xB, 0x47, 3);
    lEvidence.addSense(8, 100, 1, 0xB, 0x47, 3);
    EXPECT_THAT(lEvidence.find("target-side"), SizeIs(1));
}

TEST(SideRules, ResetsBeforeBusyAreThisHostsTimeOuts) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("lun-reset", 7, 100, 1, {3});
    lEvidence.addLuns("device-busy", 7, 110, 1, {3});
    const auto lFindings = lEvidence.find("host-timeouts");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mEpisodes, ElementsAre(1U, 2U));
    EXPECT_THAT(lFindings[0].mAgainst, IsEmpty());
    lEvidence.addLuns("queue-full", 7, 90, 1, {3});
    EXPECT_THAT(lEvidence.find("host-timeouts").at(0).mAgainst, ElementsAre(HasSubstr("QUEUE FULL")));
}

TEST(SideRules, ResetsAfterBusyOrOfAnotherPortAreNotThisHostsTimeOuts) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("device-busy", 7, 100, 1, {3});
    lEvidence.addLuns("lun-reset", 7, 110, 1, {3});
    lEvidence.addLuns("lun-reset", 7, 90, 2, {3});
    lEvidence.addLuns("lun-reset", 8, 90, 1, {3});
    EXPECT_THAT(lEvidence.find("host-timeouts"), IsEmpty());
}

TEST(SideRules, ResetsLongBeforeBusyAreNotItsCause) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("lun-reset", 7, 100, 1, {3});
    lEvidence.addLuns("device-busy", 7, 161, 1, {3});
    EXPECT_THAT(lEvidence.find("host-timeouts"), IsEmpty());
}
