/// The keeper's rules (KeeperRules.h), as a machine without a process, a clock or a file of its own: its owner reports
/// what has happened and when, and it acts through a ZTCKeeperWorld.
///
/// After each call, getNextTime() says when handleTime() is to be called at the latest.
#ifndef SENSOR_KEEPER_INCLUDE_KEEPER_H
#define SENSOR_KEEPER_INCLUDE_KEEPER_H

#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <set>
#include <string>

#include "sensor/agentcommon/include/StatusPage.h"
#include "sensor/keeper/include/BackOff.h"
#include "sensor/keeper/include/KeeperRules.h"
#include "sensor/keeper/include/KeeperWorld.h"
#include "sensor/link/include/Link.h"

using ZTCKeeperTime = std::chrono::steady_clock::time_point;

/// SIGTERM has been sent, SIGKILL follows.
struct ZTSEnding {
    bool mIsAsked = false;
    bool mIsKilled = false;
    ZTCKeeperTime mKillAt{};
};

/// The agent that runs.
struct ZTSKeptAgent {
    ZTSLinkMessage mStarted;  ///< owns the read end of its response FIFO and its bell
    bool mHasWorked = false;
    bool mIsReplaced = false;       ///< the collector has been asked to stop it
    ZTCKeeperTime mReplaceUntil{};  ///< when patience with that is over
    std::uint32_t mAdapters = 0;    ///< at the last look; 0 = not known yet
    std::int64_t mTouch = 0;        ///< its pid file at the last look
    ZTCKeeperTime mTouched{};       ///< when that was seen to change
    std::chrono::seconds mHeartbeat{};
    std::set<std::string> mHostNames;  ///< when it was started
    ZTSEnding mEnding;
};

/// An agent that has ended, and whose response FIFO the collector has not drained yet.
struct ZTSEndedAgent {
    ZTSLinkMessage mStarted;
    ZTSLinkMessage mEnded;
};

struct ZTSKeptCollector {
    bool mHasWorked = false;
    bool mIsFinishing = false;    ///< it has been told to finish
    ZTCKeeperTime mStillUntil{};  ///< without a look until then it counts as hung
    ZTSEnding mEnding;
};

class ZTCKeeper {
public:
    using ZTCTime = ZTCKeeperTime;

    /// @param arWorld     outlives the keeper
    /// @param aHeartbeat  of the agents that will be started
    ZTCKeeper(ZTCKeeperWorld& arWorld, std::chrono::seconds aHeartbeat);

    /// Starts everything. The first call.
    void start(ZTCTime aNow);

    /// @param aWaitStatus  as of waitpid()
    /// @param aReason      what the agent's page says; "running" where there is none
    void handleAgentEnd(ZTCTime aNow, int aWaitStatus, ZTEStatusEnd aReason);
    void handleCollectorEnd(ZTCTime aNow, int aWaitStatus);
    void handleStrangerEnd(ZTCTime aNow);
    /// From the collector that runs.
    void handleMessage(ZTCTime aNow, const ZTSLinkMessage& acrMessage);
    /// The collector runs, but has closed its end of the link, or sends what is not a message.
    void handleBrokenLink(ZTCTime aNow, const std::string& acrWhy);
    /// SIGTERM or SIGINT.
    void handleStop(ZTCTime aNow);
    /// Settings were read again and are good. The heartbeat is that of agents started from now on.
    void handleReload(ZTCTime aNow, std::chrono::seconds aHeartbeat, ZTCFileDescriptor aSettings);
    void handleTime(ZTCTime aNow);

    ZTCTime getNextTime() const;
    /// Everything has ended after handleStop().
    bool isDone() const { return mIsStopping && !mAgent && !mCollector; }
    /// 0: in order. 1: a process had to be ended by force, or did not end in order. 2: the history or the settings
    /// cannot be used.
    int getExitStatus() const { return mIsRefused ? 2 : mHasForced ? 1 : 0; }

private:
    void startAgent(ZTCTime aNow);
    void planAgent(ZTCTime aNow, ZTEKeeperRule aRule, const std::string& acrHow);
    void startCollector(ZTCTime aNow);
    void greetCollector(ZTCTime aNow);
    void send(ZTCTime aNow, const ZTSLinkMessage& acrMessage);
    void askToEnd(ZTCTime aNow, ZTEWatched aProcess, ZTSEnding& arEnding, ZTEKeeperRule aRule,
                  const std::string& acrWhy);
    void killIfDue(ZTCTime aNow, ZTEWatched aProcess, ZTSEnding& arEnding);
    void lookAtAgent(ZTCTime aNow);
    void lookAtHost(ZTCTime aNow);
    void stopAgentForNew(ZTCTime aNow);
    void stopRefused(ZTCTime aNow);
    void pressStop(ZTCTime aNow);
    void forgetDrained();
    ZTSLinkMessage describeState(ZTCTime aNow) const;
    void publishState(ZTCTime aNow);
    std::string nameOf(ZTEWatched aProcess) const;

    ZTCKeeperWorld& mrWorld;
    std::chrono::seconds mHeartbeat;

    std::optional<ZTSKeptAgent> mAgent;
    std::deque<ZTSEndedAgent> mEndedAgents;
    std::uint64_t mStarts = 0;
    ZTCBackOff mAgentBackOff;
    std::optional<ZTCTime> mAgentStartAt;  ///< set while no agent runs and one is planned
    bool mIsNothingToWatch = false;
    std::set<std::string> mHostNames;  ///< as the last agent met them, while there is nothing to watch
    std::string mWhy;                  ///< why no agent runs, for people
    std::optional<ZTCTime> mReplacedAt;
    std::optional<ZTSEnding> mStranger;

    std::optional<ZTSKeptCollector> mCollector;
    ZTCBackOff mCollectorBackOff;
    std::optional<ZTCTime> mCollectorStartAt;

    bool mIsStopping = false;
    ZTCTime mStoppedAt{};
    ZTCTime mAloneAt{};  ///< from then on an agent without a collector gets SIGTERM in a stop
    bool mHasForced = false;
    bool mIsRefused = false;  ///< the first collector cannot use the history or the settings

    bool mIsReady = false;
    ZTCTime mNextPulse{};
    ZTSLinkMessage mState;  ///< as last published
    std::int64_t mStateSince = 0;
    std::string mText;  ///< of the collector, for people
};

#endif
