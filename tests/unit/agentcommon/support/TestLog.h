/// The log of this very process, as a test reads it back.
#ifndef TESTS_UNIT_AGENTCOMMON_SUPPORT_TESTLOG_H
#define TESTS_UNIT_AGENTCOMMON_SUPPORT_TESTLOG_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "tests/support/AgentLog.h"

/// "-N- TEXT", for comparison.
inline std::string markedTextOf(const ZTSLogLine& acrLine) {
    return acrLine.mMark + " " + acrLine.mText;
}

class ZTCTestLog {
public:
    /// Directs the log to this file, with the log code of a fresh process.
    explicit ZTCTestLog(const std::string& acrPath);
    /// Puts the log code back.
    ~ZTCTestLog();
    ZTCTestLog(const ZTCTestLog&) = delete;
    ZTCTestLog& operator=(const ZTCTestLog&) = delete;

    /// The lines since the last forget(). Throws std::runtime_error where one is not of a log line's form.
    std::vector<ZTSLogLine> lines() const;
    /// Their marked texts; with a mark those with this mark alone, with a label those of this file alone.
    std::vector<std::string> texts(const std::string& acrMark = "", const std::string& acrLabel = "") const;
    /// How many have exactly this marked text.
    std::size_t count(const std::string& acrMarkedText) const;
    bool has(const std::string& acrMarkedText) const { return count(acrMarkedText) != 0; }
    std::optional<ZTSLogLine> find(const std::string& acrMarkedText) const;
    void forget();

    /// From here on every line goes to standard error, where a test that watches a process die can see it.
    static void sendToStandardError();

private:
    std::string mPath;
    std::size_t mOffset = 0;
};

#endif
