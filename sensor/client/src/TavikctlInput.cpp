#include "sensor/client/src/TavikctlInput.h"

#include <cerrno>
#include <charconv>
#include <system_error>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/TargetText.h"

static constexpr double scMaxSeconds = 86400;

std::chrono::milliseconds parseSeconds(const std::string& acrText, const std::string& acrWhat) {
    double lSeconds = 0;
    const char* lpEnd = acrText.data() + acrText.size();
    const auto [lpStop, lError] = std::from_chars(acrText.data(), lpEnd, lSeconds, std::chars_format::fixed);
    if (lError != std::errc() || lpStop != lpEnd || !(lSeconds >= 0.001 && lSeconds <= scMaxSeconds)) {
        throw ZTCBadInputEx(acrWhat + " \"" + acrText + "\" is not a number of seconds from 0.001 to 86400");
    }
    return std::chrono::milliseconds(static_cast<long long>(lSeconds * 1000));
}

std::uint32_t parseUnsigned(const std::string& acrText, const std::string& acrWhat) {
    return parseNumber(acrText, 0xFFFFFFFFU, acrWhat);
}

std::ifstream openInput(const std::string& acrPath) {
    std::ifstream lFile(acrPath == "-" ? "/dev/stdin" : acrPath, std::ios::binary);
    if (!lFile) {
        throw ZTCBadInputEx("cannot open " + acrPath + ": " + std::generic_category().message(errno));
    }
    return lFile;
}

std::vector<ZTSTargetPort> collectTargets(const std::vector<std::string>& acrArguments) {
    std::vector<ZTSTargetPort> lTargets;
    for (const std::string& lrArgument : acrArguments) {
        if (lrArgument.find(',') != std::string::npos) {
            lTargets.push_back(parseTarget(lrArgument));
            continue;
        }
        std::ifstream lFile = openInput(lrArgument);
        const std::vector<ZTSTargetPort> lRead = readTargets(lFile, lrArgument);
        if (lRead.empty()) {
            throw ZTCBadInputEx(lrArgument + " holds no target");
        }
        lTargets.insert(lTargets.end(), lRead.begin(), lRead.end());
    }
    return lTargets;
}
