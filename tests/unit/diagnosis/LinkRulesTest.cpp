#include <gmock/gmock.h>

#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

/// Hosts 7 and 8 on fabric 1, host 9 alone on fabric 2.
static ZTCSampleEvidence sTwoFabrics() {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addInitiator(8, 1);
    lEvidence.addInitiator(9, 2);
    return lEvidence;
}

TEST(LinkRules, OneOfTwoLinksOfAFabricIsItsCable) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 7, 100).mCount = 4;
    const auto lFindings = lEvidence.find("link-unstable");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, ElementsAre("4 link changes at host7 alone.", "host7 is Online now."));
    EXPECT_EQ(lFindings[0].mSeverity, ZTSV_Warning);
    EXPECT_THAT(lFindings[0].mNext, Contains("tavik events --initiator host7 --since 24h"));
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
}

TEST(LinkRules, ALinkThatIsDownIsAProblem) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1, "Linkdown");
    lEvidence.addInitiator(8, 1);
    lEvidence.add("link", 7, 100);
    EXPECT_EQ(lEvidence.find("link-unstable").at(0).mSeverity, ZTSV_Problem);
}

TEST(LinkRules, AllLinksOfAFabricAtOnceAreItsSwitch) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 7, 100);
    lEvidence.add("link", 8, 130);
    const auto lFindings = lEvidence.find("switch-trouble");
    ASSERT_THAT(lFindings, SizeIs(1));
    EXPECT_THAT(lFindings[0].mSeen, Contains(HasSubstr("on fabric 20:00:00:00:00:00:00:01: host7 and host8")));
    EXPECT_THAT(lFindings[0].mAgainst, IsEmpty());
    EXPECT_THAT(lEvidence.find("link-unstable"), IsEmpty());
}

TEST(LinkRules, LinksOfAFabricAtDifferentTimesAreTheirCables) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 7, 100);
    lEvidence.add("link", 8, 131);
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
    EXPECT_THAT(lEvidence.find("link-unstable"), SizeIs(2));
}

TEST(LinkRules, LinksThatFailOneAfterAnotherAreNotOneMoment) {
    ZTCSampleEvidence lEvidence;
    for (const unsigned lHost : {7U, 8U, 9U}) {
        lEvidence.addInitiator(lHost, 1);
        lEvidence.add("link", lHost, 100 + 25 * (lHost - 7));
    }
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
    EXPECT_THAT(lEvidence.find("link-unstable"), SizeIs(3));
}

TEST(LinkRules, TheOnlyPortOfAFabricIsNotProofOfItsSwitch) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 9, 100);
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
    EXPECT_THAT(lEvidence.find("link-unstable"), SizeIs(1));
}

TEST(LinkRules, PortsOfDifferentFabricsShareTheHost) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    lEvidence.addInitiator(8, 2);
    lEvidence.add("link", 7, 100);
    lEvidence.add("link", 8, 100);
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
    const auto lFindings = lEvidence.find("link-unstable");
    ASSERT_THAT(lFindings, SizeIs(2));
    EXPECT_THAT(lFindings[0].mAgainst, ElementsAre(HasSubstr("at the same moment")));
}

TEST(LinkRules, WithoutFabricNamesAllPortsTogetherAreASwitchWithADoubt) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("link", 7, 100);
    lEvidence.add("link", 8, 100);
    EXPECT_THAT(lEvidence.find("switch-trouble").at(0).mAgainst, ElementsAre(HasSubstr("not known which fabric")));
    lEvidence.addInitiator(9, std::nullopt);  // whose link stayed up
    EXPECT_THAT(lEvidence.find("switch-trouble"), IsEmpty());
}

TEST(LinkRules, RisingErrorCountersAreEvidence) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 7, 1000);
    lEvidence.addCounter(7, 960, "invalid_crc_count", 30);
    lEvidence.addCounter(7, 1020, "invalid_crc_count", 7);
    lEvidence.addCounter(7, 1020, "loss_of_sync_count", 2);
    lEvidence.addCounter(7, 1020, "rx_frames", 1000);          // no error
    lEvidence.addCounter(8, 1020, "loss_of_signal_count", 9);  // another port
    lEvidence.addCounter(7, 500, "invalid_tx_word_count", 5);  // long before
    const ZTSFinding lFinding = lEvidence.find("link-unstable").at(0);
    EXPECT_THAT(lFinding.mSeen,
                Contains("Error counters rose around that time: invalid_crc_count +37, loss_of_sync_count +2."));
    EXPECT_THAT(lFinding.mCounters, SizeIs(2));
    EXPECT_THAT(lFinding.mAgainst, IsEmpty());
}

TEST(LinkRules, CountersThatDoNotRiseSpeakAgainstADirtyCableIfTheyAreSampled) {
    ZTCSampleEvidence lEvidence = sTwoFabrics();
    lEvidence.add("link", 7, 1000);
    EXPECT_THAT(lEvidence.find("link-unstable").at(0).mAgainst, IsEmpty());
    lEvidence.addCounter(7, 1020, "rx_frames", 1000);
    EXPECT_THAT(lEvidence.find("link-unstable").at(0).mAgainst, ElementsAre(HasSubstr("No error counter rose")));
}
