#include "tavik/include/TavikRecordList.h"

#include <cstddef>

#include "common/include/Log.h"

namespace {

constexpr unsigned gcCacheLine = 64;

/// Has the processor fetch an object that is to be read soon.
template <typename T>
void sFetch(const T* apObject) noexcept {
    for (std::size_t lOffset = 0; lOffset < sizeof(T); lOffset += gcCacheLine) {
        __builtin_prefetch(reinterpret_cast<const unsigned char*>(apObject) + lOffset);
    }
}

/// Walks a list some records ahead of its encoding: a record, its data's object and its data lie scattered in memory,
/// and each tells where the next one is, so that reading them one after another would be waiting three times.
class ZTCFetchAhead {
public:
    using Iterator = ZTCList<ZTCPointer<ZTCTavikRecord>>::const_iterator;

    ZTCFetchAhead(Iterator aBegin, Iterator aEnd) : mEnd(aEnd), mRecord(aBegin), mData(aBegin), mBytes(aBegin) {
        for (unsigned i = 0; i < 3 * gcDistance; ++i) {
            step(i >= gcDistance, i >= 2 * gcDistance);
        }
    }

    void step(bool aIsDataDue = true, bool aAreBytesDue = true) {
        if (mRecord != mEnd) {
            sFetch((mRecord++)->get());
        }
        if (aIsDataDue && mData != mEnd) {
            sFetch((*mData++)->getScopeData().get());
        }
        if (aAreBytesDue && mBytes != mEnd) {
            __builtin_prefetch((*mBytes++)->getScopeData()->getEventData());
        }
    }

private:
    static constexpr unsigned gcDistance = 4;

    Iterator mEnd;
    Iterator mRecord;
    Iterator mData;
    Iterator mBytes;
};

}  // namespace

void ZTCTavikRecordList::encode(ZTCEncodableOutStream& arStream) const {
    ZT_ENTRY();
    arStream << size();
    ZTCFetchAhead lAhead(mRecordList.begin(), mRecordList.end());
    for (const ZTCPointer<ZTCTavikRecord>& lrRecord : mRecordList) {
        lAhead.step();
        lrRecord->encode(arStream);
    }
    ZT_EXIT();
}
