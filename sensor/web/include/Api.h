/// What the web server answers: the commands' documents, the metrics, and the files of the page.
#ifndef SENSOR_WEB_INCLUDE_API_H
#define SENSOR_WEB_INCLUDE_API_H

#include <functional>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/web/include/WebServer.h"

struct ZTSMetricFacts;
struct ZTSStatusFacts;

/// Episodes in one answer where no limit is given, and at most: an answer is made whole in memory.
inline constexpr std::uint64_t gcDefaultAnswerRows = 1000;
inline constexpr std::uint64_t gcMostAnswerRows = 20000;

/// Where the answers come from.
struct ZTSApiSources {
    std::string mStateDirectory;  ///< holds the history
    std::string mHost;            ///< this host's name
    std::string mVersion;
    std::function<bool()> mMayRead;             ///< whether the history may be opened already
    std::function<nlohmann::json()> mReadLive;  ///< the running sensor's live state; called on the server's thread
    /// Gives series of their own to ports that are new in the facts, and fills in all that have one. Called by any of
    /// those who ask for metrics.
    std::function<void(ZTSMetricFacts&)> mGiveSeries;
    std::function<void(ZTCNameBook&)> mAddNames;  ///< puts the administrator's names into a book
};

/// One thread: that of the server.
class ZTCApi {
public:
    explicit ZTCApi(ZTSApiSources aSources);
    ~ZTCApi();
    ZTCApi(const ZTCApi&) = delete;
    ZTCApi& operator=(const ZTCApi&) = delete;

    /// Paths: / and the other files of the page, /healthz, /metrics, /api/v1/status, /api/v1/events, /api/v1/ports,
    /// /api/v1/paths, /api/v1/explain, /api/v1/timeline, /api/v1/stream. The parameters are the commands' options:
    /// since, until, kind, port, initiator, lun, limit, open; paths: port, initiator, lun, at, trouble; explain:
    /// subject, or since and until; timeline: from, to, columns. A parameter that is wrong or unknown gets 400 and a
    /// document with the member `error`; a path that is not there 404; a history that cannot be read 503.
    ZTSWebResponse answer(const ZTSWebRequest& acrRequest);

private:
    const ZTCHistory& openHistory();
    ZTCNameBook makeNames(const ZTCHistory& acrHistory) const;
    ZTSWebResponse answerKnown(const ZTSWebRequest& acrRequest);
    ZTSWebResponse answerHealth();
    ZTSWebResponse answerMetrics();
    nlohmann::ordered_json makeStatus();
    nlohmann::ordered_json makeEvents(const ZTSWebRequest& acrRequest);
    nlohmann::ordered_json makePorts(const ZTSWebRequest& acrRequest);
    nlohmann::ordered_json makePaths(const ZTSWebRequest& acrRequest);
    nlohmann::ordered_json makeDifferences(const ZTSWebRequest& acrRequest);
    nlohmann::ordered_json makeExplanation(const ZTSWebRequest& acrRequest);
    nlohmann::ordered_json makeTimeline(const ZTSWebRequest& acrRequest);
    ZTSStatusFacts gatherFacts();

    const ZTSApiSources mSources;
    std::unique_ptr<ZTCHistory> mpHistory;
};

#endif
