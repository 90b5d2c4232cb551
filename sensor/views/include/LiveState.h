/// The state of a running sensor, as the collector sends it and `tavik` reads it.
///
/// The collector answers `{"request":"status"}` on the control socket with one line: the JSON object below. Every
/// member may be missing or null: it is then not known, which is not the same as zero or empty. A member of a wrong
/// type counts as not known and is named in `mProblems`. Members that this page does not name are skipped. Times
/// are texts as of RFC 3339 with an offset and up to six digits of a fraction. WWNs are texts with colons.
///
///     {"schema": "tavik.live/1", "storeId": "5f…", "now": "2026-11-21T10:04:12.000000+01:00",
///      "keeper": {"pid": 811, "state": "running", "since": "…", "nextStart": null},
///      "agent": {"running": true, "pid": 813, "generation": "…", "since": "…", "restarts": 0, "endReason": null,
///                "problem": null, "adapters": 2, "adaptersAtStart": 2,
///                "heldBytes": 0, "heldRecords": 0, "limitBytes": 262144},
///      "collector": {"pid": 812, "since": "…", "lastAsked": "…", "lastRetrieval": "…", "lastEvent": "…",
///                    "lastEventKind": "rscn", "disk": "ok", "diskProblem": null, "waitingFrames": 0,
///                    "waitingBytes": 0},
///      "adapters": [{"wwpn": "10:…:01", "wwnn": "20:…:01", "host": "host7", "portState": "Online",
///                    "speed": "16 Gbit"}],
///      "kinds": [{"initiator": {"wwpn": "10:…:01", "wwnn": "20:…:01", "host": "host7"},
///                 "kinds": {"rscn": "listening", "link": "no_rights"}, "words": {"link": "needs CAP_NET_ADMIN"}}],
///      "ledger": [{"initiator": {…}, "kind": "rscn", "received": 9, "refused": {"total-limit": 0}, "consolidated": 9,
///                  "handedOver": 9, "held": 0, "dropped": 0}],
///      "losses": {"since": "…", "refused": {"total-limit": 0}, "dropped": 0, "library": [{"name": "…", "count": 0}]},
///      "topology": {"scanned": "…", "ageSeconds": 12.5, "stale": true, "staleSince": "…", "blocked": ["/sys/…"]},
///      "warnings": [{"kind": "queue-full", "text": "queue-full of array7 ctrl-A: 120 within 300.0 s", "since": "…",
///                    "given": 2, "next": "…"}]}
///
/// - `keeper.state`: `starting`, `running`, `waiting-for-adapters` (also for a library: see `endReason`),
///   `waiting-to-restart` or `stopping`. `since`: when that state began. `nextStart`: when the agent is started next,
///   where that is known.
/// - `agent` is the running agent, or the last one. `endReason` is why the last one ended, in the words of the status
///   page: `shut-down`, `signal`, `no-library`, `no-adapters`, `no-event-support`, `sensor-gone`, `other`; null while
///   one runs. `problem` is one line for people on why it is down. `restarts`: starts since the keeper's own start,
///   less the first.
/// - `collector.disk`: `ok`, `full` or `read-only`; anything but `ok` means that it does not ask. `diskProblem` is one
///   line that names the folder and the reason. `waitingFrames` and `waitingBytes` are in the spool, not yet in the
///   history.
/// - `kinds`: an entry for each adapter. `words`: what the adapters' library has said about a kind.
/// - `ledger`: the totals of all agents that the database has seen, the running one's up to now. Where it is missing,
///   the reader takes the rows that the history holds.
/// - `topology`: when the names of ports and disks were last read. `staleSince`: since when they may be out of date,
///   because the files in `blocked` do not answer, or the whole reading hangs.
/// - `losses`: what was refused or dropped in the last 24 hours, or since `since` where the collector knows less.
/// - `warnings`: the open ones of the configuration's rules. `given`: how often. `next`: when again, if it goes on. A
///   hook that failed is one of the kind `hook`, an output that cannot be written one of the kind `output`, until it
///   works again.
///
/// `{"request":"warn-test"}` runs every hook with a test record. The answer comes when all have ended:
/// `{"hooks":[{"kind":"queue-full","run":["/usr/local/bin/tell"],"problem":null}]}`.
/// `{"request":"mark","name":"before update"}` is answered by `{"mark":"before update","time":"…"}` once it is stored.
/// A request that cannot be served is answered by `{"error":"…"}`, one line for people.
#ifndef SENSOR_VIEWS_INCLUDE_LIVESTATE_H
#define SENSOR_VIEWS_INCLUDE_LIVESTATE_H

#include <cstdint>
#include <map>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/HistoryTime.h"

enum ZTELiveKeeperState : std::uint8_t {
    ZTKP_Starting,
    ZTKP_Running,
    ZTKP_WaitingForAdapters,
    ZTKP_WaitingToRestart,
    ZTKP_Stopping,
    ZTKP_Count
};

