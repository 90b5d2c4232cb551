// Events at the agent's default log code, 63, where each writes its notice, beside the same line of spdlog. Both write
// into a regular file of one directory, each line with the kernel when the call returns.
//
// | benchmark              | workload                                                                                |
// |------------------------|-----------------------------------------------------------------------------------------|
// | Event/<threads>        | QUEUE FULL events that continue the pending record, from 1 or 4 threads, on one board   |
// | Spdlog/1               | peer: one line of spdlog of the same prefix (time, mark, file, line, function) and text,|
// |                        | basic file sink for one thread, flushed at every line                                   |
// | Spdlog/4               | peer: the same, basic file sink for several threads, from 4 threads                     |

#include <benchmark/benchmark.h>
#include <spdlog/sinks/basic_file_sink.h>
#include <spdlog/spdlog.h>

#include <memory>
#include <string>

#include "bench/support/BenchAgent.h"
#include "bench/support/BenchEvents.h"
#include "bench/support/BenchThreads.h"
#include "common/include/Log.h"

namespace {

void sEvent(benchmark::State& arState) {
    ZTCBenchAgent::use(1, 0, gcDefaultLogCode);
    allowLogRotation(true);
    runBenchThreads(arState, static_cast<unsigned>(arState.range(0)), [](unsigned aEvents) {
        ZTCBenchQFull lEvent;
        for (unsigned i = 0; i < aEvents; ++i) {
            lEvent.deliver();
        }
    });
    setLogCode(gcQuietLogCode);
}

void sSpdlog(benchmark::State& arState) {
    const std::string lPath = ZTCBenchAgent::directory() + "/spdlog.log";
    spdlog::drop_all();
    const std::shared_ptr<spdlog::logger> lLogger = arState.range(0) == 1
                                                        ? spdlog::basic_logger_st("bench", lPath, true)
                                                        : spdlog::basic_logger_mt("bench", lPath, true);
    lLogger->set_pattern("%Y-%m-%d %H:%M:%S.%f -N- %s:%# %!: %v");
    lLogger->flush_on(spdlog::level::info);
    runBenchThreads(arState, static_cast<unsigned>(arState.range(0)), [&lLogger](unsigned aEvents) {
        const unsigned lCategory = 4;
        const unsigned lSubcategory = 1;
        for (unsigned i = 0; i < aEvents; ++i) {
            SPDLOG_LOGGER_INFO(lLogger, "Processing QFULL event Cat={} SubCat={}", lCategory, lSubcategory);
        }
    });
}

}  // namespace

BENCHMARK(sEvent)->Name("Event")->Arg(1)->Arg(4)->UseManualTime();
BENCHMARK(sSpdlog)->Name("Spdlog")->Arg(1)->Arg(4)->UseManualTime();

BENCHMARK_MAIN();
