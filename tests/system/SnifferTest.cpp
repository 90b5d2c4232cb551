#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"

/// The dump lines of the log, without their mark.
static std::vector<std::string> sDumpLines(const ZTCAgentLog& acrLog) {
    std::vector<std::string> lLines;
    for (const std::string& lcrLine : acrLog.rawLines()) {
        if (lcrLine.starts_with("-PROT- ")) {
            lLines.push_back(lcrLine.substr(7));
        }
    }
    return lLines;
}

/// A dump line without its blanks: what remains is hex digits, then text.
static std::string sWithoutBlanks(const std::string& acrLine) {
    std::string lText;
    for (char lChar : acrLine) {
        if (lChar != ' ') {
            lText += lChar;
        }
    }
    return lText;
}

static bool sHasDumpOf(const std::vector<std::string>& acrLines, const std::string& acrHex,
                       const std::string& acrText) {
    for (const std::string& lcrLine : acrLines) {
        const std::string lPlain = sWithoutBlanks(lcrLine);
        const std::size_t lAt = lPlain.find(acrHex);
        if (lAt != std::string::npos && lPlain.find(acrText, lAt + acrHex.size()) != std::string::npos) {
            return true;
        }
    }
    return false;
}

TEST(Sniffer, RequestsAndResponsesAreDumpedWhateverTheLogCode) {
    for (const char* lpLevel : {"0", "63"}) {
        SCOPED_TRACE(lpLevel);
        ZTCAgentProcess lAgent;
        lAgent.start({"-D", "false", "-d", lpLevel, "-S", "-l", lAgent.agentLogPath()});
        lAgent.pipes().open();
        EXPECT_TRUE(lAgent.ping());
        EXPECT_TRUE(sHasDumpOf(sDumpLines(lAgent.log()), gcPingHex, ""));
        EXPECT_TRUE(sHasDumpOf(sDumpLines(lAgent.log()), "010006", ""));
    }
}

TEST(Sniffer, WithoutTheOptionNothingIsDumped) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
    EXPECT_TRUE(sDumpLines(lAgent.log()).empty());
}

TEST(Sniffer, ADumpLineHoldsSixteenBytesAsHexAndAsText) {
    ZTCAgentProcess lAgent;
    lAgent.start({"-D", "false", "-S", "-l", lAgent.agentLogPath()});
    lAgent.pipes().open();
    // A stop command with bytes behind it that are letters.
    const std::string lLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZ";
    ZTCByteWriter lRequest;
    lRequest.u8(2).raw(ZTCBytes(lLetters.begin(), lLetters.end()));
    EXPECT_EQ(hexOf(lAgent.pipes().request(lRequest.bytes())), gcSuccessHex);
    const auto lLines = sDumpLines(lAgent.log());
    EXPECT_TRUE(sHasDumpOf(lLines, "024142434445464748494a4b4c4d4e4f", "ABCDEFGHIJKLMNO"));
    EXPECT_TRUE(sHasDumpOf(lLines, "505152535455565758595a", "PQRSTUVWXYZ"));
    EXPECT_TRUE(sHasDumpOf(lLines, "0000000000", ""));
}

TEST(Sniffer, EveryByteOfALongResponseIsDumped) {
    ZTCAgentProcess lAgent(3);
    lAgent.start({"-D", "false", "-S", "-l", lAgent.agentLogPath()});
    lAgent.pipes().open();
    const ZTCBytes lBody = lAgent.pipes().request(bytesOf("01"));
    ASSERT_GT(lBody.size(), 100u);
    const auto lLines = sDumpLines(lAgent.log());
    for (std::size_t i = 0; i < lBody.size(); i += 16) {
        const auto lBegin = lBody.begin() + static_cast<std::ptrdiff_t>(i);
        const auto lEnd = lBody.begin() + static_cast<std::ptrdiff_t>(std::min(i + 16, lBody.size()));
        EXPECT_TRUE(sHasDumpOf(lLines, hexOf(ZTCBytes(lBegin, lEnd)), "")) << "offset " << i;
    }
}
