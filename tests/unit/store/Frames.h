/// Responses for the store's tests, built byte by byte and independently of the code under test.
#ifndef TESTS_UNIT_STORE_FRAMES_H
#define TESTS_UNIT_STORE_FRAMES_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "tests/support/Bytes.h"

/// 2026-03-04 05:06:00 UTC, the begin of a minute, in microseconds since the epoch.
inline constexpr std::int64_t gcBase = 1772600760LL * 1000000;
inline constexpr std::int64_t gcSecond = 1000000;
inline constexpr std::int64_t gcMinute = 60 * gcSecond;
inline constexpr std::int64_t gcDay = 86400 * gcSecond;

inline constexpr ZTCKindKey gcPlogi = 0x0101, gcPrlo = 0x0102, gcAdisc = 0x0104, gcLsRjt = 0x0108, gcLogo = 0x0110,
                            gcRscn = 0x0120, gcPortBusy = 0x0202, gcReadCheck = 0x0204, gcQueueFull = 0x0401,
                            gcDeviceBusy = 0x0402, gcCheckCondition = 0x0404, gcLunReset = 0x0408,
                            gcTargetReset = 0x0410, gcQueueDepth = 0x0440, gcLink = 0x0802;

inline constexpr std::uint64_t gcLocalPort = 0x10000000C9000001, gcLocalNode = 0x20000000C9000001;
inline constexpr std::uint64_t gcOtherLocalPort = 0x10000000C9000002;
inline constexpr std::uint64_t gcPortA = 0x500601603BA01234, gcPortB = 0x500601683BA01234;
inline constexpr std::uint64_t gcNode = 0x50060160BBA01234;

ZTSFcName makeName(std::uint64_t aValue);

struct ZTSTestRecord {
    ZTCKindKey mKind = gcLink;
    ZTCBytes mData;
    std::int64_t mBegin = gcBase;
    std::int64_t mEnd = gcBase;
    std::uint32_t mOccurrences = 1;
    std::optional<std::uint64_t> mPortName;  ///< with the node name gcNode
};

ZTCBytes encodeRecord(const ZTSTestRecord& acrRecord);

/// A scope-data body with one list.
ZTCBytes makeBody(const std::vector<ZTSTestRecord>& acrRecords, std::uint64_t aLocalPort = gcLocalPort);

// Event data.
ZTCBytes makeGenericData();
ZTCBytes makeTwoNamesData(std::uint64_t aPort, std::uint64_t aOther);  ///< plogi, adisc, logo
ZTCBytes makePortData(std::uint64_t aPort);                            ///< prlo, port-busy
ZTCBytes makeLsRjtData(std::uint64_t aPort, std::uint32_t aCommand,
                       const std::vector<std::pair<std::uint32_t, std::uint32_t>>& acrReasons);
ZTCBytes makeReadCheckData(std::uint64_t aPort, std::uint32_t aOpCode, std::uint32_t aLun,
                           const std::vector<std::uint32_t>& acrParameters);
ZTCBytes makeBusyData(std::uint64_t aPort, const std::vector<unsigned>& acrLuns);  ///< queue-full, device-busy
ZTCBytes makeAllLunsBusyData(std::uint64_t aPort);
ZTCBytes makeCheckConditionData(std::uint64_t aPort, std::uint32_t aSenseKey, std::uint32_t aAsc,
                                const std::vector<unsigned>& acrLuns, const std::vector<unsigned>& acrCommands,
                                const std::vector<unsigned>& acrAscqs);
ZTCBytes makeResetData(std::uint64_t aPort, const std::vector<std::uint32_t>& acrLuns);
ZTCBytes makeQueueDepthData(std::uint64_t aPort, const std::vector<std::pair<std::uint32_t, std::uint32_t>>& acrDepths);
ZTCBytes makeRscnData(std::uint32_t aPage);

/// queue-full of one LUN at a time.
ZTSTestRecord makeQueueFull(std::uint64_t aPort, std::int64_t aBegin, std::int64_t aEnd, std::uint32_t aOccurrences = 1,
                            unsigned aLun = 3);

#endif
