/// What this library can lose, by name.
#ifndef LIBKPM_LINUX_SRC_LOSSES_H
#define LIBKPM_LINUX_SRC_LOSSES_H

#include <array>
#include <cstdint>

#include "libkpm/common/include/Losses.h"

enum ZTELinuxLoss : std::uint8_t {
    ZTLO_SocketOverrun,     ///< the socket's buffer was full: any number of messages is lost
    ZTLO_MissingMessage,    ///< a number was passed over in the count of FC events
    ZTLO_ForeignMessage,    ///< a message that the kernel did not send
    ZTLO_MalformedMessage,  ///< a message that does not parse
    ZTLO_OutcomeOverrun,    ///< outcomes that a processor's trace buffer had no place for
    ZTLO_SenseOverrun,      ///< sense data, the same; their outcomes come without
    ZTLO_MalformedRecord,   ///< a trace page or record that does not parse
    ZTLO_Failure            ///< reading failed otherwise, or memory ran out over an event
};

/// One row a kind, in the order of the enumeration.
inline constexpr std::array<ZTSLossKind, ZTLO_Failure + 1> gcLinuxLosses{
    {{"fc-socket-overruns", "times the FC event socket overran: events are lost, and the link states are read again"},
     {"fc-events-missing", "FC events are lost: their numbers were passed over; the link states are read again"},
     {"fc-messages-foreign", "FC messages are dropped: the kernel did not send them"},
     {"fc-messages-malformed", "FC messages are dropped: they do not parse"},
     {"scsi-outcomes-lost", "SCSI outcomes are lost: a trace buffer overran"},
     {"scsi-sense-lost", "times sense data are lost: a trace buffer overran; their check conditions come without"},
     {"trace-records-malformed", "trace records are dropped: they do not parse"},
     {"other", "events are lost: they could not be read or handled"}}};

#endif
