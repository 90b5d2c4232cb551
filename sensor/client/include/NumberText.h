/// Numbers as people read them.
#ifndef SENSOR_CLIENT_INCLUDE_NUMBERTEXT_H
#define SENSOR_CLIENT_INCLUDE_NUMBERTEXT_H

#include <cstdint>
#include <string>
#include <vector>

/// "12,345".
std::string formatNumber(std::uint64_t aNumber);

/// "1 event", "12,345 events".
std::string formatCount(std::uint64_t aNumber, const std::string& acrOne);

/// "0-2,40" of rising numbers.
std::string formatRanges(const std::vector<std::uint32_t>& acrNumbers);

#endif
