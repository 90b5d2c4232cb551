/// The kinds of event as the agent is to treat them, written down a second time, so that the agent's own tables are
/// held against something: one row a kind, walked by the tests.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_DELIVEREDKINDS_H
#define TESTS_UNIT_TAVIK_SUPPORT_DELIVEREDKINDS_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"

/// What an event does that matches the pending record.
enum class ZTEOnMatch { Counts, Appends, SetsBits };

struct ZTSByteRange {
    std::size_t mBegin;
    std::size_t mEnd;  ///< one past the last
};

struct ZTSDeliveredKind {
    const char* mpName;
    unsigned mCategory;
    unsigned mSubcategory;
    std::size_t mMinimumLength;  ///< of the payload; 0: a kind without data
    std::string mTooShortText;   ///< message up to its two numbers
    std::string mNotice;
    ZTCBytes mPayload;                    ///< of exactly the minimum length
    std::string mRecordHex;               ///< the record that this payload makes
    std::vector<ZTSByteRange> mIdentity;  ///< payload bytes that tell one record from another
    ZTEOnMatch mOnMatch;
    std::string mAppendedHex;  ///< what a second event of this payload appends

    bool isIdentityByte(std::size_t aByte) const;
    std::size_t recordSize() const { return mRecordHex.size() / 2; }
    std::size_t appendedSize() const { return mAppendedHex.size() / 2; }
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
