// Reads any text as a configuration file. Every file is good, or each of its errors names a line, a key and the reason.
// A good file gives the same settings when it is read again. A duration or size that was read can be written and read
// again.
//
// Input: the text of a configuration file. Its first line is also read as a duration and as a size.
#include <algorithm>
#include <string>

#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/settings/include/Quantities.h"
#include "sensor/settings/include/Settings.h"

static void sReadQuantities(const std::string& acrText) {
    try {
        const std::chrono::milliseconds lDuration = durationFromText(acrText);
        ZT_FUZZ_REQUIRE(lDuration.count() >= 0 && lDuration <= std::chrono::hours(24) * 36500, acrText);
        ZT_FUZZ_REQUIRE(durationFromText(durationText(lDuration)) == lDuration, durationText(lDuration));
    } catch (const ZTCBadInputEx& lrException) {
        ZT_FUZZ_REQUIRE(*lrException.what() != '\0', "no reason");
    }
    try {
        const std::uint64_t lSize = sizeFromText(acrText);
        ZT_FUZZ_REQUIRE(lSize <= std::uint64_t{1024} << 40, acrText);
        ZT_FUZZ_REQUIRE(sizeFromText(sizeText(lSize)) == lSize, sizeText(lSize));
    } catch (const ZTCBadInputEx& lrException) {
        ZT_FUZZ_REQUIRE(*lrException.what() != '\0', "no reason");
    }
}

static void sRequireSense(const ZTSSettingsProblem& acrProblem, std::size_t aLines) {
    const std::string lText = acrProblem.toText();
    ZT_FUZZ_REQUIRE(!acrProblem.mText.empty() && !acrProblem.mKey.empty(), lText);
    ZT_FUZZ_REQUIRE(acrProblem.mLine <= aLines, lText);
    ZT_FUZZ_REQUIRE(lText.find("input") == 0 && lText.find('\n') == std::string::npos, lText);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const std::string lText(reinterpret_cast<const char*>(apData), aSize);
    sReadQuantities(lText.substr(0, lText.find('\n')));
    const ZTSSettingsReading lReading = parseSettings(lText, "input");
    const auto lLines = static_cast<std::size_t>(std::count(lText.begin(), lText.end(), '\n')) + 1;
    for (const ZTSSettingsProblem& lrProblem : lReading.mErrors) {
        sRequireSense(lrProblem, lLines);
    }
    ZT_FUZZ_REQUIRE(lReading.isGood() == lReading.mErrors.empty(), "good or bad");
    if (lReading.isGood()) {
        ZT_FUZZ_REQUIRE(parseSettings(lText, "input").mSettings == lReading.mSettings, "read differently");
        const ZTSSettings lDefaults = defaultSettings();
        ZT_FUZZ_REQUIRE(changedKeys(lDefaults, lReading.mSettings).empty() == (lDefaults == lReading.mSettings),
                        "what differs has no name");
        ZT_FUZZ_REQUIRE(lReading.mSettings.mSensorDirectory.starts_with('/'), lReading.mSettings.mSensorDirectory);
        ZT_FUZZ_REQUIRE(lReading.mSettings.mSensorState.starts_with('/'), lReading.mSettings.mSensorState);
    }
    return 0;
}
