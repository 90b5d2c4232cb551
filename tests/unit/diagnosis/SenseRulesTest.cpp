#include <gmock/gmock.h>

#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

/// The rules that recognise a check condition with that sense.
static std::vector<std::string> sRulesFor(std::uint32_t aKey, std::uint32_t aAsc, std::uint32_t aAscq,
                                          std::uint32_t aCommand = 0x28) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addSense(7, 100, 1, aKey, aAsc, aAscq, aCommand);
    std::vector<std::string> lRules;
    for (const ZTSFinding& lrFinding : lEvidence.diagnoseAll()) {
        lRules.emplace_back(lrFinding.mpRule->mpId);
    }
    return lRules;
}

TEST(SenseRules, UnitAttentionsAreToldApartByTheirCode) {
    EXPECT_THAT(sRulesFor(0x6, 0x29, 0x00), ElementsAre("target-restarted"));
    EXPECT_THAT(sRulesFor(0x6, 0x29, 0x07), ElementsAre("target-restarted"));
    EXPECT_THAT(sRulesFor(0x6, 0x3F, 0x0E), ElementsAre("luns-changed"));
    EXPECT_THAT(sRulesFor(0x6, 0x2A, 0x09), ElementsAre("parameters-changed"));
    EXPECT_THAT(sRulesFor(0x6, 0x28, 0x00), IsEmpty());
    EXPECT_THAT(sRulesFor(0x5, 0x29, 0x00), IsEmpty());
}

TEST(SenseRules, AbortedCommandsWithACodeOfTheTransportAreDamage) {
    for (const std::uint32_t lAsc : {0x08U, 0x10U, 0x47U, 0x48U, 0x49U, 0x4BU}) {
        EXPECT_THAT(sRulesFor(0xB, lAsc, 0), ElementsAre("transport-error")) << lAsc;
    }
    EXPECT_THAT(sRulesFor(0xB, 0x44, 0), IsEmpty());
    EXPECT_THAT(sRulesFor(0x6, 0x47, 0), IsEmpty());
    EXPECT_THAT(sRulesFor(0xFFFFFFFF, 0xFFFFFFFF, 0), IsEmpty());
}

TEST(SenseRules, CodesAreNamedAsPublished) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addSense(7, 100, 1, 0xB, 0x47, 0x03).mDetail.mAscqs = {0x03, 0x05, 0xEE};
    EXPECT_THAT(lEvidence.find("transport-error").at(0).mSeen,
                ElementsAre("1 check condition on LUN 0, seen by host7: 47/03 information unit iuCRC error detected; "
                            "47/05 protocol service CRC error; 47/EE."));
}

TEST(SenseRules, ReadCheckErrorsAreDamageToo) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("fcp-read-check", 7, 100, 1, {4}).mCount = 3;
    EXPECT_THAT(lEvidence.find("transport-error").at(0).mSeen, ElementsAre(HasSubstr("3 reads of LUN 4")));
}

TEST(SenseRules, MediumAndHardwareErrorsAreDefects) {
    EXPECT_THAT(sRulesFor(0x3, 0x11, 0x00), ElementsAre("device-error"));
    EXPECT_THAT(sRulesFor(0x4, 0x44, 0x00), ElementsAre("device-error"));
    EXPECT_THAT(sRulesFor(0x1, 0x17, 0x00), IsEmpty());
}

TEST(SenseRules, AttentionsOfAllPortsOfANodeAreOneFinding) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addInitiator(7, 1);
    for (const unsigned lPort : {2U, 3U, 4U}) {
        lEvidence.addRemotePort(7, lPort);
        lEvidence.addSense(7, 100, static_cast<int>(lPort), 0x6, 0x29, 0);
    }
    const auto lFindings = lEvidence.find("target-restarted");
    ASSERT_THAT(lFindings, SizeIs(2));
    EXPECT_THAT(lFindings[0].mRemotePorts, SizeIs(2));
}

TEST(SenseRules, AnOwnResetJustBeforeSpeaksAgainstARestart) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addSense(7, 100, 1, 0x6, 0x29, 0);
    EXPECT_EQ(lEvidence.find("target-restarted").at(0).mSeverity, ZTSV_Warning);
    lEvidence.addLuns("lun-reset", 7, 99, 2, {0});  // another port
    lEvidence.addLuns("lun-reset", 8, 99, 1, {0});  // another initiator
    EXPECT_THAT(lEvidence.find("target-restarted").at(0).mAgainst, IsEmpty());
    lEvidence.addLuns("lun-reset", 7, 99, 1, {0});
    EXPECT_THAT(lEvidence.find("target-restarted").at(0).mAgainst, ElementsAre(HasSubstr("lun-reset, episode 4")));
    EXPECT_EQ(lEvidence.find("target-restarted").at(0).mSeverity, ZTSV_Note);
}

TEST(SenseRules, AnswersToQuestionsAreNoiseAndAnswersToReadsAreNot) {
    EXPECT_THAT(sRulesFor(0x5, 0x25, 0x00, 0x12), ElementsAre("scan-noise"));  // INQUIRY
    EXPECT_THAT(sRulesFor(0x5, 0x20, 0x00, 0xA0), ElementsAre("scan-noise"));  // REPORT LUNS
    EXPECT_THAT(sRulesFor(0x5, 0x24, 0x00, 0x00), ElementsAre("scan-noise"));  // TEST UNIT READY
    EXPECT_THAT(sRulesFor(0x5, 0x25, 0x00, 0x28), IsEmpty());                  // READ(10)
    EXPECT_THAT(sRulesFor(0x5, 0x26, 0x00, 0x12), IsEmpty());
    EXPECT_THAT(sRulesFor(0x5, 0x24, 0x01, 0x12), IsEmpty());
    ZTCSampleEvidence lEvidence;
    lEvidence.addSense(7, 100, 1, 0x5, 0x25, 0x00).mDetail.mCommandCodes = {0x12, 0x2A};
    EXPECT_THAT(lEvidence.diagnoseAll(), IsEmpty());
}
