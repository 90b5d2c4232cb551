/// A store in a directory of its own, and short ways to fill and read it.
#ifndef TESTS_UNIT_STORE_STOREFIXTURE_H
#define TESTS_UNIT_STORE_STOREFIXTURE_H

#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/store/include/Store.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/store/Frames.h"

inline constexpr const char* gcGeneration = "00000000000000a1";

class ZTCStoreTest : public testing::Test {
protected:
    ZTCStore& store() {
        if (!mStore) {
            mStore = std::make_unique<ZTCStore>(mDirectory.path(), mLimits,
                                                [this](const std::string& acrLine) { mReports.push_back(acrLine); });
        }
        return *mStore;
    }
    void closeStore() { mStore.reset(); }
    ZTCHistory& history() {
        store();
        if (!mHistory) {
            mHistory = std::make_unique<ZTCHistory>(mDirectory.path());
        }
        return *mHistory;
    }
    std::string path() const { return mDirectory.path("history.db"); }

    /// Takes the records in as the next frame, in a transaction of its own.
    ZTSTakenIn take(const std::vector<ZTSTestRecord>& acrRecords, std::int64_t aNow = gcBase,
                    std::uint64_t aLocalPort = gcLocalPort) {
        return takeBody(makeBody(acrRecords, aLocalPort), false, aNow);
    }
    ZTSTakenIn takeBody(const ZTCBytes& acrBody, bool aIsTorn = false, std::int64_t aNow = gcBase) {
        ZTCStoreTransaction lTransaction = store().begin();
        ZTSTakenIn lTaken =
            store().takeIn(store().getLastFrame() + 1, gcGeneration, acrBody, aIsTorn, fromMicroseconds(aNow));
        lTransaction.commit();
        return lTaken;
    }
    std::size_t closeAt(std::int64_t aNow) {
        ZTCStoreTransaction lTransaction = store().begin();
        const std::size_t lCount =
            store().closeEpisodes(fromMicroseconds(aNow), [](const ZTSInitiator&, ZTCKindKey) { return true; });
        lTransaction.commit();
        return lCount;
    }
    /// Runs a call in a transaction.
    template <typename Call>
    void inTransaction(Call aCall) {
        ZTCStoreTransaction lTransaction = store().begin();
        aCall();
        lTransaction.commit();
    }

    std::vector<ZTSEpisode> episodes(const ZTSHistoryFilter& acrFilter = {}) {
        return history().readEpisodes(acrFilter);
    }
    std::vector<ZTSStoredRecord> records(const ZTSHistoryFilter& acrFilter = {}) {
        std::vector<ZTSStoredRecord> lRecords;
        history().visitRecords(acrFilter, [&](const ZTSStoredRecord& acrRecord) {
            lRecords.push_back(acrRecord);
            return true;
        });
        return lRecords;
    }
    std::vector<ZTSEpisode> changes(const ZTSHistoryFilter& acrFilter = {}) {
        std::vector<ZTSEpisode> lChanges;
        history().visitChanges(acrFilter, [&](const ZTSEpisode& acrEpisode) {
            lChanges.push_back(acrEpisode);
            return true;
        });
        return lChanges;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTSStoreLimits mLimits;
    std::vector<std::string> mReports;
    std::unique_ptr<ZTCStore> mStore;
    std::unique_ptr<ZTCHistory> mHistory;
};

#endif
