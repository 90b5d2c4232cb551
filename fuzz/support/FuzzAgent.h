/// The agent's system object in the fuzzer's own process, brought up by its own preInit and init over an adapters'
/// library whose answers the fuzzer sets. No thread of the agent runs; the fuzzer calls what they would call.
#ifndef FUZZ_SUPPORT_FUZZAGENT_H
#define FUZZ_SUPPORT_FUZZAGENT_H

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "fuzz/support/FuzzLibkpm.h"
#include "sensor/client/include/Response.h"
#include "tavik/include/TavikSystem.h"

/// Log codes: nothing, and everything that there is.
inline constexpr unsigned gcNoLog = 0;
inline constexpr unsigned gcWholeLog = 255;

/// Directs the log to /dev/null: its lines are made, and go nowhere.
void discardLog(unsigned aLogCode);

/// A directory for the process's files, made on the first call, in TMPDIR.
const std::string& getFuzzDirectory();

/// One at a time; each is as fresh as a new process.
class ZTCFuzzAgent {
public:
    ZTCFuzzAgent(unsigned aAdapters, unsigned aLogCode);
    ~ZTCFuzzAgent();
    ZTCFuzzAgent(const ZTCFuzzAgent&) = delete;
    ZTCFuzzAgent& operator=(const ZTCFuzzAgent&) = delete;

    ZTCTavikSystem& getSystem() { return *mpSystem; }
    /// What the library answers from now on.
    ZTSFuzzLibkpm& getLibrary() { return *mpLibrary; }

    /// Handles a request as the command thread does. The response, which must decode to its last byte; nothing where
    /// an exception ends the thread, after which nothing more may be asked.
    std::optional<ZTSResponse> request(std::span<const std::uint8_t> aBody);

    /// get-scope-data, which must be answered.
    ZTSResponse retrieve();

    void startScope(std::uint32_t aMaxRecordBytes);

private:
    std::unique_ptr<ZTCTavikSystem> mpSystem;
    ZTSFuzzLibkpm* mpLibrary;
};

#endif
