#include "sensor/diagnosis/src/SenseCodes.h"

#include <algorithm>
#include <array>
#include <cstdio>

struct ZTSSenseCode {
    std::uint8_t mAsc;
    std::uint8_t mAscq;
    const char* mpName;
};

static constexpr std::array scCodes{
    ZTSSenseCode{0x08, 0x00, "logical unit communication failure"},
    ZTSSenseCode{0x08, 0x01, "logical unit communication time-out"},
    ZTSSenseCode{0x08, 0x02, "logical unit communication parity error"},
    ZTSSenseCode{0x08, 0x03, "logical unit communication CRC error"},
    ZTSSenseCode{0x10, 0x00, "ID CRC or ECC error"},
    ZTSSenseCode{0x10, 0x01, "logical block guard check failed"},
    ZTSSenseCode{0x10, 0x02, "logical block application tag check failed"},
    ZTSSenseCode{0x10, 0x03, "logical block reference tag check failed"},
    ZTSSenseCode{0x0C, 0x00, "write error"},
    ZTSSenseCode{0x0C, 0x02, "write error, automatic reallocation failed"},
    ZTSSenseCode{0x11, 0x00, "unrecovered read error"},
    ZTSSenseCode{0x11, 0x01, "read retries exhausted"},
    ZTSSenseCode{0x11, 0x04, "unrecovered read error, automatic reallocation failed"},
    ZTSSenseCode{0x20, 0x00, "invalid command operation code"},
    ZTSSenseCode{0x24, 0x00, "invalid field in CDB"},
    ZTSSenseCode{0x25, 0x00, "logical unit not supported"},
    ZTSSenseCode{0x29, 0x00, "power on, reset, or bus device reset occurred"},
    ZTSSenseCode{0x29, 0x01, "power on occurred"},
    ZTSSenseCode{0x29, 0x02, "SCSI bus reset occurred"},
    ZTSSenseCode{0x29, 0x03, "bus device reset function occurred"},
    ZTSSenseCode{0x29, 0x04, "device internal reset"},
    ZTSSenseCode{0x29, 0x05, "transceiver mode changed to single-ended"},
    ZTSSenseCode{0x29, 0x06, "transceiver mode changed to LVD"},
    ZTSSenseCode{0x29, 0x07, "I_T nexus loss occurred"},
    ZTSSenseCode{0x2A, 0x00, "parameters changed"},
    ZTSSenseCode{0x2A, 0x01, "mode parameters changed"},
    ZTSSenseCode{0x2A, 0x02, "log parameters changed"},
    ZTSSenseCode{0x2A, 0x03, "reservations preempted"},
    ZTSSenseCode{0x2A, 0x04, "reservations released"},
    ZTSSenseCode{0x2A, 0x05, "registrations preempted"},
    ZTSSenseCode{0x2A, 0x06, "asymmetric access state changed"},
    ZTSSenseCode{0x2A, 0x07, "implicit asymmetric access state transition failed"},
    ZTSSenseCode{0x2A, 0x08, "priority changed"},
    ZTSSenseCode{0x2A, 0x09, "capacity data has changed"},
    ZTSSenseCode{0x2A, 0x0A, "error history I_T nexus cleared"},
    ZTSSenseCode{0x2A, 0x0B, "error history snapshot released"},
    ZTSSenseCode{0x2A, 0x10, "timestamp changed"},
    ZTSSenseCode{0x3F, 0x00, "target operating conditions have changed"},
    ZTSSenseCode{0x3F, 0x01, "microcode has been changed"},
    ZTSSenseCode{0x3F, 0x02, "changed operating definition"},
    ZTSSenseCode{0x3F, 0x03, "inquiry data has changed"},
    ZTSSenseCode{0x3F, 0x04, "component device attached"},
    ZTSSenseCode{0x3F, 0x05, "device identifier changed"},
    ZTSSenseCode{0x3F, 0x06, "redundancy group created or modified"},
    ZTSSenseCode{0x3F, 0x07, "redundancy group deleted"},
    ZTSSenseCode{0x3F, 0x08, "spare created or modified"},
    ZTSSenseCode{0x3F, 0x09, "spare deleted"},
    ZTSSenseCode{0x3F, 0x0A, "volume set created or modified"},
    ZTSSenseCode{0x3F, 0x0B, "volume set deleted"},
    ZTSSenseCode{0x3F, 0x0C, "volume set deassigned"},
    ZTSSenseCode{0x3F, 0x0D, "volume set reassigned"},
    ZTSSenseCode{0x3F, 0x0E, "reported LUNs data has changed"},
    ZTSSenseCode{0x3F, 0x0F, "echo buffer overwritten"},
    ZTSSenseCode{0x44, 0x00, "internal target failure"},
    ZTSSenseCode{0x47, 0x00, "SCSI parity error"},
    ZTSSenseCode{0x47, 0x01, "data phase CRC error detected"},
    ZTSSenseCode{0x47, 0x02, "SCSI parity error detected during ST data phase"},
    ZTSSenseCode{0x47, 0x03, "information unit iuCRC error detected"},
    ZTSSenseCode{0x47, 0x04, "asynchronous information protection error detected"},
    ZTSSenseCode{0x47, 0x05, "protocol service CRC error"},
    ZTSSenseCode{0x48, 0x00, "initiator detected error message received"},
    ZTSSenseCode{0x49, 0x00, "invalid message error"},
    ZTSSenseCode{0x4B, 0x00, "data phase error"},
    ZTSSenseCode{0x4B, 0x01, "invalid target port transfer tag received"},
    ZTSSenseCode{0x4B, 0x02, "too much write data"},
    ZTSSenseCode{0x4B, 0x03, "ACK/NAK time-out"},
    ZTSSenseCode{0x4B, 0x04, "NAK received"},
    ZTSSenseCode{0x4B, 0x05, "data offset error"},
    ZTSSenseCode{0x4B, 0x06, "initiator response time-out"},
    ZTSSenseCode{0x4B, 0x07, "connection lost"},
};

std::string describeSenseCode(std::uint32_t aAsc, std::uint32_t aAscq) {
    std::array<char, 24> lNumbers{};
    std::snprintf(lNumbers.data(), lNumbers.size(), "%02X/%02X", aAsc, aAscq);
    const auto lFound = std::ranges::find_if(
        scCodes, [&](const ZTSSenseCode& acrCode) { return acrCode.mAsc == aAsc && acrCode.mAscq == aAscq; });
    return lFound == scCodes.end() ? lNumbers.data() : std::string(lNumbers.data()) + " " + lFound->mpName;
}
