/// The one thread that writes the history.
///
/// It stores its jobs in the order of the calls. It commits as soon as no job waits, and at least every second. Files
/// of the spool are removed after the commit. So a slow disk delays the history, but never the retrieval.
///
/// Nothing is dropped when the disk is full: the whole transaction is tried again until it succeeds. A damaged database
/// is set aside, and a new one is begun.
///
/// Any thread may call the functions of the two sinks. One thread calls all others. Only finish() waits for the disk.
#ifndef SENSOR_COLLECTOR_INCLUDE_HISTORYWORKER_H
#define SENSOR_COLLECTOR_INCLUDE_HISTORYWORKER_H

#include <chrono>
#include <condition_variable>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "sensor/client/include/EventBell.h"
#include "sensor/collector/include/HistorySink.h"
#include "sensor/collector/include/HistoryWriter.h"
#include "sensor/collector/include/TopologyWatch.h"
#include "sensor/store/include/Store.h"
#include "sensor/topology/include/Topology.h"

/// The value that holds the losses of the last day: the text of a ZTCLossWindow.
inline constexpr const char* gcLossesValue = "collector.losses";

/// The worker's state, to be read at any time.
struct ZTSHistoryState {
    bool mIsOpen = false;  ///< the database is open: numbers and id below are known
    std::string mStoreId;
    std::uint64_t mLastFrame = 0;  ///< highest number of a frame that the database had when it was opened
    std::string mFatal;            ///< not empty: the database can never be used by this program
    std::string mProblem;          ///< not empty: nothing can be written now; one line with the reason
    bool mIsReadOnly = false;      ///< the problem is a read-only file system
    std::uint64_t mWaitingFrames = 0;
    std::uint64_t mWaitingBytes = 0;
    std::uint64_t mTakenFrames = 0;  ///< taken in and committed by this process
    std::uint64_t mTakenRecords = 0;
    ZTCHistoryTime mLastTaken;  ///< when the last of them was committed; the epoch: none
    std::uint64_t mOpenEpisodes = 0;
    std::string mGeneration;  ///< of the agent whose page was stored last and that has not ended; empty: none
    std::shared_ptr<const std::vector<ZTSPageCounts>> mpOthers;  ///< what all other agents counted; null: not known
};

/// A mark that was asked for, and what came of it.
struct ZTSMarkResult {
    std::uint64_t mTicket = 0;
    std::string mName;
    ZTCHistoryTime mTime;
    std::string mError;  ///< empty: it is stored
};

class ZTCHistoryWorker : public ZTCHistorySink, public ZTCTopologySink {
public:
    using Report = std::function<void(const std::string& acrLine)>;

    /// Starts the thread. @param arSpool  outlives this object  @param aReport  called on the worker's thread
    /// @param aRetryPause  after a transaction that has failed
    ZTCHistoryWorker(ZTCSpool& arSpool, std::string aStateDirectory, const ZTSStoreLimits& acrLimits, Report aReport,
                     std::chrono::milliseconds aRetryPause = std::chrono::seconds(1));
    /// Waits for the transaction in work, and ends the thread. What was not committed stays in the spool.
    ~ZTCHistoryWorker() override;
    ZTCHistoryWorker(const ZTCHistoryWorker&) = delete;
    ZTCHistoryWorker& operator=(const ZTCHistoryWorker&) = delete;

    // ---- ZTCHistorySink ----
    void takeIn(const ZTSSpoolEntry& acrEntry, ZTCPagePointer apPage) override;
    void notePage(ZTCPagePointer apPage) override;
    void endAgent(ZTSEndedAgent aAgent) override;

    // ---- ZTCTopologySink ----
    void notePorts(std::shared_ptr<const ZTSTopology> apPorts) override;
    /// Where several scans wait for the disk, only the last one is stored.
    void noteTopology(ZTCHistoryTime aTime, std::shared_ptr<const ZTSTopology> apTopology) override;
    void noteCounters(std::vector<ZTSCounterSample> aSamples) override;

    /// Ends the agents that an earlier collector saw running and that nobody has heard of since. Does nothing where
    /// there is none. The agent that runs stays.
    void endForgottenAgents(const std::string& acrRunningGeneration);
    void setLimits(const ZTSStoreLimits& acrLimits);
    void setMark(std::uint64_t aTicket, const std::string& acrName, ZTCHistoryTime aTime);
    /// Stores a value under a name, for those who read the history. A later value replaces it.
    void setValue(const std::string& acrName, const std::string& acrValue);
    /// The losses that the history had when it was opened; once. Empty: none, or they were taken.
    std::string takeStoredLosses();
    /// Marks that are done since the last call.
    std::vector<ZTSMarkResult> takeMarkResults();

