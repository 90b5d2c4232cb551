// The kernel's description of its types, and a record of the probe that is made with it: whatever the bytes are,
// nothing is read outside of them, a search ends, and a structure that is found has each member that was asked for.
//
// Input: two bytes with the length of the kernel's description, the description, and behind it the module's.
#include <algorithm>
#include <array>
#include <string>
#include <string_view>

#include "fuzz/support/FuzzInput.h"
#include "libkpm/linux/src/Btf.h"
#include "libkpm/linux/src/SenseData.h"

static constexpr std::array<std::string_view, 2> scTags{"tag", "internal_tag"};

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    if (aSize < 2) {
        return 0;
    }
    const std::size_t lWanted = apData[0] | std::size_t{apData[1]} << 8;
    const std::size_t lKernelSize = std::min(lWanted, aSize - 2);
    const ZTCExactBlock lKernel({apData + 2, lKernelSize}, 0);
    const ZTCExactBlock lModule({apData + 2 + lKernelSize, aSize - 2 - lKernelSize}, 0);
    const ZTCBtf lBtf({lKernel.get(), lKernelSize}, {lModule.get(), aSize - 2 - lKernelSize});
    const auto lRequest = lBtf.find("request", scTags);
    ZT_FUZZ_REQUIRE(!lRequest || lBtf.isWhole(), "found in what is not whole");
    ZT_FUZZ_REQUIRE(!lRequest || lRequest->mMembers.size() == scTags.size(), "members");
    const auto lLine = makeSenseProbe(lBtf, "group", "$arg1");
    if (const auto* lpLine = std::get_if<std::string>(&lLine)) {
        ZT_FUZZ_REQUIRE(lRequest.has_value(), *lpLine);
        ZT_FUZZ_REQUIRE(lpLine->starts_with("p:group/check_sense scsi_check_sense host=+"), *lpLine);
        ZT_FUZZ_REQUIRE(lpLine->find('\n') == std::string::npos, *lpLine);
    } else {
        ZT_FUZZ_REQUIRE(!std::get<ZTSTraceProblem>(lLine).mText.empty(), "no reason");
    }
    const ZTSSenseValues lValues = parseSense({apData, aSize});
    ZT_FUZZ_REQUIRE(lValues.mSenseKey == gcUnknownSense || (lValues.mSenseKey < 16 && lValues.mAsc < 256),
                    std::to_string(lValues.mSenseKey));
    return 0;
}
