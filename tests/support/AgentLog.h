/// The agent's log as tests read it.
#ifndef TESTS_SUPPORT_AGENTLOG_H
#define TESTS_SUPPORT_AGENTLOG_H

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tests/support/Waiting.h"

/// One line "YYYY-MM-DD HH:MM:SS.uuuuuu -N- FILE:LINE FUNCTION: TEXT".
struct ZTSLogLine {
    std::string mTimeStamp;
    std::string mMark;
    std::string mLabel;
    unsigned mLine = 0;
    std::string mFunction;
    std::string mText;
};

/// The line's parts, or nothing where it is not of that form.
std::optional<ZTSLogLine> parseLogLine(const std::string& acrLine);

/// Those lines of the text that are of a log line's form.
std::vector<ZTSLogLine> parseLogLines(const std::string& acrText);

class ZTCAgentLog {
public:
    explicit ZTCAgentLog(std::string aPath) : mPath(std::move(aPath)) {}

    const std::string& path() const { return mPath; }

    /// The complete lines that are in the file now, as they stand.
    std::vector<std::string> rawLines() const;
    /// Those of them that are of a log line's form.
    std::vector<ZTSLogLine> lines() const;
    /// How many lines have exactly this text (and this mark, where one is given) now.
    std::size_t count(const std::string& acrText, const std::string& acrMark = "") const;
    bool has(const std::string& acrText, const std::string& acrMark = "") const { return count(acrText, acrMark) != 0; }
    /// Position of the first line from `aFrom` on with exactly this text; nothing where there is none.
    std::optional<std::size_t> find(const std::string& acrText, std::size_t aFrom = 0) const;
    /// The lines whose text contains this.
    std::vector<ZTSLogLine> containing(const std::string& acrPart) const;

    /// Waits until `aCount` lines have exactly this text.
    void waitFor(const std::string& acrText, std::size_t aCount = 1,
                 const ZTCDeadline& acrDeadline = ZTCDeadline()) const;
    /// Waits until a line fulfils the condition and returns it; `acrWhat` names it in the failure.
    ZTSLogLine waitForLine(const std::function<bool(const ZTSLogLine&)>& acrCondition, const std::string& acrWhat,
                           const ZTCDeadline& acrDeadline = ZTCDeadline()) const;

private:
    std::string mPath;
};

#endif
