/// A response as the sensor holds it.
#ifndef SENSOR_CLIENT_INCLUDE_RESPONSE_H
#define SENSOR_CLIENT_INCLUDE_RESPONSE_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/FcName.h"

/// A date-time. All but the last field is the agent's local time. Values are kept as received, whatever they are.
struct ZTSReceivedTime {
    std::uint16_t mYear = 0;
    std::uint8_t mMonth = 0;
    std::uint8_t mDay = 0;
    std::uint8_t mHour = 0;
    std::uint8_t mMinute = 0;
    std::uint8_t mSecond = 0;
    std::uint8_t mSeparator = 0;
    std::uint16_t mMilliseconds = 0;
    std::uint16_t mMicroseconds = 0;  ///< below the millisecond
    std::uint64_t mEpochSeconds = 0;

    bool operator==(const ZTSReceivedTime&) const = default;

    /// "2026-03-04 05:06:07.123456".
    std::string toText() const;
};

struct ZTSReceivedNames {
    ZTSFcName mPortName;
    ZTSFcName mNodeName;

    bool operator==(const ZTSReceivedNames&) const = default;
};

/// One consolidated observation.
struct ZTSReceivedRecord {
    std::uint32_t mOccurrences = 0;
    ZTSReceivedTime mBegin;
    ZTSReceivedTime mEnd;
    std::uint8_t mCategory = 0;
    std::uint8_t mSubcategory = 0;
    std::optional<ZTSReceivedNames> mNames;  ///< of the remote port, where it is a registered target
    std::vector<std::uint8_t> mEventData;    ///< see RecordFields.h

    bool operator==(const ZTSReceivedRecord&) const = default;
};

/// The records of one local port.
struct ZTSReceivedList {
    std::string mInitiatorKey;  ///< node name, a full stop, port name; kept as received
    std::vector<ZTSReceivedRecord> mRecords;

    bool operator==(const ZTSReceivedList&) const = default;

    /// The key's two names, where it consists of them.
    std::optional<ZTSReceivedNames> getInitiatorNames() const;
};

struct ZTSResponse {
    ZTEResponseOutcome mOutcome = ZTRO_Success;
    std::int32_t mResult = 0;           ///< of ZTRO_Success
    std::uint16_t mStatus = 0;          ///< of ZTRO_Failed
    std::uint32_t mAnnouncedLists = 0;  ///< of ZTRO_ScopeData; more than follow where the agent skipped a board
    std::vector<ZTSReceivedList> mLists;
    std::size_t mUnreadBytes = 0;  ///< bytes behind the last field; 0 in what an agent of this protocol sends

    bool operator==(const ZTSResponse&) const = default;

    std::uint64_t countRecords() const;
    std::uint64_t countOccurrences() const;
};

/// "ZTSAPS_Invalid" for 6, and so on; "unknown status" for a value that is none.
const char* getStatusName(std::uint16_t aStatus);

#endif
