/// Takes in the files that earlier collectors, agents and keepers have left: `.part` files that will never be whole,
/// and status pages. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_LEFTOVERS_H
#define SENSOR_COLLECTOR_INCLUDE_LEFTOVERS_H

#include <functional>
#include <string>
#include <system_error>
#include <vector>

#include "sensor/collector/include/HistorySink.h"
#include "sensor/collector/include/Spool.h"

class ZTCLeftovers {
public:
    using Report = std::function<void(const std::string& acrLine)>;

    /// @param aAgentDirectory  holds the pages  @param arSpool, arHistory  outlive this object
    ZTCLeftovers(std::string aAgentDirectory, ZTCSpool& arSpool, ZTCHistorySink& arHistory, Report aReport)
        : mAgentDirectory(std::move(aAgentDirectory)),
          mrSpool(arSpool),
          mrHistory(arHistory),
          mReport(std::move(aReport)) {}

    /// The page of that start, read now; null: there is none.
    ZTCPagePointer findPage(const std::string& acrGeneration) const;

    /// Hands what waits in the spool to the history, and sees to it that new numbers are above all that were used.
    /// Once, at a start. Throws ZTCSpoolTroubleEx; nothing has been handed over then.
    /// @param aLastNumber  the highest that the history has
    void takeInWaiting(std::uint64_t aLastNumber);

    /// For times without an agent: tears every `.part`. Throws ZTCSpoolTroubleEx; to be called again then.
    void tearParts();

    /// Hands the pages of agents that have ended to the history, which removes them. To be called when no agent waits
    /// to be emptied. Throws ZTCClientEx where it cannot be seen whether an agent runs.
    /// @param acrCurrent  the running agent's page, which stays; empty: none
    /// @return false: to be called again. The agent of a page still runs, or descriptors or memory were short.
    bool endPages(const std::string& acrCurrent);

private:
    std::vector<std::string> listPages(std::error_code& arError) const;

    const std::string mAgentDirectory;
    ZTCSpool& mrSpool;
    ZTCHistorySink& mrHistory;
    const Report mReport;
};

#endif
