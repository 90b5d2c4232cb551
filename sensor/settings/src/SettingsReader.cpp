/// Reads a text into settings. The only source that knows TOML.
#define TOML_EXCEPTIONS 0
#include <toml++/toml.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <map>
#include <optional>
#include <string>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/FcName.h"
#include "sensor/settings/include/Quantities.h"
#include "sensor/settings/include/Settings.h"
#include "sensor/settings/src/SettingsSyntax.h"
#include "sensor/settings/src/SettingsTable.h"

static constexpr const char* scWrongType = "wrong type";
static constexpr const char* scOutOfRange = "out of range";

static std::string sNumberText(double aNumber) {
    char lText[400];
    return {lText, std::to_chars(lText, lText + sizeof(lText), aNumber, std::chars_format::fixed).ptr};
}

/// With a point also where the number is whole: 1.0 is not a whole number to TOML.
static std::string sFractionText(double aNumber) {
    const std::string lText = sNumberText(aNumber);
    return lText.find_first_not_of("-0123456789") == std::string::npos ? lText + ".0" : lText;
}

/// The value as people read it.
static std::string sValueText(const toml::node& acrNode) {
    switch (acrNode.type()) {
        case toml::node_type::string:
            return quoted(acrNode.as_string()->get());
        case toml::node_type::integer:
            return std::to_string(acrNode.as_integer()->get());
        case toml::node_type::floating_point:
            return sFractionText(acrNode.as_floating_point()->get());
        case toml::node_type::boolean:
            return acrNode.as_boolean()->get() ? "true" : "false";
        case toml::node_type::array:
            return "a list";
        case toml::node_type::table:
            return "a table";
        default:
            return "a date or time";
    }
}

static std::string sRangeText(const ZTSRange& acrRange) {
    switch (acrRange.mQuantity) {
        case ZTQ_Seconds:
            return "seconds, or a text such as \"90s\", from " + sNumberText(acrRange.mLeast) + " to " +
                   sNumberText(acrRange.mMost) + " s";
        case ZTQ_WholeSeconds:
            return "whole seconds, or a text such as \"90s\", from " + sNumberText(acrRange.mLeast) + " to " +
                   sNumberText(acrRange.mMost) + " s";
        case ZTQ_Bytes:
            return "a size such as \"64MiB\", from " + sizeText(static_cast<std::uint64_t>(acrRange.mLeast)) + " to " +
                   sizeText(static_cast<std::uint64_t>(acrRange.mMost));
        case ZTQ_Count:
            break;
    }
    return "a whole number from " + sNumberText(acrRange.mLeast) + " to " + sNumberText(acrRange.mMost);
}

/// What is wrong with a value, and what it must be.
struct ZTSFault {
    const char* mpWhat;
    std::string mMust;
    const toml::node* mpPart = nullptr;  ///< the element of a list that is wrong; null: the whole value
};

// One function for each type of a member: sets it, or says what is wrong.

static std::optional<ZTSFault> sRead(const toml::node& acrNode, const ZTSRange&, bool& arValue) {
    if (!acrNode.is_boolean()) {
        return ZTSFault{scWrongType, "true or false"};
    }
    arValue = acrNode.as_boolean()->get();
    return {};
}

static std::optional<ZTSFault> sRead(const toml::node& acrNode, const ZTSRange& acrRange, std::uint64_t& arValue) {
    std::int64_t lNumber = 0;
    if (acrNode.is_integer()) {
        lNumber = acrNode.as_integer()->get();
    } else if (acrRange.mQuantity == ZTQ_Bytes && acrNode.is_string()) {
        try {
            lNumber = static_cast<std::int64_t>(sizeFromText(acrNode.as_string()->get()));
        } catch (const ZTCTooLargeEx&) {
            return ZTSFault{scOutOfRange, sRangeText(acrRange)};
        } catch (const ZTCBadInputEx&) {
            return ZTSFault{"not a size", sRangeText(acrRange)};
        }
    } else {
        return ZTSFault{scWrongType, sRangeText(acrRange)};
    }
    if (static_cast<double>(lNumber) < acrRange.mLeast || static_cast<double>(lNumber) > acrRange.mMost) {
        return ZTSFault{scOutOfRange, sRangeText(acrRange)};
    }
    arValue = static_cast<std::uint64_t>(lNumber);
    return {};
}