/// The text in JSON: "starting", "running", and so on.
const char* getLiveKeeperStateName(ZTELiveKeeperState aState);

enum ZTEDiskState : std::uint8_t { ZTDK_Ok, ZTDK_Full, ZTDK_ReadOnly, ZTDK_Count };

/// The text in JSON: "ok", "full" or "read-only".
const char* getDiskStateName(ZTEDiskState aState);

struct ZTSLiveKeeper {
    std::optional<std::uint64_t> mPid;
    std::optional<ZTELiveKeeperState> mState;
    std::optional<ZTCHistoryTime> mSince;
    std::optional<ZTCHistoryTime> mNextStart;
};

struct ZTSLiveAgent {
    std::optional<bool> mIsRunning;
    std::optional<std::uint64_t> mPid;
    std::string mGeneration;
    std::optional<ZTCHistoryTime> mSince;
    std::optional<std::uint64_t> mRestarts;
    std::string mEndReason;
    std::string mProblem;
    std::optional<std::uint64_t> mAdapters;
    std::optional<std::uint64_t> mAdaptersAtStart;
    std::optional<std::uint64_t> mHeldBytes;
    std::optional<std::uint64_t> mHeldRecords;
    std::optional<std::uint64_t> mLimitBytes;
};

struct ZTSLiveCollector {
    std::optional<std::uint64_t> mPid;
    std::optional<ZTCHistoryTime> mSince;
    std::optional<ZTCHistoryTime> mLastAsked;
    std::optional<ZTCHistoryTime> mLastRetrieval;
    std::optional<ZTCHistoryTime> mLastEvent;
    std::string mLastEventKind;
    std::optional<ZTEDiskState> mDisk;
    std::string mDiskProblem;
    std::optional<std::uint64_t> mWaitingFrames;
    std::optional<std::uint64_t> mWaitingBytes;
};

struct ZTSLiveAdapter {
    ZTSInitiator mInitiator;
    std::string mPortState;  ///< "Online"; empty: not known
    std::string mSpeed;
};

struct ZTSLiveKinds {
    ZTSInitiator mInitiator;
    std::map<std::string, std::string> mStates;  ///< kind's name to the name of its state
    std::map<std::string, std::string> mWords;   ///< kind's name to the library's words

    /// The kinds and their states, in the order of the table of kinds; what is not in it comes behind.
    std::vector<std::pair<std::string, std::string>> getOrdered() const;
};

struct ZTSLiveLedgerRow {
    ZTSInitiator mInitiator;
    std::string mKind;
    std::optional<std::uint64_t> mReceived;
    std::map<std::string, std::uint64_t> mRefused;  ///< by reason
    std::optional<std::uint64_t> mConsolidated;
    std::optional<std::uint64_t> mHandedOver;
    std::optional<std::uint64_t> mHeld;
    std::optional<std::uint64_t> mDropped;
};

struct ZTSLibraryLoss {
    std::string mName;
    std::uint64_t mCount = 0;
};

struct ZTSLiveLosses {
    std::optional<ZTCHistoryTime> mSince;
    std::map<std::string, std::uint64_t> mRefused;  ///< by reason
    std::optional<std::uint64_t> mDropped;
    std::vector<ZTSLibraryLoss> mLibrary;
};

/// How current the names of ports and disks are.
struct ZTSLiveTopology {
    std::optional<ZTCHistoryTime> mScanned;
    std::optional<bool> mIsStale;
    std::optional<ZTCHistoryTime> mStaleSince;
    std::vector<std::string> mBlocked;  ///< files that do not answer
};

/// A warning that is open.
struct ZTSLiveWarning {
    std::string mKind;
    std::string mText;  ///< for people
    std::optional<ZTCHistoryTime> mSince;
    std::optional<std::uint64_t> mGiven;
    std::optional<ZTCHistoryTime> mNext;
};

struct ZTSLiveState {
    std::string mStoreId;
    std::optional<ZTCHistoryTime> mNow;
    ZTSLiveKeeper mKeeper;
    ZTSLiveAgent mAgent;
    ZTSLiveCollector mCollector;
    std::optional<std::vector<ZTSLiveAdapter>> mAdapters;
    std::optional<std::vector<ZTSLiveKinds>> mKinds;
    std::optional<std::vector<ZTSLiveLedgerRow>> mLedger;
    std::optional<ZTSLiveLosses> mLosses;
    std::optional<ZTSLiveTopology> mTopology;
    std::optional<std::vector<ZTSLiveWarning>> mWarnings;
    std::vector<std::string> mProblems;  ///< members that could not be read, one line each
};

/// Never throws, whatever the document holds.
ZTSLiveState readLiveState(const nlohmann::json& acrDocument);

#endif
