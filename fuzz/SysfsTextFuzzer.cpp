// The small texts of sysfs and of a trace buffer's statistics: what is taken out of a text is within its limits and is
// the same when it is written down and read again, whatever blanks stand around it. The hosts that the texts name give
// a filter that lets through just these hosts.
//
// Input: a text; its lines are read alone too.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/support/FuzzInput.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SysfsText.h"

template <class Number>
static std::string sHex(Number aNumber) {
    char lText[32];
    std::snprintf(lText, sizeof lText, "0x%llx", static_cast<unsigned long long>(aNumber));
    return lText;
}

static std::string sHexOf(const HBA_wwn& acrName) {
    std::uint64_t lNumber = 0;
    for (const std::uint8_t lByte : acrName.wwn) {
        lNumber = lNumber * 256 + lByte;
    }
    return sHex(lNumber);
}

static void sCheckNumbers(std::string_view aText) {
    if (const auto lName = parseSysfsWwn(aText)) {
        const auto lAgain = parseSysfsWwn(" " + sHexOf(*lName) + "\n");
        ZT_FUZZ_REQUIRE(lAgain && std::memcmp(&*lAgain, &*lName, sizeof *lName) == 0, sHexOf(*lName));
    }
    if (const auto lId = parseSysfsFcId(aText)) {
        ZT_FUZZ_REQUIRE(*lId <= 0xFFFFFF, std::to_string(*lId));
        ZT_FUZZ_REQUIRE(parseSysfsFcId(sHex(*lId) + "\n") == lId, sHex(*lId));
        ZT_FUZZ_REQUIRE(parseSysfsWwn(aText).has_value(), sHex(*lId));
    }
    if (const auto lNumber = parseSysfsNumber(aText)) {
        ZT_FUZZ_REQUIRE(parseSysfsNumber("\t" + std::to_string(*lNumber) + " \n") == lNumber, std::to_string(*lNumber));
        ZT_FUZZ_REQUIRE(!parseSysfsWwn(aText), std::to_string(*lNumber));
    }
}

static void sCheckNames(std::string_view aText, std::vector<std::uint32_t>& arHosts) {
    if (const auto lHost = parseSysfsHostName(aText)) {
        ZT_FUZZ_REQUIRE(parseSysfsHostName("host" + std::to_string(*lHost)) == lHost, std::to_string(*lHost));
        arHosts.push_back(*lHost);
    }
    if (const auto lRport = parseSysfsRportName(aText)) {
        const std::string lText =
            "rport-" + std::to_string(lRport->mHost) + ":" + std::to_string(lRport->mChannel) + "-0";
        const auto lAgain = parseSysfsRportName(lText);
        ZT_FUZZ_REQUIRE(lAgain && lAgain->mHost == lRport->mHost && lAgain->mChannel == lRport->mChannel, lText);
        ZT_FUZZ_REQUIRE(!parseSysfsHostName(aText), lText);
        arHosts.push_back(lRport->mHost);
    }
}

static void sCheckState(std::string_view aText) {
    const ZTELinuxLink lState = parseSysfsPortState(aText);
    const std::string lBlank = "  " + std::string(aText) + "\n";
    ZT_FUZZ_REQUIRE(parseSysfsPortState(lBlank) == lState, lBlank);
    ZT_FUZZ_REQUIRE(lState == ZTLK_Unknown || (aText.size() >= 5 && !parseSysfsNumber(aText)), std::string(aText));
}

static void sCheckLosses(std::string_view aText) {
    const auto lLosses = parseTraceLosses(aText);
    if (!lLosses) {
        return;
    }
    const std::string lMore = std::string(aText) + "\ndropped events: 5\n";
    const auto lAfter = parseTraceLosses(lMore);
    const bool lHasRoom = *lLosses <= ~std::uint64_t{0} - 5;
    ZT_FUZZ_REQUIRE(lAfter.has_value() == lHasRoom, std::to_string(*lLosses));
    ZT_FUZZ_REQUIRE(!lAfter || *lAfter == *lLosses + 5, std::to_string(*lAfter));
    ZT_FUZZ_REQUIRE(!parseTraceLosses(std::string(aText) + "\noverrun: -1\n"), "a count that is none");
}

/// Whether the filter names that host, by its text: "host_no == N" and "(host_no >= N && host_no <= M)".
static bool sLetsThrough(const std::string& acrFilter, std::uint32_t aHost) {
    std::size_t lPlace = acrFilter.find('(');
    while (lPlace != std::string::npos) {
        unsigned lFirst = 0;
        unsigned lLast = 0;
        const char* lpText = acrFilter.c_str() + lPlace + (acrFilter[lPlace] == '|' ? 3 : 1);
        if (std::sscanf(lpText, "host_no == %u", &lFirst) == 1) {
            lLast = lFirst;
        } else if (std::sscanf(lpText, "(host_no >= %u && host_no <= %u", &lFirst, &lLast) != 2) {
            failFuzzing("a term of the filter", __FILE__, __LINE__, acrFilter);
        }
        if (lFirst <= aHost && aHost <= lLast) {
            return true;
        }
        lPlace = acrFilter.find("||", lPlace + 1);
    }
    return false;
}

static void sCheckFilter(std::vector<std::uint32_t> aHosts) {
    std::sort(aHosts.begin(), aHosts.end());
    aHosts.erase(std::unique(aHosts.begin(), aHosts.end()), aHosts.end());
    const std::string lFilter = makeScsiFilter(aHosts);
    ZT_FUZZ_REQUIRE(lFilter.size() < gcScsiFilterLimit, std::to_string(lFilter.size()));
    ZT_FUZZ_REQUIRE(lFilter.starts_with("result & 42"), lFilter);
    if (lFilter == "result & 42") {
        return;
    }
    for (const std::uint32_t lHost : aHosts) {
        ZT_FUZZ_REQUIRE(sLetsThrough(lFilter, lHost), lFilter);
        for (const std::uint32_t lNeighbour : {lHost - 1, lHost + 1}) {
            ZT_FUZZ_REQUIRE(
                sLetsThrough(lFilter, lNeighbour) == std::binary_search(aHosts.begin(), aHosts.end(), lNeighbour),
                lFilter);
        }
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const ZTCExactBlock lBlock({apData, aSize}, 0);
    const std::string_view lText(reinterpret_cast<const char*>(lBlock.get()), aSize);
    std::vector<std::uint32_t> lHosts;
    const auto lCheck = [&lHosts](std::string_view aText) {
        sCheckNumbers(aText);
        sCheckNames(aText, lHosts);
        sCheckState(aText);
        sCheckLosses(aText);
    };
    lCheck(lText);
    for (std::string_view lRest = lText; !lRest.empty();) {
        const std::size_t lEnd = std::min(lRest.find('\n'), lRest.size());
        const ZTCExactBlock lLine({apData + (lRest.data() - lText.data()), lEnd}, 0);
        lCheck({reinterpret_cast<const char*>(lLine.get()), lEnd});
        lRest.remove_prefix(std::min(lEnd + 1, lRest.size()));
    }
    sCheckFilter(lHosts);
    return 0;
}
