/// What the tests of the log's sink share: a sink with a file of the test's own, a clock that the test moves, and
/// standard error in the test's hands.

#ifndef TESTS_UNIT_COMMON_LOGSINKTESTING_H
#define TESTS_UNIT_COMMON_LOGSINKTESTING_H

#include <gtest/gtest.h>

#include <cstdarg>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <system_error>
#include <vector>

#include "common/include/LogSink.h"
#include "tests/unit/common/LogTesting.h"

using Lines = std::vector<std::string>;

/// What the sink's clock shows, in milliseconds.
inline std::uint64_t gNowMs = 0;

/// Writes a line of mark and text alone.
void writeTo(ZTCLogSink& arSink, const char* apFormat, ...) __attribute__((format(printf, 2, 3)));
inline void writeTo(ZTCLogSink& arSink, const char* apFormat, ...) {
    ZTCLogLine lLine("-M-");
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    lLine.finish(apFormat, lArguments);
    va_end(lArguments);
    arSink.write(lLine);
}

/// The lines of a file; those that the log has written about itself as mark and text alone.
inline Lines sinkLines(const std::string& acrPath) {
    Lines lLines;
    for (const std::string& lrLine : linesOfFile(acrPath)) {
        const std::string lText = withoutLineNumber(withoutStamp(lrLine));
        const bool lIsOwn = lText.starts_with("-W- common/src/LogSink:# ");
        lLines.push_back(lIsOwn ? "-W- " + lText.substr(lText.find(": ") + 2) : lrLine);
    }
    return lLines;
}

/// The descriptors of this process that lead to the file.
inline std::vector<int> descriptorsOf(const std::string& acrPath) {
    std::vector<int> lDescriptors;
    for (const auto& lrEntry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code lError;
        if (std::filesystem::read_symlink(lrEntry.path(), lError) == std::filesystem::canonical(acrPath)) {
            lDescriptors.push_back(std::stoi(lrEntry.path().filename().string()));
        }
    }
    return lDescriptors;
}

class ZTCLogSinkFixture : public testing::Test {
protected:
    ZTCLogSinkFixture() {
        gNowMs = 1000000;
        mpSink->setClock([]() noexcept { return gNowMs; });
        setLogCode(gcDefaultLogCode);
    }
    ~ZTCLogSinkFixture() override {
        mpSink->close();
        setLogCode(gcDefaultLogCode);
    }

    std::string lostReport(unsigned aCount, const std::string& acrReason) const {
        return "-W- " + std::to_string(aCount) + " log lines could not be written to '" + mPath +
               "' and went to standard error: " + acrReason;
    }

    ZTCTemporaryDirectory mDirectory;
    std::string mPath = mDirectory.path("log");
    ZTCCapturedStandardError mStandardError;
    std::unique_ptr<ZTCLogSink> mpSink = std::make_unique<ZTCLogSink>();
};

#endif
