#include "system/include/CommandLineParser.h"

#include <cstddef>
#include <cstdint>

#include "common/include/Exception.h"
#include "common/include/ThrowWith.h"
#include "os/common/include/Clib.h"

namespace {

/// Makes a text of the command line fit for a message: one line, of bounded length.
class ZTCShownText {
public:
    explicit ZTCShownText(const char* apText) {
        std::size_t lLength = 0;
        for (; apText[lLength] != '\0' && lLength < gcMost; ++lLength) {
            const unsigned char lCharacter = static_cast<unsigned char>(apText[lLength]);
            mText[lLength] = lCharacter < 0x20 || lCharacter == 0x7f ? '?' : apText[lLength];
        }
        ClibStrcpy(mText + lLength, sizeof(mText) - lLength, apText[lLength] == '\0' ? "" : "...");
    }
    const char* get() const { return mText; }

private:
    static constexpr std::size_t gcMost = 160;
    char mText[gcMost + 4];
};

/// A number of digits alone: decimal, or hexadecimal behind 0x where that is allowed. False if it is none, or above the
/// limit.
bool sParseNumber(const char* apText, bool aMayBeHexadecimal, std::uint64_t aLimit, unsigned& arNumber) {
    std::uint64_t lBase = 10;
    if (aMayBeHexadecimal && apText[0] == '0' && (apText[1] == 'x' || apText[1] == 'X')) {
        lBase = 16;
        apText += 2;
    }
    if (*apText == '\0') {
        return false;
    }
    std::uint64_t lNumber = 0;
    for (; *apText != '\0'; ++apText) {
        std::uint64_t lDigit;
        if (*apText >= '0' && *apText <= '9') {
            lDigit = static_cast<std::uint64_t>(*apText - '0');
        } else if (lBase == 16 && *apText >= 'a' && *apText <= 'f') {
            lDigit = static_cast<std::uint64_t>(*apText - 'a') + 10;
        } else if (lBase == 16 && *apText >= 'A' && *apText <= 'F') {
            lDigit = static_cast<std::uint64_t>(*apText - 'A') + 10;
        } else {
            return false;
        }
        lNumber = lNumber * lBase + lDigit;
        if (lNumber > aLimit) {
            return false;
        }
    }
    arNumber = static_cast<unsigned>(lNumber);
    return true;
}

bool sTakeHelp(const char*, ZTSCommandLineOptions& arOptions) {
    return arOptions.mShowHelp = true;
}

bool sTakeVersion(const char*, ZTSCommandLineOptions& arOptions) {
    return arOptions.mShowVersion = true;
}

bool sTakeShutDown(const char*, ZTSCommandLineOptions& arOptions) {
    return arOptions.mShutDownOther = true;
}

bool sTakeSniffer(const char*, ZTSCommandLineOptions& arOptions) {
    return arOptions.mSniffer = true;
}

bool sTakeDaemon(const char* apValue, ZTSCommandLineOptions& arOptions) {
    arOptions.mRunAsDaemon = ClibStrcmp(apValue, "true") == 0;
    return arOptions.mRunAsDaemon || ClibStrcmp(apValue, "false") == 0;
}

bool sTakeLogFile(const char* apValue, ZTSCommandLineOptions& arOptions) {
    arOptions.mLogFile = ZTCString(apValue);
    arOptions.mHasLogFile = true;
    return *apValue != '\0';
}

bool sTakeLogCode(const char* apValue, ZTSCommandLineOptions& arOptions) {
    arOptions.mHasLogCode = true;
    return sParseNumber(apValue, true, 255, arOptions.mLogCode);
}

bool sTakeConfigFile(const char* apValue, ZTSCommandLineOptions& arOptions) {
    arOptions.mConfigFile = ZTCString(apValue);
    return arOptions.mHasConfigFile = true;
}

bool sTakeHbTimeout(const char* apValue, ZTSCommandLineOptions& arOptions) {
    arOptions.mHasHbTimeout = true;
    return sParseNumber(apValue, false, UINT32_MAX, arOptions.mHbTimeout) && arOptions.mHbTimeout > 0;
}

struct ZTSOptionRule {
    const char* mpIdentifier;
    const char* mpLimits;  ///< of its value
    bool (*mpTake)(const char* apValue, ZTSCommandLineOptions& arOptions);
};

constexpr ZTSOptionRule scOptionRules[] = {
    {"-h", "", sTakeHelp},
    {"-v", "", sTakeVersion},
    {"-s", "", sTakeShutDown},
    {"-D", "true or false", sTakeDaemon},
    {"-l", "the name of the log file", sTakeLogFile},
    {"-d", "a number from 0 to 255, decimal or hexadecimal behind 0x", sTakeLogCode},
    {"-c", "the name of a configuration file", sTakeConfigFile},
    {"-S", "", sTakeSniffer},
    {"-b", "a number of seconds from 1 to 4294967295, decimal", sTakeHbTimeout},
};

const ZTSOptionRule* sFindRule(const char* apIdentifier) {
    for (const ZTSOptionRule& lcrRule : scOptionRules) {
        if (ClibStrcmp(lcrRule.mpIdentifier, apIdentifier) == 0) {
            return &lcrRule;
        }
    }
    return nullptr;
}

const ZTSCommandLineArgumentDesc* sFindDesc(const ZTCVector<ZTSCommandLineArgumentDesc>& acrDescs,
                                            const char* apArgument) {
    for (unsigned lIndex = 0; lIndex < acrDescs.numberOfElements(); ++lIndex) {
        const ZTSCommandLineArgumentDesc& lcrDesc = acrDescs.get(lIndex);
        if (ClibStrcmp(lcrDesc.identifier, apArgument) == 0) {
            return &lcrDesc;
        }
    }
    return nullptr;
}

}  // namespace

void ZTCCommandLineParser::parse(const ZTCVector<ZTSCommandLineArgumentDesc>& acrDescs, int aArgc,
                                 const char* const* apArgv) {
    mState = ZTPS_Running;
    mOptions = ZTSCommandLineOptions();
    ZTSCommandLineOptions lOptions;

    for (int lIndex = 1; lIndex < aArgc; ++lIndex) {
        const char* lpArgument = apArgv[lIndex];
        const ZTSCommandLineArgumentDesc* lpDesc = sFindDesc(acrDescs, lpArgument);
        const ZTSOptionRule* lpRule = lpDesc != nullptr ? sFindRule(lpArgument) : nullptr;
        if (lpRule == nullptr) {
            throwWith<ZTCInvalidEx>("Unknown option '%s'; -h shows those that there are",
                                    ZTCShownText(lpArgument).get());
        }

        const char* lpValue = "";
        if (lpDesc->type == ZTCLAT_OptionValue) {
            if (lIndex + 1 >= aArgc || sFindDesc(acrDescs, apArgv[lIndex + 1]) != nullptr) {
                throwWith<ZTCInvalidEx>("Option %s: the value is missing; it has to be %s", lpArgument,
                                        lpRule->mpLimits);
            }
            lpValue = apArgv[++lIndex];
        }
        if (!lpRule->mpTake(lpValue, lOptions)) {
            throwWith<ZTCInvalidEx>("Option %s: bad value '%s'; it has to be %s", lpArgument,
                                    ZTCShownText(lpValue).get(), lpRule->mpLimits);
        }
    }
    mOptions = lOptions;
    mState = ZTPS_Done;
}
