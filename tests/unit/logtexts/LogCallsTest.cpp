#include "tests/unit/logtexts/support/LogCalls.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <tuple>

#include "tests/support/LogTexts.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

std::vector<std::string> sCallsOf(const std::string& acrSource) {
    std::vector<std::string> lCalls;
    for (const ZTSLogCall& lcrCall : readLogCalls(acrSource).mCalls) {
        lCalls.push_back(lcrCall.mMark + " " + lcrCall.mText);
    }
    return lCalls;
}

/// Mark, label, text.
using ZTCPlacedText = std::tuple<std::string, std::string, std::string>;

/// The label under which a source's lines stand, written down a second time.
std::string sLabelOf(const std::string& acrPath) {
    const std::string lWithout = acrPath.substr(0, acrPath.rfind('.'));
    const std::string lcAgent = "tavik/src/";
    return lWithout.starts_with(lcAgent) ? ".//" + lWithout.substr(lcAgent.size()) : lWithout;
}

/// All sources of the agent, by their paths from the root.
const std::map<std::string, ZTSLogSource>& sSources() {
    static const auto& srSources = *[] {
        auto* const lpSources = new std::map<std::string, ZTSLogSource>;
        const std::filesystem::path lRoot(TAVIK_SOURCE_ROOT);
        for (const char* lpFolder : {"common", "os", "system", "sensor/agentcommon", "tavik"}) {
            for (const auto& lcrEntry : std::filesystem::recursive_directory_iterator(lRoot / lpFolder)) {
                const std::string lExtension = lcrEntry.path().extension().string();
                if (lExtension == ".cpp" || lExtension == ".h") {
                    (*lpSources)[lcrEntry.path().lexically_relative(lRoot).string()] =
                        readLogCalls(readFile(lcrEntry.path().string()));
                }
            }
        }
        return lpSources;
    }();
    return srSources;
}

bool sIsInTable(const std::string& acrMark, const std::string& acrLabel, const std::string& acrText) {
    return std::any_of(logTexts().begin(), logTexts().end(), [&](const ZTSLogText& acrRow) {
        return acrRow.mpMark == acrMark && acrRow.mpLabel == acrLabel && acrRow.mpFormat == acrText;
    });
}

/// Whether a call takes its text from elsewhere in its source.
bool sIsIndirect(const ZTSLogCall& acrCall, const std::string& acrLabel) {
    return acrCall.mText.empty() || (acrCall.mText == "%s" && !sIsInTable(acrCall.mMark, acrLabel, "%s"));
}

bool sHasIndirectCall(const ZTSLogSource& acrSource, const std::string& acrLabel) {
    return std::any_of(acrSource.mCalls.begin(), acrSource.mCalls.end(),
                       [&](const ZTSLogCall& acrCall) { return sIsIndirect(acrCall, acrLabel); });
}

}  // namespace

// ---- Reading sources ----

TEST(LogCalls, EverySortOfCallIsRead) {
    const char* const lpSource = R"source(
        void f() {
            ZT_LOG_NOTICE("Plain");
            ZT_LOG_ERR("With %u, and %s", lpA->b(1, ")"), ',');
            ZT_TRACE_MSG("In "
                         "two parts");
            ZT_LOG_INFO("a \"quoted\" text");
            ZT_ASSERT(lpSystem != __null);
            ZT_NEVER_GET_HERE();
            ZT_LOG_WARN("line break\n");
            ZT_LOG_ERR("%" PRIu64 " bytes", lCount);
            ZT_LOG_NAP("%s %s", lHex, lText);
            ZT_LOG_ALERT("%s", "given");
        }
    )source";
    EXPECT_EQ((std::vector<std::string>{"-N- Plain", "-E- With %u, and %s", "-T- In two parts", "-I- a \"quoted\" text",
                                        "-H- Assertion [ lpSystem != __null ] failed", "-H- Assertion [ false ] failed",
                                        "-W- line break", "-E- %lu bytes", "-PROT- %s %s", "-A- given"}),
              sCallsOf(lpSource));
}

TEST(LogCalls, ATextFromElsewhereIsAnEmptyOne) {
    EXPECT_EQ((std::vector<std::string>{"-N- ", "-E- %s"}),
              sCallsOf("ZT_LOG_NOTICE(lpRow->mpText, 1); ZT_LOG_ERR(\"%s\", lText);"));
}

TEST(LogCalls, CommentsAndPreprocessorLinesAndOtherWordsDoNotCount) {
    EXPECT_EQ(std::vector<std::string>{},
              sCallsOf("// ZT_LOG_ERR(\"a\")\n/* ZT_LOG_ERR(\"b\") */\n#define X ZT_LOG_ERR(\"c\") \\\n "
                       "ZT_LOG_ERR(\"d\")\n"
                       "const char* s = \"ZT_LOG_ERR('e')\"; void g() ZT_REQUIRES(mLock); MY_ZT_LOG_ERR(\"f\");"));
    EXPECT_EQ((std::vector<std::string>{"-E- behind"}),
              sCallsOf("int n = 1'000; char q = '\"'; ZT_LOG_ERR(\"behind\");"));
}

