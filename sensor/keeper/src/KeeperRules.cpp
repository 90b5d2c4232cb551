#include "sensor/keeper/include/KeeperRules.h"

#include <algorithm>
#include <array>

using std::chrono::seconds;

std::span<const ZTSKeeperRule> keeperRules() {
    static constexpr auto scRules = std::to_array<ZTSKeeperRule>({
        {ZTKR_NothingToWatch, "the agent's page says no adapters, no library or no event support",
         "this is a state, not a failure. Start the agent when the names in /sys/class/fc_host have changed (compared "
         "every 10 s), and after 60 s at the latest",
         seconds(10), seconds(60)},
        {ZTKR_AgentWorked, "the agent ended in another way, and has worked", "start it after 1 s, and reset the pauses",
         seconds(1), seconds(1)},
        {ZTKR_AgentFailed, "the agent ended in another way, and has not worked",
         "start it after 1 s, then 2, 4 ... 60 s", seconds(1), seconds(60)},
        {ZTKR_AgentReplaced, "the agent ended as the keeper wanted (new adapter)", "start it at once", seconds(0),
         seconds(0)},
        {ZTKR_CollectorWorked, "the collector ended, and has worked", "start it at once, and reset the pauses",
         seconds(0), seconds(0)},
        {ZTKR_CollectorFailed, "the collector ended, and has not worked", "start it after 1 s, then 2, 4 ... 60 s",
         seconds(1), seconds(60)},
        {ZTKR_CollectorRefused,
         "the collector ended with status 2, for example because a newer version has written the history",
         "if no collector of this sensor has worked, the sensor stops with status 2. The last line of the collector "
         "names what it cannot use. Otherwise the collector is started again, as after any other end",
         seconds(0), seconds(0)},
        {ZTKR_AgentStill, "the agent has not touched its pid file for twice its heartbeat plus 5 s",
         "the agent hangs: SIGTERM, after 15 s SIGKILL", seconds(5), seconds(15)},
        {ZTKR_AgentSilent, "the collector waits for an answer of the agent, and no byte has come for 60 s",
         "the agent hangs: SIGTERM, after 15 s SIGKILL", seconds(60), seconds(15)},
        {ZTKR_CollectorStill, "the collector has completed no look for 120 s (the first one: 600 s)",
         "the collector hangs: SIGTERM, after 15 s SIGKILL", seconds(120), seconds(15)},
        {ZTKR_NewAdapter, "the agent's page shows more adapters than before",
         "the collector stops the agent, retrieves until the agent holds nothing, and shuts it down. This happens at "
         "most once in 10 minutes. If it takes longer than 90 s, the agent gets SIGTERM",
         seconds(600), seconds(90)},
        {ZTKR_Stranger, "an agent runs that this keeper has not started",
         "SIGTERM, after 15 s SIGKILL; then start an agent", seconds(0), seconds(15)},
        {ZTKR_Stop, "SIGTERM or SIGINT",
         "the collector stops the agent, retrieves until the agent holds nothing, shuts it down, stores everything and "
         "ends. A process that still runs after 14 s gets SIGTERM, and SIGKILL before 20 s have passed; the exit "
         "status is then 1, else 0",
         seconds(14), seconds(19)},
    });
    return scRules;
}

const ZTSKeeperRule& keeperRule(ZTEKeeperRule aRule) {
    return keeperRules()[aRule];
}

ZTEKeeperRule classifyAgentEnd(ZTEStatusEnd aReason, bool aHasWorked, bool aIsReplaced) {
    if (aReason == ZTSE_NoAdapters || aReason == ZTSE_NoLibrary || aReason == ZTSE_NoEventSupport) {
        return ZTKR_NothingToWatch;
    }
    if (aIsReplaced) {
        return ZTKR_AgentReplaced;
    }
    return aHasWorked ? ZTKR_AgentWorked : ZTKR_AgentFailed;
}
