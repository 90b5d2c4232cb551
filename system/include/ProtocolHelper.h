/// Moves one message at a time between a buffer and a channel, and dumps it to the log in sniffer mode.

#ifndef SYSTEM_INCLUDE_PROTOCOLHELPER_H
#define SYSTEM_INCLUDE_PROTOCOLHELPER_H

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "os/common/include/Reader.h"
#include "os/common/include/Writer.h"

/// Used by any thread that may use the reader or the writer.
///
/// In sniffer mode each message's body is dumped, whatever the log code, sixteen bytes a line: their hex digits, each
/// byte followed by a blank, padded to the width of sixteen, one blank more, then the bytes as text with a dot for what
/// cannot be printed.
class ZTCProtocolHelper {
public:
    ZTCProtocolHelper() = default;
    virtual ~ZTCProtocolHelper() = default;

    ZTCProtocolHelper(const ZTCProtocolHelper&) = delete;
    ZTCProtocolHelper& operator=(const ZTCProtocolHelper&) = delete;

    /// Puts the message that waits in the reader into arBuffer, which may be empty before. The last argument is 0, for
    /// nothing special. Throws what the reader does.
    virtual void receive(const ZTCPointer<ZTCReader>& acrReader, ZTCPointer<ZTCBuffer>& arBuffer, unsigned aFlags);

    /// Sends the message. The last argument is 0. Throws what the writer does.
    virtual void send(const ZTCPointer<ZTCWriter>& acrWriter, const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned aFlags);

    /// Sniffer mode, for the whole process; off at first. Any thread.
    static void setSnifferMode(bool aIsOn);
    static bool isSnifferModeOn();
};

#endif
