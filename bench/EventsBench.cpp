// The path of one event, from the library's callback to the record, with notices masked off (log code 31).
//
// | benchmark           | workload                                                                                   |
// |---------------------|--------------------------------------------------------------------------------------------|
// | Matched/<kind>      | events that continue the pending record, one thread, one board: QUEUE FULL (counts and     |
// |                     | sets a bit), PLOGI (counts), LS_RJT (appends 8 bytes), check condition (counts and sets    |
// |                     | three bits), RSCN of one page (counts)                                                     |
// | Counted/<kind>      | the same with the status page on; CountedNew/10: NewKnown/10 with it                       |
// | PrometheusCounter   | peer: a counter of prometheus-cpp looked up by three labels, made before, and incremented  |
// | LockAndClock        | floor: a plain pthread mutex locked and unlocked, uncontended, and one CLOCK_REALTIME      |
// | NewKnown/<targets>  | QUEUE FULL events, each of another registered port in a scattered order: each a new record |
// |                     | with names; 10 or 20000 targets; retrieved after every 4000                                |
// | NewUnknown/<targets>| the same of ports that are not registered                                                  |
// | MapInsert           | peer: 4000 keys inserted into a std::map in a scattered order, emptied after that          |
// | Same/<threads>      | Matched/QFull from 1, 2, 4 or 8 threads, events a second in all                            |
// | Mix/<threads>       | as many threads, where every tenth event of all is of another port: nine matched, one new; |
// |                     | a retrieval after every 32768 events                                                       |
// | LogMasked           | a notice with two numbers while notices are masked off                                     |
// | EmptyCall           | floor: a call of an empty function                                                         |

#include <benchmark/benchmark.h>
#include <prometheus/counter.h>
#include <prometheus/registry.h>
#include <pthread.h>

#include <atomic>
#include <cstdint>
#include <ctime>
#include <map>
#include <mutex>

#include "bench/support/BenchAgent.h"
#include "bench/support/BenchEvents.h"
#include "bench/support/BenchThreads.h"
#include "common/include/Log.h"