// ---- The sources and the table ----

TEST(LogCalls, EveryCallOfTheSourcesStandsInTheTable) {
    std::set<ZTCPlacedText> lMissing;
    std::size_t lCalls = 0;
    for (const auto& [lcrPath, lcrSource] : sSources()) {
        for (const ZTSLogCall& lcrCall : lcrSource.mCalls) {
            const std::string lLabel = lcrCall.mMark == "-PROT-" ? "" : sLabelOf(lcrPath);
            ++lCalls;
            if (!sIsIndirect(lcrCall, lLabel) && !sIsInTable(lcrCall.mMark, lLabel, lcrCall.mText)) {
                lMissing.emplace(lcrCall.mMark, lLabel, lcrCall.mText);
            }
        }
    }
    EXPECT_EQ(std::set<ZTCPlacedText>{}, lMissing);
    EXPECT_LT(100u, lCalls);
}

TEST(LogCalls, EveryTextThatACallMayTakeFromElsewhereStandsInTheTable) {
    // Texts of exceptions, which stand in the same sources.
    const std::set<std::string> lNoLogTexts{"unknown exception", "Shutting down Tavik"};
    std::set<std::string> lMissing;
    for (const auto& [lcrPath, lcrSource] : sSources()) {
        const std::string lLabel = sLabelOf(lcrPath);
        if (!sHasIndirectCall(lcrSource, lLabel)) {
            continue;
        }
        for (const std::string& lcrLiteral : lcrSource.mLiterals) {
            const bool lIsInTable = std::any_of(logTexts().begin(), logTexts().end(), [&](const ZTSLogText& acrRow) {
                return acrRow.mpLabel == lLabel && acrRow.mpFormat == lcrLiteral;
            });
            if (lcrLiteral.find(' ') != std::string::npos && lNoLogTexts.count(lcrLiteral) == 0 && !lIsInTable) {
                lMissing.insert(lcrLiteral);
            }
        }
    }
    EXPECT_EQ(std::set<std::string>{}, lMissing);
}

TEST(LogCalls, EveryRowOfTheTableStandsInItsSource) {
    std::set<ZTCPlacedText> lStale;
    for (const ZTSLogText& lcrRow : logTexts()) {
        const bool lIsThere = std::any_of(sSources().begin(), sSources().end(), [&](const auto& acrEntry) {
            const std::string lLabel = sLabelOf(acrEntry.first);
            const ZTSLogSource& lcrSource = acrEntry.second;
            const bool lIsDump = std::string(lcrRow.mpMark) == "-PROT-";
            if (!lIsDump && lLabel != lcrRow.mpLabel) {
                return false;
            }
            const bool lIsCalled =
                std::any_of(lcrSource.mCalls.begin(), lcrSource.mCalls.end(), [&](const ZTSLogCall& acrCall) {
                    return acrCall.mMark == lcrRow.mpMark && acrCall.mText == lcrRow.mpFormat;
                });
            return lIsCalled ||
                   (!lIsDump && sHasIndirectCall(lcrSource, lLabel) &&
                    std::count(lcrSource.mLiterals.begin(), lcrSource.mLiterals.end(), lcrRow.mpFormat) != 0);
        });
        const std::string lText = lcrRow.mpFormat;
        if (!lIsThere && lText != "Entered" && lText != "Left") {
            lStale.emplace(lcrRow.mpMark, lcrRow.mpLabel, lText);
        }
    }
    EXPECT_EQ(std::set<ZTCPlacedText>{}, lStale);
}

TEST(LogCalls, NoRowStandsInTheTableTwiceAndEveryMarkIsThatOfItsLevel) {
    const std::map<std::string, unsigned> lLevels{{"-H-", 1},  {"-A-", 2},  {"-C-", 4},   {"-E-", 8},     {"-W-", 16},
                                                  {"-N-", 32}, {"-I-", 64}, {"-T-", 128}, {"-PROT-", 256}};
    std::set<std::tuple<std::string, std::string, std::string, std::string>> lRows;
    for (const ZTSLogText& lcrRow : logTexts()) {
        EXPECT_TRUE(lRows.emplace(lcrRow.mpMark, lcrRow.mpLabel, lcrRow.mpFunction, lcrRow.mpFormat).second)
            << lcrRow.mpFormat;
        EXPECT_EQ(lLevels.at(lcrRow.mpMark), lcrRow.mLevel) << lcrRow.mpFormat;
    }
}
