#include "sensor/outlets/include/JournalOutlet.h"

#include <array>

#include "sensor/views/include/TimeText.h"

/// Made once at random, and never changed: catalogues and filters name them.
static constexpr std::array<std::pair<std::string_view, const char*>, 22> scMessageIds{
    {{"plogi", "6eadc8e534d44b2eb5eb6d579b760da5"},          {"prlo", "e3e6adc01f554f0f8f6f641e06285362"},
     {"adisc", "08a5c1b864544d18b3c93bcd9e68cbc9"},          {"lsrjt", "79ff11c0fd6c4645bd34fed1f21132bf"},
     {"logo", "8feb5005c6d94784ad00424ba3081068"},           {"rscn", "38dd5a17f3e844e591a7370723cd5652"},
     {"fabric-busy", "aad56a825b8448b0b3be1be6a52e54f3"},    {"port-busy", "65674aa907d247f79c5e6cd504b302fa"},
     {"fcp-read-check", "5db6f55ae70942bc9d043defceeb9fda"}, {"queue-full", "aec6d9a3b5e14a959a0f13f6afc111c9"},
     {"device-busy", "60abe7782e8e45ff87867319d385b363"},    {"check-condition", "3005bc0195f44e79ba2a512d585035e9"},
     {"lun-reset", "5ca0270bf4404b5887a7697db0674107"},      {"target-reset", "ccceaffb14f94d148c8fb62ab4cc8664"},
     {"bus-reset", "b188583349054bccac6603dd8601790b"},      {"queue-depth", "303cd7e59a024067bf9436fe0295b5df"},
     {"port-interrupt", "9d725801a3e1455d898f0f0697a5502b"}, {"link", "19e364f7d18347f8ace201d259f162bb"},
     {"temperature", "14e6f2fde686453eac97e40655922030"},    {"adapter-arrival", "ed5886f2e7984532aefc007b261c3b43"},
     {"other", "8eb89a3d5210460f9aa6a8e34e460b63"},          {"missed", "f18a2bf47290492aa9ab9b52e44ca354"}}};

const char* getMessageId(std::string_view aKind) {
    const char* lpOther = "";
    for (const auto& [lName, lpId] : scMessageIds) {
        if (lName == aKind) {
            return lpId;
        }
        lpOther = lName == "other" ? lpId : lpOther;
    }
    return lpOther;
}

/// As of syslog: a beginning is worth a look, the rest is for the record.
static const char* sPriority(ZTEPhase aPhase) {
    return aPhase == ZTP_Open ? "5" : "6";
}

static std::string sMessage(const ZTSOutletChange& acrChange) {
    const ZTSEpisode& lrEpisode = acrChange.mEpisode;
    static constexpr std::array<const char*, 3> scPhases{"began", "goes on", "ended"};
    const std::string lInitiator = !lrEpisode.mInitiator.mHost.empty() ? lrEpisode.mInitiator.mHost
                                   : lrEpisode.mInitiator.mWwpn        ? lrEpisode.mInitiator.mWwpn->toText()
                                                                       : "an unknown adapter";
    return getKindName(lrEpisode.mKind) + " at " + lInitiator + (acrChange.mPort.empty() ? "" : " of ") +
           acrChange.mPort + " " + scPhases.at(lrEpisode.mPhase) + ": " + std::to_string(lrEpisode.mCount) + " since " +
           formatDateTime(lrEpisode.mFirst);
}

void ZTCJournalOutlet::write(std::span<const ZTSOutletChange> aChanges) {
    for (const ZTSOutletChange& lrChange : aChanges) {
        const ZTSEpisode& lrEpisode = lrChange.mEpisode;
        const std::string lKind = getKindName(lrEpisode.mKind);
        ZTCJournalFields lFields{{"MESSAGE", sMessage(lrChange)},
                                 {"MESSAGE_ID", getMessageId(lKind)},
                                 {"PRIORITY", sPriority(lrEpisode.mPhase)},
                                 {"SYSLOG_IDENTIFIER", "tavik"},
                                 {"TAVIK_KIND", lKind},
                                 {"TAVIK_PHASE", getPhaseName(lrEpisode.mPhase)},
                                 {"TAVIK_SEQ", std::to_string(lrEpisode.mSeq)},
                                 {"TAVIK_EPISODE", std::to_string(lrEpisode.mEpisode)},
                                 {"TAVIK_COUNT", std::to_string(lrEpisode.mCount)},
                                 {"TAVIK_FIRST", toRfc3339(lrEpisode.mFirst)},
                                 {"TAVIK_LAST", toRfc3339(lrEpisode.mLast)}};
        if (lrEpisode.mInitiator.mWwpn) {
            lFields.emplace_back("TAVIK_INITIATOR", lrEpisode.mInitiator.mWwpn->toText());
        }
        if (lrEpisode.mRemotePort) {
            lFields.emplace_back("TAVIK_REMOTE_PORT", lrEpisode.mRemotePort->mWwpn.toText());
            lFields.emplace_back("TAVIK_REMOTE_PORT_NAME", lrChange.mPort);
        }
        lFields.emplace_back("TAVIK_JSON", lrChange.mLine);
        mSocket.send(lFields);
    }
}

void ZTCJournalOutlet::writeMissed(std::uint64_t aChanges, const std::string& acrLine) {
    mSocket.send({{"MESSAGE", std::to_string(aChanges) +
                                  " changes of episodes were removed from the history before the journal took them"},
                  {"MESSAGE_ID", getMessageId("missed")},
                  {"PRIORITY", "4"},
                  {"SYSLOG_IDENTIFIER", "tavik"},
                  {"TAVIK_KIND", "missed"},
                  {"TAVIK_COUNT", std::to_string(aChanges)},
                  {"TAVIK_JSON", acrLine}});
}
