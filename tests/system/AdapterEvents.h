/// The event data that the adapters' library delivers, built by hand, kind by kind; and what the agent is to make of
/// them.
#ifndef TESTS_SYSTEM_ADAPTEREVENTS_H
#define TESTS_SYSTEM_ADAPTEREVENTS_H

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"
#include "tests/support/EventKinds.h"
#include "tests/support/LibraryEvent.h"

/// Two remote ports, each with a node.
inline const std::uint64_t gcRemotePort = 0x500601603ba01234;
inline const std::uint64_t gcRemoteNode = 0x500601603ba09999;
inline const std::uint64_t gcOtherPort = 0x210000e08b05abcd;
inline const std::uint64_t gcOtherNode = 0x200000e08b05abcd;

ZTCBytes plogiData(std::uint64_t aPort, std::uint64_t aNode);
ZTCBytes prloData(std::uint64_t aPort);
ZTCBytes adiscData(std::uint64_t aPort, std::uint64_t aNode);
ZTCBytes lsRjtData(std::uint64_t aPort, std::uint32_t aCommand, std::uint32_t aReason, std::uint32_t aExplanation);
ZTCBytes logoData(std::uint64_t aPort, std::uint64_t aPayloadPort);
ZTCBytes portBusyData(std::uint64_t aPort);
ZTCBytes fcpReadCheckData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aOpCode, std::uint32_t aParameter);
ZTCBytes scsiData(std::uint64_t aPort, std::uint32_t aLun);
ZTCBytes checkConditionData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aCommandCode,
                            std::uint32_t aSenseKey, std::uint32_t aAsc, std::uint32_t aAscq);
ZTCBytes queueDepthData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aOldValue, std::uint32_t aNewValue);
/// An RSCN payload of these page words, from its command code on.
ZTCBytes rscnPayload(const std::vector<std::uint32_t>& acrPages);

/// Record data, as hex.
std::string qFullRecord(std::uint64_t aPort, const std::vector<unsigned>& acrLunBits);
std::string allLunsRecord(std::uint64_t aPort);
std::string checkConditionRecord(std::uint64_t aPort, std::uint32_t aSenseKey, std::uint32_t aAsc,
                                 const std::vector<unsigned>& acrLunBits, const std::vector<unsigned>& acrCommandBits,
                                 const std::vector<unsigned>& acrAscqBits);
std::string rscnRecord(std::uint32_t aPage);

/// What becomes of a second event of the same identity.
enum class ZTEContinuation { Counts, Appends };

struct ZTSEventData {
    ZTCBytes mData;          ///< an event's data
    std::string mRecordHex;  ///< the record that it makes
    ZTCBytes mSameIdentity;  ///< data that continue that record
    ZTEContinuation mContinuation;
    std::string mContinuedHex;      ///< the record after them
    std::vector<ZTCBytes> mOthers;  ///< data that start a record of their own: one changed part of the identity each
};

/// One row per kind that is delivered with data, but for RSCN.
struct ZTSDataKind : ZTSTestKind, ZTSEventData {};

std::vector<ZTSDataKind> dataKinds();

/// One row per kind without data: how it is delivered.
struct ZTSBareKind : ZTSTestKind {
    ZTSLibraryEvent mEvent;
};

std::vector<ZTSBareKind> bareKinds(unsigned aBoard = 0);

#endif
