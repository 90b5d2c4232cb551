#include "tavik/include/TavikRecord.h"

#include "common/include/Log.h"
#include "common/include/NetworkOrder.h"

namespace {

constexpr char scTimeSeparator[] = ".";

}  // namespace

ZTCTavikRecord::ZTCTavikRecord(const ZTCPointer<ZTCScopeData>& acrData)
    : mBeginTime(scTimeSeparator),
      mEndTime(scTimeSeparator),
      mBeginTimeStamp(mBeginTime),
      mEndTimeStamp(mEndTime),
      mOccurences(1),
      mScopeData(acrData) {
    ZT_ENTRY();
    ZT_EXIT();
}

void ZTCTavikRecord::incrementOccurrences() noexcept {
    ZT_ENTRY();
    ++mOccurences;
    *mEndTimeStamp = ZTCDateTime(scTimeSeparator);
    ZT_EXIT();
}

void ZTCTavikRecord::encode(ZTCEncodableOutStream& arStream) const {
    ZT_ENTRY();
    const ZTCScopeData& lrData = *mScopeData;
    unsigned char* lpBytes = arStream.extend(gcFixedSize + lrData.getEncodedSize());
    lpBytes = storeInNetworkOrder(lpBytes, mOccurences);
    lpBytes = mBeginTimeStamp->store(lpBytes);
    lpBytes = mEndTimeStamp->store(lpBytes);
    lrData.store(lpBytes);
    ZT_EXIT();
}
