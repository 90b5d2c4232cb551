/// The inside of ZTCStore: one open database with its books, and the transaction that is under way.
#ifndef SENSOR_STORE_SRC_STOREIMPLEMENTATION_H
#define SENSOR_STORE_SRC_STOREIMPLEMENTATION_H

#include <chrono>
#include <cstdio>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

#include "sensor/store/include/Store.h"
#include "sensor/store/src/CountBook.h"
#include "sensor/store/src/Counter.h"
#include "sensor/store/src/CounterBook.h"
#include "sensor/store/src/CoverageBook.h"
#include "sensor/store/src/EpisodeBook.h"
#include "sensor/store/src/LedgerBook.h"
#include "sensor/store/src/NameTable.h"
#include "sensor/store/src/Retention.h"
#include "sensor/store/src/TopologyBook.h"

/// Everything that is tied to one open database.
struct ZTSOpenStore {
    explicit ZTSOpenStore(const std::string& acrPath);

    void load();
    void flush();

    ZTCDatabase mDatabase;
    ZTSCounter mCounter;
    ZTSCounter mStoredCounter;
    ZTCNameTable mNames{mDatabase};
    ZTCEpisodeBook mEpisodes{mDatabase, mCounter};
    ZTCCountBook mCounts{mDatabase};
    ZTCLedgerBook mLedger{mDatabase, mCounter, mNames};
    ZTCCoverageBook mCoverage{mDatabase, mNames};
    ZTCTopologyBook mTopology{mDatabase};
    ZTCCounterBook mPortCounters{mDatabase, mNames};
    ZTCRetention mRetention{mDatabase};
    ZTCStatement mFindFrame{mDatabase, "SELECT 1 FROM frame WHERE number = ?"};
    ZTCStatement mInsertFrame{mDatabase,
                              "INSERT INTO frame(number, generation, time, bytes, records, occurrences, torn) "
                              "VALUES (?, ?, ?, ?, ?, ?, ?)"};
    ZTCStatement mDeleteFrames{mDatabase, "DELETE FROM frame WHERE number <= ?"};
};

class ZTCStore::ZTCImplementation {
public:
    ZTCImplementation(const std::string& acrStateDirectory, const ZTSStoreLimits& acrLimits, Report aReport);

    /// Runs an operation of the present transaction. An exception rolls it back.
    template <typename Call>
    auto change(const char* apName, Call aCall) {
        if (!mIsInTransaction) {
            throw std::logic_error(std::string("history: ") + apName + " needs a transaction");
        }
        return watch(apName, aCall);
    }

    /// Runs an operation outside of a transaction.
    template <typename Call>
    auto keepUp(const char* apName, Call aCall) {
        if (mIsInTransaction) {
            throw std::logic_error(std::string("history: ") + apName + " within a transaction");
        }
        loadAgain();
        return watch(apName, aCall);
    }

    /// Runs a question, within the present transaction or without one.
    template <typename Call>
    auto look(const char* apName, Call aCall) {
        loadAgain();
        return watch(apName, aCall);
    }

    ~ZTCImplementation();
    ZTCImplementation(const ZTCImplementation&) = delete;
    ZTCImplementation& operator=(const ZTCImplementation&) = delete;

    void open();
    void reopen();
    void begin();
    void commit();
    void rollBack() noexcept;
    ZTSTakenIn takeIn(std::uint64_t aNumber, const std::string& acrGeneration, std::span<const std::uint8_t> aBody,
                      bool aIsTorn, std::int64_t aNow);
    bool retireStep(std::int64_t aNow, std::chrono::steady_clock::time_point aSteadyNow);
    void checkpoint();
    bool hasFrame(std::uint64_t aNumber);
    /// Makes memory equal to the database again, where a rollback or a failed opening has left it otherwise.
    void loadAgain();
    bool isInTransaction(std::uint64_t aSerial) const { return mIsInTransaction && mSerial == aSerial; }

    std::string mPath;
    ZTSStoreLimits mLimits;
    Report mReport;
    ZTCAddressResolver mResolver;
    std::unique_ptr<ZTSOpenStore> mpOpen;
    std::string mStoreId;
    bool mIsInTransaction = false;
    std::uint64_t mSerial = 0;  ///< of the present or last transaction
    bool mNeedsLoad = false;    ///< memory is ahead of the database after a rollback
    bool mIsDamaged = false;

private:
    template <typename Call>
    auto watch(const char* apName, Call aCall) {
        const auto lStart = std::chrono::steady_clock::now();
        const auto lReport = [&] {
            const auto lPassed = std::chrono::steady_clock::now() - lStart;
            if (lPassed > mLimits.mReportAfter && mReport) {
                char lText[128];
                std::snprintf(lText, sizeof lText, "history: %s took %.3f s, more than %.3f s", apName,
                              std::chrono::duration<double>(lPassed).count(),
                              std::chrono::duration<double>(mLimits.mReportAfter).count());
                mReport(lText);
            }
        };
        try {
            if constexpr (std::is_void_v<decltype(aCall())>) {
                aCall();
                lReport();
            } else {
                auto lResult = aCall();
                lReport();
                return lResult;
            }
        } catch (const ZTCStoreDamagedEx&) {
            mIsDamaged = true;
            rollBack();
            throw;
        } catch (...) {
            rollBack();
            throw;
        }
    }
};

#endif
