/// Each function stores one thing that has happened. The caller has begun a transaction of the store. If that
/// transaction fails, the same call may be made again in the next one. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_HISTORYWRITER_H
#define SENSOR_COLLECTOR_INCLUDE_HISTORYWRITER_H

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "sensor/collector/include/HistorySink.h"
#include "sensor/store/include/Store.h"
#include "sensor/topology/include/Topology.h"

class ZTCHistoryWriter {
public:
    using Report = std::function<void(const std::string& acrLine)>;

    /// Sets the store's address resolver. @param arStore, acrSpool  outlive this object
    ZTCHistoryWriter(ZTCStore& arStore, const ZTCSpool& acrSpool, Report aReport);
    ~ZTCHistoryWriter();
    ZTCHistoryWriter(const ZTCHistoryWriter&) = delete;
    ZTCHistoryWriter& operator=(const ZTCHistoryWriter&) = delete;

    /// Takes a file of the spool in, unless the database has it, and the page. The file stays. One that cannot be read
    /// throws ZTCSpoolTroubleEx; where it is gone, and at the last try, it is set aside instead, with a gap. Returns
    /// the records that were taken in; nothing where none could be.
    std::optional<std::uint64_t> takeIn(const ZTSSpoolEntry& acrEntry, const ZTCPagePointer& acrPage, bool aIsLastTry);
    /// A look at the running agent's page.
    void notePage(const ZTCPagePointer& acrPage);
    /// Ends an agent whose files are all taken in.
    void endAgent(const ZTSEndedAgent& acrAgent);
    /// Ends the agents that were seen running and that nobody has heard of since.
    void endForgottenAgents(const std::string& acrRunningGeneration);
    void notePorts(std::shared_ptr<const ZTSTopology> apPorts);
    /// The agent whose page was stored last, and that has not ended since; empty: none.
    std::string getGeneration() const { return mpPage != nullptr ? mpPage->mStartId : std::string(); }
    /// Closes the episodes that are over by the last page.
    void closeEpisodes();

private:
    void storePage(const ZTCPagePointer& acrPage);
    void storeLibraryLosses(const ZTSStatusSnapshot& acrPage);
    void noteSeen(const std::string& acrGeneration);
    void countStart(const std::string& acrGeneration);
    void noteEnded(const std::string& acrGeneration);
    void setAside(const ZTSSpoolName& acrName, const std::string& acrReason);
    std::optional<ZTSRemotePort> resolve(const ZTSFcName& acrInitiator, std::uint32_t aFcId) const;

    ZTCStore& mrStore;
    const ZTCSpool& mrSpool;
    const Report mReport;
    ZTCPagePointer mpPage;  ///< of the running agent, as last stored
    std::shared_ptr<const ZTSTopology> mpPorts;
};

#endif
