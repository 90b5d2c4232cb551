#include "tests/sensor/HistoryCheck.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <filesystem>
#include <map>

#include "sensor/store/include/History.h"

/// The first columns of the answer's rows, or what SQLite says against it.
static std::string sExecute(const std::string& acrStateDirectory, const char* apSql) {
    sqlite3* lpDatabase = nullptr;
    std::string lResult;
    const auto lNote = [](void* apResult, int, char** appValues, char**) {
        *static_cast<std::string*>(apResult) += appValues[0];
        return 0;
    };
    const std::string lPath = acrStateDirectory + "/history.db";
    if (sqlite3_open_v2(lPath.c_str(), &lpDatabase, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK ||
        sqlite3_busy_timeout(lpDatabase, 20000) != SQLITE_OK ||
        sqlite3_exec(lpDatabase, apSql, lNote, &lResult, nullptr) != SQLITE_OK) {
        lResult = sqlite3_errmsg(lpDatabase);
    }
    sqlite3_close(lpDatabase);
    return lResult;
}

std::string checkIntegrity(const std::string& acrStateDirectory) {
    return sExecute(acrStateDirectory, "PRAGMA integrity_check");
}

void setSchemaVersion(const std::string& acrStateDirectory, unsigned aVersion) {
    EXPECT_EQ(sExecute(acrStateDirectory, ("PRAGMA user_version = " + std::to_string(aVersion)).c_str()), "");
}

unsigned getSchemaVersion(const std::string& acrStateDirectory) {
    return static_cast<unsigned>(std::stoul(sExecute(acrStateDirectory, "PRAGMA user_version")));
}

std::vector<std::string> listSpool(const std::string& acrStateDirectory) {
    std::vector<std::string> lNames;
    std::error_code lError;
    for (const auto& lrEntry : std::filesystem::directory_iterator(acrStateDirectory + "/spool", lError)) {
        lNames.push_back(lrEntry.path().filename());
    }
    return lNames;
}

std::uint64_t countStored(const std::string& acrStateDirectory) {
    std::uint64_t lSum = 0;
    try {
        for (const ZTSLedgerRow& lrRow : ZTCHistory(acrStateDirectory).readLedger()) {
            lSum += lrRow.mStored + lrRow.mRetired;
        }
    } catch (const ZTCNoHistoryEx&) {
        return 0;
    }
    return lSum;
}

std::uint64_t countRefused(const std::string& acrStateDirectory) {
    std::uint64_t lSum = 0;
    for (const ZTSLedgerRow& lrRow : ZTCHistory(acrStateDirectory).readLedger()) {
        lSum += lrRow.getRefusedTotal();
    }
    return lSum;
}

static std::string sNameOf(const ZTSInitiator& acrInitiator) {
    return acrInitiator.mWwpn ? acrInitiator.mWwpn->toText() : "";
}

void expectSoundHistory(const std::string& acrStateDirectory) {
    EXPECT_EQ(checkIntegrity(acrStateDirectory), "ok");
    EXPECT_EQ(listSpool(acrStateDirectory), std::vector<std::string>());
    const ZTCHistory lHistory(acrStateDirectory);
    std::uint64_t lEpisodes = 0;
    std::uint64_t lStored = 0;
    // What agents held when they were killed is in the gaps.
    std::map<std::pair<std::string, ZTCKindKey>, std::uint64_t> lHeldInGaps;
    for (const ZTSGap& lrGap : lHistory.readGaps()) {
        EXPECT_LE(lrGap.mFrom, lrGap.mTo) << lrGap.mReason;
        for (const ZTSGapCount& lrCount : lrGap.mCounts) {
            lHeldInGaps[{sNameOf(lrCount.mInitiator), lrCount.mKind}] += lrCount.mHeld;
        }
    }
    for (const ZTSLedgerRow& lrRow : lHistory.readLedger()) {
        SCOPED_TRACE(getKindName(lrRow.mKind));
        EXPECT_EQ(lrRow.mReceived, lrRow.mConsolidated + lrRow.getRefusedTotal());
        const std::uint64_t lInGaps = lHeldInGaps[{sNameOf(lrRow.mInitiator), lrRow.mKind}];
        EXPECT_EQ(lrRow.mConsolidated, lrRow.mHandedOver + lrRow.mHeld + lrRow.mDropped + lInGaps);
        EXPECT_EQ(lrRow.mStored + lrRow.mRetired + lrRow.mLost, lrRow.mHandedOver);
        lStored += lrRow.mStored;
    }
    lHistory.visitEpisodes({}, [&](const ZTSEpisode& acrEpisode) {
        lEpisodes += acrEpisode.mCount;
        return true;
    });
    EXPECT_EQ(lEpisodes, lStored) << "the episodes' counts and the ledger differ";
}
