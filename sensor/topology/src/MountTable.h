/// Where block devices are mounted, or swapped to. Source: `proc(5)`, mountinfo and swaps.
#ifndef SENSOR_TOPOLOGY_SRC_MOUNTTABLE_H
#define SENSOR_TOPOLOGY_SRC_MOUNTTABLE_H

#include <map>
#include <string>
#include <vector>

/// Mount points by block device, sorted; "[swap]" where a device is swapped to.
/// @param acrDeviceOfNumber  the block devices of interest by "MAJOR:MINOR"
std::map<std::string, std::vector<std::string>> readMounts(const std::string& acrMountInfo, const std::string& acrSwaps,
                                                           const std::map<std::string, std::string>& acrDeviceOfNumber);

#endif
