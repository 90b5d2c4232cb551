// Handing records over, what that costs the callbacks, and registering targets. Notices are masked off (log code 31).
//
// A full load is 262144 bytes of event data, where events are refused: QUEUE FULL records of two ports in turn ("one"),
// or records of all kinds in turn ("mixed"), spread over the boards in turn.
//
// | benchmark               | workload                                                                               |
// |-------------------------|----------------------------------------------------------------------------------------|
// | Retrieve/<load>/<boards>| flush, swap and encode of a full load, as the command does it; bytes of the response   |
// | Command/<load>/<boards> | the whole get-scope-data command: the same, and the records freed                      |
// | MemcpyPass/<load>/<b>   | floor: one pass over the same records in list order that copies their data by memcpy;  |
// |                         | as many bytes are counted as for Retrieve                                              |
// | Get/<load>/<boards>     | the whole of it by the wall clock, from the command's write into its FIFO over the     |
// |                         | agent's command thread to the last byte of the response that the sensor reads          |
// | LockHold/<load>/<boards>| nanoseconds for which a retrieval holds the previous-data lock, median and 99 %, with  |
// |                         | a full load, and with no record but the pending one ("empty"; after a full load was    |
// |                         | made and retrieved, so that the caches are as in the other cases)                      |
// | Latency/alone           | nanoseconds of a callback that continues the pending record, 99 %                      |
// | Latency/retrieved       | the same while another thread retrieves back to back                                   |
// | RegisterTargets         | the register-targets command with 20000 targets, none of them known                    |
// | MapInsert20000          | peer: their names inserted into a std::map                                             |
// | Memory                  | what 65536 records of four bytes add to the peak of resident memory, held, handed over |
// |                         | as a response and freed, in a process of its own                                       |

#include <benchmark/benchmark.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <fstream>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "bench/support/BenchAgent.h"
#include "bench/support/BenchEvents.h"
#include "bench/support/WatchedLock.h"
#include "common/include/EncodableStream.h"
#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"

namespace {

enum ZTELoad { ZTBL_Empty, ZTBL_One, ZTBL_Mixed };

constexpr unsigned scManyTargets = 20000;

/// Events of all kinds but RSCN, which has a callback of its own.
std::vector<std::unique_ptr<ZTCBenchEvent>> sMakeMixture(std::uint64_t aPort) {
    std::vector<std::unique_ptr<ZTCBenchEvent>> lEvents;
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        if (&lcrKind != &gcScopeEventKinds[findKindIndex("rscn").value()]) {
            lEvents.push_back(std::make_unique<ZTCBenchEvent>(lcrKind.mDeliveredCategory, lcrKind.mDeliveredSubcategory,
                                                              aPort, std::vector<std::uint32_t>{5, 6, 7, 8, 9}));
        }
    }
    return lEvents;
}

/// Brings the agent, whose lists are empty, to the load.
void sFill(ZTCBenchAgent& arAgent, ZTELoad aLoad, unsigned aBoards) {
    static ZTCBenchQFull sFirst(gcBenchPortBase);
    static ZTCBenchQFull sSecond(gcBenchPortBase + 1);
    static const auto& srMixture = *new std::vector<std::unique_ptr<ZTCBenchEvent>>(sMakeMixture(gcBenchPortBase));
    if (aLoad == ZTBL_Empty) {
        sFirst.deliver();
        return;
    }
    for (unsigned i = 0; arAgent.system().getTotalEventDataSize() < gcMaxScopeDataSize; ++i) {
        const unsigned lBoard = i / 2 % aBoards;
        if (aLoad == ZTBL_One) {
            (i % 2 == 0 ? sFirst : sSecond).deliver(lBoard);
        } else {
            srMixture[i % srMixture.size()]->deliver(lBoard);
        }
    }
}

