/// The agent's system object in the benchmark's own process, brought up by its own preInit and init over a directory
/// and an adapters' library of the benchmarks. Its threads run only where a benchmark starts them: otherwise it calls
/// what they would call.
#ifndef BENCH_SUPPORT_BENCHAGENT_H
#define BENCH_SUPPORT_BENCHAGENT_H

#include <cstddef>
#include <string>
#include <vector>

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "tavik/include/TavikProtocolHandler.h"
#include "tavik/include/TavikSystem.h"

/// The log code with errors and warnings, and without notices.
inline constexpr unsigned gcQuietLogCode = 31;

/// One thread at a time, as the command thread.
class ZTCBenchAgent {
public:
    /// The agent with so many boards and registered targets, port gcBenchPortBase + n and FC id n + 1 each, collecting.
    /// Made at the first call, and then the one that callbacks reach. Sets the log code.
    static ZTCBenchAgent& use(unsigned aBoards, unsigned aTargets = 0, unsigned aLogCode = gcQuietLogCode,
                              bool aHasStatusPage = false);

    /// An agent of its own, which callbacks reach until it goes.
    ZTCBenchAgent(unsigned aBoards, unsigned aTargets, bool aHasStatusPage = false);
    ~ZTCBenchAgent();
    ZTCBenchAgent(const ZTCBenchAgent&) = delete;
    ZTCBenchAgent& operator=(const ZTCBenchAgent&) = delete;

    ZTCTavikSystem& system() { return *mpSystem; }

    /// One request, handled on this thread; the response's body.
    ZTCPointer<ZTCBuffer> request(const std::vector<unsigned char>& acrBody);
    ZTCPointer<ZTCBuffer> retrieve() { return request({1}); }

    /// Starts the agent's own threads, once, and ends them.
    void startThreads();
    void stopThreads();

    /// One request to the running command thread, as the sensor makes it over the two FIFOs. Returns when the last byte
    /// of the response was read; the number of its bytes.
    std::size_t requestOverPipes(const std::vector<unsigned char>& acrBody);

    static std::vector<unsigned char> makeRegisterTargets(unsigned aTargets);

    /// A directory of this process on a real file system; removed at its end.
    static const std::string& directory();

private:
    ZTCTavikSystem* mpSystem;
    int mResponseReader;
    int mCommandWriter = -1;
};

#endif
