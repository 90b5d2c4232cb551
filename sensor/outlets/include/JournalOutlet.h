/// The system's journal as an outlet: an entry for each change of an episode, with a MESSAGE_ID of its kind that the
/// catalogue explains.
#ifndef SENSOR_OUTLETS_INCLUDE_JOURNALOUTLET_H
#define SENSOR_OUTLETS_INCLUDE_JOURNALOUTLET_H

#include <string_view>

#include "sensor/outlets/include/ChangeOutlet.h"
#include "sensor/outlets/include/JournalSocket.h"

/// MESSAGE_ID of a kind's name; that of "other" for a kind that is none of the twenty; that of "missed" for what the
/// journal did not get.
const char* getMessageId(std::string_view aKind);

class ZTCJournalOutlet : public ZTCChangeOutlet {
public:
    explicit ZTCJournalOutlet(std::string aSocketPath = gcJournalSocketPath) : mSocket(std::move(aSocketPath)) {}

    const char* getTitle() const override { return "the journal"; }
    const char* getName() const override { return "journal"; }
    void write(std::span<const ZTSOutletChange> aChanges) override;
    void writeMissed(std::uint64_t aChanges, const std::string& acrLine) override;

private:
    ZTCJournalSocket mSocket;
};

#endif