/// Processor time of this thread in seconds, which others that run do not stretch.
double sThreadSeconds() {
    std::timespec lNow{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &lNow);
    return static_cast<double>(lNow.tv_sec) + static_cast<double>(lNow.tv_nsec) / 1e9;
}

/// The steps of the command up to the encoded bytes; the lists taken stay with the caller.
Size sRetrieve(ZTCTavikSystem& arSystem, ZTCTavikRecordsMap& arTaken) {
    constexpr Size lcKeySize = 128;
    ZTCEncodableOutStream lStream(1024);
    lStream << static_cast<unsigned char>(ZTRO_ScopeData) << arSystem.getNumRecordLists();
    ZTCTavikRecordsMap lFresh;
    arSystem.makeRecordLists(lFresh);
    Size lRoom;
    {
        const ZTCPrevDataHold lHold(arSystem);
        lRoom = arSystem.getTotalEventDataSize();
        arSystem.clearPrevScopeData();
        arSystem.clearRecordsMap(arTaken);
        arSystem.addNewRecordListsToRecordsMap(lFresh);
        arSystem.resetTotalEventDataSize();
    }
    for (const auto& lrEntry : arTaken) {
        lRoom += lcKeySize + lrEntry.second->size() * ZTCTavikRecord::gcMostBesideData;
    }
    lStream.reserve(lRoom);
    for (const auto& lrEntry : arTaken) {
        lStream << arSystem.getFcInitiator(lrEntry.first)->getKey();
        lrEntry.second->encode(lStream);
    }
    return lStream.getBuffer()->getSize();
}

Size sCopyData(ZTCTavikSystem& arSystem, unsigned aBoards, std::vector<unsigned char>& arTo) {
    const ZTCPrevDataHold lHold(arSystem);
    std::size_t lUsed = 0;
    for (unsigned lBoard = 0; lBoard < aBoards; ++lBoard) {
        for (const auto& lrRecord : *arSystem.getRecordList(lBoard)) {
            ZTCScopeData& lrData = *lrRecord->getScopeData();
            std::memcpy(arTo.data() + lUsed, lrData.getEventData(), lrData.getEventDataSize());
            lUsed += lrData.getEventDataSize();
        }
    }
    benchmark::DoNotOptimize(arTo.data());
    benchmark::ClobberMemory();
    return static_cast<Size>(lUsed);
}

enum ZTEWhat { ZTBW_Retrieve, ZTBW_Command, ZTBW_MemcpyPass };

void sHandOver(benchmark::State& arState, ZTEWhat aWhat, ZTELoad aLoad, unsigned aBoards) {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(aBoards, 10);
    std::vector<unsigned char> lCopy(2 * gcMaxScopeDataSize);
    std::int64_t lBytes = 0;
    for (auto lUnused : arState) {
        sFill(lrAgent, aLoad, aBoards);
        double lSeconds = sThreadSeconds();
        if (aWhat == ZTBW_Retrieve) {
            ZTCTavikRecordsMap lTaken;
            lBytes += sRetrieve(lrAgent.system(), lTaken);
            lSeconds = sThreadSeconds() - lSeconds;
        } else if (aWhat == ZTBW_Command) {
            lBytes += lrAgent.retrieve()->getSize();
            lSeconds = sThreadSeconds() - lSeconds;
        } else {
            sCopyData(lrAgent.system(), aBoards, lCopy);
            lSeconds = sThreadSeconds() - lSeconds;
            lBytes += lrAgent.retrieve()->getSize();
        }
        arState.SetIterationTime(lSeconds);
    }
    lrAgent.retrieve();
    arState.SetBytesProcessed(lBytes);
}

