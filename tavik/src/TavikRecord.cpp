#include "tavik/include/TavikRecord.h"

#include "common/include/Log.h"
#include "common/include/Memory.h"

namespace {

constexpr char gcTimeSeparator[] = ".";

}  // namespace

ZTCTavikRecord::ZTCTavikRecord(const ZTCPointer<ZTCScopeData>& acrData)
    : mBeginTimeStamp(NEW ZTCDateTime(gcTimeSeparator)),
      mEndTimeStamp(NEW ZTCDateTime(gcTimeSeparator)),
      mOccurences(1),
      mScopeData(acrData) {
    ZT_ENTRY();
    ZT_EXIT();
}

void ZTCTavikRecord::incrementOccurrences() noexcept {
    ZT_ENTRY();
    ++mOccurences;
    *mEndTimeStamp = ZTCDateTime(gcTimeSeparator);
    ZT_EXIT();
}

void ZTCTavikRecord::encode(ZTCEncodableOutStream& arStream) const {
    ZT_ENTRY();
    arStream << mOccurences;
    mBeginTimeStamp->encode(arStream);
    mEndTimeStamp->encode(arStream);
    mScopeData->encode(arStream);
    ZT_EXIT();
}
