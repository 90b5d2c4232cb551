/// Agents (one generation for each start), their counts, and what was lost with them.
///
/// An ended agent's counts are added to generation 0, so that the table holds at most one row for each initiator and
/// kind and running agent beside it.
#ifndef SENSOR_STORE_SRC_LEDGERBOOK_H
#define SENSOR_STORE_SRC_LEDGERBOOK_H

#include <cstdint>
#include <map>
#include <span>
#include <string>
#include <tuple>
#include <vector>

#include "sensor/store/include/Ledger.h"
#include "sensor/store/src/Counter.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/NameTable.h"

class ZTCLedgerBook {
public:
    ZTCLedgerBook(ZTCDatabase& arDatabase, ZTSCounter& arCounter, ZTCNameTable& arNames);

    /// Forgets what has not been written, and what is known of the database.
    void clear();

    /// The number of the agent with this start id, a new one where there is none.
    std::uint64_t findOrAddGeneration(const std::string& acrName);
    bool hasEnded(const std::string& acrName);

    std::vector<ZTSPageCounts> sumOthers(const std::string& acrName);

    void addTaken(std::uint64_t aGeneration, std::uint32_t aInitiator, ZTCKindKey aKind, std::uint64_t aOccurrences);
    void note(const std::string& acrGeneration, std::span<const ZTSPageCounts> aCounts);
    bool endAgent(const std::string& acrGeneration, std::int64_t aFrom, std::int64_t aTo, bool aIsVanished,
                  const std::string& acrReason, bool aHasLastPage);
    bool noteGap(const ZTSGap& acrGap);
    void flush();

private:
    struct Missing {
        std::uint32_t mInitiator;
        ZTCKindKey mKind;
        std::uint64_t mHeld;
        std::uint64_t mHandedOver;
    };
    using Key = std::tuple<std::uint64_t, std::uint32_t, ZTCKindKey>;

    bool writeGap(std::int64_t aFrom, std::int64_t aTo, const std::string& acrReason, const std::string& acrGeneration,
                  bool aIsCountKnown, std::span<const Missing> aMissing);

    ZTCDatabase& mrDatabase;
    ZTSCounter& mrCounter;
    ZTCNameTable& mrNames;
    std::map<Key, std::uint64_t> mTaken;
    std::map<Key, ZTSPageCounts> mNoted;  ///< as written last, of agents that run
    std::pair<std::string, std::uint64_t> mLastGeneration;
    ZTCStatement mAddTaken, mSetCounts;
};

#endif
