// The history against plainer tables, all with the same settings of SQLite:
//
//   TakeIn/*       a full response (65,536 records, 64 ports and 20 kinds in turn) into episodes, counts and raw
//   records.
//                  "new": every episode begins. "open": every episode is open already
//   InsertEach     the same response, one INSERT a record in one transaction
//   Ports          remote ports of 30 days by occurrences, over a million episodes that hold ten million occurrences
//   GroupEach      the same question to a table with one row an event
//   Bytes          size of the two databases, for a million events
#include <benchmark/benchmark.h>

#include <chrono>
#include <filesystem>
#include <memory>

#include "sensor/client/include/RecordView.h"
#include "sensor/store/include/History.h"
#include "sensor/store/include/Store.h"
#include "sensor/store/src/Database.h"
#include "sensor/store/src/StoreFile.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/store/Frames.h"

static constexpr unsigned scPorts = 64;
static constexpr unsigned scFullResponse = 65536;
static constexpr unsigned scEpisodes = 1'000'000;
static constexpr unsigned scOccurrences = 10;
static constexpr unsigned scDays = 30;

static ZTSTestRecord sRecord(unsigned aNumber, std::int64_t aTime) {
    static constexpr ZTCKindKey scGenericKinds[] = {0x0201, 0x0420, 0x0801, 0x0802, 0x0804, 0x1001};
    const std::uint64_t lPort = gcPortA + aNumber % scPorts;
    const unsigned lKind = aNumber / scPorts % 20;
    ZTSTestRecord lRecord;
    lRecord.mBegin = lRecord.mEnd = aTime;
    lRecord.mOccurrences = scOccurrences;
    switch (lKind) {
        case 0:
        case 1:
        case 2:
            lRecord.mKind = lKind == 0 ? gcPlogi : lKind == 1 ? gcAdisc : gcLogo;
            lRecord.mData = makeTwoNamesData(lPort, gcNode);
            break;
        case 3:
        case 4:
            lRecord.mKind = lKind == 3 ? gcPrlo : gcPortBusy;
            lRecord.mData = makePortData(lPort);
            break;
        case 5:
            lRecord.mKind = gcLsRjt;
            lRecord.mData = makeLsRjtData(lPort, 3, {{9, 0x2A}});
            break;
        case 6:
            lRecord.mKind = gcRscn;
            lRecord.mData = makeRscnData(0x010000 + aNumber % scPorts);
            break;
        case 7:
            lRecord.mKind = gcReadCheck;
            lRecord.mData = makeReadCheckData(lPort, 0x28, 1, {7});
            break;
        case 8:
        case 9:
            lRecord.mKind = lKind == 8 ? gcQueueFull : gcDeviceBusy;
            lRecord.mData = makeBusyData(lPort, {aNumber % 256});
            break;
        case 10:
            lRecord.mKind = gcCheckCondition;
            lRecord.mData = makeCheckConditionData(lPort, 6, 41, {aNumber % 256}, {40}, {0});
            break;
        case 11:
        case 12:
            lRecord.mKind = lKind == 11 ? gcLunReset : gcTargetReset;
            lRecord.mData = makeResetData(lPort, {aNumber % 256});
            break;
        case 13:
            lRecord.mKind = gcQueueDepth;
            lRecord.mData = makeQueueDepthData(lPort, {{aNumber % 256, 16}});
            break;
        default:
            lRecord.mKind = scGenericKinds[lKind - 14];
            lRecord.mData = makeGenericData();
            break;
    }
    return lRecord;
}

static const ZTCBytes& sFullResponse() {
    static const ZTCBytes scBody = [] {
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < scFullResponse; ++i) {
            lRecords.push_back(sRecord(i, gcBase + i));
        }
        return makeBody(lRecords);
    }();
    return scBody;
}

static void sTakeIn(ZTCStore& arStore, const ZTCBytes& acrBody) {
    ZTCStoreTransaction lTransaction = arStore.begin();
    arStore.takeIn(arStore.getLastFrame() + 1, "bench", acrBody, false, fromMicroseconds(gcBase));
    lTransaction.commit();
}

static double sSeconds(std::chrono::steady_clock::time_point aStart) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - aStart).count();
}

static void sBenchTakeIn(benchmark::State& arState, bool aIsOpen) {
    for ([[maybe_unused]] auto lStep : arState) {
        const ZTCTemporaryDirectory lDirectory;
        ZTCStore lStore(lDirectory.path(), {}, nullptr);
        if (aIsOpen) {
            sTakeIn(lStore, sFullResponse());
        }
        const auto lStart = std::chrono::steady_clock::now();
        sTakeIn(lStore, sFullResponse());
        arState.SetIterationTime(sSeconds(lStart));
    }
    arState.SetItemsProcessed(static_cast<std::int64_t>(arState.iterations()) * scFullResponse);
}
BENCHMARK_CAPTURE(sBenchTakeIn, new, false)->Name("TakeIn/new")->UseManualTime();
BENCHMARK_CAPTURE(sBenchTakeIn, open, true)->Name("TakeIn/open")->UseManualTime();

/// A table with one row a record, or an event.
static ZTCDatabase sPlainDatabase(const std::string& acrPath) {
    createHistoryFile(acrPath);
    ZTCDatabase lDatabase(acrPath, ZTDA_ReadWrite);
    lDatabase.execute("PRAGMA journal_mode = WAL; PRAGMA synchronous = FULL; PRAGMA cache_size = -4096");
    lDatabase.execute(
        "CREATE TABLE event(begin INTEGER, end INTEGER, occurrences INTEGER, initiator TEXT, "
        "kind INTEGER, port BLOB, data BLOB)");
    return lDatabase;
}

