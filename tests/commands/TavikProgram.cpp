#include "tests/commands/TavikProgram.h"

#include <filesystem>

#include "tests/support/ChildProcess.h"

ZTCTavikProgram::ZTCTavikProgram(const std::string& acrMore) {
    for (const char* const lpFolder : {"run", "state"}) {
        std::filesystem::create_directory(path(lpFolder));
    }
    writeFile(path("tavik.toml"), "[agent]\nlog = \"" + path("agent.log") + "\"\n[sensor]\ndirectory = \"" +
                                      path("run") + "\"\nstate = \"" + path("state") + "\"\n" + acrMore);
    mEnvironment = {{"PATH", "/usr/sbin:/usr/bin:/sbin:/bin"}, {"TAVIK_CONFIG", path("tavik.toml")}, {"TZ", "UTC"}};
}

ZTSTavikRun ZTCTavikProgram::run(const std::vector<std::string>& acrArguments) {
    ZTCChildProcess lChild({.mProgram = TAVIK_PROGRAM,
                            .mArguments = acrArguments,
                            .mEnvironment = mEnvironment,
                            .mWorkingDirectory = mDirectory.path(),
                            .mOutputPrefix = path("run-" + std::to_string(++mRuns))});
    ZTSTavikRun lRun;
    lRun.mExit = lChild.waitForExit();
    lRun.mOutput = lChild.standardOutput();
    lRun.mError = lChild.standardError();
    return lRun;
}
