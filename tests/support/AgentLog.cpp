#include "tests/support/AgentLog.h"

#include <algorithm>

#include "tests/support/TemporaryDirectory.h"

static bool sIsTimeStamp(const std::string& acrText) {
    const std::string lPattern = "dddd-dd-dd dd:dd:dd.dddddd";
    return acrText.size() == lPattern.size() &&
           std::equal(acrText.begin(), acrText.end(), lPattern.begin(), [](char aChar, char aPattern) {
               return aPattern == 'd' ? aChar >= '0' && aChar <= '9' : aChar == aPattern;
           });
}

std::optional<ZTSLogLine> parseLogLine(const std::string& acrLine) {
    // Positions, not a regular expression: storms leave logs of many thousand lines.
    constexpr std::size_t lcStampLength = 26;
    if (acrLine.size() < lcStampLength + 6 || !sIsTimeStamp(acrLine.substr(0, lcStampLength)) ||
        acrLine[lcStampLength] != ' ') {
        return std::nullopt;
    }
    ZTSLogLine lParsed;
    lParsed.mTimeStamp = acrLine.substr(0, lcStampLength);
    lParsed.mMark = acrLine.substr(lcStampLength + 1, 3);
    if (lParsed.mMark[0] != '-' || lParsed.mMark[2] != '-' || acrLine[lcStampLength + 4] != ' ') {
        return std::nullopt;
    }
    const std::size_t lPlace = lcStampLength + 5;
    const std::size_t lColon = acrLine.find(':', lPlace);
    const std::size_t lBlank = acrLine.find(' ', lPlace);
    if (lColon == std::string::npos || lBlank == std::string::npos || lBlank < lColon + 2) {
        return std::nullopt;
    }
    lParsed.mLabel = acrLine.substr(lPlace, lColon - lPlace);
    const std::string lNumber = acrLine.substr(lColon + 1, lBlank - lColon - 1);
    if (lNumber.size() > 6 ||
        !std::all_of(lNumber.begin(), lNumber.end(), [](char c) { return c >= '0' && c <= '9'; })) {
        return std::nullopt;
    }
    lParsed.mLine = static_cast<unsigned>(std::stoul(lNumber));
    const std::size_t lEnd = acrLine.find(": ", lBlank + 1);
    if (lEnd == std::string::npos) {
        return std::nullopt;
    }
    lParsed.mFunction = acrLine.substr(lBlank + 1, lEnd - lBlank - 1);
    lParsed.mText = acrLine.substr(lEnd + 2);
    return lParsed;
}

static std::vector<std::string> sCompleteLines(const std::string& acrText) {
    std::vector<std::string> lLines;
    std::size_t lBegin = 0;
    for (std::size_t lEnd = acrText.find('\n'); lEnd != std::string::npos; lEnd = acrText.find('\n', lBegin)) {
        lLines.push_back(acrText.substr(lBegin, lEnd - lBegin));
        lBegin = lEnd + 1;
    }
    return lLines;
}

std::vector<ZTSLogLine> parseLogLines(const std::string& acrText) {
    std::vector<ZTSLogLine> lLines;
    for (const std::string& lcrLine : sCompleteLines(acrText)) {
        if (const auto lParsed = parseLogLine(lcrLine)) {
            lLines.push_back(*lParsed);
        }
    }
    return lLines;
}

std::vector<std::string> ZTCAgentLog::rawLines() const {
    return sCompleteLines(readFile(mPath));
}

std::vector<ZTSLogLine> ZTCAgentLog::lines() const {
    return parseLogLines(readFile(mPath));
}

std::size_t ZTCAgentLog::count(const std::string& acrText, const std::string& acrMark) const {
    const auto lLines = lines();
    return static_cast<std::size_t>(std::count_if(lLines.begin(), lLines.end(), [&](const ZTSLogLine& acrLine) {
        return acrLine.mText == acrText && (acrMark.empty() || acrLine.mMark == acrMark);
    }));
}

std::optional<std::size_t> ZTCAgentLog::find(const std::string& acrText, std::size_t aFrom) const {
    const auto lLines = lines();
    for (std::size_t i = aFrom; i < lLines.size(); ++i) {
        if (lLines[i].mText == acrText) {
            return i;
        }
    }
    return std::nullopt;
}

std::vector<ZTSLogLine> ZTCAgentLog::containing(const std::string& acrPart) const {
    std::vector<ZTSLogLine> lFound;
    for (const ZTSLogLine& lcrLine : lines()) {
        if (lcrLine.mText.find(acrPart) != std::string::npos) {
            lFound.push_back(lcrLine);
        }
    }
    return lFound;
}

void ZTCAgentLog::waitFor(const std::string& acrText, std::size_t aCount, const ZTCDeadline& acrDeadline) const {
    waitUntil([&] { return count(acrText) >= aCount; },
              std::to_string(aCount) + " log line(s) \"" + acrText + "\" in " + mPath, acrDeadline);
}

ZTSLogLine ZTCAgentLog::waitForLine(const std::function<bool(const ZTSLogLine&)>& acrCondition,
                                    const std::string& acrWhat, const ZTCDeadline& acrDeadline) const {
    ZTSLogLine lFound;
    waitUntil(
        [&] {
            const auto lLines = lines();
            const auto lPosition = std::find_if(lLines.begin(), lLines.end(), acrCondition);
            if (lPosition == lLines.end()) {
                return false;
            }
            lFound = *lPosition;
            return true;
        },
        "a log line: " + acrWhat + " in " + mPath, acrDeadline);
    return lFound;
}
