/// The messages that the kernel multicasts for Fibre Channel hosts: netlink messages of the SCSI transports' family
/// (18), each with one event of the FC transport class. Pure: bytes in, events out.
///
/// A message, offsets from its begin:
///
///      0  message length (4), type 0x11 (2), flags (2), sequence (4), sender (4)      the netlink header
///     16  version 1 (1), transport 1 (1), magic 0xA1B2 (2), kind 0x100 (2), length (2)  the SCSI transports' header
///     24  seconds (8), vendor (8), host (2), length of the data (2), number (4), code (4)
///     52  data
///
/// The whole is padded to a multiple of 8 bytes. Integers are in the host's order.
#ifndef LIBKPM_LINUX_SRC_FCMESSAGE_H
#define LIBKPM_LINUX_SRC_FCMESSAGE_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "libkpm/linux/src/HostBytes.h"

/// Event codes of the transport class that the library looks at.
enum ZTELinuxFcCode : std::uint32_t {
    ZTLFC_Lip = 0x1,
    ZTLFC_LinkUp = 0x2,
    ZTLFC_LinkDown = 0x3,
    ZTLFC_LipReset = 0x4,
    ZTLFC_Rscn = 0x5,
    ZTLFC_AdapterChange = 0x103,
    ZTLFC_PortUnknown = 0x200,  ///< the first of the five that report a port's state
    ZTLFC_PortError = 0x204     ///< the last of them
};

/// The longest message that can come: 52 bytes and 65535 of data, padded.
inline constexpr std::size_t gcMostFcMessageBytes = 65592;

struct ZTSLinuxFcEvent {
    std::uint32_t mHost = 0;
    std::uint32_t mNumber = 0;  ///< one count for all hosts
    std::uint32_t mCode = 0;
    ZTCByteSpan mData;  ///< borrowed from the datagram
};

/// Walks the messages of one datagram.
class ZTCLinuxFcMessages {
public:
    explicit ZTCLinuxFcMessages(ZTCByteSpan aDatagram, std::endian aOrder = std::endian::native)
        : mRest(aDatagram), mOrder(aOrder) {}

    /// The next event; nothing when the datagram is at its end. Skips messages of other kinds. Skips and counts
    /// malformed messages. A bad length ends the datagram and counts once.
    std::optional<ZTSLinuxFcEvent> next();

    /// Messages so far that did not parse.
    std::uint64_t getMalformed() const { return mMalformed; }

private:
    std::optional<ZTSLinuxFcEvent> parse(ZTCByteSpan aMessage);

    ZTCByteSpan mRest;
    std::endian mOrder;
    std::uint64_t mMalformed = 0;
};

/// The payload of a registered state change notification as on the wire (command 0x61, page length 4, payload length,
/// pages) from the data of an RSCN event: page words in the host's order. Nothing where the data are no whole number of
/// pages, are none, or are more than the length field can say.
std::optional<std::vector<std::uint8_t>> makeLinuxRscn(ZTCByteSpan aData, std::endian aOrder = std::endian::native);

#endif
