/// The table of the keeper's rules: what it does in which case, and after which time. The keeper takes its times from
/// it, and docs/sensor.md shows it row by row.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPERRULES_H
#define SENSOR_KEEPER_INCLUDE_KEEPERRULES_H

#include <chrono>
#include <span>

#include "sensor/agentcommon/include/StatusPage.h"

enum ZTEKeeperRule {
    ZTKR_NothingToWatch,    ///< agent ended: no adapters, no library, or one without events
    ZTKR_AgentWorked,       ///< agent ended after it had worked
    ZTKR_AgentFailed,       ///< agent ended before it had worked
    ZTKR_AgentReplaced,     ///< agent ended because the keeper wanted a new one
    ZTKR_CollectorWorked,   ///< collector ended after it had worked
    ZTKR_CollectorFailed,   ///< collector ended before it had worked
    ZTKR_CollectorRefused,  ///< the first collector cannot use the history or the settings
    ZTKR_AgentStill,        ///< no heartbeat
    ZTKR_AgentSilent,       ///< no answer
    ZTKR_CollectorStill,    ///< no look
    ZTKR_NewAdapter,
    ZTKR_Stranger,  ///< an agent that this keeper has not started
    ZTKR_Stop
};

struct ZTSKeeperRule {
    ZTEKeeperRule mRule;
    const char* mpWhen;
    const char* mpThen;
    std::chrono::seconds mFirst;  ///< see mpThen: the first pause, or the limit that was passed
    std::chrono::seconds mMost;   ///< the longest pause; of a limit: until force is used
};

std::span<const ZTSKeeperRule> keeperRules();
const ZTSKeeperRule& keeperRule(ZTEKeeperRule aRule);

/// In an orderly stop, no new try with a collector is made after this time.
inline constexpr std::chrono::seconds gcStopLastCollector{10};

/// Which rule the end of an agent falls under.
/// @param aReason      as its page says; "running" where it has no page or was killed
/// @param aHasWorked   it had answered a start command
/// @param aIsReplaced  the keeper wanted a new one
ZTEKeeperRule classifyAgentEnd(ZTEStatusEnd aReason, bool aHasWorked, bool aIsReplaced);

#endif
