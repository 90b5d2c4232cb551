// docs/simulated-library.md names what the tables and the reader of scenarios hold.
#include <gtest/gtest.h>

#include <cstdio>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "libkpm/sim/src/Engine.h"
#include "libkpm/sim/src/KindTable.h"
#include "libkpm/sim/src/Scenario.h"
#include "tests/support/TemporaryDirectory.h"

static std::vector<std::string> sLinesOf(const std::string& acrPath) {
    std::istringstream lText(readFile(acrPath));
    std::vector<std::string> lLines;
    for (std::string lLine; std::getline(lText, lLine);) {
        lLines.push_back(lLine);
    }
    return lLines;
}

static const std::vector<std::string>& sPage() {
    static const std::vector<std::string>& srLines = *new std::vector<std::string>(sLinesOf(TAVIK_SIM_PAGE));
    return srLines;
}

/// The lines of the page that begin so.
static std::vector<std::string> sRows(const std::string& acrBegin) {
    std::vector<std::string> lRows;
    for (const std::string& lrLine : sPage()) {
        if (lrLine.starts_with(acrBegin)) {
            lRows.push_back(lrLine);
        }
    }
    return lRows;
}

static bool sHasRow(const std::string& acrBegin, const std::vector<std::string>& acrParts = {}) {
    for (const std::string& lrRow : sRows(acrBegin)) {
        bool lHasAll = true;
        for (const std::string& lrPart : acrParts) {
            lHasAll = lHasAll && lrRow.find(lrPart) != std::string::npos;
        }
        if (lHasAll) {
            return true;
        }
    }
    return false;
}

/// The words that a pattern's first group finds in the reader of scenarios.
static std::set<std::string> sWordsOfTheReader(const char* apPattern) {
    std::string lSource;
    for (const char* lpFile : {"Scenario.cpp", "ScenarioEvents.cpp", "ScenarioFields.cpp"}) {
        lSource += readFile(std::string(TAVIK_SIM_SOURCES "/") + lpFile);
    }
    const std::regex lPattern(apPattern);
    std::set<std::string> lWords;
    for (std::sregex_iterator lMatch(lSource.begin(), lSource.end(), lPattern); lMatch != std::sregex_iterator();
         ++lMatch) {
        lWords.insert((*lMatch)[1]);
    }
    return lWords;
}

TEST(SimulatedLibraryPage, HasARowForEveryKindWithItsPairCallbackSizeAndFields) {
    static constexpr const char* scCallbacks[] = {"scope", "link", "RSCN", "temperature"};
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        const ZTSSimKind& lrKind = getSimKind(lKind);
        const ZTSScopeEventKind& lrPair = gcScopeEventKinds[lKind];
        char lPair[32];
        std::snprintf(lPair, sizeof lPair, "%u, 0x%02x", unsigned{lrPair.mDeliveredCategory},
                      unsigned{lrPair.mDeliveredSubcategory});
        std::string lFields;
        for (const ZTSSimField& lrField : lrKind.mFields) {
            lFields += (lFields.empty() ? "`" : ", `") + std::string(lrField.mpName) + "=`";
        }
        const std::string lRow = "| `" + std::string(lrKind.mpName) + "` | " + lPair + " | " +
                                 scCallbacks[lrKind.mDelivery] + " | " + std::to_string(lrPair.mDataSize) + " | " +
                                 (lFields.empty() ? "none" : lFields) + " |";
        EXPECT_TRUE(sHasRow(lRow)) << lRow;
    }
}

TEST(SimulatedLibraryPage, HasARowForEveryFieldWithItsMeaningAndItsRangeInAStorm) {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        const ZTSSimKind& lrKind = getSimKind(lKind);
        for (const ZTSSimField& lrField : lrKind.mFields) {
            std::string lStorm = "-";
            if (lrField.mDefault == ZTSDF_Lun) {
                lStorm = "from the storm's `lun=`";
            } else if (lrField.mStormLimit != 0) {
                lStorm = "0 to " + std::to_string(lrField.mStormLimit);
            }
            EXPECT_TRUE(sHasRow("| `" + std::string(lrField.mpName) + "=` |",
                                {"`" + std::string(lrKind.mpName) + "`", "| " + std::string(lrField.mpMeaning) + " |",
                                 "| " + lStorm + " |"}))
                << lrKind.mpName << ' ' << lrField.mpName << "=: " << lrField.mpMeaning << ", " << lStorm;
        }
    }
}

