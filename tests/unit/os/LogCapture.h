/// Sends the log of the code under test to a file of the test's own, with every level on.
#ifndef TESTS_UNIT_OS_LOGCAPTURE_H
#define TESTS_UNIT_OS_LOGCAPTURE_H

#include "common/include/Log.h"
#include "tests/support/AgentLog.h"
#include "tests/support/TemporaryDirectory.h"

class ZTCLogCapture {
public:
    explicit ZTCLogCapture(unsigned aLogCode = 255) : mFile(mDirectory.path("test.log")) {
        setLogFilePath(mFile.path().c_str());
        setLogCode(aLogCode);
    }
    ~ZTCLogCapture() {
        setLogFilePath("/dev/null");
        setLogCode(gcDefaultLogCode);
    }
    ZTCLogCapture(const ZTCLogCapture&) = delete;
    ZTCLogCapture& operator=(const ZTCLogCapture&) = delete;

    const ZTCAgentLog& file() const { return mFile; }

    /// How many lines have this mark.
    std::size_t countMark(const std::string& acrMark) const {
        std::size_t lCount = 0;
        for (const ZTSLogLine& lcrLine : mFile.lines()) {
            lCount += lcrLine.mMark == acrMark ? 1 : 0;
        }
        return lCount;
    }

private:
    ZTCTemporaryDirectory mDirectory;
    ZTCAgentLog mFile;
};

#endif
