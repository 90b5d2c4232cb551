/// The calls of the log that stand in a source, read out of its text.
#ifndef TESTS_UNIT_LOGTEXTS_SUPPORT_LOGCALLS_H
#define TESTS_UNIT_LOGTEXTS_SUPPORT_LOGCALLS_H

#include <string>
#include <vector>

struct ZTSLogCall {
    std::string mMark;
    /// The format, or the text where the format is "%s" and the text a literal; an assertion's whole line. Without a
    /// line break at its end. Empty where the call takes its format from elsewhere.
    std::string mText;
};

struct ZTSLogSource {
    std::vector<ZTSLogCall> mCalls;
    std::vector<std::string> mLiterals;  ///< every text in quotes that stands in the source, its neighbours joined
};

/// Reads a source's text. Comments and preprocessor lines do not count; "Entered", "Left" and the like of ZT_ENTRY and
/// ZT_EXIT are not noted.
ZTSLogSource readLogCalls(const std::string& acrSource);

#endif