static std::optional<ZTSFault> sRead(const toml::node& acrNode, const ZTSRange& acrRange,
                                     std::chrono::milliseconds& arValue) {
    double lSeconds = 0;
    if (acrNode.is_string()) {
        try {
            lSeconds = static_cast<double>(durationFromText(acrNode.as_string()->get()).count()) / 1000;
        } catch (const ZTCTooLargeEx&) {
            return ZTSFault{scOutOfRange, sRangeText(acrRange)};
        } catch (const ZTCBadInputEx&) {
            return ZTSFault{"not a duration", sRangeText(acrRange)};
        }
    } else if (acrNode.is_number()) {
        lSeconds = acrNode.is_integer() ? static_cast<double>(acrNode.as_integer()->get())
                                        : acrNode.as_floating_point()->get();
    } else {
        return ZTSFault{scWrongType, sRangeText(acrRange)};
    }
    // Written so that "not a number" is out of range.
    if (!(lSeconds >= acrRange.mLeast && lSeconds <= acrRange.mMost)) {
        return ZTSFault{scOutOfRange, sRangeText(acrRange)};
    }
    if (acrRange.mQuantity == ZTQ_WholeSeconds && lSeconds != std::floor(lSeconds)) {
        return ZTSFault{"a fraction of a second", sRangeText(acrRange)};
    }
    arValue = std::chrono::milliseconds(std::llround(lSeconds * 1000));
    return {};
}

static std::optional<ZTSFault> sRead(const toml::node& acrNode, const ZTSRange& acrRange, std::string& arValue) {
    if (!acrNode.is_string()) {
        return ZTSFault{scWrongType, "a text: " + std::string(acrRange.mpRule->mpRange)};
    }
    const std::string& lcrText = acrNode.as_string()->get();
    if (!acrRange.mpRule->mpIsGood(lcrText)) {
        return ZTSFault{"not usable", acrRange.mpRule->mpRange};
    }
    arValue = acrRange.mpRule->mIsDirectory ? lcrText.substr(0, lcrText.find_last_not_of('/') + 1) : lcrText;
    return {};
}

static std::optional<ZTSFault> sRead(const toml::node& acrNode, const ZTSRange& acrRange,
                                     std::vector<std::string>& arValue) {
    if (!acrNode.is_array()) {
        return ZTSFault{scWrongType, "a list of texts, each " + std::string(acrRange.mpRule->mpRange)};
    }
    std::vector<std::string> lTexts;
    for (const toml::node& lcrElement : *acrNode.as_array()) {
        if (const auto lFault = sRead(lcrElement, acrRange, lTexts.emplace_back())) {
            return ZTSFault{"an element is not usable", "a list of texts, each " + lFault->mMust, &lcrElement};
        }
    }
    arValue = std::move(lTexts);
    return {};
}

class ZTCSettingsReader {
public:
    ZTCSettingsReader(const std::string& acrText, const std::string& acrFile) {
        mReading.mFile = acrFile;
        mReading.mContent = acrText;
    }

    ZTSSettingsReading read() {
        for (const ZTSKey& lcrKey : settingsTable()) {
            readDefault(lcrKey);
        }
        if (const auto lLine = findLineWithBareCharacter(mReading.mContent)) {
            addError(*lLine, "syntax", "a character beyond ASCII that is neither in quotes nor in a comment");
            return std::move(mReading);
        }
        const toml::parse_result lResult = toml::parse(mReading.mContent);
        if (!lResult) {
            const toml::parse_error& lcrError = lResult.error();
            // The parser's words can hold a line break of the file.
            addError(lcrError.source().begin.line, "syntax", escaped(lcrError.description()));
            return std::move(mReading);
        }
        for (const auto& [lName, lNode] : lResult.table()) {
            readRoot(lName, lNode);
        }
        checkTogether();
        const auto lIsBefore = [](const ZTSSettingsProblem& acrOne, const ZTSSettingsProblem& acrOther) {
            return acrOne.mLine < acrOther.mLine;
        };
        std::stable_sort(mReading.mErrors.begin(), mReading.mErrors.end(), lIsBefore);
        return std::move(mReading);
    }

private:
    void addError(unsigned aLine, const std::string& acrKey, const std::string& acrText) {
        mReading.mErrors.push_back({mReading.mFile, aLine, acrKey, acrText});
    }

