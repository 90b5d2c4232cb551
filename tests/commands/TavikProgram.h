/// Runs the built `tavik` with a configuration and folders of a test's own.
#ifndef TESTS_COMMANDS_TAVIKPROGRAM_H
#define TESTS_COMMANDS_TAVIKPROGRAM_H

#include <map>
#include <string>
#include <vector>

#include "tests/support/TemporaryDirectory.h"

struct ZTSTavikRun {
    int mExit = -1;
    std::string mOutput;
    std::string mError;
};

class ZTCTavikProgram {
public:
    /// @param acrMore  lines of the configuration behind those of the folders
    explicit ZTCTavikProgram(const std::string& acrMore = {});

    ZTSTavikRun run(const std::vector<std::string>& acrArguments);
    std::string path(const std::string& acrName) const { return mDirectory.path(acrName); }
    void setVariable(const std::string& acrName, const std::string& acrValue) { mEnvironment[acrName] = acrValue; }

private:
    ZTCTemporaryDirectory mDirectory;
    std::map<std::string, std::string> mEnvironment;
    unsigned mRuns = 0;
};

#endif
