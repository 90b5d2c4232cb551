// Targets as people write them, in a file and in an argument: what is taken can be written and read again, and is
// encoded to a request that the agent's decoder reads; what is refused is refused with a reason.
//
// Input: the text of a file of targets.
#include <cstdio>
#include <sstream>
#include <string>

#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/TargetText.h"

static std::string sTextOf(const ZTSTargetPort& acrTarget) {
    char lFcId[16];
    std::snprintf(lFcId, sizeof lFcId, "0x%06x", acrTarget.mFcId);
    return acrTarget.mNodeName.toText() + "," + acrTarget.mPortName.toText() + "," + lFcId;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const std::string lText(reinterpret_cast<const char*>(apData), aSize);
    std::istringstream lStream(lText);
    try {
        const std::vector<ZTSTargetPort> lTargets = readTargets(lStream, "input");
        for (const ZTSTargetPort& lrTarget : lTargets) {
            ZT_FUZZ_REQUIRE(lrTarget.mFcId <= gcMaxFcAddress, std::to_string(lrTarget.mFcId));
            ZT_FUZZ_REQUIRE(parseTarget(sTextOf(lrTarget)) == lrTarget, sTextOf(lrTarget));
        }
        if (lTargets.size() <= gcMaxTargetsPerRequest) {
            const ZTCWireBytes lBody = encodeRegisterTargets(lTargets);
            ZT_FUZZ_REQUIRE(lBody.size() == 5 + 20 * lTargets.size(), std::to_string(lBody.size()));
        }
    } catch (const ZTCBadInputEx& lrException) {
        ZT_FUZZ_REQUIRE(std::string(lrException.what()).find("input") != std::string::npos, lrException.what());
    }
    try {
        const ZTSTargetPort lTarget = parseTarget(lText);
        ZT_FUZZ_REQUIRE(parseTarget(sTextOf(lTarget)) == lTarget, sTextOf(lTarget));
    } catch (const ZTCBadInputEx& lrException) {
        ZT_FUZZ_REQUIRE(*lrException.what() != '\0', "no reason");
    }
    return 0;
}
