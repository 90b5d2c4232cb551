#include "tests/sensor/HistoryCheck.h"

#include <gtest/gtest.h>
#include <sqlite3.h>

#include <filesystem>
#include <map>
#include <sstream>

#include "sensor/store/include/History.h"
#include "tests/support/Waiting.h"

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

/// The first thing that is wrong with it; empty: nothing.
static std::string sFindFlaw(const std::string& acrStateDirectory) {
    if (const std::string lProblem = checkIntegrity(acrStateDirectory); lProblem != "ok") {
        return lProblem;
    }
    for (const std::string& lrName : listSpool(acrStateDirectory)) {
        return lrName + " is in the spool";
    }
    const ZTCHistory lHistory(acrStateDirectory);
    std::uint64_t lEpisodes = 0;
    std::uint64_t lStored = 0;
    // What agents held when they were killed is in the gaps.
    std::map<std::pair<std::string, ZTCKindKey>, std::uint64_t> lHeldInGaps;
    for (const ZTSGap& lrGap : lHistory.readGaps()) {
        if (lrGap.mFrom > lrGap.mTo) {
            return "a gap ends before it begins: " + lrGap.mReason;
        }
        for (const ZTSGapCount& lrCount : lrGap.mCounts) {
            lHeldInGaps[{sNameOf(lrCount.mInitiator), lrCount.mKind}] += lrCount.mHeld;
        }
    }
    for (const ZTSLedgerRow& lrRow : lHistory.readLedger()) {
        const std::uint64_t lInGaps = lHeldInGaps[{sNameOf(lrRow.mInitiator), lrRow.mKind}];
        if (lrRow.mReceived != lrRow.mConsolidated + lrRow.getRefusedTotal() ||
            lrRow.mConsolidated != lrRow.mHandedOver + lrRow.mHeld + lrRow.mDropped + lInGaps ||
            lrRow.mStored + lrRow.mRetired + lrRow.mLost != lrRow.mHandedOver) {
            std::ostringstream lText;
            lText << sNameOf(lrRow.mInitiator) << " " << getKindName(lrRow.mKind) << ": received " << lrRow.mReceived
                  << ", refused " << lrRow.getRefusedTotal() << ", consolidated " << lrRow.mConsolidated
                  << ", handed over " << lrRow.mHandedOver << ", held " << lrRow.mHeld << ", dropped " << lrRow.mDropped
                  << ", held in gaps " << lInGaps << ", stored " << lrRow.mStored << ", retired " << lrRow.mRetired
                  << ", lost " << lrRow.mLost;
            return lText.str();
        }
        lStored += lrRow.mStored;
    }
    lHistory.visitEpisodes({}, [&](const ZTSEpisode& acrEpisode) {
        lEpisodes += acrEpisode.mCount;
        return true;
    });
    return lEpisodes == lStored
               ? ""
               : "the episodes have " + std::to_string(lEpisodes) + ", the ledger has " + std::to_string(lStored);
}

void expectSoundHistory(const std::string& acrStateDirectory) {
    EXPECT_EQ(sFindFlaw(acrStateDirectory), "");
}

void waitForSoundHistory(const std::string& acrStateDirectory) {
    std::string lFlaw;
    try {
        waitUntil(
            [&] {
                try {
                    lFlaw = sFindFlaw(acrStateDirectory);
                } catch (const std::exception& lrEx) {
                    lFlaw = lrEx.what();  // a collector is just opening it
                }
                return lFlaw.empty();
            },
            "a sound history", ZTCDeadline(3 * gcTestPatience));
    } catch (const std::runtime_error&) {
        ADD_FAILURE() << lFlaw;
    }
}
