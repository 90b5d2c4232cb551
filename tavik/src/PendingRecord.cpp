// The records of the system object: the boards' lists, and the pending record, which consolidation is still extending.
// TavikSystem.cpp has the rest of the object.
#include <atomic>
#include <cstdint>

#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "tavik/include/TavikSystem.h"

namespace {

/// Returns the new total. Its writers hold the lock, so none comes in between; its readers without the lock need no
/// order.
inline std::uint32_t sAddToTotal(std::atomic<std::uint32_t>& arTotal, unsigned int aBytes) noexcept {
    ZT_ENTRY();
    const std::uint32_t lTotal = arTotal.load(std::memory_order_relaxed) + aBytes;
    arTotal.store(lTotal, std::memory_order_relaxed);
    ZT_EXIT();
    return lTotal;
}

}  // namespace

void ZTCTavikSystem::makeRecordLists(ZTCTavikRecordsMap& arLists) {
    ZT_ENTRY();
    const unsigned int lNumberOfAdapters = mLibkpmAbs->LIBKPM_GetNumberOfAdapters();
    mStatusPage.setAdapters(lNumberOfAdapters);
    for (unsigned int lIndex = 0; lIndex < lNumberOfAdapters; ++lIndex) {
        arLists.insert(lIndex, ZTCPointer<ZTCTavikRecordList>(NEW ZTCTavikRecordList(lIndex, this)));
    }
    ZT_EXIT();
}

void ZTCTavikSystem::clearRecordsMap(ZTCTavikRecordsMap& arTaken) noexcept {
    ZT_ENTRY();
    arTaken.clear();
    mRecordsMap.swap(arTaken);
    ZT_EXIT();
}

void ZTCTavikSystem::addNewRecordListsToRecordsMap(ZTCTavikRecordsMap& arLists) noexcept {
    ZT_ENTRY();
    mRecordsMap.swap(arLists);
    ZT_EXIT();
}

void ZTCTavikSystem::filePrevScopeRecord() {
    ZT_ENTRY();
    if (mRecordsMap.hasKey(mPrevBoardId)) {
        mRecordsMap.get(mPrevBoardId)->addRecord(mPrevScopeRecord);
    } else {
        ZT_LOG_ERR("Dropping the pending scope record of board %u: the board has no record list any more",
                   mPrevBoardId);
        if (mpPrevRow != nullptr) {
            mStatusPage.countDropped(*mpPrevRow, mPrevScopeRecord->getOccurrences());
        }
    }
    ZT_EXIT();
}

void ZTCTavikSystem::setPrevScopeData(unsigned int aBoardId, ZTCPointer<ZTCScopeData>& arData) {
    ZT_ENTRY();
    const auto lRecord = ZTCPointer<ZTCTavikRecord>::make(arData);
    if (mPrevScopeDataSet) {
        filePrevScopeRecord();
    }
    // From here on nothing can fail: the filed record is pending no longer.
    mPrevScopeData = arData;
    mPrevScopeRecord = lRecord;
    mPrevBoardId = aBoardId;
    mPrevScopeDataSet = true;
    const std::uint32_t lTotal = sAddToTotal(mTotalEventDataSize, arData->getEventDataSize());
    mpPrevRow = mStatusPage.findRow(aBoardId, arData->getCategory(), arData->getSubcategory());
    if (mpPrevRow != nullptr) {
        countOccurrence();
        mStatusPage.countRecord(lTotal);
    }
    mBell.noteHeld(lTotal);
    ZT_EXIT();
}

void ZTCTavikSystem::clearPrevScopeData() {
    ZT_ENTRY();
    if (mPrevScopeDataSet) {
        filePrevScopeRecord();
        mPrevScopeDataSet = false;
    }
    ZT_EXIT();
}

void ZTCTavikSystem::appendEventData(unsigned char* apData, unsigned int aLength) {
    ZT_ENTRY();
    mPrevScopeData->appendEventData(apData, aLength);
    mPrevScopeRecord->incrementOccurrences();
    const std::uint32_t lTotal = sAddToTotal(mTotalEventDataSize, aLength);
    if (mpPrevRow != nullptr) {
        countOccurrence();
        mStatusPage.setHeldBytes(lTotal);
    }
    mBell.noteHeld(lTotal);
    ZT_EXIT();
}
