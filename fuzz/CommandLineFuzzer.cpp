// The agent's command line: it is taken whole, with values inside their limits, or refused with one line of bounded
// length and nothing of it taken.
//
// Input: the arguments, separated by zero bytes.
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "fuzz/support/FuzzInput.h"
#include "system/include/CommandLineParser.h"
#include "tavik/include/TavikProtocolHandler.h"
#include "tavik/include/TavikSystem.h"

/// The agent's own options.
class ZTCOptionsOfTheAgent : public ZTCTavikSystem {
public:
    ZTCOptionsOfTheAgent() : ZTCTavikSystem(ZTCString(gcTavikName)) { setCmdLineArgDescs(); }
    const ZTCVector<ZTSCommandLineArgumentDesc>& get() const { return mCmdLineArgDescs; }
};

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    static const ZTCOptionsOfTheAgent& srOptions = *new ZTCOptionsOfTheAgent;
    const std::string lLine(reinterpret_cast<const char*>(apData), aSize);
    std::vector<std::string> lTexts{"qrv-tvk"};
    for (std::size_t lBegin = 0; lBegin < lLine.size();) {
        const std::size_t lEnd = std::min(lLine.find('\0', lBegin), lLine.size());
        lTexts.push_back(lLine.substr(lBegin, lEnd - lBegin));
        lBegin = lEnd + 1;
    }
    std::vector<const char*> lArguments;
    for (const std::string& lrText : lTexts) {
        lArguments.push_back(lrText.c_str());
    }
    const auto lCount = static_cast<int>(lArguments.size());
    lArguments.push_back(nullptr);

    ZTCCommandLineParser lParser;
    try {
        lParser.parse(srOptions.get(), lCount, lArguments.data());
        ZT_FUZZ_REQUIRE(lParser.getState() == ZTPS_Done, std::to_string(lParser.getState()));
    } catch (const ZTCInvalidEx& lrException) {
        const std::string lText = lrException.what();
        ZT_FUZZ_REQUIRE(!lText.empty() && lText.size() < 512, lText);
        for (const char lCharacter : lText) {
            const auto lByte = static_cast<unsigned char>(lCharacter);
            ZT_FUZZ_REQUIRE(lByte >= 0x20 && lByte != 0x7F, lText);
        }
        ZT_FUZZ_REQUIRE(lParser.getState() == ZTPS_Running, std::to_string(lParser.getState()));
    }
    const ZTSCommandLineOptions& lrOptions = lParser.getOptions();
    if (lParser.getState() == ZTPS_Done) {
        ZT_FUZZ_REQUIRE(lrOptions.mLogCode <= 255, std::to_string(lrOptions.mLogCode));
        ZT_FUZZ_REQUIRE(!lrOptions.mHasHbTimeout || lrOptions.mHbTimeout >= 1, "no heartbeat");
        ZT_FUZZ_REQUIRE(!lrOptions.mHasLogFile || lrOptions.mLogFile.length() > 0, "no log file");
    } else {
        const bool lHasAny = lrOptions.mShowHelp || lrOptions.mShowVersion || lrOptions.mShutDownOther ||
                             lrOptions.mSniffer || !lrOptions.mRunAsDaemon || lrOptions.mHasLogFile ||
                             lrOptions.mHasLogCode || lrOptions.mHasConfigFile || lrOptions.mHasHbTimeout;
        ZT_FUZZ_REQUIRE(!lHasAny, "an option of a refused line was taken");
    }
    return 0;
}
