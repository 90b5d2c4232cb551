#include "libkpm/sim/src/ScenarioFields.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <system_error>
#include <utility>

std::uint64_t readSimNumber(std::string_view aField, std::string_view aText, std::uint64_t aLeast,
                            std::uint64_t aMost) {
    const bool lHex = aText.starts_with("0x") || aText.starts_with("0X");
    const std::string_view lDigits = lHex ? aText.substr(2) : aText;
    std::uint64_t lValue = 0;
    const auto [lpEnd, lError] =
        std::from_chars(lDigits.data(), lDigits.data() + lDigits.size(), lValue, lHex ? 16 : 10);
    const bool lIsWhole = lpEnd == lDigits.data() + lDigits.size();
    if (lDigits.empty() || !lIsWhole || lError == std::errc::invalid_argument) {
        refuseSim(nameSimField(aField) + "takes a number, not " + quoteSimWord(aText));
    }
    if (lError != std::errc() || lValue < aLeast || lValue > aMost) {
        refuseSim(nameSimField(aField) + "takes a number from " + std::to_string(aLeast) + " to " +
                  std::to_string(aMost) + ", not " + quoteSimWord(aText));
    }
    return lValue;
}

std::uint32_t readSimNumber32(std::string_view aField, std::string_view aText) {
    return static_cast<std::uint32_t>(readSimNumber(aField, aText, 0, gcSimMax32));
}

static int sHexDigit(char aChar) {
    if (aChar >= '0' && aChar <= '9') {
        return aChar - '0';
    }
    if (aChar >= 'a' && aChar <= 'f') {
        return aChar - 'a' + 10;
    }
    if (aChar >= 'A' && aChar <= 'F') {
        return aChar - 'A' + 10;
    }
    return -1;
}

/// Pairs of hex digits, with or without a colon between two pairs.
static std::optional<std::vector<std::uint8_t>> sHexBytes(std::string_view aText) {
    std::vector<std::uint8_t> lBytes;
    for (std::size_t lPlace = 0; lPlace < aText.size(); lPlace += 2) {
        if (aText[lPlace] == ':' && lPlace > 0) {
            ++lPlace;
        }
        if (lPlace + 2 > aText.size()) {
            return std::nullopt;
        }
        const int lHigh = sHexDigit(aText[lPlace]);
        const int lLow = sHexDigit(aText[lPlace + 1]);
        if (lHigh < 0 || lLow < 0) {
            return std::nullopt;
        }
        lBytes.push_back(static_cast<std::uint8_t>(lHigh * 16 + lLow));
    }
    return lBytes;
}

std::vector<std::uint8_t> readSimBytes(std::string_view aField, std::string_view aText, std::size_t aMost) {
    std::optional<std::vector<std::uint8_t>> lBytes = sHexBytes(aText);
    if (!lBytes) {
        refuseSim(nameSimField(aField) + "takes pairs of hex digits, not " + quoteSimWord(aText));
    }
    if (lBytes->size() > aMost) {
        refuseSim(nameSimField(aField) + "takes at most " + std::to_string(aMost) + " bytes, not " +
                  std::to_string(lBytes->size()));
    }
    return std::move(*lBytes);
}

std::optional<HBA_wwn> findSimWwn(std::string_view aText) {
    if (aText.size() != 23 || aText[2] != ':') {
        return std::nullopt;
    }
    const std::optional<std::vector<std::uint8_t>> lBytes = sHexBytes(aText);
    if (!lBytes || lBytes->size() != sizeof(HBA_wwn::wwn)) {
        return std::nullopt;
    }
    HBA_wwn lWwn{};
    std::copy(lBytes->begin(), lBytes->end(), lWwn.wwn);
    return lWwn;
}

const ZTSSimPort* findSimPort(const std::vector<ZTSSimPort>& acrPorts, std::string_view aName) {
    const auto lFound = std::find_if(acrPorts.begin(), acrPorts.end(),
                                     [&](const ZTSSimPort& acrPort) { return acrPort.mName == aName; });
    return lFound == acrPorts.end() ? nullptr : &*lFound;
}

HBA_wwn readSimWwn(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario,
                   bool aIsNodeName) {
    if (const std::optional<HBA_wwn> lWwn = findSimWwn(aText)) {
        return *lWwn;
    }
    const ZTSSimPort* lpPort = findSimPort(acrScenario.mAdapters, aText);
    if (lpPort == nullptr) {
        lpPort = findSimPort(acrScenario.mPorts, aText);
    }
    if (lpPort == nullptr) {
        refuseSim(nameSimField(aField) +
                  "takes a world wide name (30:00:00:00:00:00:00:01) or the name of an adapter or a port, not " +
                  quoteSimWord(aText));
    }
    return aIsNodeName ? lpPort->mWwnn : lpPort->mWwpn;
}

void checkSimListSize(std::string_view aField, std::size_t aSize) {
    if (aSize > gcSimMaxListSize) {
        refuseSim(nameSimField(aField) + "lists more than " + std::to_string(gcSimMaxListSize) + " values");
    }
}

