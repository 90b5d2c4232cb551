/// What the tests of the log share: the lines of a file, captured standard error.

#ifndef TESTS_UNIT_COMMON_LOGTESTING_H
#define TESTS_UNIT_COMMON_LOGTESTING_H

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <sstream>
#include <string>
#include <string_view>
#include <vector>

#include "tests/support/TemporaryDirectory.h"

/// The lines of a text, without their line breaks.
inline std::vector<std::string> linesOf(const std::string& acrText) {
    std::vector<std::string> lLines;
    std::istringstream lStream(acrText);
    for (std::string lLine; std::getline(lStream, lLine);) {
        lLines.push_back(lLine);
    }
    return lLines;
}

inline std::vector<std::string> linesOfFile(const std::string& acrPath) {
    return linesOf(readFile(acrPath));
}

/// The part of a line behind its time stamp; empty where the line does not begin with one.
inline std::string withoutStamp(const std::string& acrLine) {
    static constexpr std::string_view scPattern = "dddd-dd-dd dd:dd:dd.dddddd ";
    if (acrLine.size() < scPattern.size()) {
        return "";
    }
    for (std::size_t i = 0; i < scPattern.size(); ++i) {
        const bool lFits = scPattern[i] == 'd' ? acrLine[i] >= '0' && acrLine[i] <= '9' : acrLine[i] == scPattern[i];
        if (!lFits) {
            return "";
        }
    }
    return acrLine.substr(scPattern.size());
}

/// The line with # for the number of its source line.
inline std::string withoutLineNumber(const std::string& acrLine) {
    const std::size_t lBegin = acrLine.find(':') + 1;
    const std::size_t lEnd = acrLine.find_first_not_of("0123456789", lBegin);
    const bool lIsNumber = lBegin != 0 && lEnd != lBegin && lEnd != std::string::npos && acrLine[lEnd] == ' ';
    return lIsNumber ? acrLine.substr(0, lBegin) + "#" + acrLine.substr(lEnd) : acrLine;
}

/// Standard error goes into a pipe while the object lives: a pipe, since no limit on file sizes holds for it.
class ZTCCapturedStandardError {
public:
    ZTCCapturedStandardError() {
        EXPECT_EQ(0, pipe2(mPipe, O_CLOEXEC | O_NONBLOCK));
        mFormer = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3);
        dup2(mPipe[1], STDERR_FILENO);
    }
    ZTCCapturedStandardError(const ZTCCapturedStandardError&) = delete;
    ZTCCapturedStandardError& operator=(const ZTCCapturedStandardError&) = delete;
    ~ZTCCapturedStandardError() {
        dup2(mFormer, STDERR_FILENO);
        close(mFormer);
        close(mPipe[0]);
        close(mPipe[1]);
    }

    /// What was written since the last call.
    std::string take() {
        std::string lText;
        char lBytes[4096];
        for (ssize_t lCount = 0; (lCount = read(mPipe[0], lBytes, sizeof(lBytes))) > 0;) {
            lText.append(lBytes, static_cast<std::size_t>(lCount));
        }
        return lText;
    }

    /// Closes the reading end, so that further writes fail.
    void closeReader() {
        close(mPipe[0]);
        mPipe[0] = open("/dev/null", O_RDONLY | O_CLOEXEC);
    }

private:
    int mPipe[2] = {-1, -1};
    int mFormer = -1;
};

#endif