TEST(SimulatedLibraryPage, HasARowForEveryDirective) {
    const std::set<std::string> lDirectives = sWordsOfTheReader("\\{\"([a-z]+)\", sParse[A-Za-z]+\\}");
    EXPECT_EQ(lDirectives.size(), 10u);
    for (const std::string& lrDirective : lDirectives) {
        EXPECT_TRUE(sHasRow("| `" + lrDirective + " ")) << lrDirective;
    }
    EXPECT_FALSE(sRows("`storm ").empty());
    EXPECT_TRUE(sHasRow("| `state "));
    EXPECT_TRUE(sHasRow("| `loss "));
}

TEST(SimulatedLibraryPage, HasARowForEveryFieldOfALine) {
    const std::set<std::string> lFields =
        sWordsOfTheReader("(?:take\\(|takeRequired\\(|takeSimNumber\\(arLine, |takeSimWwn\\(arLine, )\"([a-z]+)\"");
    for (const char* lpField : {"board", "times", "pages", "seed", "wwpn", "fcid", "status", "handle", "size"}) {
        EXPECT_EQ(lFields.count(lpField), 1u) << lpField;
    }
    for (const std::string& lrField : lFields) {
        const std::regex lCell("^\\| (`[a-z]+=`, )?`" + lrField + "=(null)?`[ ,].*");
        bool lHasRow = lrField == "pages";  // explained in words
        for (const std::string& lrLine : sPage()) {
            lHasRow = lHasRow || std::regex_match(lrLine, lCell);
        }
        EXPECT_TRUE(lHasRow) << lrField;
    }
    EXPECT_FALSE(sRows("`rscn` has a field of its own, `pages=`: ").empty());
}

TEST(SimulatedLibraryPage, HasTheLimits) {
    for (const auto& [lrWhat, lrLimit] : std::vector<std::pair<std::string, std::uint64_t>>{
             {"bytes of a scenario", gcSimMaxTextSize},
             {"bytes of a line", gcSimMaxLineSize},
             {"adapters", gcSimMaxAdapters},
             {"remote ports", gcSimMaxPorts},
             {"event, storm, state and loss lines", gcSimMaxEventLines},
             {"values of a list", gcSimMaxListSize},
             {"bytes of `data=` and `length=`", gcSimMaxDataSize},
             {"bytes of `reason=` and of the name of a loss", gcSimMaxTextValue},
             {"`times=` and `count=`", gcSimMaxTimes},
             {"`at=`, `every=` and `over=`", gcSimMaxMilliseconds},
             {"`threads=` of a line", gcSimMaxThreads},
             {"`threads=` of all lines together", gcSimMaxTotalThreads}}) {
        EXPECT_TRUE(sHasRow("| " + lrWhat + " | " + std::to_string(lrLimit) + " ")) << lrWhat << ' ' << lrLimit;
    }
}

TEST(SimulatedLibraryPage, HasTheStatuses) {
    for (const ZTELibraryStatus lStatus :
         {ZTLST_NoScenario, ZTLST_BadScenario, ZTLST_NoSocket, ZTLST_AlreadyOpen, ZTLST_NoResources, ZTLST_NotOpen,
          ZTLST_NoSuchBoard, ZTLST_NotItsPort, ZTLST_NoSuchKind, ZTLST_NullPointer, ZTLST_NoSuchHandle}) {
        EXPECT_TRUE(sHasRow("| " + std::to_string(lStatus) + " | ")) << lStatus;
    }
}

TEST(SimulatedLibraryPage, ItsExampleScenariosParse) {
    std::size_t lExamples = 0;
    for (std::size_t lLine = 0; lLine < sPage().size(); ++lLine) {
        if (sPage()[lLine] != "```kpm") {
            continue;
        }
        std::string lScenario;
        while (sPage().at(++lLine) != "```") {
            lScenario += sPage()[lLine] + "\n";
        }
        EXPECT_NO_THROW(parseSimScenario(lScenario)) << lScenario;
        ++lExamples;
    }
    EXPECT_EQ(lExamples, 3u);
}

TEST(SimulatedLibraryPage, TheLinesOfItsInjectionsAreTaken) {
    const ZTSSimScenario lScenario = parseSimScenario(getDefaultSimScenario());
    for (const char* lpLine :
         {"queue-full port=disk0 lun=0-7 times=100", "plogi board=all", "storm count=100000 threads=8",
          "state link failed board=hba1 reason=\"cable pulled\""}) {
        EXPECT_NO_THROW(parseSimEventLine(lpLine, lScenario)) << lpLine;
    }
    EXPECT_EQ(sRows("kpm-sim inject queue-full port=disk0 lun=0-7 times=100 plogi board=all").size(), 1u);
    EXPECT_EQ(sRows("kpm-sim inject 'storm count=100000 threads=8'").size(), 1u);
}
