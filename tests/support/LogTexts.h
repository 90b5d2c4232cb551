/// Every text that the agent can log, in one table: the tests drive each of them and find it in a log that was really
/// written, and compare the sources with it, so that no text is changed, moved or added unnoticed.
#ifndef TESTS_SUPPORT_LOGTEXTS_H
#define TESTS_SUPPORT_LOGTEXTS_H

#include <vector>

/// Where a text is driven.
enum class ZTELogTextPath {
    Agent,   ///< by the agent itself, over its pipes, its library and its files
    Process  ///< in a test's own process: no path of the agent leads there, or none that can be had at will
};

struct ZTSLogText {
    unsigned mLevel;
    const char* mpMark;
    const char* mpLabel;     ///< the source file; empty for the lines without a place
    const char* mpFunction;  ///< likewise
    const char* mpFormat;    ///< as it stands in the source, an assertion with its condition
    ZTELogTextPath mPath;
};

/// The lines "Entered" and "Left" of every function but the system's constructor are not listed.
const std::vector<ZTSLogText>& logTexts();

#endif
