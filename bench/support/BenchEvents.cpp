#include "bench/support/BenchEvents.h"

#include <cstring>

#include "tavik/include/TavikCore.h"

HBA_wwn makeBenchName(std::uint64_t aValue) {
    HBA_wwn lName;
    for (unsigned i = 0; i < sizeof lName.wwn; ++i) {
        lName.wwn[i] = static_cast<std::uint8_t>(aValue >> 8 * (7 - i));
    }
    return lName;
}

ZTCBenchEvent::ZTCBenchEvent(unsigned aCategory, unsigned aSubcategory, std::uint64_t aPort,
                             const std::vector<std::uint32_t>& acrNumbers)
    : mCategory(aCategory), mSubcategory(aSubcategory) {
    std::size_t lUsed = 12;
    for (const std::uint32_t lNumber : acrNumbers) {
        std::memcpy(mData.data() + lUsed, &lNumber, sizeof lNumber);
        lUsed += sizeof lNumber;
    }
    setPort(aPort);
    mPayload.zt_payload_data = mData.data();
    mEvent.zt_evt_version = ZT_EVENT_VERSION;
    mEvent.zt_evt_size = ZT_EVENT_HEADER_SIZE + lUsed;
    mEvent.zt_evt_payload = &mPayload;
}

void ZTCBenchEvent::setPort(std::uint64_t aPort) {
    const HBA_wwn lName = makeBenchName(aPort);
    std::memcpy(mData.data() + 4, lName.wwn, sizeof lName.wwn);
}

void ZTCBenchEvent::deliver(unsigned aBoard) {
    ScopeCb_Generic(aBoard, HBA_wwn{}, mCategory, mSubcategory, nullptr, &mEvent);
}

void deliverBenchRscn(unsigned aBoard) {
    static unsigned char sPayload[] = {0x61, 4, 0, 8, 0x00, 0x01, 0x02, 0x03};
    ScopeCb_KpmRscn(aBoard, sPayload, sizeof sPayload);
}
