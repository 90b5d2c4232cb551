#include "libkpm/linux/src/NetworkNamespace.h"

#include <algorithm>
#include <charconv>
#include <cstdint>

/// Takes the next word off a line; empty where there is none.
static std::string_view sTakeWord(std::string_view& arLine) {
    arLine.remove_prefix(std::min(arLine.find_first_not_of(' '), arLine.size()));
    const std::size_t lEnd = std::min(arLine.find(' '), arLine.size());
    const std::string_view lWord = arLine.substr(0, lEnd);
    arLine.remove_prefix(lEnd);
    return lWord;
}

static std::optional<std::uint64_t> sTakeNumber(std::string_view& arLine) {
    const std::string_view lWord = sTakeWord(arLine);
    std::uint64_t lNumber = 0;
    const auto [lpEnd, lError] = std::from_chars(lWord.data(), lWord.data() + lWord.size(), lNumber);
    if (lError != std::errc() || lpEnd != lWord.data() + lWord.size()) {
        return std::nullopt;
    }
    return lNumber;
}

std::optional<bool> hasKernelSocket(std::string_view aTable, unsigned aFamily) {
    bool lIsHeader = true;
    while (!aTable.empty()) {
        const std::size_t lEnd = std::min(aTable.find('\n'), aTable.size());
        std::string_view lLine = aTable.substr(0, lEnd);
        aTable.remove_prefix(std::min(lEnd + 1, aTable.size()));
        sTakeWord(lLine);  // the address of the socket
        if (lIsHeader) {
            if (sTakeWord(lLine) != "Eth" || sTakeWord(lLine) != "Pid") {
                return std::nullopt;
            }
            lIsHeader = false;
            continue;
        }
        const std::optional<std::uint64_t> lFamily = sTakeNumber(lLine);
        const std::optional<std::uint64_t> lSender = sTakeNumber(lLine);
        if (lFamily == aFamily && lSender == 0u) {
            return true;
        }
    }
    return lIsHeader ? std::nullopt : std::optional(false);
}
