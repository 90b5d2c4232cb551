/// Feeds the sensor's outlets: the web server with its stream, the metrics file, the file of JSON lines, the journal.
///
/// It reads the history in a thread of its own, so that a slow outlet never delays collecting. An outlet that fails is
/// reported once and tried again. It then continues where it stopped.
#ifndef SENSOR_OUTLETS_INCLUDE_OUTLETS_H
#define SENSOR_OUTLETS_INCLUDE_OUTLETS_H

#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "sensor/metrics/include/SeriesPorts.h"
#include "sensor/outlets/include/ChangeOutlet.h"
#include "sensor/outlets/include/JournalSocket.h"
#include "sensor/outlets/include/OutputProblems.h"
#include "sensor/settings/include/Settings.h"
#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/web/include/Api.h"

/// The name of a stored value of an outlet. There are three values:
///   seq     the number of the last change that the outlet has
///   missed  how many changes were deleted as too old before the outlet had them; the history counts these
///   told    how many of the missed changes were reported to the outlet
std::string getOutletValue(const std::string& acrOutlet, const char* apValue);

struct ZTSOutletsSetup {
    std::string mStateDirectory;
    std::string mHost;
    std::string mVersion;
    std::string mJournalSocket = gcJournalSocketPath;
    /// Stores a value in the history, soon; called on any thread.
    std::function<void(const std::string& acrName, const std::string& acrValue)> mSetValue;
    /// A line for people; called on the outlets' thread.
    std::function<void(const std::string& acrLine)> mReport;
};

class ZTCOutlets {
public:
    /// Starts the thread. The history is not touched before the first openHistory().
    ZTCOutlets(ZTSOutletsSetup aSetup, const ZTSSettings& acrSettings);
    /// Writes what is due, and ends the thread.
    ~ZTCOutlets();
    ZTCOutlets(const ZTCOutlets&) = delete;
    ZTCOutlets& operator=(const ZTCOutlets&) = delete;

    // Any thread; none of them waits for an outlet.
    void setSettings(const ZTSSettings& acrSettings);
    /// The database can be read from now on. Before that the outlets say that it cannot.
    void openHistory();
    /// The running sensor's live state, as JSON in one line.
    void setLive(std::string aLive);
    /// Something new may be in the history, or somebody may have begun to read: everything that is due is fed.
    void wake();

    /// The port of the web server; 0: none, or a Unix socket.
    unsigned getPort() const;

    /// The outputs that do not work now: a JSON list of open warnings, as LiveState.h describes it.
    std::string describe() const { return mProblems.describe(); }

private:
    /// An outlet with what it has.
    struct ZTSFedOutlet {
        std::unique_ptr<ZTCChangeOutlet> mpOutlet;
        std::optional<std::uint64_t> mSeq;  ///< the last change that it has; absent: to be read from the history
        std::uint64_t mTold = 0;            ///< missed changes that it has reported
    };

    void run();
    bool waitForWork();
    void applySettings();
    void openServer();
    void feedHistory();
    void feed();
    void feedStream();
    void feed(ZTSFedOutlet& arOutlet);
    void giveMissed(ZTSFedOutlet& arOutlet);
    void makeOutlets(const ZTSSettings& acrNew);
    bool isFailing() const;
    void writeMetrics();
    std::string toLine(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames) const;
    ZTCNameBook makeNames() const;
    std::string readLive() const;
    void giveSeries(ZTSMetricFacts& arFacts);

    const ZTSOutletsSetup mSetup;
    ZTCOutputProblems mProblems;  ///< of any thread

    // ---- of the outlets' thread ----
    ZTSSettings mSettings;
    std::unique_ptr<ZTCHistory> mpHistory;
    std::vector<ZTSFedOutlet> mOutlets;
    std::optional<std::uint64_t> mStreamSeq;  ///< what the streams have; absent: nobody listens
    std::chrono::steady_clock::time_point mNextMetrics{};
    std::chrono::steady_clock::time_point mNextServer{};

    // ---- guarded by mMutex ----
    mutable std::mutex mMutex;
    std::condition_variable mWake;
    bool mIsStopping = false;
    bool mHasWork = true;
    bool mMayRead = false;
    std::optional<ZTSSettings> mNewSettings;
    std::string mLive = "{}";
    std::map<std::string, std::string> mNames;  ///< the administrator's, for the server's thread
    std::size_t mMostSeries = 0;
    ZTCSeriesPorts mSeriesPorts;  ///< of the database with this id
    std::string mSeriesStoreId;
    unsigned mPort = 0;

    std::unique_ptr<ZTCApi> mpApi;           ///< of the server's thread; outlives the server
    std::unique_ptr<ZTCApi> mpFileApi;       ///< of the outlets' thread
    std::unique_ptr<ZTCWebServer> mpServer;  ///< of the outlets' thread
    std::thread mThread;
};

#endif
