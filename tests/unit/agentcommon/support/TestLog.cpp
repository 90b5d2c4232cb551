#include "tests/unit/agentcommon/support/TestLog.h"

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include "common/include/Log.h"
#include "tests/support/TemporaryDirectory.h"

ZTCTestLog::ZTCTestLog(const std::string& acrPath) : mPath(acrPath) {
    setLogCode(gcDefaultLogCode);
    setLogFilePath(mPath.c_str());
    forget();
}

ZTCTestLog::~ZTCTestLog() {
    setLogCode(gcDefaultLogCode);
}

std::vector<ZTSLogLine> ZTCTestLog::lines() const {
    const std::string lContent = readFileFrom(mPath, mOffset);
    std::vector<ZTSLogLine> lLines;
    std::size_t lBegin = 0;
    for (std::size_t lEnd = lContent.find('\n', lBegin); lEnd != std::string::npos;
         lEnd = lContent.find('\n', lBegin)) {
        const std::string lLine = lContent.substr(lBegin, lEnd - lBegin);
        const std::optional<ZTSLogLine> lParsed = parseLogLine(lLine);
        if (!lParsed) {
            throw std::runtime_error("not a log line: " + lLine);
        }
        lLines.push_back(*lParsed);
        lBegin = lEnd + 1;
    }
    return lLines;
}

std::vector<std::string> ZTCTestLog::texts(const std::string& acrMark, const std::string& acrLabel) const {
    std::vector<std::string> lTexts;
    for (const ZTSLogLine& lcrLine : lines()) {
        if ((acrMark.empty() || lcrLine.mMark == acrMark) && (acrLabel.empty() || lcrLine.mLabel == acrLabel)) {
            lTexts.push_back(markedTextOf(lcrLine));
        }
    }
    return lTexts;
}

std::size_t ZTCTestLog::count(const std::string& acrMarkedText) const {
    const std::vector<std::string> lTexts = texts();
    return static_cast<std::size_t>(std::count(lTexts.begin(), lTexts.end(), acrMarkedText));
}

std::optional<ZTSLogLine> ZTCTestLog::find(const std::string& acrMarkedText) const {
    for (const ZTSLogLine& lcrLine : lines()) {
        if (markedTextOf(lcrLine) == acrMarkedText) {
            return lcrLine;
        }
    }
    return std::nullopt;
}

void ZTCTestLog::forget() {
    std::error_code lError;
    const std::uintmax_t lSize = std::filesystem::file_size(mPath, lError);
    mOffset = lError ? 0 : lSize;
}

void ZTCTestLog::sendToStandardError() {
    // The log refuses a directory and says its lines on standard error.
    setLogFilePath("/");
}
