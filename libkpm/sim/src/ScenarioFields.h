/// The values in a scenario's lines: numbers, bytes, names, lists of them, boards and ports.
///
/// A `read` function reads one text, a `take` function takes its field from a line first. All of them refuse what does
/// not fit, with ZTCSimRefusal: the message names the field, the limit and the value.
#ifndef LIBKPM_SIM_SRC_SCENARIOFIELDS_H
#define LIBKPM_SIM_SRC_SCENARIOFIELDS_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/Scenario.h"
#include "libkpm/sim/src/ScenarioLine.h"

inline constexpr std::uint32_t gcSimMax32 = std::numeric_limits<std::uint32_t>::max();
inline constexpr std::uint32_t gcSimMaxFcId = 0xFFFFFF;

/// A number in decimal or 0x-hexadecimal, from aLeast to aMost.
std::uint64_t readSimNumber(std::string_view aField, std::string_view aText, std::uint64_t aLeast, std::uint64_t aMost);
std::uint32_t readSimNumber32(std::string_view aField, std::string_view aText);

/// The number in a field that may be missing.
std::uint64_t takeSimNumber(ZTCSimLine& arLine, std::string_view aField, std::uint64_t aLeast, std::uint64_t aMost,
                            std::uint64_t aDefault);

/// A list of numbers from 0 to aMost: 1,2, 0-15, all, unknown.
std::vector<std::uint32_t> readSimNumberList(std::string_view aField, std::string_view aText, std::uint32_t aMost);

/// Pairs of hex digits, at most aMost of them, with or without a colon between two pairs.
std::vector<std::uint8_t> readSimBytes(std::string_view aField, std::string_view aText, std::size_t aMost);

/// A world wide name in its 23 characters; none where the text is something else.
std::optional<HBA_wwn> findSimWwn(std::string_view aText);

/// A world wide name: written out, or that of an adapter or a remote port.
HBA_wwn readSimWwn(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario,
                   bool aIsNodeName);

/// The world wide name, written out, in a field that the line needs.
HBA_wwn takeSimWwn(ZTCSimLine& arLine, std::string_view aField);

/// The port of this name, or null.
const ZTSSimPort* findSimPort(const std::vector<ZTSSimPort>& acrPorts, std::string_view aName);

/// A board by its adapter's name or its number.
std::uint32_t readSimBoard(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario);

/// The boards of a line: those it names, or by default the first one (`aAllByDefault`: all).
ZTSSimBoards takeSimBoards(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault);

/// The remote ports of a line: those it names, or by default the first one (`aAllByDefault`: all) of the scenario. A
/// name that no line above declares may be a world wide name. Never empty.
std::vector<ZTSSimPort> takeSimPorts(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault);

/// The kind that the next word of the line names; none for `all`.
std::optional<std::size_t> takeSimKind(ZTCSimLine& arLine);

/// Refuses a list of more than gcSimMaxListSize values.
void checkSimListSize(std::string_view aField, std::size_t aSize);

/// Calls `aEach` for every part of a list with commas.
template <class Each>
void forEachSimPart(std::string_view aField, std::string_view aText, Each aEach) {
    std::size_t lPlace = 0;
    while (true) {
        const std::size_t lComma = aText.find(',', lPlace);
        const std::string_view lPart =
            aText.substr(lPlace, lComma == std::string_view::npos ? lComma : lComma - lPlace);
        if (lPart.empty()) {
            refuseSim(nameSimField(aField) + "has an empty value in its list");
        }
        aEach(lPart);
        if (lComma == std::string_view::npos) {
            return;
        }
        lPlace = lComma + 1;
    }
}

/// The next word of the line, which is one of a few.
template <class Value, std::size_t Count>
Value takeSimChoice(ZTCSimLine& arLine, const std::array<std::pair<std::string_view, Value>, Count>& acrChoices) {
    std::string lWords;
    for (const auto& [lrName, lrValue] : acrChoices) {
        lWords += (lWords.empty() ? "" : " or ") + std::string(lrName);
    }
    const std::string_view lWord = arLine.takeWord(lWords.c_str());
    for (const auto& [lrName, lrValue] : acrChoices) {
        if (lrName == lWord) {
            return lrValue;
        }
    }
    refuseSim(std::string(arLine.getDirective()) + " takes " + lWords + ", not " + quoteSimWord(lWord));
}

#endif
