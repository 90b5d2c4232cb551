#include "libkpm/linux/src/InstanceName.h"

#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <optional>
#include <string_view>

#include "libkpm/linux/src/Sysfs.h"

static const char* const scPrefix = "libkpm-linux-";
static const char* const scSensePrefix = "libkpm-linux-sense-";

/// When a process was started, in the kernel's ticks since boot: field 22 of its stat file.
static std::optional<std::string> sStartTime(const std::string& acrProcess) {
    const std::optional<std::string> lText = readSmallFile("/proc/" + acrProcess + "/stat", 4096);
    if (!lText) {
        return std::nullopt;
    }
    // The second field, the name in brackets, may hold anything.
    std::size_t lPlace = lText->rfind(')');
    for (int lField = 2; lField < 22 && lPlace != std::string::npos; ++lField) {
        lPlace = lText->find(' ', lPlace + 1);
    }
    if (lPlace == std::string::npos) {
        return std::nullopt;
    }
    return lText->substr(lPlace + 1, lText->find(' ', lPlace + 1) - lPlace - 1);
}

static std::string sMakeName(const char* apPrefix) {
    return apPrefix + std::to_string(::getpid()) + "-" + sStartTime("self").value_or("0");
}

std::string makeTraceInstanceName() {
    return sMakeName(scPrefix);
}

std::string makeSenseInstanceName() {
    return sMakeName(scSensePrefix);
}

bool isTraceInstanceLeftOver(const std::string& acrName) {
    if (!acrName.starts_with(scPrefix)) {
        return false;
    }
    const std::string lRest =
        acrName.substr(std::strlen(acrName.starts_with(scSensePrefix) ? scSensePrefix : scPrefix));
    const std::size_t lDash = lRest.find('-');
    const auto lIsNumber = [](std::string_view aText) {
        return !aText.empty() &&
               std::all_of(aText.begin(), aText.end(), [](char aChar) { return '0' <= aChar && aChar <= '9'; });
    };
    if (lDash == std::string::npos || !lIsNumber(lRest.substr(0, lDash)) || !lIsNumber(lRest.substr(lDash + 1))) {
        return false;
    }
    return sStartTime(lRest.substr(0, lDash)) != lRest.substr(lDash + 1);
}
