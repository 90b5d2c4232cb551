#include <gmock/gmock.h>

#include "tests/unit/commands/TavikProgram.h"

using testing::HasSubstr;

class WrongUse : public TavikProgram {};

TEST_F(WrongUse, Is2InOneLineWithoutOutput) {
    fill();
    const std::vector<std::string> lLines[] = {
        {"no-such-command"},
        {"--no-such-option"},
        {"status", "events"},
        {"events", "--kind"},
        {"events", "--kind", "queue-ful"},
        {"events", "--kind", "rscn", "--kind", "nothing"},
        {"ports", "--kind", "nothing"},
        {"events", "--lun", "-1"},
        {"events", "--lun", "four"},
        {"events", "--limit", "many"},
        {"events", "--since", "no such mark"},
        {"events", "--until", "2026-02-30"},
        {"events", "--since", "1h", "--until", "2h"},
        {"events", "--follow", "--since", "1h", "--until", "2h"},
        {"events", "--records", "--since", "1h", "--until", "2h"},
        {"ports", "--since", "1h", "--until", "2h"},
        {"explain", "--since", "1h", "--until", "2h"},
        {"diff", "1h", "2h"},
        {"events", "--port", "nobody"},
        {"events", "--initiator", "host99"},
        {"events", "--no-such"},
        {"explain", "no-such-thing"},
        {"explain", "999999"},
        {"explain", "rscn", "link"},
        {"mark"},
        {"mark", ""},
        {"mark", "10m"},
        {"mark", "line\nbreak"},
        {"mark", std::string(65, 'x')},
        {"status", "--watch"},
        {"--json", "status", "--watch"},
        {"--config", "/no/such/file.toml"},
        {"--config", ""},
    };
    for (const std::vector<std::string>& lrLine : lLines) {
        SCOPED_TRACE(testing::PrintToString(lrLine));
        const ZTSFinishedRun lRun = run(lrLine);
        EXPECT_EQ(lRun.mStatus, 2);
        EXPECT_EQ(lRun.mOutput, "");
        expectOneLine(lRun);
    }
}

TEST_F(WrongUse, ABadConfigurationNamesFileLineAndKey) {
    writeFile(mDirectory.path("bad.toml"), "[collect]\nperiod = 0\nnonsense = 1\n");
    const ZTSFinishedRun lRun = run({"--config", mDirectory.path("bad.toml"), "events"});
    EXPECT_EQ(lRun.mStatus, 2);
    expectOneLine(lRun);
    EXPECT_THAT(lRun.mErrors, HasSubstr(mDirectory.path("bad.toml") + ":2: collect.period: "));
    EXPECT_THAT(lRun.mErrors, HasSubstr("and 1 more"));
}

TEST_F(WrongUse, WithoutAHistoryCommandsSaySoWith3) {
    for (const char* lpCommand : {"events", "ports"}) {
        const ZTSFinishedRun lRun = run({lpCommand});
        EXPECT_EQ(lRun.mStatus, 3);
        EXPECT_EQ(lRun.mOutput, "");
        expectOneLine(lRun);
        EXPECT_THAT(lRun.mErrors, HasSubstr("no history yet"));
    }
}

TEST_F(WrongUse, AHistoryThatCannotBeReachedIsNotSaidToBeMissing) {
    writeFile(mDirectory.path("file"), "");
    writeFile(mDirectory.path("behind.toml"), "sensor.state = \"" + mDirectory.path("file") + "\"\n");
    const std::vector<std::string> lCommands[] = {{"events"}, {"ports"}, {"events", "--follow"}};
    for (const std::vector<std::string>& lrCommand : lCommands) {
        std::vector<std::string> lLine{"--config", mDirectory.path("behind.toml")};
        lLine.insert(lLine.end(), lrCommand.begin(), lrCommand.end());
        const ZTSFinishedRun lRun = run(lLine);
        EXPECT_EQ(lRun.mStatus, 3);
        expectOneLine(lRun);
        EXPECT_THAT(lRun.mErrors, HasSubstr("the history cannot be read: Not a directory"));
    }
}

TEST_F(WrongUse, HelpAndVersionAre0) {
    for (const char* lpOption : {"--help", "--version"}) {
        const ZTSFinishedRun lRun = run({lpOption});
        EXPECT_EQ(lRun.mStatus, 0);
        EXPECT_NE(lRun.mOutput, "");
    }
    EXPECT_THAT(run({"events", "--help"}).mOutput, HasSubstr("--follow"));
}

TEST_F(WrongUse, OutputThatCannotBeWrittenIs4) {
    const ZTSFinishedRun lRun = runShell("\"$0\" explain deaf > /dev/full");
    EXPECT_EQ(lRun.mStatus, 4);
    expectOneLine(lRun);
}