std::vector<std::uint32_t> readSimNumberList(std::string_view aField, std::string_view aText, std::uint32_t aMost) {
    std::vector<std::uint32_t> lNumbers;
    forEachSimPart(aField, aText, [&](std::string_view aPart) {
        if (aPart == "all" || aPart == "unknown") {
            if (aMost != gcSimMax32) {
                refuseSim(nameSimField(aField) + "takes a number from 0 to " + std::to_string(aMost) + ", not " +
                          quoteSimWord(aPart));
            }
            lNumbers.push_back(gcSimMax32);
            checkSimListSize(aField, lNumbers.size());
            return;
        }
        const std::size_t lDash = aPart.find('-', 1);
        const std::uint64_t lFirst = readSimNumber(aField, aPart.substr(0, lDash), 0, aMost);
        const std::uint64_t lLast =
            lDash == std::string_view::npos ? lFirst : readSimNumber(aField, aPart.substr(lDash + 1), 0, aMost);
        if (lLast < lFirst) {
            refuseSim(nameSimField(aField) + "has the range " + quoteSimWord(aPart) + " that ends before it begins");
        }
        for (std::uint64_t lNumber = lFirst; lNumber <= lLast; ++lNumber) {
            lNumbers.push_back(static_cast<std::uint32_t>(lNumber));
            checkSimListSize(aField, lNumbers.size());
        }
    });
    return lNumbers;
}

std::uint32_t readSimBoard(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario) {
    const std::vector<ZTSSimPort>& lrAdapters = acrScenario.mAdapters;
    if (const ZTSSimPort* lpAdapter = findSimPort(lrAdapters, aText)) {
        return static_cast<std::uint32_t>(lpAdapter - lrAdapters.data());
    }
    if (aText.front() < '0' || aText.front() > '9') {
        refuseSim(nameSimField(aField) + "names " + quoteSimWord(aText) +
                  ", which is not an adapter of the lines above");
    }
    const std::uint32_t lBoard = readSimNumber32(aField, aText);
    if (lBoard >= lrAdapters.size()) {
        refuseSim(nameSimField(aField) + "names the board " + std::to_string(lBoard) + ", but the lines above have " +
                  std::to_string(lrAdapters.size()) + " adapters");
    }
    return lBoard;
}

ZTSSimBoards takeSimBoards(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault) {
    const std::optional<std::string_view> lText = arLine.take("board");
    ZTSSimBoards lBoards;
    if (lText ? *lText == "all" : aAllByDefault) {
        lBoards.mAll = true;
        return lBoards;
    }
    forEachSimPart("board", lText.value_or("0"), [&](std::string_view aPart) {
        lBoards.mBoards.push_back(readSimBoard("board", aPart, acrScenario));
        checkSimListSize("board", lBoards.mBoards.size());
    });
    return lBoards;
}

std::vector<ZTSSimPort> takeSimPorts(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault) {
    const std::vector<ZTSSimPort>& lrDeclared = acrScenario.mPorts;
    const std::optional<std::string_view> lText = arLine.take("port");
    std::vector<ZTSSimPort> lPorts;
    if (lText ? *lText == "all" : aAllByDefault) {
        lPorts = lrDeclared;
    } else if (!lText) {
        lPorts.assign(lrDeclared.begin(), lrDeclared.begin() + (lrDeclared.empty() ? 0 : 1));
    } else {
        forEachSimPart("port", *lText, [&](std::string_view aPart) {
            if (const ZTSSimPort* lpPort = findSimPort(lrDeclared, aPart)) {
                lPorts.push_back(*lpPort);
            } else if (const std::optional<HBA_wwn> lWwn = findSimWwn(aPart)) {
                const auto lKnown = std::find_if(lrDeclared.begin(), lrDeclared.end(), [&](const ZTSSimPort& acrPort) {
                    return std::equal(std::begin(lWwn->wwn), std::end(lWwn->wwn), std::begin(acrPort.mWwpn.wwn));
                });
                lPorts.push_back(lKnown != lrDeclared.end() ? *lKnown : ZTSSimPort{std::string(aPart), *lWwn, {}, 0});
            } else {
                refuseSim("port= names " + quoteSimWord(aPart) +
                          ", which is neither a port of the lines above nor a world wide name");
            }
            checkSimListSize("port", lPorts.size());
        });
    }
    if (lPorts.empty()) {
        lPorts.emplace_back();
    }
    return lPorts;
}

std::uint64_t takeSimNumber(ZTCSimLine& arLine, std::string_view aField, std::uint64_t aLeast, std::uint64_t aMost,
                            std::uint64_t aDefault) {
    const std::optional<std::string_view> lText = arLine.take(aField);
    return lText ? readSimNumber(aField, *lText, aLeast, aMost) : aDefault;
}

HBA_wwn takeSimWwn(ZTCSimLine& arLine, std::string_view aField) {
    const std::string_view lText = arLine.takeRequired(aField);
    const std::optional<HBA_wwn> lWwn = findSimWwn(lText);
    if (!lWwn) {
        refuseSim(nameSimField(aField) + "takes a world wide name (30:00:00:00:00:00:00:01), not " +
                  quoteSimWord(lText));
    }
    return *lWwn;
}

std::optional<std::size_t> takeSimKind(ZTCSimLine& arLine) {
    const std::string_view lName = arLine.takeWord("an event kind, or all");
    const std::optional<std::size_t> lKind = findKindIndex(lName);
    if (!lKind && lName != "all") {
        refuseSim(quoteSimWord(lName) + " is not an event kind");
    }
    return lKind;
}
