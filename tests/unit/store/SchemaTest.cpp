// Versions of the schema, damaged databases, and files as operators see them.
#include "sensor/store/src/Schema.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <map>

#include "sensor/store/src/DamageCheck.h"
#include "tests/unit/store/Damage.h"
#include "tests/unit/store/Integrity.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

class SchemaTest : public ZTCStoreTest {
protected:
    std::vector<std::string> files() const {
        std::vector<std::string> lNames;
        for (const auto& lrEntry : std::filesystem::directory_iterator(mDirectory.path())) {
            lNames.push_back(lrEntry.path().filename());
        }
        std::ranges::sort(lNames);
        return lNames;
    }
    void execute(const std::string& acrSql) {
        ZTCDatabase lDatabase(path(), ZTDA_ReadWrite);
        lDatabase.execute(acrSql.c_str());
    }
};

}  // namespace

TEST_F(SchemaTest, ANewDatabaseHasTheSettingsThatItsUpkeepNeeds) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    EXPECT_EQ(queryNumber(path(), "PRAGMA auto_vacuum"), 2) << "incremental";
    EXPECT_EQ(queryText(path(), "PRAGMA journal_mode"), "wal");
    EXPECT_EQ(queryNumber(path(), "PRAGMA user_version"), static_cast<std::int64_t>(getSchemaSteps().size()));
    for (const char* const lpEnd : {"", "-wal", "-shm"}) {
        struct stat lState {};
        ASSERT_EQ(stat((path() + lpEnd).c_str(), &lState), 0) << lpEnd;
        EXPECT_EQ(lState.st_mode & 07777U, 0640U) << lpEnd;
    }
    closeStore();
    EXPECT_TRUE(exists(path() + "-wal")) << "readers without the right to write need it after a clean close";
    EXPECT_EQ(episodes().size(), 1U);
}

TEST_F(SchemaTest, EachDatabaseHasANameOfItsOwnThatStays) {
    const std::string lName = store().getStoreId();
    EXPECT_EQ(lName.size(), 32U);
    closeStore();
    EXPECT_EQ(store().getStoreId(), lName);
    EXPECT_EQ(history().getStoreId(), lName);
    ZTCTemporaryDirectory lOther;
    EXPECT_NE(ZTCStore(lOther.path(), {}, nullptr).getStoreId(), lName);
}

TEST_F(SchemaTest, AnEmptyFileIsANewDatabase) {
    writeFile(path(), "");
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    EXPECT_EQ(episodes().size(), 1U);
    EXPECT_TRUE(mReports.empty());
}

TEST_F(SchemaTest, ANewerSchemaIsRefusedAndTheFileStaysAsItIs) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    closeStore();
    execute("PRAGMA user_version = 99");
    const auto lMustRefuse = [&](const auto& acrCall) {
        try {
            acrCall();
            ADD_FAILURE() << "it was accepted";
        } catch (const ZTCStoreNewerEx& lrProblem) {
            const std::string lText = lrProblem.what();
            EXPECT_NE(lText.find("version 99"), std::string::npos) << lText;
            EXPECT_NE(lText.find(path()), std::string::npos) << lText;
        }
    };
    lMustRefuse([&] { store(); });
    lMustRefuse([&] { const ZTCHistory lHistory(mDirectory.path()); });
    EXPECT_TRUE(mReports.empty());
    execute("PRAGMA user_version = " + std::to_string(getSchemaSteps().size()));
    EXPECT_EQ(episodes().size(), 1U);
}

TEST_F(SchemaTest, StepsThatAreMissingAreMadeInOneTransaction) {
    static constexpr std::array scFirst = {"CREATE TABLE one(a); INSERT INTO one VALUES (7)"};
    static constexpr std::array scBroken = {scFirst[0], "ALTER TABLE one ADD COLUMN b", "CREATE NONSENSE"};
    static constexpr std::array scLater = {scFirst[0], "ALTER TABLE one ADD COLUMN b", "UPDATE one SET b = a + 1"};
    writeFile(path(), "");
    ZTCDatabase lDatabase(path(), ZTDA_ReadWrite);
    migrateSchema(lDatabase, scFirst);
    EXPECT_THROW(checkSchema(lDatabase, scLater), ZTCNoHistoryEx);
    EXPECT_THROW(migrateSchema(lDatabase, scBroken), ZTCStoreEx);
    EXPECT_EQ(lDatabase.readNumber("PRAGMA user_version"), 1);
    EXPECT_EQ(lDatabase.readNumber("SELECT count(*) FROM pragma_table_info('one')"), 1) << "nothing of it was kept";
    migrateSchema(lDatabase, scLater);
    EXPECT_EQ(lDatabase.readNumber("SELECT b FROM one"), 8);
    EXPECT_EQ(lDatabase.readNumber("PRAGMA user_version"), 3);
    EXPECT_NO_THROW(checkSchema(lDatabase, scLater));
    EXPECT_THROW(migrateSchema(lDatabase, scFirst), ZTCStoreNewerEx);
}