void sGet(benchmark::State& arState, ZTELoad aLoad, unsigned aBoards) {
    // Threads that have ended cannot be started again, so this is an agent of its own.
    ZTCBenchAgent lAgent(aBoards, 10);
    lAgent.startThreads();
    std::size_t lBytes = 0;
    for (auto lUnused : arState) {
        sFill(lAgent, aLoad, aBoards);
        const std::int64_t lBegin = benchNow();
        lBytes += lAgent.requestOverPipes({1});
        arState.SetIterationTime(static_cast<double>(benchNow() - lBegin) / 1e9);
    }
    lAgent.stopThreads();
    arState.SetBytesProcessed(static_cast<std::int64_t>(lBytes));
}

void sLockHold(benchmark::State& arState, ZTELoad aLoad, unsigned aBoards) {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(aBoards, 10);
    auto& lrMutex = const_cast<ZTCMutex&>(lrAgent.system().getPrevDataLock());
    std::vector<std::int64_t> lHolds;
    for (auto lUnused : arState) {
        if (aLoad == ZTBL_Empty) {
            sFill(lrAgent, ZTBL_One, aBoards);
            lrAgent.retrieve();
        }
        sFill(lrAgent, aLoad, aBoards);
        const ZTCWatchedLock lWatch(&lrMutex.getOsMutex().mMutex);
        lrAgent.retrieve();
        lHolds.push_back(lWatch.holds().back());
    }
    arState.counters["median_ns"] = benchPercentile(lHolds, 50);
    arState.counters["p99_ns"] = benchPercentile(lHolds, 99);
}

void sLatency(benchmark::State& arState, bool aIsRetrieved) {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(1, 10);
    ZTCBenchQFull lEvent;
    std::vector<std::int64_t> lTimes;
    lTimes.reserve(1 << 22);
    std::atomic<bool> lIsOver{false};
    std::thread lRetriever;
    if (aIsRetrieved) {
        lRetriever = std::thread([&] {
            while (!lIsOver.load(std::memory_order_relaxed)) {
                lrAgent.retrieve();
            }
        });
    }
    for (auto lUnused : arState) {
        const std::int64_t lBegin = benchNow();
        lEvent.deliver();
        lTimes.push_back(benchNow() - lBegin);
    }
    lIsOver = true;
    if (aIsRetrieved) {
        lRetriever.join();
    }
    lrAgent.retrieve();
    arState.counters["median_ns"] = benchPercentile(lTimes, 50);
    arState.counters["p99_ns"] = benchPercentile(lTimes, 99);
}

void sRegisterTargets(benchmark::State& arState) {
    const std::vector<unsigned char> lBody = ZTCBenchAgent::makeRegisterTargets(scManyTargets);
    for (auto lUnused : arState) {
        // Targets are never removed, so each command gets an agent of its own.
        ZTCBenchAgent lAgent(1, 0);
        const double lBegin = sThreadSeconds();
        lAgent.request(lBody);
        arState.SetIterationTime(sThreadSeconds() - lBegin);
    }
    arState.SetItemsProcessed(arState.iterations() * scManyTargets);
}

void sMapInsert(benchmark::State& arState) {
    for (auto lUnused : arState) {
        std::map<unsigned long, unsigned long> lMap;
        const double lBegin = sThreadSeconds();
        for (unsigned long i = 0; i < scManyTargets; ++i) {
            lMap.try_emplace(ZTCWorldWideName(makeBenchName(gcBenchPortBase + i).wwn).getKey(), i);
        }
        arState.SetIterationTime(sThreadSeconds() - lBegin);
    }
    arState.SetItemsProcessed(arState.iterations() * scManyTargets);
}

/// The peak of this process's resident memory in KiB.
long sReadPeak() {
    std::ifstream lStatus("/proc/self/status");
    for (std::string lLine; std::getline(lStatus, lLine);) {
        if (lLine.starts_with("VmHWM:")) {
            return std::stol(lLine.substr(6));
        }
    }
    return 0;
}

