#include "sensor/settings/include/SettingsList.h"

#include <algorithm>
#include <variant>

#include "sensor/settings/src/SettingsTable.h"

/// A shorter text is no secret, and replacing it would garble everything else.
static constexpr std::size_t scLeastSecret = 4;

static std::string sText(bool aValue) {
    return aValue ? "true" : "false";
}

static std::string sText(std::uint64_t aValue) {
    return std::to_string(aValue);
}

static std::string sText(std::chrono::milliseconds aValue) {
    return std::to_string(aValue.count()) + " ms";
}

static std::string sText(const std::string& acrValue) {
    return "\"" + acrValue + "\"";
}

static std::string sText(const std::vector<std::string>& acrValues) {
    std::string lText;
    for (const std::string& lrValue : acrValues) {
        lText += (lText.empty() ? "" : ", ") + sText(lrValue);
    }
    return "[" + lText + "]";
}

static std::string sText(const ZTSWarnRule& acrRule) {
    const std::size_t lArguments = acrRule.mRun.empty() ? 0 : acrRule.mRun.size() - 1;
    return acrRule.mKind + ", count " + sText(acrRule.mCount) + ", within " + sText(acrRule.mWithin) + ", per " +
           acrRule.mPer + ", timeout " + sText(acrRule.mTimeout) + ", run " +
           (acrRule.mRun.empty() ? "nothing" : acrRule.mRun.front()) +
           "; arguments left out: " + std::to_string(lArguments);
}

std::string listSettings(const ZTSSettings& acrSettings) {
    std::string lList;
    for (const ZTSKey& lrKey : settingsTable()) {
        const std::string lValue =
            std::visit([&acrSettings](auto apMember) { return sText(acrSettings.*apMember); }, lrKey.mMember);
        lList += lrKey.toText() + " = " + lValue + "\n";
    }
    for (const auto& [lWwn, lName] : acrSettings.mNames) {
        lList += "names." + lWwn + " = " + sText(lName) + "\n";
    }
    for (const ZTSWarnRule& lrRule : acrSettings.mWarnings) {
        lList += "warn = " + sText(lrRule) + "\n";
    }
    return lList;
}

std::vector<std::string> listSecrets(const ZTSSettings& acrSettings) {
    std::vector<std::string> lSecrets;
    for (const ZTSWarnRule& lrRule : acrSettings.mWarnings) {
        for (std::size_t i = 1; i < lrRule.mRun.size(); ++i) {
            if (lrRule.mRun[i].size() >= scLeastSecret) {
                lSecrets.push_back(lrRule.mRun[i]);
            }
        }
    }
    // The longest first: one may be a part of another.
    std::ranges::sort(lSecrets, std::ranges::greater(), &std::string::size);
    return lSecrets;
}
