/// The answer to `{"request":"status"}`: the collector's present state, as the JSON that LiveState.h describes.
#ifndef SENSOR_COLLECTOR_INCLUDE_LIVESTATEJSON_H
#define SENSOR_COLLECTOR_INCLUDE_LIVESTATEJSON_H

#include <sys/types.h>

#include <optional>
#include <string>

#include "sensor/collector/include/HistorySink.h"
#include "sensor/collector/include/HistoryWorker.h"
#include "sensor/collector/include/LossWindow.h"
#include "sensor/collector/include/TopologyWatch.h"
#include "sensor/link/include/Link.h"
#include "sensor/topology/include/Topology.h"

struct ZTSLiveFacts {
    ZTCHistoryTime mNow;
    pid_t mKeeperPid = 0;
    const ZTSLinkMessage* mpKeeperState = nullptr;  ///< the last one of its type; null: none has come
    pid_t mCollectorPid = 0;
    ZTCHistoryTime mSince;  ///< when the collector started
    bool mIsAgentRunning = false;
    pid_t mAgentPid = 0;
    std::uint64_t mRestarts = 0;
    ZTCPagePointer mpPage;  ///< of the running agent, or of the last one; null: not known
    std::optional<ZTCHistoryTime> mLastAsked;
    std::string mSpoolProblem;  ///< empty: none
    bool mIsSpoolReadOnly = false;
    ZTSHistoryState mHistory;
    ZTSLosses mLosses;
    ZTSTopology mPorts;
    std::string mWarnings = "[]";  ///< the open ones, as a JSON list
    ZTSTopologyState mTopology;
};

/// One line, without a line break.
std::string toLiveStateJson(const ZTSLiveFacts& acrFacts);

#endif
