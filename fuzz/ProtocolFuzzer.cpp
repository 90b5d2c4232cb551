// The command handler over a library whose answers change: whatever a request holds, it is answered with a response
// that decodes to its last byte and has an outcome that the command can have, or it ends the command thread by an
// exception.
//
// Input: the number of adapters, the log code, the registrations' statuses (their number, then a byte each), then
// requests: the number of adapters from now on, the length (16 bits), the body. A body's code is taken modulo the six
// commands: an unknown code ends the process by design.
#include <vector>

#include "fuzz/support/FuzzAgent.h"
#include "fuzz/support/FuzzInput.h"
#include "sensor/agentcommon/include/SensorAgentProtocol.h"

static constexpr std::uint8_t scCommands = 6;
static constexpr std::uint32_t scMaxAdapters = 4;

/// Whether the command may be answered so.
static bool sIsAnswer(std::uint8_t aCommand, const ZTSResponse& acrResponse) {
    switch (aCommand) {
        case ZTSTVKC_StartScope:
            return acrResponse.mOutcome == ZTRO_Success ||
                   (acrResponse.mOutcome == ZTRO_Failed && acrResponse.mStatus == ZTSAPS_NotAllowed);
        case ZTSTVKC_GetScopeData:
            return acrResponse.mOutcome == ZTRO_ScopeData && acrResponse.countRecords() == 0;
        case ZTSTVKC_RegisterTargets:
        case ZTSTVKC_CollectionPeriod:
            return acrResponse.mOutcome == ZTRO_Success ||
                   (acrResponse.mOutcome == ZTRO_Failed && acrResponse.mStatus == ZTSAPS_Invalid);
        default:
            return acrResponse.mOutcome == ZTRO_Success;
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    const std::uint32_t lAdapters = 1 + lInput.takeByte() % scMaxAdapters;
    const unsigned lLogCode = lInput.takeByte();
    const std::span<const std::uint8_t> lStatuses = lInput.take(lInput.takeByte());
    ZTCFuzzAgent lAgent(lAdapters, lLogCode);
    lAgent.getLibrary().mpStatuses = lStatuses.data();
    lAgent.getLibrary().mStatusCount = static_cast<std::uint32_t>(lStatuses.size());
    while (!lInput.isAtEnd()) {
        lAgent.getLibrary().mAdapters = lInput.takeByte() % (scMaxAdapters + 2);
        const std::span<const std::uint8_t> lBytes = lInput.take(lInput.takeShort());
        std::vector<std::uint8_t> lBody(lBytes.begin(), lBytes.end());
        if (lBody.empty()) {
            continue;  // no frame has an empty body
        }
        lBody[0] = static_cast<std::uint8_t>(lBody[0] % scCommands);
        const std::optional<ZTSResponse> lResponse = lAgent.request(lBody);
        if (!lResponse) {
            break;
        }
        ZT_FUZZ_REQUIRE(lBody[0] != ZTSTVKC_ShutDown, "the agent goes on after the shut-down command");
        ZT_FUZZ_REQUIRE(sIsAnswer(lBody[0], *lResponse),
                        std::to_string(lBody[0]) + " is answered with outcome " + std::to_string(lResponse->mOutcome));
    }
    return 0;
}
