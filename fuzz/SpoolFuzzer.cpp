// The spool folder as a collector finds it, whatever is in it: names that are not the spool's are left alone, every
// other file has one place in the plan, numbers rise, and a file's bytes are never read beyond their end.
//
// Input: lines, each a file's name, a blank, and its content; the first line is the running agent's generation.
#include <algorithm>
#include <sstream>
#include <string>
#include <vector>

#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/ResponseDecoder.h"
#include "sensor/collector/include/SpoolRecovery.h"

static void sLookAtBody(const std::string& acrContent) {
    const std::vector<std::uint8_t> lBytes(acrContent.begin(), acrContent.end());
    const ZTSSpooledBody lBody = readSpooledBody(lBytes);
    const std::size_t lHeader = lBody.mHasLength ? 4 : 0;
    ZT_FUZZ_REQUIRE(!lBody.mHasLength || lHeader + lBody.mBody.size() + lBody.mBehind == lBytes.size(), acrContent);
    ZT_FUZZ_REQUIRE(lBody.mMissing == 0 || lBody.mBehind == 0, acrContent);
    ZT_FUZZ_REQUIRE(lBody.isWhole() == (lBody.mHasLength && lBody.mMissing == 0 && lBody.mBehind == 0), acrContent);
    decodeAsFarAsPossible(lBody.mBody);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    std::istringstream lLines(std::string(reinterpret_cast<const char*>(apData), aSize));
    std::string lGeneration;
    std::getline(lLines, lGeneration);
    std::vector<ZTSSpoolEntry> lEntries;
    for (std::string lLine; std::getline(lLines, lLine);) {
        const std::size_t lBlank = std::min(lLine.find(' '), lLine.size());
        const std::string lContent = lLine.substr(std::min(lBlank + 1, lLine.size()));
        sLookAtBody(lContent);
        if (const auto lName = parseSpoolName(lLine.substr(0, lBlank))) {
            ZT_FUZZ_REQUIRE(lName->toText() == lLine.substr(0, lBlank), lLine);
            lEntries.push_back({*lName, lContent.size()});
        }
    }
    const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, lGeneration);
    ZT_FUZZ_REQUIRE(lPlan.mWaiting.size() + lPlan.mTear.size() + (lPlan.mResume ? 1 : 0) == lEntries.size(),
                    "a file has no place, or two");
    for (const ZTSSpoolEntry& lrEntry : lEntries) {
        ZT_FUZZ_REQUIRE(lrEntry.mName.mNumber < lPlan.mNextNumber || lrEntry.mName.mNumber == UINT64_MAX,
                        lrEntry.mName.toText());
    }
    return 0;
}
