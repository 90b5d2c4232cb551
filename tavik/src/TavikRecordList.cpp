#include "tavik/include/TavikRecordList.h"

#include "common/include/Log.h"

void ZTCTavikRecordList::encode(ZTCEncodableOutStream& arStream) const {
    ZT_ENTRY();
    arStream << size();
    for (const ZTCPointer<ZTCTavikRecord>& lrRecord : mRecordList) {
        lrRecord->encode(arStream);
    }
    ZT_EXIT();
}
