#include "tests/unit/store/Integrity.h"

#include "sensor/store/src/Database.h"

std::string queryText(const std::string& acrPath, const std::string& acrSql) {
    ZTCDatabase lDatabase(acrPath, ZTDA_ReadOnly);
    ZTCStatement lRow(lDatabase, acrSql);
    return lRow.query().step() ? lRow.text(0) : "";
}

std::int64_t queryNumber(const std::string& acrPath, const std::string& acrSql) {
    ZTCDatabase lDatabase(acrPath, ZTDA_ReadOnly);
    return lDatabase.readNumber(acrSql.c_str());
}

void expectIntegrity(const std::string& acrPath) {
    EXPECT_EQ(queryText(acrPath, "PRAGMA integrity_check"), "ok");
    const auto lSum = [&](const char* apSql) { return queryNumber(acrPath, apSql); };
    const std::int64_t lTaken = lSum("SELECT sum(taken) FROM total");
    EXPECT_EQ(lSum("SELECT sum(count) FROM episode") + lSum("SELECT sum(retired) FROM total"), lTaken);
    EXPECT_EQ(lSum("SELECT sum(taken) FROM ledger"), lTaken);
    EXPECT_EQ(lSum("SELECT sum(occurrences) FROM frame"), lTaken);
    EXPECT_EQ(lSum("SELECT occurrences FROM counter"), lTaken);
    EXPECT_EQ(lSum("SELECT retrievals FROM counter"), lSum("SELECT count(*) FROM frame"));
    if (lSum("SELECT sum(retired) FROM total") == 0) {
        EXPECT_EQ(lSum("SELECT sum(count) FROM minute"), lTaken);
        EXPECT_EQ(lSum("SELECT sum(count) FROM day"), lTaken);
        EXPECT_EQ(lSum("SELECT sum(records) FROM episode"), lSum("SELECT sum(records) FROM frame"));
    }
    // Every change belongs to an episode, and every episode has the changes that it names.
    EXPECT_EQ(lSum("SELECT count(*) FROM change c LEFT JOIN episode e ON e.id = c.episode WHERE e.id IS NULL OR "
                   "c.seq NOT IN (e.openSeq, e.updateSeq, e.closeSeq)"),
              0);
    EXPECT_EQ(lSum("SELECT count(*) FROM change"),
              lSum("SELECT sum(1 + (updateSeq <> 0) + (closeSeq <> 0)) FROM episode"));
    EXPECT_EQ(lSum("SELECT count(*) FROM record WHERE episode NOT IN (SELECT id FROM episode)"), 0);
}
