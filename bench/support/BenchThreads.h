/// Several threads that work on one thing, timed from outside.
#ifndef BENCH_SUPPORT_BENCHTHREADS_H
#define BENCH_SUPPORT_BENCHTHREADS_H

#include <benchmark/benchmark.h>

#include <chrono>
#include <latch>
#include <thread>
#include <vector>

/// Calls aBody(events) on so many threads at once, which share the events of one iteration; the iteration's time is
/// that from the start of all to the end of the last. For benchmarks with manual time.
template <typename Body>
void runBenchThreads(benchmark::State& arState, unsigned aThreads, Body aBody) {
    constexpr unsigned lcEvents = 40000;
    for (auto lUnused : arState) {
        std::latch lStart(static_cast<std::ptrdiff_t>(aThreads) + 1);
        std::vector<std::thread> lThreads;
        for (unsigned i = 0; i < aThreads; ++i) {
            lThreads.emplace_back([&] {
                lStart.arrive_and_wait();
                aBody(lcEvents / aThreads);
            });
        }
        const auto lBegin = std::chrono::steady_clock::now();
        lStart.arrive_and_wait();
        for (std::thread& lrThread : lThreads) {
            lrThread.join();
        }
        arState.SetIterationTime(std::chrono::duration<double>(std::chrono::steady_clock::now() - lBegin).count());
    }
    arState.SetItemsProcessed(arState.iterations() * lcEvents);
}

#endif
