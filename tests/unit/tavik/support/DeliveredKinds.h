/// The events that the agent consolidates one by one: for each kind a payload, the record it makes, and how a record
/// goes on. The rows build on the tests' own table of kinds.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_DELIVEREDKINDS_H
#define TESTS_UNIT_TAVIK_SUPPORT_DELIVEREDKINDS_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"
#include "tests/support/EventKinds.h"

/// What an event does that matches the pending record.
enum class ZTEOnMatch { Counts, Appends, SetsBits };

struct ZTSByteRange {
    std::size_t mBegin;
    std::size_t mEnd;  ///< one past the last
};

struct ZTSDeliveredData {
    ZTCBytes mPayload;                      ///< of exactly the kind's minimum length
    std::string mRecordHex;                 ///< the record that this payload makes
    std::vector<ZTSByteRange> mIdentity{};  ///< payload bytes that tell one record from another
    ZTEOnMatch mOnMatch = ZTEOnMatch::Counts;
    std::string mAppendedHex{};  ///< what a second event of this payload appends
};

struct ZTSDeliveredKind : ZTSTestKind, ZTSDeliveredData {
    bool isIdentityByte(std::size_t aByte) const;
};

/// The thirteen kinds with data. The payloads name the remote port gcKindPort, their second name is gcKindNode.
const std::vector<ZTSDeliveredKind>& kindsWithData();
/// The six kinds without.
const std::vector<ZTSDeliveredKind>& kindsWithoutData();
/// All nineteen that are consolidated event by event: everything but RSCN.
const std::vector<ZTSDeliveredKind>& allKinds();
const ZTSDeliveredKind& kindNamed(const std::string& acrName);

inline constexpr std::uint64_t gcKindPort = 0x500601603ba01234;
inline constexpr std::uint64_t gcKindNode = 0x500601603ba09999;

// Payloads by their fields, in the host's order as the library delivers them.
ZTCBytes makeNamesPayload(std::uint64_t aPort, std::uint64_t aSecond);
ZTCBytes makePortPayload(std::uint64_t aPort);
ZTCBytes makePortPayload(std::uint64_t aPort, const std::vector<std::uint32_t>& acrNumbers);

/// The 32 bytes of a bit field with these bits set, as hex.
std::string bitFieldHex(const std::vector<unsigned>& acrBits);

#endif
