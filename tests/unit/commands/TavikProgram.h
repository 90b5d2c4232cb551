/// The program `tavik` in a directory of its own, with a history that tests fill.
#ifndef TESTS_UNIT_COMMANDS_TAVIKPROGRAM_H
#define TESTS_UNIT_COMMANDS_TAVIKPROGRAM_H

#include <gtest/gtest.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "sensor/store/include/Store.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/store/Frames.h"

class TavikProgram : public testing::Test {
protected:
    TavikProgram();

    struct ZTSFinishedRun {
        int mStatus;
        std::string mOutput;
        std::string mErrors;
    };

    ZTSChildProcessSetup setup(const std::vector<std::string>& acrArguments);
    ZTSFinishedRun run(const std::vector<std::string>& acrArguments);
    /// The program as "$0" of a shell's script.
    ZTSFinishedRun runShell(const std::string& acrScript);
    /// Runs with --json, expects status 0, and gives the document.
    nlohmann::json runJson(std::vector<std::string> aArguments);

    std::string controlPath() const { return mDirectory.path("run/control"); }
    std::string statePath() const { return mDirectory.path("state"); }

    /// The history's writer, made when it is first asked for.
    ZTCStore& store();
    /// Takes in one frame with these records.
    void takeIn(const std::vector<ZTSTestRecord>& acrRecords, std::uint64_t aLocalPort = gcLocalPort);
    /// Two episodes of port A (queue-full on LUNs 3 and 4, 5 times; a logo), one of port B of another initiator.
    void fill();

    /// That exactly one line was printed on standard error, by the program.
    static void expectOneLine(const ZTSFinishedRun& acrRun);

    const ZTCTemporaryDirectory mDirectory;

private:
    std::unique_ptr<ZTCStore> mpStore;
    std::uint64_t mFrames = 0;
    int mRuns = 0;
};

#endif
