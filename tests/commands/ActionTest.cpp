// What a trouble tells a person to type has to work: commands of tavik are run, others are checked word by word.
#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <sstream>

#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/StateTable.h"
#include "tests/commands/TavikProgram.h"

using testing::Contains;
using testing::HasSubstr;

/// The parts of an action that a ";" separates, without what stands behind a "#".
static std::vector<std::string> sParts(const std::string& acrAction) {
    std::vector<std::string> lParts;
    std::istringstream lStream(acrAction.substr(0, acrAction.find('#')));
    for (std::string lPart; std::getline(lStream, lPart, ';');) {
        const std::size_t lFirst = lPart.find_first_not_of(' ');
        if (lFirst != std::string::npos) {
            lParts.push_back(lPart.substr(lFirst, lPart.find_last_not_of(' ') + 1 - lFirst));
        }
    }
    return lParts;
}

static std::vector<std::string> sWords(const std::string& acrPart) {
    std::vector<std::string> lWords;
    std::istringstream lStream(acrPart);
    for (std::string lWord; lStream >> lWord;) {
        lWords.push_back(lWord);
    }
    if (!lWords.empty() && lWords.front() == "sudo") {
        lWords.erase(lWords.begin());
    }
    return lWords;
}

/// One action or see of a row.
struct ZTSAdvice {
    std::string mRow;
    std::string mText;
};

static void PrintTo(const ZTSAdvice& acrAdvice, std::ostream* apStream) {
    *apStream << acrAdvice.mRow << ": " << acrAdvice.mText;
}

static std::vector<ZTSAdvice> sAllAdvice() {
    std::vector<ZTSAdvice> lAll;
    for (const ZTSStateRow& lrRow : getStateTable()) {
        lAll.push_back({lrRow.mpId, lrRow.mpAction});
        lAll.push_back({lrRow.mpId, lrRow.mpSee});
    }
    lAll.push_back({"names that are stale", gcStaleNamesAction});
    for (const ZTSSanTroubleRow& lrRow : getSanTroubleTable()) {
        lAll.push_back({lrRow.mpId, getSanAction(lrRow)});
        lAll.push_back(
            {lrRow.mpId, describeSanTrouble({.mKind = lrRow.mKind, .mSeverity = ZTSS_Warning}, {}, {}, {}).mSee});
    }
    return lAll;
}

class Advice : public testing::TestWithParam<ZTSAdvice> {
protected:
    /// The option has to be one of the command's: a live screen cannot be run here.
    void checkOptions(const std::vector<std::string>& acrWords) {
        const ZTSTavikRun lHelp = mTavik.run({acrWords.at(1), "--help"});
        for (const std::string& lrWord : acrWords) {
            if (lrWord.starts_with("--")) {
                EXPECT_THAT(lHelp.mOutput, HasSubstr(lrWord));
            }
        }
    }

    void runTavik(const std::vector<std::string>& acrWords) {
        checkOptions(acrWords);
        if (std::ranges::find(acrWords, "--watch") != acrWords.end()) {
            return;
        }
        const ZTSTavikRun lRun = mTavik.run({acrWords.begin() + 1, acrWords.end()});
        // There is no sensor and no history here: 3 says so. 2 would be wrong use.
        EXPECT_TRUE(lRun.mExit == 0 || lRun.mExit == 3) << lRun.mExit << ": " << lRun.mError;
        if (acrWords.at(1) == "explain") {
            EXPECT_EQ(lRun.mExit, 0) << lRun.mError;
        }
    }

    static void checkUnit(const std::string& acrUnit) {
        EXPECT_TRUE(exists(std::string(TAVIK_UNITS) + "/" + acrUnit + ".service")) << "no unit " << acrUnit;
    }

    void check(const std::vector<std::string>& acrWords, const std::string& acrPart) {
        const std::string& lrProgram = acrWords.at(0);
        if (lrProgram == "tavik") {
            runTavik(acrWords);
        } else if (lrProgram == "systemctl") {
            ASSERT_EQ(acrWords.size(), 3U) << acrPart;
            EXPECT_THAT((std::vector<std::string>{"start", "restart", "edit"}), Contains(acrWords[1]));
            checkUnit(acrWords[2]);
        } else if (lrProgram == "journalctl" && acrWords.size() == 4) {
            EXPECT_EQ(acrWords[1], "-k") << acrPart;  // the kernel's log
            EXPECT_TRUE(acrWords[2] == "-n" && std::stoi(acrWords[3]) > 0) << acrPart;
        } else if (lrProgram == "journalctl") {
            ASSERT_EQ(acrWords.size(), 5U) << acrPart;
            EXPECT_EQ(acrWords[1], "-u");
            checkUnit(acrWords[2]);
            EXPECT_TRUE((acrWords[3] == "-n" && std::stoi(acrWords[4]) > 0) ||
                        (acrWords[3] == "--since" && acrWords[4] == "yesterday"))
                << acrPart;
        } else if (lrProgram == "df" || lrProgram == "ls" || lrProgram == "lspci" || lrProgram == "grep" ||
                   lrProgram == "tail") {
            EXPECT_TRUE(lrProgram == "lspci" || exists("/usr/bin/" + lrProgram) || exists("/bin/" + lrProgram));
        } else {
            // Words for a person: they begin as a sentence does, or go on after a command.
            EXPECT_TRUE(std::isupper(static_cast<unsigned char>(acrPart.front())) != 0 ||
                        acrPart.starts_with("make room"))
                << "neither a command nor words: " << acrPart;
        }
    }

    ZTCTavikProgram mTavik;
};

TEST_P(Advice, CanBeFollowed) {
    for (const std::string& lrPart : sParts(GetParam().mText)) {
        check(sWords(lrPart), lrPart);
    }
}

INSTANTIATE_TEST_SUITE_P(OfEveryTrouble, Advice, testing::ValuesIn(sAllAdvice()));

TEST(AdviceTable, EveryTroubleHasSomethingToDoAndSomewhereToReadOn) {
    for (const ZTSAdvice& lrAdvice : sAllAdvice()) {
        EXPECT_TRUE(!lrAdvice.mText.empty() || lrAdvice.mRow == "collecting") << lrAdvice.mRow;
    }
}