namespace {

constexpr unsigned scBatch = 4000;
constexpr unsigned scAppendBatch = 16384;

/// Scattered, and every number below the (uneven) count is met.
std::uint64_t sScatter(std::uint64_t aIndex, std::uint64_t aCount) {
    return aIndex * 7919 % aCount;
}

template <bool HasStatusPage>
ZTCBenchAgent& sUse(unsigned aTargets = 0) {
    return ZTCBenchAgent::use(1, aTargets, gcQuietLogCode, HasStatusPage);
}

template <bool HasStatusPage>
void sMatched(benchmark::State& arState, ZTCBenchEvent& arEvent) {
    ZTCBenchAgent& lrAgent = sUse<HasStatusPage>();
    for (auto lUnused : arState) {
        arEvent.deliver();
    }
    lrAgent.retrieve();
    arState.SetItemsProcessed(arState.iterations());
}

template <bool HasStatusPage>
void sMatchedQFull(benchmark::State& arState) {
    ZTCBenchQFull lEvent;
    sMatched<HasStatusPage>(arState, lEvent);
}

template <bool HasStatusPage>
void sMatchedPlogi(benchmark::State& arState) {
    ZTCBenchEvent lEvent(1, 0x01, gcBenchPortBase, {0x20000000, 0xc9000000});
    sMatched<HasStatusPage>(arState, lEvent);
}

template <bool HasStatusPage>
void sMatchedCheckCondition(benchmark::State& arState) {
    ZTCBenchEvent lEvent(4, 0x04, gcBenchPortBase, {5, 0x28, 6, 0x29, 2});
    sMatched<HasStatusPage>(arState, lEvent);
}

template <bool HasStatusPage>
void sMatchedLsRjt(benchmark::State& arState) {
    ZTCBenchAgent& lrAgent = sUse<HasStatusPage>();
    ZTCBenchEvent lEvent(1, 0x08, gcBenchPortBase, {3, 9, 0x29});
    while (arState.KeepRunningBatch(scAppendBatch)) {
        for (unsigned i = 0; i < scAppendBatch; ++i) {
            lEvent.deliver();
        }
        arState.PauseTiming();
        lrAgent.retrieve();
        arState.ResumeTiming();
    }
}

template <bool HasStatusPage>
void sMatchedRscn(benchmark::State& arState) {
    ZTCBenchAgent& lrAgent = sUse<HasStatusPage>();
    for (auto lUnused : arState) {
        deliverBenchRscn();
    }
    lrAgent.retrieve();
}

void sPrometheusCounter(benchmark::State& arState) {
    prometheus::Registry lRegistry;
    auto& lrFamily =
        prometheus::BuildCounter().Name("fc_events_total").Help("Fibre Channel events").Register(lRegistry);
    const prometheus::Labels lLabels{{"board", "0"}, {"kind", "queue-full"}, {"port", "50:06:01:60:3b:a0:12:34"}};
    for (auto lUnused : arState) {
        lrFamily.Add(lLabels).Increment();
    }
}

void sLockAndClock(benchmark::State& arState) {
    static pthread_mutex_t sMutex = PTHREAD_MUTEX_INITIALIZER;
    for (auto lUnused : arState) {
        std::timespec lNow;
        pthread_mutex_lock(&sMutex);
        clock_gettime(CLOCK_REALTIME, &lNow);
        pthread_mutex_unlock(&sMutex);
        benchmark::DoNotOptimize(lNow);
    }
}

template <bool HasStatusPage>
void sNew(benchmark::State& arState, std::uint64_t aFirstPort) {
    const auto lTargets = static_cast<unsigned>(arState.range(0));
    ZTCBenchAgent& lrAgent = sUse<HasStatusPage>(lTargets);
    ZTCBenchQFull lEvent;
    std::uint64_t lNext = 0;
    while (arState.KeepRunningBatch(scBatch)) {
        for (unsigned i = 0; i < scBatch; ++i) {
            lEvent.setPort(aFirstPort + sScatter(lNext++, lTargets));
            lEvent.deliver();
        }
        arState.PauseTiming();
        lrAgent.retrieve();
        arState.ResumeTiming();
    }
}

template <bool HasStatusPage>
void sNewKnown(benchmark::State& arState) {
    sNew<HasStatusPage>(arState, gcBenchPortBase);
}

void sNewUnknown(benchmark::State& arState) {
    sNew<false>(arState, gcBenchPortBase + 0x80000);
}

void sMapInsert(benchmark::State& arState) {
    std::map<std::uint64_t, std::uint64_t> lMap;
    while (arState.KeepRunningBatch(scBatch)) {
        for (std::uint64_t i = 0; i < scBatch; ++i) {
            lMap.try_emplace(gcBenchPortBase + sScatter(i, scBatch - 1), i);
        }
        arState.PauseTiming();
        lMap.clear();
        arState.ResumeTiming();
    }
}

void sSame(benchmark::State& arState) {
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(1);
    runBenchThreads(arState, static_cast<unsigned>(arState.range(0)), [](unsigned aEvents) {
        ZTCBenchQFull lEvent;
        for (unsigned i = 0; i < aEvents; ++i) {
            lEvent.deliver();
        }
    });
    lrAgent.retrieve();
}

void sMix(benchmark::State& arState) {
    constexpr std::uint64_t lcRetrieveAfter = 32768;
    constexpr std::uint64_t lcRun = 10;
    ZTCBenchAgent& lrAgent = ZTCBenchAgent::use(1, 10);
    std::atomic<std::uint64_t> lDelivered{0};
    std::mutex lCommand;
    runBenchThreads(arState, static_cast<unsigned>(arState.range(0)), [&](unsigned aEvents) {
        ZTCBenchQFull lEvent;
        for (unsigned i = 0; i < aEvents; ++i) {
            const std::uint64_t lIndex = lDelivered.fetch_add(1, std::memory_order_relaxed);
            lEvent.setPort(gcBenchPortBase + lIndex / lcRun % 10);
            lEvent.deliver();
            if (lIndex % lcRetrieveAfter == lcRetrieveAfter - 1) {
                const std::lock_guard<std::mutex> lOneAtATime(lCommand);
                lrAgent.retrieve();
            }
        }
    });
    lrAgent.retrieve();
}

void sLogMasked(benchmark::State& arState) {
    setLogCode(gcQuietLogCode);
    unsigned lCategory = 4;
    unsigned lSubcategory = 1;
    for (auto lUnused : arState) {
        ZT_LOG_NOTICE("Processing QFULL event Cat=%u SubCat=%u", lCategory, lSubcategory);
        benchmark::ClobberMemory();
    }
    benchmark::DoNotOptimize(lCategory);
    benchmark::DoNotOptimize(lSubcategory);
}

__attribute__((noinline)) void sEmpty() {
    asm volatile("");
}

void sEmptyCall(benchmark::State& arState) {
    for (auto lUnused : arState) {
        sEmpty();
        benchmark::ClobberMemory();
    }
}

}  // namespace

BENCHMARK(sMatchedQFull<false>)->Name("Matched/QFull");
BENCHMARK(sMatchedPlogi<false>)->Name("Matched/Plogi");
BENCHMARK(sMatchedLsRjt<false>)->Name("Matched/LsRjt");
BENCHMARK(sMatchedCheckCondition<false>)->Name("Matched/CheckCondition");
BENCHMARK(sMatchedRscn<false>)->Name("Matched/Rscn");
BENCHMARK(sMatchedQFull<true>)->Name("Counted/QFull");
BENCHMARK(sMatchedPlogi<true>)->Name("Counted/Plogi");
BENCHMARK(sMatchedLsRjt<true>)->Name("Counted/LsRjt");
BENCHMARK(sMatchedCheckCondition<true>)->Name("Counted/CheckCondition");
BENCHMARK(sMatchedRscn<true>)->Name("Counted/Rscn");
BENCHMARK(sPrometheusCounter)->Name("PrometheusCounter");
BENCHMARK(sLockAndClock)->Name("LockAndClock");
BENCHMARK(sNewKnown<false>)->Name("NewKnown")->Arg(10)->Arg(20000);
BENCHMARK(sNewKnown<true>)->Name("CountedNew")->Arg(10);
BENCHMARK(sNewUnknown)->Name("NewUnknown")->Arg(10)->Arg(20000);
BENCHMARK(sMapInsert)->Name("MapInsert");
BENCHMARK(sSame)->Name("Same")->Arg(1)->Arg(2)->Arg(4)->Arg(8)->UseManualTime();
BENCHMARK(sMix)->Name("Mix")->Arg(1)->Arg(2)->Arg(4)->Arg(8)->UseManualTime();
BENCHMARK(sLogMasked)->Name("LogMasked");
BENCHMARK(sEmptyCall)->Name("EmptyCall");

BENCHMARK_MAIN();
