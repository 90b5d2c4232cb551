#include "fuzz/support/FuzzKernel.h"

#include <fstream>
#include <iterator>
#include <variant>

#include "fuzz/support/FuzzInput.h"

static std::string sRead(const std::string& acrName) {
    std::ifstream lFile(std::string(TAVIK_CAPTURES "/") + acrName);
    std::string lText((std::istreambuf_iterator<char>(lFile)), std::istreambuf_iterator<char>());
    ZT_FUZZ_REQUIRE(!lText.empty(), acrName);
    return lText;
}

static ZTSFuzzKernel sKernel(const char* apName) {
    const std::string lEvents = std::string(apName) + "/tracing/events/";
    const auto lPage = makeTracePageLayout(parseTraceFormat(sRead(lEvents + "header_page")));
    const auto lDone = makeScsiDoneLayout(parseTraceFormat(sRead(lEvents + "scsi/scsi_dispatch_cmd_done/format")));
    ZT_FUZZ_REQUIRE(std::holds_alternative<ZTSTracePageLayout>(lPage), apName);
    ZT_FUZZ_REQUIRE(std::holds_alternative<ZTSScsiDoneLayout>(lDone), apName);
    return {apName, std::get<ZTSTracePageLayout>(lPage), std::get<ZTSScsiDoneLayout>(lDone)};
}

const ZTSFuzzKernel& getFuzzKernel(std::size_t aKernel) {
    static const ZTSFuzzKernel scKernels[gcFuzzKernels] = {sKernel("6.1"), sKernel("6.12")};
    return scKernels[aKernel];
}

std::uint64_t fuzzNumber(ZTCByteSpan aBytes, std::size_t aOffset, std::size_t aSize, std::endian aOrder) {
    std::uint64_t lNumber = 0;
    for (std::size_t lByte = 0; lByte < aSize; ++lByte) {
        const std::size_t lPower = aOrder == std::endian::little ? lByte : aSize - 1 - lByte;
        lNumber += std::uint64_t{aBytes[aOffset + lByte]} << (8 * lPower);
    }
    return lNumber;
}
