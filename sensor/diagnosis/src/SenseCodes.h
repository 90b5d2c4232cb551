/// Names of the additional sense codes that the rules look at, as T10 assigns them (the list is published at t10.org).
#ifndef SENSOR_DIAGNOSIS_SRC_SENSECODES_H
#define SENSOR_DIAGNOSIS_SRC_SENSECODES_H

#include <cstdint>
#include <string>

enum ZTESenseKey : std::uint32_t {
    ZTSK_MediumError = 0x3,
    ZTSK_HardwareError = 0x4,
    ZTSK_IllegalRequest = 0x5,
    ZTSK_UnitAttention = 0x6,
    ZTSK_AbortedCommand = 0xB
};

/// "29/04 device internal reset"; the numbers alone where the table has no name.
std::string describeSenseCode(std::uint32_t aAsc, std::uint32_t aAscq);

#endif