TEST_F(SchemaTest, AHistoryOfTheFirstVersionKeepsAllItsRowsAndGetsTheNewTables) {
    writeFile(path(), "");
    execute(readFile(TAVIK_FIRST_HISTORY));
    ASSERT_EQ(queryNumber(path(), "PRAGMA user_version"), 1);
    EXPECT_THROW(ZTCHistory(mDirectory.path()), ZTCNoHistoryEx) << "a reader does not change it";
    const auto lCountRows = [this] {
        std::map<std::string, std::int64_t> lRows;
        for (const char* const lpTable : {"initiator", "port", "generation", "frame", "episode", "change", "record",
                                          "minute", "day", "total", "ledger", "run", "coverage", "value"}) {
            lRows[lpTable] = queryNumber(path(), std::string("SELECT count(*) FROM ") + lpTable);
        }
        return lRows;
    };
    const std::map<std::string, std::int64_t> lBefore = lCountRows();
    ASSERT_EQ(lBefore.at("episode"), 2);
    ASSERT_EQ(lBefore.at("record"), 3);

    EXPECT_EQ(store().getStoreId(), "0d8280fdd503dad45bafaa8325b13390");
    closeStore();
    EXPECT_TRUE(mReports.empty()) << mReports.front();
    EXPECT_EQ(lCountRows(), lBefore);
    EXPECT_EQ(queryNumber(path(), "PRAGMA user_version"), static_cast<std::int64_t>(getSchemaSteps().size()));
    for (const char* const lpTable : {"topology", "scan", "counterName", "portCounter"}) {
        EXPECT_EQ(queryNumber(path(), std::string("SELECT count(*) FROM ") + lpTable), 0) << lpTable;
    }
    const std::vector<ZTSEpisode> lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 2U);
    EXPECT_EQ(getKindName(lEpisodes[0].mKind), "queue-full");
    EXPECT_EQ(lEpisodes[0].mCount, 1000U);
    EXPECT_EQ(getKindName(lEpisodes[1].mKind), "check-condition");
    EXPECT_EQ(lEpisodes[1].mCount, 8U);
    EXPECT_EQ(records().size(), 3U);

    // It goes on with it.
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    EXPECT_EQ(episodes().size(), 3U);
    inTransaction([this] { EXPECT_TRUE(store().noteTopology(gcBase, {})); });
    EXPECT_TRUE(history().readTopology(gcBase));
}

TEST_F(SchemaTest, AReaderSaysWhenThereIsNoHistoryYet) {
    const auto lReason = [this] {
        try {
            ZTCHistory(mDirectory.path());
        } catch (const ZTCNoHistoryEx& lrEx) {
            return std::string(lrEx.what());
        }
        return std::string();
    };
    EXPECT_EQ(lReason(), path() + ": there is no history yet: no sensor has run with this state directory");
    writeFile(path(), "");
    EXPECT_EQ(lReason(), path() + ": there is no history yet: the sensor is about to make it");
}

TEST_F(SchemaTest, ADamagedDatabaseIsRenamedAndReportedAndANewOneBegun) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    const std::string lName = store().getStoreId();
    closeStore();
    for (const std::string& lrContent : {std::string(8192, 'x'), readFile(path()).substr(0, 5000)}) {
        writeFile(path(), lrContent);
        EXPECT_NE(store().getStoreId(), lName);
        closeStore();
    }
    const auto lNames = files();
    EXPECT_EQ(std::ranges::count_if(lNames,
                                    [](const std::string& acrName) {
                                        return acrName.starts_with("history.damaged-") && acrName.ends_with(".db");
                                    }),
              2);
    ASSERT_EQ(mReports.size(), 2U);
    EXPECT_NE(mReports[0].find("history.damaged-"), std::string::npos) << mReports[0];
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    EXPECT_EQ(episodes().size(), 1U);
}

