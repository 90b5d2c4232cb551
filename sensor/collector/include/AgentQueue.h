/// The agents that the keeper has started. The collector works with one at a time: it goes on to the next one when all
/// bytes that the former one wrote are in the spool. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_AGENTQUEUE_H
#define SENSOR_COLLECTOR_INCLUDE_AGENTQUEUE_H

#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "sensor/collector/include/AgentSession.h"
#include "sensor/collector/include/KeeperPort.h"
#include "sensor/collector/include/LossWindow.h"

class ZTCAgentQueue {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;
    using Report = std::function<void(const std::string& acrLine)>;

    /// @param arKeeper, arSpool, arHistory  outlive this object  @param aDirectory  the agents'
    ZTCAgentQueue(ZTCKeeperPort& arKeeper, ZTCSpool& arSpool, ZTCHistorySink& arHistory, std::string aDirectory,
                  const ZTSSessionSettings& acrSettings, Report aReport);

    // ---- what the keeper and others say ----
    void noteStarted(ZTSLinkMessage aMessage);
    void noteEnded(const ZTSLinkMessage& acrMessage, ZTCTime aNow);
    /// Stops the agent of this start in order.
    void stop(std::uint64_t aStart, ZTCTime aNow);
    /// Stops every agent in order, later ones too.
    void stopAll(ZTCTime aNow);
    void setSettings(const ZTSSessionSettings& acrSettings, ZTCTime aNow);
    /// All that are known now: for the running agent, and for those that follow it.
    void setTargets(std::vector<ZTSTargetPort> aTargets, ZTCTime aNow);

    // ---- the loop ----
    /// Does all that is due, and reports it to the keeper.
    void run(ZTCTime aNow);
    /// When run() is to be called at the latest; empty: nothing is planned.
    std::optional<ZTCTime> getNextStep() const;
    /// To be polled for POLLIN; -1: nothing.
    int getResponseFifo() const { return mpSession != nullptr ? mpSession->getResponseFifo() : -1; }
    int getBell() const { return mpSession != nullptr ? mpSession->getBell() : -1; }
    /// What poll() has said of the two.
    void noteResponseEvents(short aEvents);
    void noteBellEvents(short aEvents, ZTCTime aNow);

    // ---- what can be seen ----
    /// The agent whose turn it is; null: none.
    const ZTCAgentSession* getSession() const { return mpSession.get(); }
    bool hasWaiting() const { return !mWaiting.empty(); }
    bool isEmpty() const { return mpSession == nullptr && mWaiting.empty(); }
    /// The page of the running agent, read now, or of the last one; null: not known.
    ZTCPagePointer readPage();
    /// As of the last look; null: not known.
    const ZTCPagePointer& getPage() const { return mpLastPage; }
    std::optional<ZTCHistoryTime> getLastAsked() const { return mLastAsked; }
    /// @param aSince  from then on; the last 24 hours at most
    ZTSLosses getLosses(ZTCHistoryTime aNow, ZTCHistoryTime aSince = {}) { return mLosses.get(aNow, aSince); }

    // ---- what outlives this process ----
    /// Takes over the losses that an earlier process has stored. Call it before run().
    void restoreLosses(const std::string& acrText) { mLosses.restore(acrText); }
    /// To be stored, where something was lost since the last call.
    std::optional<std::string> takeNewLosses();

private:
    struct ZTSWaitingAgent {
        ZTSAgentStart mStart;
        std::optional<int> mWaitStatus;  ///< it has ended
    };

    void beginNext(ZTCTime aNow);
    void step(ZTCTime aNow);

    ZTCKeeperPort& mrKeeper;
    ZTCSpool& mrSpool;
    ZTCHistorySink& mrHistory;
    const std::string mDirectory;
    const Report mReport;
    ZTSSessionSettings mSettings;
    std::vector<ZTSTargetPort> mTargets;

    std::deque<ZTSWaitingAgent> mWaiting;
    std::unique_ptr<ZTCAgentSession> mpSession;
    bool mIsDue = false;
    bool mIsStoppingAll = false;
    ZTCPagePointer mpLastPage;
    std::optional<ZTCHistoryTime> mLastAsked;
    ZTCLossWindow mLosses;
    bool mHasNewLosses = false;
};

#endif
