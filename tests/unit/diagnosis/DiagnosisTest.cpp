#include "sensor/diagnosis/include/Diagnosis.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <set>
#include <sstream>

#include "libkpm/include/ScopeEventKinds.h"
#include "tests/unit/diagnosis/EvidenceSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

TEST(Diagnosis, NothingMeansNothing) {
    EXPECT_THAT(diagnose({}), IsEmpty());
}

TEST(Diagnosis, EveryRuleHasAnIdOfItsOwnAndAllItsWords) {
    std::set<std::string> lIds;
    for (const ZTSRule& lrRule : getRules()) {
        EXPECT_TRUE(lIds.insert(lrRule.mpId).second) << lrRule.mpId;
        EXPECT_EQ(findRule(lrRule.mpId), &lrRule);
        EXPECT_FALSE(findKindIndex(lrRule.mpId)) << "a kind has the name " << lrRule.mpId;
        for (const char* lpText : {lrRule.mpTitle, lrRule.mpWanted, lrRule.mpAgainst, lrRule.mpMeans, lrRule.mpNext}) {
            EXPECT_STRNE(lpText, "") << lrRule.mpId;
        }
        std::istringstream lKinds(lrRule.mpKinds);
        std::size_t lCount = 0;
        for (std::string lKind; lKinds >> lKind; ++lCount) {
            EXPECT_TRUE(findKindIndex(lKind)) << lrRule.mpId << ": " << lKind;
        }
        EXPECT_NE(lCount, 0U) << lrRule.mpId;
    }
    EXPECT_EQ(findRule("no-such-rule"), nullptr);
}

TEST(Diagnosis, TheWorstComesFirstAndOfLikeSeverityTheLatest) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addSense(7, 500, 1, 0x5, 0x25, 0, 0x12);         // noise
    lEvidence.addSense(7, 400, 1, 0x6, 0x3F, 0xE);             // note
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});  // problem
    lEvidence.addLuns("queue-full", 7, 200, 4, {0});           // problem, later
    std::vector<std::string> lIds;
    for (const ZTSFinding& lrFinding : lEvidence.diagnoseAll()) {
        lIds.emplace_back(lrFinding.mpRule->mpId);
    }
    EXPECT_THAT(lIds, ElementsAre("lun-overload", "port-overload", "luns-changed", "scan-noise"));
}

TEST(Diagnosis, KindsThatWouldSayMoreAndAreNotHeardAreNamed) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});
    lEvidence.hide(7, "port-busy", ZTKST_NoRights);
    lEvidence.hide(7, "plogi");      // of no use to this rule
    lEvidence.hide(8, "port-busy");  // another initiator
    const ZTSFinding lFinding = lEvidence.find("port-overload").at(0);
    ASSERT_THAT(lFinding.mUnobserved, SizeIs(1));
    EXPECT_EQ(getKindName(lFinding.mUnobserved[0].mKind), "port-busy");
    EXPECT_EQ(lFinding.mUnobserved[0].mState, ZTKST_NoRights);
}

TEST(Diagnosis, PortsAreCalledWhatPeopleCallThem) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3});
    lEvidence.evidence().mNameRemotePort = [](const ZTSRemotePort&) { return std::string("array7 ctrl-A"); };
    lEvidence.evidence().mNameInitiator = [](const ZTSInitiator&) { return std::string("blue"); };
    const ZTSFinding lFinding = lEvidence.find("port-overload").at(0);
    EXPECT_EQ(lFinding.mSubject, "array7 ctrl-A");
    EXPECT_THAT(lFinding.mSeen.at(0), HasSubstr("seen by blue"));
    EXPECT_THAT(lFinding.mNext, testing::Contains("tavik events --port " + remoteName(1).toText() + " --since 24h"));
}

TEST(Diagnosis, NoStepKeepsAPlaceholder) {
    ZTCSampleEvidence lEvidence;
    ZTSEpisode& lrEpisode = lEvidence.add("link", 7, 100);
    lrEpisode.mInitiator.mHost.clear();  // nothing knows which host it is
    const auto lFindings = lEvidence.find("link-unstable");
    ASSERT_THAT(lFindings, SizeIs(1));
    for (const std::string& lrStep : lFindings[0].mNext) {
        EXPECT_THAT(lrStep, Not(HasSubstr("{host}")));
        EXPECT_THAT(lrStep, Not(HasSubstr("fc_host/")));
    }
}

TEST(Diagnosis, MalformedEpisodesProveNothing) {
    ZTCSampleEvidence lEvidence;
    lEvidence.addLuns("queue-full", 7, 100, 1, {0, 1, 2, 3}).mIsMalformed = true;
    EXPECT_THAT(lEvidence.diagnoseAll(), IsEmpty());
}

TEST(Diagnosis, TheOrderOfTheEpisodesDoesNotMatter) {
    ZTCSampleEvidence lEvidence;
    lEvidence.add("rscn", 7, 100);
    lEvidence.addRelogin(7, 101, 0);
    lEvidence.addRelogin(7, 103, 2);
    lEvidence.addLuns("lun-reset", 7, 200, 1, {3});
    lEvidence.addLuns("device-busy", 7, 210, 1, {3});
    lEvidence.addLuns("queue-full", 7, 300, 1, {0, 1, 2, 3});
    const auto lDescribe = [&lEvidence] {
        std::vector<std::string> lTexts;
        for (const ZTSFinding& lrFinding : lEvidence.diagnoseAll()) {
            lTexts.push_back(lrFinding.mpRule->mpId + (" " + lrFinding.mSeen.at(0)));
        }
        return lTexts;
    };
    const std::vector<std::string> lExpected = lDescribe();
    EXPECT_THAT(lExpected, SizeIs(3));
    std::ranges::reverse(lEvidence.evidence().mEpisodes);
    EXPECT_EQ(lDescribe(), lExpected);
}