    ZTSHistoryState getState() const;
    /// Rings whenever the state has changed. The caller clears it.
    const ZTCEventBell& getBell() const { return mBell; }

    /// Waits until everything is stored, at most so long; then ends the run in the history, and the thread. Returns
    /// whether everything was stored.
    bool finish(std::chrono::milliseconds aAtMost);

private:
    struct ZTSFrameJob {
        ZTSSpoolEntry mEntry;
        ZTCPagePointer mpPage;
        std::chrono::steady_clock::time_point mSince;
        bool mIsSynced = false;
        unsigned mTries = 0;  ///< that failed because the file could not be read
    };
    struct ZTSPageJob {
        ZTCPagePointer mpPage;
    };
    struct ZTSForgottenJob {
        std::string mRunningGeneration;
    };
    struct ZTSPortsJob {
        std::shared_ptr<const ZTSTopology> mpPorts;
    };
    struct ZTSTopologyJob {};  ///< what is to be stored is in mTopology
    struct ZTSCountersJob {
        std::vector<ZTSCounterSample> mSamples;
    };
    struct ZTSMarkJob {
        ZTSMarkResult mMark;
    };
    struct ZTSValueJob {
        std::string mName;
        std::string mValue;
    };
    using ZTCJob = std::variant<ZTSFrameJob, ZTSPageJob, ZTSEndedAgent, ZTSForgottenJob, ZTSPortsJob, ZTSTopologyJob,
                                ZTSCountersJob, ZTSMarkJob, ZTSValueJob>;
    struct ZTSScan {
        ZTCHistoryTime mTime;
        std::shared_ptr<const ZTSTopology> mpTopology;
    };

    void submit(ZTCJob aJob);
    void run();
    bool openStore();
    void beginRun();
    bool nextBatch(std::deque<ZTCJob>& arBatch);
    void work(std::deque<ZTCJob>& arBatch);
    void storeBatch(std::deque<ZTCJob>& arBatch);
    void settle(std::deque<ZTCJob>& arBatch, std::size_t aCount);
    bool noteGeneration();
    void syncWaiting(std::deque<ZTCJob>& arBatch, std::chrono::milliseconds aAge);
    void upkeep();
    void closeRun();

    void store(ZTSFrameJob& arJob);
    void store(ZTSPageJob& arJob);
    void store(ZTSEndedAgent& arAgent);
    void store(ZTSForgottenJob& arJob);
    void store(ZTSPortsJob& arJob);
    void store(ZTSTopologyJob& arJob);
    void store(ZTSCountersJob& arJob);
    void store(ZTSMarkJob& arJob);
    void store(ZTSValueJob& arJob);

    bool pause(std::chrono::milliseconds aTime);
    void setProblem(const std::string& acrProblem);

    // ---- constant after construction ----
    ZTCSpool& mrSpool;
    const std::string mDirectory;
    const Report mReport;
    const std::chrono::milliseconds mRetryPause;
    const ZTCEventBell mBell;

    // ---- of the worker's thread ----
    std::unique_ptr<ZTCStore> mpStore;
    std::unique_ptr<ZTCHistoryWriter> mpWriter;  ///< on the store
    std::string mLastProblem;
    std::chrono::steady_clock::time_point mLastCheckpoint{};
    std::chrono::steady_clock::time_point mLastUpkeep{};
    bool mHasMoreToRetire = false;
    std::uint64_t mBatchFrames = 0;
    std::uint64_t mBatchRecords = 0;

    // ---- guarded by mMutex ----
    mutable std::mutex mMutex;
    std::condition_variable mWake;
    std::deque<ZTCJob> mQueue;
    ZTSScan mScan;               ///< the last one
    bool mIsScanQueued = false;  ///< a job for it is in the queue
    ZTSStoreLimits mLimits;
    bool mHasNewLimits = false;
    bool mIsStopping = false;   ///< end at once
    bool mIsFinishing = false;  ///< end when all is stored
    bool mIsDone = false;
    ZTSHistoryState mState;
    std::vector<ZTSMarkResult> mMarkResults;
    std::string mStoredLosses;

    std::thread mThread;
};

#endif
