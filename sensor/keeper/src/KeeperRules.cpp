#include "sensor/keeper/include/KeeperRules.h"

#include <algorithm>
#include <array>

using std::chrono::seconds;

std::span<const ZTSKeeperRule> keeperRules() {
    static constexpr auto scRules = std::to_array<ZTSKeeperRule>({
        {ZTKR_NothingToWatch, "the agent's page says no adapters, no library or no event support",
         "a state, not a failure: start it when the names in /sys/class/fc_host have changed (compared every 10 s), at "
         "the latest after 60 s",
         seconds(10), seconds(60)},
        {ZTKR_AgentWorked, "the agent ended otherwise, and had answered a start command",
         "start it after 1 s; the back-off begins anew", seconds(1), seconds(1)},
        {ZTKR_AgentFailed, "the agent ended otherwise, before that", "start it after 1 s, then 2, 4 ... 60 s",
         seconds(1), seconds(60)},
        {ZTKR_AgentReplaced, "the agent ended as the keeper wanted (new adapter)", "start it at once", seconds(0),
         seconds(0)},
        {ZTKR_CollectorWorked, "the collector ended, and had completed a look or taken in a frame",
         "start it at once; the back-off begins anew", seconds(0), seconds(0)},
        {ZTKR_CollectorFailed, "the collector ended before that", "start it after 1 s, then 2, 4 ... 60 s", seconds(1),
         seconds(60)},
        {ZTKR_CollectorRefused,
         "the collector ended with status 2, for example because a newer version has written the history",
         "if no collector of this sensor has worked, the sensor stops with status 2: the collector's last line names "
         "what it cannot use. Otherwise it is started again as after any other end",
         seconds(0), seconds(0)},
        {ZTKR_AgentStill, "the agent's pid file has not been touched for twice its heartbeat and 5 s",
         "the agent hangs: SIGTERM, after 15 s SIGKILL", seconds(5), seconds(15)},
        {ZTKR_AgentSilent, "the collector has asked, and for 60 s no byte of an answer has come",
         "the agent hangs: SIGTERM, after 15 s SIGKILL", seconds(60), seconds(15)},
        {ZTKR_CollectorStill, "the collector has completed no look for 120 s (the first one: 600 s)",
         "the collector hangs: SIGTERM, after 15 s SIGKILL", seconds(120), seconds(15)},
        {ZTKR_NewAdapter, "the agent's page shows more adapters than before",
         "the collector stops the agent, gets until nothing is held, shuts it down; once in 10 minutes at most; "
         "SIGTERM "
         "where that takes longer than 90 s",
         seconds(600), seconds(90)},
        {ZTKR_Stranger, "an agent runs that this keeper has not started",
         "SIGTERM, after 15 s SIGKILL; then start an agent", seconds(0), seconds(15)},
        {ZTKR_Stop, "SIGTERM or SIGINT",
         "the collector stops the agent, gets until nothing is held, shuts it down, takes everything in and ends; what "
         "still runs after 14 s gets SIGTERM, and SIGKILL before 20 s are over (status 1, else 0)",
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