/// Inserts every record.
class ZTCInserter : public ZTCResponseVisitor {
public:
    explicit ZTCInserter(ZTCDatabase& arDatabase)
        : mInsert(arDatabase, "INSERT INTO event VALUES (?, ?, ?, ?, ?, ?, ?)") {}

    void visitOutcome(const ZTSResponse&) override {}
    void visitList(std::string_view aInitiatorKey) override { mInitiator = aInitiatorKey; }
    void visitRecord(const ZTSRecordView& acrRecord) override {
        const bool lHasPort = acrRecord.mEventData.size() >= 12;
        mInsert.run(static_cast<std::int64_t>(acrRecord.mBegin.mEpochSeconds),
                    static_cast<std::int64_t>(acrRecord.mEnd.mEpochSeconds), acrRecord.mOccurrences, mInitiator,
                    makeKindKey(acrRecord.mCategory, acrRecord.mSubcategory),
                    acrRecord.mEventData.subspan(lHasPort ? 4 : 0, lHasPort ? 8 : 0), acrRecord.mEventData);
    }

private:
    ZTCStatement mInsert;
    std::string_view mInitiator;
};

static void sBenchInsertEach(benchmark::State& arState) {
    for ([[maybe_unused]] auto lStep : arState) {
        const ZTCTemporaryDirectory lDirectory;
        ZTCDatabase lDatabase = sPlainDatabase(lDirectory.path("plain.db"));
        ZTCInserter lInserter(lDatabase);
        const auto lStart = std::chrono::steady_clock::now();
        std::size_t lUnread = 0;
        lDatabase.execute("BEGIN IMMEDIATE");
        visitResponse(sFullResponse(), lInserter, lUnread);
        lDatabase.execute("COMMIT");
        arState.SetIterationTime(sSeconds(lStart));
    }
    arState.SetItemsProcessed(static_cast<std::int64_t>(arState.iterations()) * scFullResponse);
}
BENCHMARK(sBenchInsertEach)->Name("InsertEach")->UseManualTime();

/// A month of episodes, made once.
struct ZTSMonth {
    ZTCTemporaryDirectory mDirectory;
    std::uint64_t mBytes = 0;
    std::uint64_t mPlainBytes = 0;

    ZTSMonth() {
        ZTCStore lStore(mDirectory.path(), {}, nullptr);
        static constexpr std::int64_t scStep = scDays * gcDay / scEpisodes;
        std::vector<ZTSTestRecord> lRecords;
        for (unsigned i = 0; i < scEpisodes; ++i) {
            lRecords.push_back(sRecord(i, gcBase + i * scStep));
            if (lRecords.size() == 8192 || i + 1 == scEpisodes) {
                sTakeIn(lStore, makeBody(lRecords));
                lStore.checkpoint();
                lRecords.clear();
            }
        }
        mBytes = lStore.getDatabaseBytes();
        ZTCDatabase lPlain = sPlainDatabase(mDirectory.path("plain.db"));
        lPlain.execute(
            "BEGIN IMMEDIATE; "
            "WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < 9999999) "
            "INSERT INTO event SELECT 1772600760 + i / 4, 1772600760 + i / 4, 1, "
            "'20:00:00:00:c9:00:00:01.10:00:00:00:c9:00:00:01', 256 + i / 640 % 20, "
            "CAST(printf('%08d', i / 10 % 64) AS BLOB), zeroblob(32) FROM n; COMMIT");
        lPlain.execute("PRAGMA wal_checkpoint(TRUNCATE)");
        mPlainBytes = getFileBytes(mDirectory.path("plain.db"));
    }
};

static ZTSMonth& sMonth() {
    static ZTSMonth sTheMonth;
    return sTheMonth;
}

static void sBenchPorts(benchmark::State& arState) {
    const ZTCHistory lHistory(sMonth().mDirectory.path());
    ZTSHistoryFilter lFilter;
    lFilter.mSince = fromMicroseconds(gcBase + 7 * 60 * gcMinute + 5);
    double lSeconds = 0;
    for ([[maybe_unused]] auto lStep : arState) {
        const auto lStart = std::chrono::steady_clock::now();
        const auto lPorts = lHistory.readPorts(lFilter);
        lSeconds += sSeconds(lStart);
        if (lPorts.size() < scPorts - 1) {
            arState.SkipWithError("ports are missing");
        }
    }
    arState.counters["milliseconds"] = benchmark::Counter(lSeconds * 1000, benchmark::Counter::kAvgIterations);
}
BENCHMARK(sBenchPorts)->Name("Ports")->Unit(benchmark::kMillisecond);

static void sBenchGroupEach(benchmark::State& arState) {
    ZTCDatabase lPlain(sMonth().mDirectory.path("plain.db"), ZTDA_ReadOnly);
    ZTCStatement lGroup(lPlain, "SELECT port, kind, count(*) FROM event WHERE end >= ? GROUP BY port, kind");
    for ([[maybe_unused]] auto lStep : arState) {
        lGroup.query(1772600760);
        while (lGroup.step()) {
            benchmark::DoNotOptimize(lGroup.number(2));
        }
    }
}
BENCHMARK(sBenchGroupEach)->Name("GroupEach")->Unit(benchmark::kMillisecond)->Iterations(1);

static void sBenchBytes(benchmark::State& arState) {
    for ([[maybe_unused]] auto lStep : arState) {
        benchmark::DoNotOptimize(sMonth().mBytes);
    }
    static constexpr double scMillions = 1.0 * scEpisodes * scOccurrences / 1e6;
    arState.counters["bytes"] = static_cast<double>(sMonth().mBytes) / scMillions;
    arState.counters["plain_bytes"] = static_cast<double>(sMonth().mPlainBytes) / scMillions;
}
BENCHMARK(sBenchBytes)->Name("Bytes")->Iterations(1);

BENCHMARK_MAIN();
