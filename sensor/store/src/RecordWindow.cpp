#include "sensor/store/src/RecordWindow.h"

void ZTCPendingRecords::add(std::uint64_t aSeq, std::span<const std::uint8_t> aRecord) {
    mEntries.push_back({.mSeq = aSeq, .mOffset = mBytes.size(), .mSize = aRecord.size()});
    mBytes.insert(mBytes.end(), aRecord.begin(), aRecord.end());
}

void ZTCPendingRecords::keepLast(std::size_t aCount) {
    if (mEntries.size() <= aCount) {
        return;
    }
    mEntries.erase(mEntries.begin(), mEntries.end() - static_cast<std::ptrdiff_t>(aCount));
    const std::size_t lStart = mEntries.empty() ? mBytes.size() : mEntries.front().mOffset;
    mBytes.erase(mBytes.begin(), mBytes.begin() + static_cast<std::ptrdiff_t>(lStart));
    for (Entry& lrEntry : mEntries) {
        lrEntry.mOffset -= lStart;
    }
}

ZTCStoreBytes ZTCPendingRecords::encode() const {
    ZTCStoreBytes lChunk;
    lChunk.reserve(mBytes.size() + 2 * mEntries.size() + 10);
    std::uint64_t lBefore = 0;
    for (const Entry& lrEntry : mEntries) {
        appendVarint(lChunk, lrEntry.mSeq - lBefore);
        lBefore = lrEntry.mSeq;
        const auto lStart = mBytes.begin() + static_cast<std::ptrdiff_t>(lrEntry.mOffset);
        lChunk.insert(lChunk.end(), lStart, lStart + static_cast<std::ptrdiff_t>(lrEntry.mSize));
    }
    return lChunk;
}

void ZTCPendingRecords::clear() {
    mEntries = {};
    mBytes = {};
}

void visitChunk(std::span<const std::uint8_t> aChunk,
                const std::function<void(std::uint64_t aSeq, const ZTSRecordView& acrRecord)>& acrVisitor) {
    std::uint64_t lSeq = 0;
    try {
        while (!aChunk.empty()) {
            lSeq += takeVarint(aChunk);
            const ZTSRecordView lRecord = readRecordView(aChunk);
            acrVisitor(lSeq, lRecord);
            aChunk = aChunk.subspan(lRecord.mBytes.size());
        }
    } catch (const ZTCDecodeEx& lrProblem) {
        throw ZTCStoreDamagedEx(std::string("history: a stored record cannot be read: ") + lrProblem.what());
    }
}

void ZTCRecordWindow::add(std::uint64_t aOrdinal, std::uint64_t aSeq, std::span<const std::uint8_t> aRecord,
                          std::uint64_t aLimit) {
    if (aOrdinal < aLimit) {
        mHead.add(aSeq, aRecord);
        mNextHead = aOrdinal + 1;
    } else if (aLimit != 0) {
        mTail.add(aSeq, aRecord);
        mNextTail = aOrdinal + 1;
        if (mTail.size() >= 4 * aLimit) {
            mTail.keepLast(aLimit);
        }
    }
}

void ZTCRecordWindow::flush(std::uint64_t aRecords, std::uint64_t aLimit, const Insert& acrInsert,
                            const Delete& acrDelete) {
    mTail.keepLast(aLimit);
    for (auto [lpRecords, lNext] : {std::pair(&mHead, mNextHead), std::pair(&mTail, mNextTail)}) {
        if (lpRecords->size() != 0) {
            const std::uint64_t lOrdinal = lNext - lpRecords->size();
            acrInsert(lOrdinal, lpRecords->size(), lpRecords->encode());
            noteStored(lOrdinal, lpRecords->size());
            lpRecords->clear();
        }
    }
    while (!mStored.empty() && mStored.front().mOrdinal < aLimit) {
        mStored.pop_front();  // the head is kept, and needs no watching
    }
    while (!mStored.empty() && mStored.front().mOrdinal + mStored.front().mCount + aLimit <= aRecords) {
        acrDelete(mStored.front().mOrdinal);
        mStored.pop_front();
    }
}
