// Filters as people write them: what is taken means the same each time, and what is refused is refused in one line that
// names the option. A text that is read as a time or a duration is so whatever the marks are called.
//
// Input: lines, each the first letter of an option and its text: s since, u until, k kind, p port, i initiator, l lun,
// n limit, m a mark's name, a an administrator's name of a remote port.
#include <sstream>
#include <string>
#include <vector>

#include "fuzz/support/FuzzInput.h"
#include "sensor/views/include/FilterText.h"

static constexpr std::uint64_t scDefaultLimit = 20;

static const ZTCHistoryTime scNow{std::chrono::microseconds(1763712000000000)};

struct ZTSFuzzedFilter {
    ZTSFilterTexts mTexts;
    ZTCNameBook mNames;
    std::vector<ZTSMark> mMarks;
};

static void sTakeLine(char aLetter, const std::string& acrText, ZTSFuzzedFilter& arFilter) {
    switch (aLetter) {
        case 's':
            arFilter.mTexts.mSince = acrText;
            break;
        case 'u':
            arFilter.mTexts.mUntil = acrText;
            break;
        case 'k':
            arFilter.mTexts.mKinds.push_back(acrText);
            break;
        case 'p':
            arFilter.mTexts.mPorts.push_back(acrText);
            break;
        case 'i':
            arFilter.mTexts.mInitiators.push_back(acrText);
            break;
        case 'l':
            arFilter.mTexts.mLuns.push_back(acrText);
            break;
        case 'n':
            arFilter.mTexts.mLimit = acrText;
            break;
        case 'm':
            arFilter.mMarks.push_back({acrText, scNow - std::chrono::hours(1)});
            break;
        case 'a': {
            ZTSRemotePort lPort;
            lPort.mWwpn = ZTSFcName{{0x50, 6, 1, 0x60, 0x3b, 0xa0, 0x12, 0x34}};
            arFilter.mNames.addRemotePort(lPort);
            arFilter.mNames.addName(lPort.mWwpn, acrText);
            break;
        }
        default:
            break;
    }
}

static void sReadPoint(const std::string& acrText, const std::vector<ZTSMark>& acrMarks) {
    if (acrText.empty()) {
        return;
    }
    std::vector<ZTSMark> lNamesake = acrMarks;
    lNamesake.push_back({acrText, scNow});
    const ZTCHistoryTime lPoint = readPoint(acrText, "--since", lNamesake, scNow);
    try {
        const ZTCHistoryTime lWithoutMarks = readPoint(acrText, "--since", {}, scNow);
        ZT_FUZZ_REQUIRE(lWithoutMarks == lPoint, "a mark in place of a time: " + acrText);
    } catch (const ZTCBadFilterEx&) {
        ZT_FUZZ_REQUIRE(!isTimeOrDuration(acrText), acrText);
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    std::istringstream lLines(std::string(reinterpret_cast<const char*>(apData), aSize));
    ZTSFuzzedFilter lInput;
    for (std::string lLine; std::getline(lLines, lLine);) {
        if (!lLine.empty()) {
            sTakeLine(lLine[0], lLine.substr(1), lInput);
        }
    }
    sReadPoint(lInput.mTexts.mSince, lInput.mMarks);
    sReadPoint(lInput.mTexts.mUntil, lInput.mMarks);
    bool lIsChecked = false;
    try {
        checkFilter(lInput.mTexts);
        lIsChecked = true;
        const ZTSHistoryFilter lFilter = readFilter(lInput.mTexts, lInput.mNames, lInput.mMarks, scNow, scDefaultLimit);
        ZT_FUZZ_REQUIRE(lFilter.mKinds.size() == lInput.mTexts.mKinds.size(), "kinds");
        ZT_FUZZ_REQUIRE(lFilter.mPorts.size() >= lInput.mTexts.mPorts.size(), "ports");
        ZT_FUZZ_REQUIRE(lFilter.mSince.has_value() == !lInput.mTexts.mSince.empty(), "since");
        ZT_FUZZ_REQUIRE(!lFilter.mSince || !lFilter.mUntil || *lFilter.mSince <= *lFilter.mUntil, "order");
        ZT_FUZZ_REQUIRE(lInput.mTexts.mLimit.empty() ? lFilter.mLimit == scDefaultLimit : true, "limit");
    } catch (const ZTCBadFilterEx& lrException) {
        const std::string lText = lrException.what();
        ZT_FUZZ_REQUIRE(lText.starts_with("--") && lText.find('\n') == std::string::npos, lText);
        const bool lIsOfCheck =
            lText.starts_with("--kind") || lText.starts_with("--lun") || lText.starts_with("--limit");
        ZT_FUZZ_REQUIRE(lIsOfCheck != lIsChecked, "checked before, refused now: " + lText);
    }
    return 0;
}
