/// Episodes and raw records as the history hands them out.
///
/// An episode is a run of like events of one initiator, kind, remote port and identity. The identity is what the agent
/// compares for the kind, without the LUN. Gaps within an episode are at most `episode.gap` seconds.
#ifndef SENSOR_STORE_INCLUDE_EPISODE_H
#define SENSOR_STORE_INCLUDE_EPISODE_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sensor/client/include/FcName.h"
#include "sensor/client/include/Response.h"
#include "sensor/store/include/HistoryTime.h"

/// An event kind as one number: the delivered category in the high byte, the subcategory in the low byte.
using ZTCKindKey = std::uint16_t;

constexpr ZTCKindKey makeKindKey(std::uint8_t aCategory, std::uint8_t aSubcategory) {
    return static_cast<ZTCKindKey>(aCategory << 8 | aSubcategory);
}

/// The kind's name, such as "queue-full"; "other" for 0; "unknown-C-S" in decimal for a pair that is no kind.
std::string getKindName(ZTCKindKey aKind);

/// The kind of that name, one of the twenty; nothing for any other text.
std::optional<ZTCKindKey> findKind(std::string_view aName);

/// How far an episode has come. The numbers are those in the database.
enum ZTEPhase : std::uint8_t {
    ZTP_Open = 0,    ///< it has begun
    ZTP_Update = 1,  ///< it has grown; at most one such change a minute
    ZTP_Closed = 2   ///< it has ended
};

/// "open", "update" or "closed".
const char* getPhaseName(ZTEPhase aPhase);

/// A local port. Without a WWPN: events of boards that the agent could not name, or a key that holds no names.
struct ZTSInitiator {
    std::optional<ZTSFcName> mWwpn;
    std::optional<ZTSFcName> mWwnn;
    std::string mHost;  ///< "host7"; empty: not known

    bool operator==(const ZTSInitiator&) const = default;
};

/// A remote port. What is not known is absent.
struct ZTSRemotePort {
    ZTSFcName mWwpn;
    std::optional<ZTSFcName> mWwnn;
    std::optional<std::uint32_t> mFcId;  ///< 24 bits

    bool operator==(const ZTSRemotePort&) const = default;
};

/// The union of the LUNs of an episode.
struct ZTSLunSet {
    bool mIsAll = false;                  ///< an event was for every LUN
    std::vector<std::uint32_t> mNumbers;  ///< rising, each once; those that were named one by one
    bool mHasMore = false;                ///< more numbers above 255 were seen than are kept (gcMostOtherLuns)

    bool operator==(const ZTSLunSet&) const = default;
};

/// How often one reason was given.
struct ZTSReasonCount {
    std::uint32_t mValue = 0;        ///< lsrjt: reason code. fcp-read-check: FCPI parameter. queue-depth: new depth
    std::uint32_t mExplanation = 0;  ///< lsrjt: reason code explanation. Otherwise 0
    std::uint64_t mCount = 0;

    bool operator==(const ZTSReasonCount&) const = default;
};

/// What an episode holds beside its count and times. Absent where the kind has no such field.
struct ZTSEpisodeDetail {
    std::optional<ZTSFcName> mNodeName;             ///< plogi, adisc
    std::optional<ZTSFcName> mPayloadPortName;      ///< logo
    std::optional<std::uint32_t> mOriginalCommand;  ///< lsrjt
    std::optional<std::uint32_t> mOpCode;           ///< fcp-read-check
    std::optional<std::uint32_t> mSenseKey;         ///< check-condition
    std::optional<std::uint32_t> mAsc;              ///< check-condition
    std::optional<std::uint32_t> mPage;             ///< rscn: address format in bits 24 and 25, FC address below
    std::optional<ZTSLunSet> mLuns;                 ///< every kind that has LUNs
    std::vector<std::uint32_t> mAscqs;              ///< check-condition; rising, each once
    std::vector<std::uint32_t> mCommandCodes;       ///< check-condition; rising, each once
    std::vector<ZTSReasonCount> mReasons;  ///< lsrjt, fcp-read-check, queue-depth; rising by value, explanation
    std::uint64_t mOtherReasons = 0;       ///< occurrences of reasons beyond the first gcMostReasons different ones

    bool operator==(const ZTSEpisodeDetail&) const = default;
};

/// Different LUN numbers above 255, and different reasons, that one episode keeps.
inline constexpr std::size_t gcMostOtherLuns = 1024;
inline constexpr std::size_t gcMostReasons = 1024;

struct ZTSEpisode {
    std::uint64_t mSeq = 0;      ///< of its latest change; never repeats in one database
    std::uint64_t mEpisode = 0;  ///< its number, rising with arrival; never changes
    ZTEPhase mPhase = ZTP_Open;
    ZTCKindKey mKind = 0;
    ZTSInitiator mInitiator;
    std::optional<ZTSRemotePort> mRemotePort;  ///< absent: the kind has none, or it is not known
    std::uint64_t mCount = 0;                  ///< occurrences, exactly
    std::uint64_t mRecords = 0;                ///< records that they came in
    ZTCHistoryTime mFirst;
    ZTCHistoryTime mLast;
    bool mHasClockFlag = false;  ///< a record's last time lies before its first
    bool mIsMalformed = false;   ///< the records' data do not fit the kind's layout, or the kind is unknown
    ZTSEpisodeDetail mDetail;

    bool isOpen() const { return mPhase != ZTP_Closed; }
};

/// A record as the agent handed it over.
struct ZTSStoredRecord {
    std::uint64_t mSeq = 0;  ///< order of arrival; shares its numbers with the changes of episodes
    std::uint64_t mEpisode = 0;
    std::uint64_t mOrdinal = 0;  ///< place within its episode, from 0 on
    ZTCKindKey mKind = 0;
    ZTSInitiator mInitiator;
    std::optional<ZTSRemotePort> mRemotePort;
    bool mHasClockFlag = false;
    ZTSReceivedRecord mRecord;
};

#endif