/// Holds and hands over 65536 records; returns by how much the peak of resident memory has risen.
long sMeasurePeak() {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(1);
    ZTCBenchEvent lFirst(8, 0x01, gcBenchPortBase, {});
    ZTCBenchEvent lSecond(16, 0x01, gcBenchPortBase, {});
    std::ofstream("/proc/self/clear_refs") << "5" << std::flush;
    const long lBefore = sReadPeak();
    while (lrAgent.system().getTotalEventDataSize() < gcMaxScopeDataSize) {
        lFirst.deliver();
        lSecond.deliver();
    }
    lrAgent.retrieve();
    return sReadPeak() - lBefore;
}

void sMemory(benchmark::State& arState) {
    constexpr double lcRecords = gcMaxScopeDataSize / 4;
    ZTCBenchAgent::directory();
    long lKiB = 0;
    for (auto lUnused : arState) {
        int lPipe[2];
        if (pipe(lPipe) != 0) {
            arState.SkipWithError("pipe failed");
            return;
        }
        // No thread runs here, so that the child may go on as a process of its own.
        const pid_t lChild = fork();
        if (lChild == 0) {
            const long lPeak = sMeasurePeak();
            _exit(write(lPipe[1], &lPeak, sizeof lPeak) == sizeof lPeak ? 0 : 1);
        }
        if (read(lPipe[0], &lKiB, sizeof lKiB) != sizeof lKiB) {
            arState.SkipWithError("the child has failed");
        }
        waitpid(lChild, nullptr, 0);
        close(lPipe[0]);
        close(lPipe[1]);
    }
    arState.counters["peak_KiB"] = static_cast<double>(lKiB);
    arState.counters["bytes_a_record"] = static_cast<double>(lKiB) * 1024 / lcRecords;
}

void sRegister() {
    static const struct {
        const char* mpName;
        ZTELoad mLoad;
    } lcLoads[] = {{"one", ZTBL_One}, {"mixed", ZTBL_Mixed}, {"empty", ZTBL_Empty}};
    static const struct {
        const char* mpName;
        ZTEWhat mWhat;
    } lcWhats[] = {{"Retrieve", ZTBW_Retrieve}, {"Command", ZTBW_Command}, {"MemcpyPass", ZTBW_MemcpyPass}};
    // First, while the process has no memory to give back.
    benchmark::RegisterBenchmark("Memory", sMemory)->Iterations(1);
    for (const auto& lcrLoad : lcLoads) {
        for (const unsigned lBoards : {1u, 64u}) {
            const std::string lEnd = std::string("/") + lcrLoad.mpName + "/" + std::to_string(lBoards);
            for (const auto& lcrWhat : lcWhats) {
                if (lcrLoad.mLoad != ZTBL_Empty) {
                    benchmark::RegisterBenchmark((lcrWhat.mpName + lEnd).c_str(), sHandOver, lcrWhat.mWhat,
                                                 lcrLoad.mLoad, lBoards)
                        ->UseManualTime()
                        ->Iterations(40)
                        ->Unit(benchmark::kMicrosecond);
                }
            }
            if (lcrLoad.mLoad != ZTBL_Empty) {
                benchmark::RegisterBenchmark(("Get" + lEnd).c_str(), sGet, lcrLoad.mLoad, lBoards)
                    ->UseManualTime()
                    ->Iterations(40)
                    ->Unit(benchmark::kMicrosecond);
            }
            benchmark::RegisterBenchmark(("LockHold" + lEnd).c_str(), sLockHold, lcrLoad.mLoad, lBoards)
                ->Iterations(100);
        }
    }
    benchmark::RegisterBenchmark("Latency/alone", sLatency, false)->Iterations(1000000);
    benchmark::RegisterBenchmark("Latency/retrieved", sLatency, true)->Iterations(1000000);
    benchmark::RegisterBenchmark("RegisterTargets", sRegisterTargets)->UseManualTime()->Iterations(2);
    benchmark::RegisterBenchmark("MapInsert20000", sMapInsert)->UseManualTime()->Iterations(2);
}

}  // namespace

int main(int argc, char** argv) {
    sRegister();
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
