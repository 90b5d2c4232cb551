/// Entries for the system's journal by its native protocol: one datagram an entry, or a sealed file in memory where an
/// entry is too large for a datagram.
#ifndef SENSOR_OUTLETS_INCLUDE_JOURNALSOCKET_H
#define SENSOR_OUTLETS_INCLUDE_JOURNALSOCKET_H

#include <string>
#include <utility>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"

/// Where a journal listens.
inline constexpr const char* gcJournalSocketPath = "/run/systemd/journal/socket";

/// Names and values. A name has capital letters, digits and underscores; a value may hold any bytes.
using ZTCJournalFields = std::vector<std::pair<std::string, std::string>>;

/// The entry as it is sent: NAME=value and a line break; a value with a line break as NAME, a line break, its length in
/// eight bytes from the lowest on, and the value.
std::string toJournalEntry(const ZTCJournalFields& acrFields);

class ZTCJournalSocket {
public:
    /// Opens nothing yet.
    explicit ZTCJournalSocket(std::string aPath = gcJournalSocketPath) : mPath(std::move(aPath)) {}

    /// Sends one entry. Throws ZTCSystemCallEx where no journal takes it: none listens, or its queue stays full for a
    /// second.
    void send(const ZTCJournalFields& acrFields);

private:
    void sendFile(const std::string& acrEntry);

    const std::string mPath;
    ZTCFileDescriptor mSocket;
};

#endif
