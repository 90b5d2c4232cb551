/// Events handed to the agent's callbacks as an adapters' library would: every block stands in memory of exactly its
/// own size, so that a sanitizer sees each byte that is read beside it, and is gone when the callback has returned.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_DELIVERIES_H
#define TESTS_UNIT_TAVIK_SUPPORT_DELIVERIES_H

#include <cstdint>
#include <optional>
#include <vector>

#include "tests/support/Bytes.h"

/// How a scope event differs from an ordinary one.
struct ZTSDeliveryShape {
    std::optional<std::uint64_t> mSize;  ///< zt_evt_size; the data and the header where it is not given
    bool mHasPayload = true;             ///< false: the event's payload pointer is null
    bool mHasData = true;                ///< false: the payload's data pointer is null
    bool mIsMisaligned = false;          ///< event, payload and data all stand at odd addresses
    ZTSWwn mPort{};                      ///< the local port's name
};

void deliverScope(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, const ZTCBytes& acrData,
                  const ZTSDeliveryShape& acrShape = {});
/// A scope event whose event pointer is null.
void deliverNullEvent(unsigned aBoard, unsigned aCategory, unsigned aSubcategory);
void deliverLink(unsigned aBoard, const ZTSWwn& acrPort);
void deliverNullLink(unsigned aBoard);
void deliverTemperature(unsigned aBoard);
void deliverRscn(unsigned aBoard, const ZTCBytes& acrPayload);
/// An RSCN with another length than that of its bytes; without bytes its pointer is null.
void deliverRscn(unsigned aBoard, const ZTCBytes& acrPayload, unsigned aLength);

/// An RSCN payload of these page words, from its command code on.
ZTCBytes makeRscn(const std::vector<std::uint32_t>& acrPages);
/// The same with a payload length of one's choice in its header.
ZTCBytes makeRscn(const std::vector<std::uint32_t>& acrPages, unsigned aPayloadLength);

#endif
