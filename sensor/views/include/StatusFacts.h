/// What `tavik status` has learned, and what it could not learn. Gathered by the caller, judged by the table of states.
#ifndef SENSOR_VIEWS_INCLUDE_STATUSFACTS_H
#define SENSOR_VIEWS_INCLUDE_STATUSFACTS_H

#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/views/include/LiveState.h"
#include "sensor/views/include/NameBook.h"
#include "sensor/views/include/SanView.h"

/// What came of asking the running sensor.
enum ZTEAnswer : std::uint8_t {
    ZTAN_Answered,
    ZTAN_NoSensor,      ///< nobody listens on the control socket
    ZTAN_NotPermitted,  ///< this user may not ask
    ZTAN_Silent,        ///< somebody listens, but nothing came in time
    ZTAN_Refused        ///< an error, or nothing that can be read
};

/// The status page that an agent left behind.
struct ZTSLeftPage {
    std::uint64_t mHeld = 0;              ///< occurrences that the agent held
    bool mIsAgentAlive = false;           ///< its process runs on, without a sensor
    bool mHasEndedInOrder = false;        ///< the agent itself noted why it ended
    std::optional<ZTCHistoryTime> mLast;  ///< its last sign of life that is known
};

/// What the history says for the status.
struct ZTSHistoryFacts {
    std::string mStoreId;
    std::vector<ZTSLedgerRow> mLedger;
    std::vector<ZTSGap> mGaps;  ///< those within the facts' span, oldest first
    std::optional<ZTSRun> mLastRun;
    ZTSRetrievalTotals mRetrievals;
    std::optional<ZTCHistoryTime> mLastEvent;
    std::string mLastEventKind;
    std::uint64_t mOpenEpisodes = 0;  ///< at most gcMostOpenEpisodes are counted
    std::uint64_t mOpenPorts = 0;     ///< different remote ports of these
    std::optional<ZTSSanView> mSan;   ///< absent: no topology has been stored
};

/// Open episodes that the status counts at most: it has to answer at once.
inline constexpr std::uint64_t gcMostOpenEpisodes = 1000;

/// How far back losses are counted, unless less is asked for.
inline constexpr std::chrono::hours gcLossSpan{24};

/// Files and folders of the configuration that the words for people name.
struct ZTSStatusPlaces {
    std::string mSettingsFile = "/etc/tavik/tavik.toml";
    std::string mStateDirectory = "/var/lib/tavik";
    std::string mAgentLog = "/var/log/tavik/qrv-tvk.log";
    std::string mLibrary;  ///< of the adapters; empty: the agent's own default
};

struct ZTSStatusFacts {
    std::string mHost;
    ZTSStatusPlaces mPlaces;
    ZTCHistoryTime mNow;
    ZTEAnswer mAnswer = ZTAN_NoSensor;
    std::string mAnswerProblem;         ///< one line: why the sensor did not answer
    std::optional<ZTSLiveState> mLive;  ///< present for ZTAN_Answered alone
    std::optional<ZTSHistoryFacts> mHistory;
    std::string mHistoryProblem;   ///< one line: why there is no history to read
    bool mIsHistoryNewer = false;  ///< the reason is that a newer version has written it
    /// The paths of damaged ones that were set aside, by their dates; absent: not known.
    std::optional<std::vector<std::string>> mDamagedHistories{};
    std::chrono::microseconds mLossSpan = gcLossSpan;  ///< how far back the losses of both reach
    std::optional<ZTSLeftPage> mLeftPage;
    std::string mPageProblem;  ///< one line: why it is not known whether a page was left
    ZTCNameBook mNames;
};

/// Throws what ZTCHistory throws.
ZTSHistoryFacts readHistoryFacts(const ZTCHistory& acrHistory, ZTCHistoryTime aNow);

/// Events lost within the facts' span, as far as that is known.
struct ZTSLossSum {
    std::uint64_t mInGaps = 0;
    bool mIsAtLeast = false;      ///< a gap does not know how much it lacks
    std::uint64_t mRefused = 0;   ///< but those that came while collection was off
    std::uint64_t mDropped = 0;   ///< by the agent, or named as lost by the adapters' library
    bool mIsRefusedKnown = true;  ///< false: the sensor did not say

    std::uint64_t getTotal() const { return mInGaps + mRefused + mDropped; }
};

ZTSLossSum sumLosses(const ZTSStatusFacts& acrFacts);

/// The time of the last event and its kind, from the sensor or else from the history.
struct ZTSLastEvent {
    std::optional<ZTCHistoryTime> mTime;
    std::string mKind;
};

ZTSLastEvent findLastEvent(const ZTSStatusFacts& acrFacts);

/// A topology that is older than this, while the sensor runs, is not as of now.
inline constexpr std::chrono::minutes gcScanSpan{5};

/// The command to run where names are stale.
inline constexpr const char* gcStaleNamesAction = "journalctl -k -n 50";

/// Says that the running sensor's names are out of date, since when, why, and what to do. Empty: they are current, or
/// the sensor did not say.
std::string describeStaleNames(const ZTSStatusFacts& acrFacts);

/// Says that damaged histories were set aside, and what to do. Empty: there are none, as far as is known.
std::string describeDamagedHistories(const ZTSStatusFacts& acrFacts);

/// One line for each thing that could not be learned, or that is in a damaged history.
std::vector<std::string> listUnknown(const ZTSStatusFacts& acrFacts);

#endif
