// Ports, LUNs and paths of a large host: 8 initiators, 64 remote ports, 200 LUNs with 8 paths each, multipath and
// mounts.
//
//   Scan/LargeHost      everything in a tree of files in the place of sysfs
//   ReadSan/LargeHost   its judgement out of a history of a week, as `tavik status` makes it
#include <benchmark/benchmark.h>

#include "sensor/store/include/Store.h"
#include "sensor/topology/include/TopologyScan.h"
#include "sensor/views/include/SanView.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/topology/FakeSysfs.h"

static constexpr unsigned scLuns = 200;
static constexpr std::int64_t scHour = 3'600'000'000;
static constexpr unsigned scHours = 7 * 24;

/// The tree has many files: it is written once, however often a benchmark is called.
static ZTSTopologyRoots sLargeHost() {
    static ZTCFakeSysfs lTree;
    static const bool lIsWritten = (lTree.addLargeHost(scLuns), true);
    benchmark::DoNotOptimize(lIsWritten);
    return lTree.roots();
}

static void Scan(benchmark::State& arState) {
    const ZTSTopologyRoots lRoots = sLargeHost();
    ZTCPatientReader lReader;
    for (auto lIteration : arState) {
        benchmark::DoNotOptimize(scanTopology(lRoots, lReader));
    }
}
BENCHMARK(Scan)->Name("Scan/LargeHost")->Unit(benchmark::kMillisecond)->UseRealTime();

/// A week in which one path an hour changes its queue depth, and a port has just gone.
static void sFillHistory(const std::string& acrDirectory, std::int64_t aNow) {
    ZTCPatientReader lReader;
    ZTSTopology lTopology = scanTopology(sLargeHost(), lReader);
    ZTCStore lStore(acrDirectory, {}, [](const std::string&) {});
    for (unsigned lHour = 0; lHour <= scHours; ++lHour) {
        lTopology.mPaths[lHour % lTopology.mPaths.size()].mQueueDepth = 32 - lHour % 31;
        if (lHour == scHours) {
            lTopology.mRemotePorts[0].mState = "Blocked";
        }
        ZTCStoreTransaction lTransaction = lStore.begin();
        lStore.noteTopology(aNow - (scHours - lHour) * scHour, lTopology);
        lTransaction.commit();
    }
}

static void ReadSan(benchmark::State& arState) {
    static const ZTCTemporaryDirectory lDirectory;
    static const std::int64_t lNow = toMicroseconds(getHistoryTime());
    static const bool lIsFilled = (sFillHistory(lDirectory.path(), lNow), true);
    benchmark::DoNotOptimize(lIsFilled);
    const ZTCHistory lHistory(lDirectory.path());
    for (auto lIteration : arState) {
        benchmark::DoNotOptimize(readSan(lHistory, fromMicroseconds(lNow)));
    }
}
BENCHMARK(ReadSan)->Name("ReadSan/LargeHost")->Unit(benchmark::kMillisecond)->UseRealTime();

BENCHMARK_MAIN();