TEST_F(SchemaTest, DamageInTheMiddleIsFoundWhenTheDatabaseIsOpened) {
    for (std::uint64_t i = 0; i < 200; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    closeStore();
    std::string lContent = readFile(path());
    ASSERT_GT(lContent.size(), 100000U);
    const std::size_t lPage = lContent.size() / 4096 / 2 * 4096;
    std::fill_n(lContent.begin() + static_cast<std::ptrdiff_t>(lPage), 4096, '\x55');
    writeFile(path(), lContent);
    store();
    ASSERT_EQ(mReports.size(), 1U);
    EXPECT_THAT(mReports[0], testing::HasSubstr("the database is damaged"));
    EXPECT_TRUE(episodes().empty());
    expectIntegrity(path());
}

TEST_F(SchemaTest, AFileThatIsNoDatabaseIsSetAsideAlsoWhereAJournalStandsBesideIt) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    const std::string lJournal = readFile(path() + "-wal");
    ASSERT_GT(lJournal.size(), 4096U);
    closeStore();
    EXPECT_EQ(readFile(path() + "-wal"), "") << "the database is whole after a clean end";
    writeFile(path() + "-wal", lJournal);
    writeFile(path(), "garbage");
    store();
    ASSERT_EQ(mReports.size(), 1U);
    EXPECT_TRUE(episodes().empty());
}

TEST_F(SchemaTest, OfALargeDatabaseTheFirstRowOfEachTableIsReadAtItsOpening) {
    for (std::uint64_t i = 0; i < 200; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    closeStore();
    ZTCDatabase lGood(path(), ZTDA_ReadWrite);
    EXPECT_NO_THROW(checkForDamage(lGood, 0));
    EXPECT_NO_THROW(checkForDamage(lGood));
    std::string lContent = readFile(path());
    // All but the schema's pages: every table's first page.
    std::fill(lContent.begin() + 4096 * 2, lContent.end(), '\x55');
    writeFile(path(), lContent);
    ZTCDatabase lBad(path(), ZTDA_ReadWrite);
    EXPECT_THROW(checkForDamage(lBad, 0), ZTCStoreDamagedEx);
}

TEST_F(SchemaTest, DamageThatAQuestionMeetsIsSetAsideByReopening) {
    for (std::uint64_t i = 0; i < 200; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    closeStore();
    store();
    damageHistory(path());
    try {
        for (int i = 0; i < 100; ++i) {
            store().getValue("value " + std::to_string(i));
            store().hasEnded("agent " + std::to_string(i));
        }
    } catch (const ZTCStoreDamagedEx&) {
        store().reopen();
    }
    EXPECT_EQ(mReports.size(), 1U) << "the file has been set aside";
    EXPECT_EQ(store().getValue("value"), "");
}

TEST_F(SchemaTest, DamageThatShowsLaterIsSetAsideByReopening) {
    for (std::uint64_t i = 0; i < 200; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    closeStore();
    std::string lContent = readFile(path());
    ASSERT_GT(lContent.size(), 100000U);
    // All but the first pages: the schema can be read, the tables cannot.
    std::fill(lContent.begin() + 4096 * 2, lContent.end(), '\x55');
    writeFile(path(), lContent);
    const auto lTry = [&] {
        for (int i = 0; i < 3; ++i) {
            take({makeQueueFull(gcPortA, gcBase, gcBase)});
        }
    };
    try {
        lTry();
    } catch (const ZTCStoreDamagedEx&) {
        store().reopen();
        lTry();
    }
    EXPECT_EQ(mReports.size(), 1U);
    EXPECT_EQ(episodes().size(), 1U);
    EXPECT_EQ(episodes()[0].mCount, 3U);
    expectIntegrity(path());
}

TEST_F(SchemaTest, NoQueryScansATableThatGrows) {
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    ZTCDatabase lDatabase(path(), ZTDA_ReadOnly);
    const auto lQueries = ZTCHistory::getQueries();
    EXPECT_GT(lQueries.size(), 10U);
    for (const std::string& lrQuery : lQueries) {
        ZTCStatement lPlan(lDatabase, "EXPLAIN QUERY PLAN " + lrQuery);
        lPlan.query();
        int lRows = 0;
        while (lPlan.step()) {
            ++lRows;
            const std::string lStep = lPlan.text(3);
            EXPECT_FALSE(lStep.starts_with("SCAN")) << lrQuery << "\n" << lStep;
            EXPECT_EQ(lStep.find("TEMP B-TREE"), std::string::npos) << lrQuery << "\n" << lStep;
        }
        EXPECT_GT(lRows, 0);
    }
}