    void addFault(const toml::node& acrNode, const std::string& acrKey, const ZTSFault& acrFault) {
        const toml::node& lcrWrong = acrFault.mpPart != nullptr ? *acrFault.mpPart : acrNode;
        addError(lcrWrong.source().begin.line, acrKey,
                 std::string(acrFault.mpWhat) + ": " + sValueText(lcrWrong) + ", must be " + acrFault.mMust);
    }

    void addUnknown(const toml::key& acrName, const toml::node& acrNode, const std::string& acrKey,
                    const std::string& acrKnown) {
        addError(acrName.source().begin.line, acrKey,
                 "unknown key: " + sValueText(acrNode) + ", must be one of " + acrKnown);
    }

    std::optional<ZTSFault> assign(const ZTSKey& acrKey, const toml::node& acrNode) {
        return std::visit([&](auto apMember) { return sRead(acrNode, acrKey.mRange, mReading.mSettings.*apMember); },
                          acrKey.mMember);
    }

    void readDefault(const ZTSKey& acrKey) {
        const toml::parse_result lResult = toml::parse(std::string("value = ") + acrKey.mpDefault);
        if (!lResult || assign(acrKey, *lResult.table().get("value"))) {
            addError(0, acrKey.toText(), std::string("the default ") + acrKey.mpDefault + " cannot be used");
        }
    }

    void readRoot(const toml::key& acrName, const toml::node& acrNode) {
        if (acrName.str() == "names") {
            readNames(acrNode);
        } else if (acrName.str() == "warn") {
            readWarnings(acrNode);
        } else {
            readSection(acrName, acrNode);
        }
    }

    void readSection(const toml::key& acrName, const toml::node& acrNode) {
        const std::string lSection(acrName.str());
        std::string lKnown;
        for (const ZTSKey& lcrKey : settingsTable()) {
            if (lSection == lcrKey.mpSection) {
                lKnown += (lKnown.empty() ? "" : ", ") + lcrKey.toText();
            }
        }
        if (lKnown.empty()) {
            addUnknown(acrName, acrNode, lSection, sectionNames());
            return;
        }
        if (!acrNode.is_table()) {
            addFault(acrNode, lSection, {scWrongType, "a table: [" + lSection + "]"});
            return;
        }
        for (const auto& [lName, lValue] : *acrNode.as_table()) {
            const std::string lKey = lSection + "." + std::string(lName.str());
            const auto lTable = settingsTable();
            const auto lRow = std::find_if(lTable.begin(), lTable.end(),
                                           [&](const ZTSKey& acrKey) { return lKey == acrKey.toText(); });
            if (lRow == lTable.end()) {
                addUnknown(lName, lValue, lKey, lKnown);
                continue;
            }
            mLines[lKey] = lValue.source().begin.line;
            if (const auto lFault = assign(*lRow, lValue)) {
                addFault(lValue, lKey, *lFault);
            }
        }
    }

    static std::string sectionNames() {
        std::string lNames;
        const char* lpLast = "";
        for (const ZTSKey& lcrKey : settingsTable()) {
            if (std::string(lpLast) != lcrKey.mpSection) {
                lpLast = lcrKey.mpSection;
                lNames += std::string("[") + lpLast + "], ";
            }
        }
        return lNames + "[names], [[warn]]";
    }

    void readNames(const toml::node& acrNode) {
        if (!acrNode.is_table()) {
            addFault(acrNode, "names", {scWrongType, "a table: [names]"});
            return;
        }
        for (const auto& [lName, lValue] : *acrNode.as_table()) {
            const std::string lWritten(lName.str());
            const std::string lKey = "names." + quoted(lWritten);
            std::string lNormal;
            try {
                lNormal = ZTSFcName::fromText(lWritten).toText();
            } catch (const ZTCBadInputEx&) {
                addError(lName.source().begin.line, lKey,
                         "not a world wide name: " + quoted(lWritten) +
                             ", must be 8 hex pairs with colons, such as 50:06:01:60:3b:a0:12:34");
                continue;
            }
            std::string lText;
            if (const auto lFault = sRead(lValue, {.mpRule = &gcNameRule}, lText)) {
                addFault(lValue, lKey, *lFault);
            } else if (!mReading.mSettings.mNames.emplace(lNormal, lText).second) {
                addError(lName.source().begin.line, lKey,
                         "named twice: " + quoted(lText) + ", must be one name for " + lNormal);
            }
        }
    }

