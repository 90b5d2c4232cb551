#include "sensor/client/include/NumberText.h"

std::string formatNumber(std::uint64_t aNumber) {
    std::string lText = std::to_string(aNumber);
    for (std::size_t i = lText.size(); i > 3;) {
        i -= 3;
        lText.insert(i, ",");
    }
    return lText;
}

std::string formatCount(std::uint64_t aNumber, const std::string& acrOne) {
    return formatNumber(aNumber) + " " + acrOne + (aNumber == 1 ? "" : "s");
}

std::string formatRanges(const std::vector<std::uint32_t>& acrNumbers) {
    std::string lText;
    for (std::size_t i = 0; i < acrNumbers.size();) {
        std::size_t lLast = i;
        while (lLast + 1 < acrNumbers.size() && acrNumbers[lLast + 1] == acrNumbers[lLast] + 1) {
            ++lLast;
        }
        lText += (lText.empty() ? "" : ",") + std::to_string(acrNumbers[i]);
        if (lLast != i) {
            lText += (lLast == i + 1 ? "," : "-") + std::to_string(acrNumbers[lLast]);
        }
        i = lLast + 1;
    }
    return lText;
}
