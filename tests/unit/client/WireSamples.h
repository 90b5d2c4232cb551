/// Responses and event data of every kind, built byte by byte and independently of the code under test.
#ifndef TESTS_UNIT_CLIENT_WIRESAMPLES_H
#define TESTS_UNIT_CLIENT_WIRESAMPLES_H

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"
#include "tests/support/EventKinds.h"

/// Names that the samples use.
inline constexpr std::uint64_t gcSamplePort = 0x500601603BA01234;
inline constexpr std::uint64_t gcSampleNode = 0x50060160BBA01234;
inline constexpr const char* gcSamplePortText = "50:06:01:60:3b:a0:12:34";
inline constexpr const char* gcSampleNodeText = "50:06:01:60:bb:a0:12:34";
inline constexpr const char* gcSampleKey = "20:00:00:00:c9:00:00:01.10:00:00:00:c9:00:00:01";

/// Event data of one kind, and what tools make of it.
struct ZTSSampleData {
    ZTCBytes mData;
    std::string mJson;     ///< the "data" object
    std::string mDetails;  ///< the table's last column
};

/// What of the data goes beyond the kind's record size are appended entries.
struct ZTSSampleKind : ZTSTestKind, ZTSSampleData {};

/// One for each of the twenty kinds, in catalogue order.
std::vector<ZTSSampleKind> makeSampleKinds();

/// 2026-03-04 05:06:07.089012 local, 1772600767 seconds since the epoch.
ZTCBytes makeSampleTime();

/// One encoded record.
ZTCBytes makeSampleRecord(std::uint8_t aCategory, std::uint8_t aSubcategory, const ZTCBytes& acrData,
                          bool aHasNames = false, std::uint32_t aOccurrences = 1);

/// One encoded list.
ZTCBytes makeSampleList(const std::string& acrKey, const std::vector<ZTCBytes>& acrRecords);

/// A whole response body. `aAnnouncedLists` is what stands in its count.
ZTCBytes makeSampleResponse(std::uint32_t aAnnouncedLists, const std::vector<ZTCBytes>& acrLists);

/// Two lists: one with a record of every kind, every other one with names; one that is empty.
ZTCBytes makeFullSampleResponse();

#endif