    void readWarnings(const toml::node& acrNode) {
        if (!acrNode.is_array_of_tables()) {
            addFault(acrNode, "warn", {scWrongType, "tables: [[warn]]"});
            return;
        }
        for (const toml::node& lcrElement : *acrNode.as_array()) {
            readWarning(*lcrElement.as_table());
        }
    }

    void readWarning(const toml::table& acrTable) {
        ZTSWarnRule& lrRule = mReading.mSettings.mWarnings.emplace_back();
        for (const auto& [lName, lValue] : acrTable) {
            const std::string lField(lName.str());
            const std::string lKey = "warn." + lField;
            std::optional<ZTSFault> lFault;
            if (lField == "kind") {
                lFault = sRead(lValue, {.mpRule = &gcWarnKindRule}, lrRule.mKind);
            } else if (lField == "count") {
                lFault = sRead(lValue, {ZTQ_Count, 1, 1e9}, lrRule.mCount);
            } else if (lField == "within") {
                lFault = sRead(lValue, {ZTQ_Seconds, 1, 30 * 86400.0}, lrRule.mWithin);
            } else if (lField == "per") {
                lFault = sRead(lValue, {.mpRule = &gcWarnPerRule}, lrRule.mPer);
            } else if (lField == "run") {
                lFault = sRead(lValue, {.mpRule = &gcAnyRule}, lrRule.mRun);
            } else if (lField == "timeout") {
                lFault = sRead(lValue, {ZTQ_Seconds, 1, 3600}, lrRule.mTimeout);
            } else {
                addUnknown(lName, lValue, lKey, "kind, count, within, per, run, timeout");
            }
            if (lFault) {
                addFault(lValue, lKey, *lFault);
            }
        }
        const unsigned lLine = acrTable.source().begin.line;
        if (acrTable.get("kind") == nullptr) {
            addError(lLine, "warn.kind", std::string("missing: no value, must be ") + gcWarnKindRule.mpRange);
        }
        const toml::node* const lpRun = acrTable.get("run");
        const bool lHasProgram = !lrRule.mRun.empty() && gcProgramRule.mpIsGood(lrRule.mRun.front());
        const bool lIsReported = lpRun != nullptr && lrRule.mRun.empty() && !isEmptyList(acrTable);
        if (!lHasProgram && !lIsReported) {
            const std::string lValue = lpRun == nullptr      ? "no value"
                                       : lrRule.mRun.empty() ? "an empty list"
                                                             : quoted(lrRule.mRun.front());
            addError(lpRun == nullptr ? lLine : lpRun->source().begin.line, "warn.run",
                     "names no program: " + lValue + ", must be a list that begins with " + gcProgramRule.mpRange);
        }
    }

    static bool isEmptyList(const toml::table& acrTable) {
        const toml::array* lpList = acrTable.get_as<toml::array>("run");
        return lpList != nullptr && lpList->empty();
    }

    /// Checks that need several keys.
    void checkTogether() {
        const ZTSSettings& lcrSettings = mReading.mSettings;
        if (isPublicListen(lcrSettings.mHttpListen) && !lcrSettings.mHttpPublic) {
            addError(mLines["http.listen"], "http.listen",
                     "reachable from other hosts: " + quoted(lcrSettings.mHttpListen) +
                         ", must be a loopback address or unix:PATH unless http.public = true");
        }
    }

    ZTSSettingsReading mReading;
    std::map<std::string, unsigned> mLines;  ///< of the keys that the file has
};

ZTSSettingsReading parseSettings(const std::string& acrText, const std::string& acrFile) {
    return ZTCSettingsReader(acrText, acrFile).read();
}

ZTSSettings defaultSettings() {
    return parseSettings("", "").mSettings;
}
