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

static constexpr unsigned scHosts = 8;
static constexpr unsigned scPortsOfAHost = 8;
static constexpr unsigned scLuns = 200;
static constexpr std::int64_t scHour = 3'600'000'000;
static constexpr unsigned scHours = 7 * 24;

static void sWriteHost(ZTCFakeSysfs& arTree) {
    for (unsigned lHost = 0; lHost < scHosts; ++lHost) {
        arTree.addHost(lHost);
        for (unsigned lTarget = 0; lTarget < scPortsOfAHost; ++lTarget) {
            arTree.addRemotePort(lHost, lTarget, lHost * scPortsOfAHost + lTarget);
        }
    }
    for (unsigned lLun = 0; lLun < scLuns; ++lLun) {
        std::vector<std::string> lDisks;
        for (unsigned lHost = 0; lHost < scHosts; ++lHost) {
            lDisks.push_back("sd" + std::to_string(lLun) + "x" + std::to_string(lHost));
            arTree.addPath(lHost, lLun % scPortsOfAHost, lLun, "naa." + std::to_string(lLun), lDisks.back());
        }
        const std::string lNumber = std::to_string(lLun);
        arTree.addMapping(lLun, "mpath" + lNumber, "mpath-" + lNumber, lDisks);
        arTree.mount("dm-" + lNumber, "/data/" + lNumber);
    }
}

static void Scan(benchmark::State& arState) {
    ZTCFakeSysfs lTree;
    sWriteHost(lTree);
    const ZTSTopologyRoots lRoots = lTree.roots();
    ZTCPatientReader lReader;
    for (auto lIteration : arState) {
        benchmark::DoNotOptimize(scanTopology(lRoots, lReader));
    }
}
BENCHMARK(Scan)->Name("Scan/LargeHost")->Unit(benchmark::kMillisecond)->UseRealTime();

/// A week in which one path an hour changes its queue depth, and a port has just gone.
static void ReadSan(benchmark::State& arState) {
    ZTCFakeSysfs lTree;
    sWriteHost(lTree);
    ZTCPatientReader lReader;
    ZTSTopology lTopology = scanTopology(lTree.roots(), lReader);
    const ZTCTemporaryDirectory lDirectory;
    const std::int64_t lNow = toMicroseconds(getHistoryTime());
    ZTCStore lStore(lDirectory.path(), {}, [](const std::string&) {});
    for (unsigned lHour = 0; lHour <= scHours; ++lHour) {
        lTopology.mPaths[lHour % lTopology.mPaths.size()].mQueueDepth = 32 - lHour % 31;
        if (lHour == scHours) {
            lTopology.mRemotePorts[0].mState = "Blocked";
        }
        ZTCStoreTransaction lTransaction = lStore.begin();
        lStore.noteTopology(lNow - (scHours - lHour) * scHour, lTopology);
        lTransaction.commit();
    }
    const ZTCHistory lHistory(lDirectory.path());
    for (auto lIteration : arState) {
        benchmark::DoNotOptimize(readSan(lHistory, fromMicroseconds(lNow)));
    }
}
BENCHMARK(ReadSan)->Name("ReadSan/LargeHost")->Unit(benchmark::kMillisecond)->UseRealTime();

BENCHMARK_MAIN();
