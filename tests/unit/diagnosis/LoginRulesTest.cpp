#include <gmock/gmock.h>

#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

TEST(LoginRules, PortsOfDifferentNodesThatLogInAgainAreAZoningChange) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100).mCount = 2;
    lEvidence.addRelogin(7, 101, 0);
    lEvidence.addRelogin(7, 103, 2);
    const auto lFindings = lEvidence.find("zoning-changed");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre(HasSubstr("After 2 RSCN pages at host7, ")));
    EXPECT_THAT(lFindings[0].mEpisodes, SizeIs(5));
    EXPECT_THAT(lEvidence.find("controller-failover"), IsEmpty());
}

TEST(LoginRules, AllPortsOfOneNodeAreItsController) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 2);
    lEvidence.addRelogin(7, 103, 3);
    const auto lFindings = lEvidence.find("controller-failover");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, Contains(HasSubstr("of node " + nodeName(1).toText())));
    EXPECT_THAT(lEvidence.find("zoning-changed"), IsEmpty());
}

TEST(LoginRules, SomePortsOfANodeAreNotItsController) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 2);
    lEvidence.addRelogin(7, 103, 3);
    // A third port of the node, that stays.
    lEvidence.addInitiator(7, 1);
    lEvidence.addRemotePort(7, 9);
    lEvidence.evidence().mTopology->mRemotePorts.back().mWwnn = nodeName(1);
    EXPECT_THAT(lEvidence.find("controller-failover"), IsEmpty());
    EXPECT_THAT(lEvidence.find("zoning-changed"), SizeIs(1));
}

TEST(LoginRules, OnePortThatLogsInAgainIsNeither) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 2);
    EXPECT_THAT(lEvidence.find("controller-failover"), IsEmpty());
    EXPECT_THAT(lEvidence.find("zoning-changed"), IsEmpty());
}

TEST(LoginRules, AfterALinkEventLoginsAreItsConsequence) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 0);
    lEvidence.addRelogin(7, 103, 2);
    lEvidence.add("link", 8, 95);  // another port
    EXPECT_THAT(lEvidence.find("zoning-changed"), SizeIs(1));
    lEvidence.add("link", 7, 95);
    EXPECT_THAT(lEvidence.find("zoning-changed"), IsEmpty());
}

TEST(LoginRules, LogoutsBeforeTheRscnAreNotItsConsequence) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addRelogin(7, 101, 0);
    lEvidence.addRelogin(7, 103, 2);
    lEvidence.add("rscn", 7, 110);
    EXPECT_THAT(lEvidence.find("zoning-changed"), IsEmpty());
}

TEST(LoginRules, PortsThatDoNotComeBackAreNamed) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 0);
    lEvidence.addRelogin(7, 103, 2);
    lEvidence.add("logo", 7, 104, 4);
    EXPECT_THAT(lEvidence.find("zoning-changed").at(0).mSeen,
                Contains("Not back yet: " + remoteName(4).toText() + "."));
}

TEST(LoginRules, RejectionsForWantOfResourcesAreTheLimit) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addRejection(7, 100, 1, 0x03, 0x09, 0x29);
    EXPECT_THAT(lEvidence.find("login-limit"), SizeIs(1));
    EXPECT_THAT(lEvidence.find("login-unsupported"), IsEmpty());
}

TEST(LoginRules, RejectionsAsUnsupportedAreNotTheLimit) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addRejection(7, 100, 1, 0x03, 0x0B, 0);
    lEvidence.addRejection(7, 100, 2, 0x20, 0x03, 0x2C);
    EXPECT_THAT(lEvidence.find("login-unsupported"), SizeIs(2));
    EXPECT_THAT(lEvidence.find("login-limit"), IsEmpty());
}

TEST(LoginRules, OtherRejectionsAreNeither) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addRejection(7, 100, 1, 0x03, 0x05, 0x19);  // busy, in progress
    lEvidence.addRejection(7, 100, 1, 0x52, 0x0B, 0x00);  // ADISC not supported
    lEvidence.addRejection(7, 100, 1, 0x52, 0x09, 0x29);  // ADISC for want of resources
    EXPECT_THAT(lEvidence.diagnoseAll(), IsEmpty());
}
