/// Explains the events of a period of time: each rule of a table is looked for in the evidence.
///
/// Pure: no clock, no files, no history. Any thread.
#ifndef SENSOR_DIAGNOSIS_INCLUDE_DIAGNOSIS_H
#define SENSOR_DIAGNOSIS_INCLUDE_DIAGNOSIS_H

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/include/Ledger.h"
#include "sensor/topology/include/Topology.h"

/// How bad it is. The order is the order in which findings are shown.
enum ZTESeverity : std::uint8_t {
    ZTSV_Problem,  ///< I/O suffers, or is about to
    ZTSV_Warning,  ///< to be looked into
    ZTSV_Note,     ///< normal after a change; good to know
    ZTSV_Noise     ///< harmless; counted, and shown only on request
};

/// "problem", "warning", "note", "noise".
const char* getFindingSeverityName(ZTESeverity aSeverity);

/// By how much one of the kernel's counters of a port rose within one minute.
struct ZTSCounterRise {
    ZTCHistoryTime mMinute;  ///< where it begins
    ZTSFcName mInitiator;
    std::optional<ZTSFcName> mRemotePort;  ///< absent: a counter of the initiator
    std::string mCounter;                  ///< the kernel's name of it: "invalid_crc_count"
    std::uint64_t mDifference = 0;
};

/// A kind that does not reach Tavik from an initiator.
struct ZTSUnobserved {
    ZTSInitiator mInitiator;
    ZTCKindKey mKind = 0;
    ZTEKindState mState = ZTKST_NoSource;  ///< no source, no rights, or failed
};

/// All that the rules look at.
struct ZTSEvidence {
    ZTCHistoryTime mFrom;
    ZTCHistoryTime mTo;
    std::vector<ZTSEpisode> mEpisodes;      ///< that overlap the time, in any order
    std::optional<ZTSTopology> mTopology;   ///< as it was at the end; absent: not known
    std::vector<ZTSCounterRise> mCounters;  ///< of the time; a minute without an entry had no rise, or was not sampled
    std::vector<ZTSUnobserved> mUnobserved;
    /// How people call a port. Empty: WWPN, or hostN for an initiator.
    std::function<std::string(const ZTSRemotePort&)> mNameRemotePort;
    std::function<std::string(const ZTSInitiator&)> mNameInitiator;
};

struct ZTSRule;

/// One thing that the evidence shows.
struct ZTSFinding {
    const ZTSRule* mpRule = nullptr;  ///< never null in what diagnose() returns
    ZTESeverity mSeverity = ZTSV_Note;
    std::string mSubject;               ///< the port, LUN or initiator that it is about, as people call it
    std::vector<std::string> mSeen;     ///< what was seen, a sentence or two each
    std::vector<std::string> mAgainst;  ///< what speaks against it here; empty: nothing that is known
    std::vector<std::string> mNext;     ///< what to look at next, a step each
    std::vector<ZTSInitiator> mInitiators;
    std::vector<ZTSRemotePort> mRemotePorts;
    std::vector<std::uint64_t> mEpisodes;    ///< numbers of the episodes that show it, rising
    std::vector<std::uint64_t> mSeqs;        ///< sequence numbers of their latest changes, in the order of mEpisodes
    std::vector<ZTSCounterRise> mCounters;   ///< rises of counters that support it, summed over its time
    std::vector<ZTSUnobserved> mUnobserved;  ///< kinds that would say more and do not reach Tavik
    std::uint64_t mOccurrences = 0;          ///< events of these episodes
    ZTCHistoryTime mFirst;
    ZTCHistoryTime mLast;

    bool isShownBy(std::uint64_t aEpisode) const;
};

class ZTCEvidenceIndex;

/// A row of the table of rules.
struct ZTSRule {
    const char* mpId;  ///< stable; as `tavik explain` takes it
    ZTESeverity mSeverity;
    const char* mpTitle;
    const char* mpWanted;   ///< what must be there
    const char* mpAgainst;  ///< what speaks against it
    const char* mpMeans;
    const char* mpNext;   ///< steps, a line each; {port}, {wwpn}, {initiator}, {host}: of the finding
    const char* mpKinds;  ///< names of kinds that it needs or that say more, with blanks between
    void (*mpLook)(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, std::vector<ZTSFinding>& arFindings);
};

std::span<const ZTSRule> getRules();

/// The rule of that id, or null.
const ZTSRule* findRule(std::string_view aId);

/// Every rule's findings: the worst first, of like severity the latest first.
std::vector<ZTSFinding> diagnose(const ZTSEvidence& acrEvidence);

#endif
