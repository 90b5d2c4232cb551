// The history was written by a newer version: every command says so, and what can be done.
#include <gmock/gmock.h>
#include <sqlite3.h>

#include <nlohmann/json.hpp>

#include "sensor/store/include/Store.h"
#include "tests/commands/TavikProgram.h"

using testing::HasSubstr;
using testing::Not;

class NewerHistory : public testing::Test {
protected:
    NewerHistory() {
        { const ZTCStore lStore(mTavik.path("state"), {}, nullptr); }
        sqlite3* lpDatabase = nullptr;
        EXPECT_EQ(sqlite3_open(mTavik.path("state/history.db").c_str(), &lpDatabase), SQLITE_OK);
        EXPECT_EQ(sqlite3_exec(lpDatabase, "PRAGMA user_version = 99", nullptr, nullptr, nullptr), SQLITE_OK);
        EXPECT_EQ(sqlite3_close(lpDatabase), SQLITE_OK);
    }

    ZTCTavikProgram mTavik;
};

TEST_F(NewerHistory, EndsCommandsThatReadItWithStatus2) {
    const std::vector<std::string> lCommands[] = {{"events"},  {"events", "--follow"}, {"ports"},     {"paths"},
                                                  {"explain"}, {"explain", "1"},       {"diff", "1h"}};
    for (const std::vector<std::string>& lrCommand : lCommands) {
        const ZTSTavikRun lRun = mTavik.run(lrCommand);
        EXPECT_EQ(lRun.mExit, 2) << lrCommand.front();
        EXPECT_THAT(lRun.mError, HasSubstr("its schema has version 99")) << lrCommand.front();
        EXPECT_EQ(lRun.mOutput, "") << lrCommand.front();
    }
}

TEST_F(NewerHistory, IsWhatStatusNamesAndNotASensorThatVanished) {
    const ZTSTavikRun lRun = mTavik.run({"status"});
    EXPECT_EQ(lRun.mExit, 3);
    EXPECT_THAT(lRun.mOutput, HasSubstr("NOT COLLECTING; the history is of a newer version"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("Install the newer version again"));
    EXPECT_THAT(lRun.mOutput, Not(HasSubstr("vanished")));
    EXPECT_EQ(nlohmann::json::parse(mTavik.run({"status", "--json"}).mOutput)["state"], "newer-history");
    const ZTSTavikRun lCheck = mTavik.run({"check"});
    EXPECT_EQ(lCheck.mExit, 2);
    EXPECT_THAT(lCheck.mOutput, HasSubstr("TAVIK CRITICAL - NOT COLLECTING; the history is of a newer version"));
}

TEST_F(NewerHistory, IsExplained) {
    const ZTSTavikRun lRun = mTavik.run({"explain", "newer-history"});
    EXPECT_EQ(lRun.mExit, 0);
    EXPECT_THAT(lRun.mOutput, HasSubstr("history.db-wal"));
}
