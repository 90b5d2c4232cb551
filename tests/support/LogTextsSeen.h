/// Finds the rows of the table of log texts that lines of a log belong to.
#ifndef TESTS_SUPPORT_LOGTEXTSSEEN_H
#define TESTS_SUPPORT_LOGTEXTSSEEN_H

#include <cstddef>
#include <set>
#include <string>
#include <vector>

#include "tests/support/AgentLog.h"
#include "tests/support/LogTexts.h"

/// Whether a line has a text of this format.
bool isOfFormat(const std::string& acrText, const std::string& acrFormat);

/// Takes log lines and notes which rows of the table they belong to.
class ZTCLogTextsSeen {
public:
    void add(const std::vector<std::string>& acrRawLines);

    /// The rows of this path that no line belonged to, one text each.
    std::vector<std::string> unseen(ZTELogTextPath aPath) const;
    /// The lines that belong to no row, each once, without time and line number.
    const std::set<std::string>& strangers() const { return mStrangers; }

private:
    std::set<std::size_t> mSeen;
    std::set<std::string> mStrangers;
};

#endif
