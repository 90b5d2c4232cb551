#include "sensor/store/src/RecordWindow.h"

#include <algorithm>
#include <cstring>
#include <string>

/// No record of an agent comes near this: its event data have a limit of their own.
static constexpr std::uint64_t scMostRecordBytes = 64ULL * 1024 * 1024;

/// Records for which there is room from the first one on.
static constexpr std::size_t scRoom = 16;

void ZTCPendingRecords::add(std::uint64_t aSeq, std::span<const std::uint8_t> aRecord) {
    if (mEntries.empty()) {
        mEntries.reserve(scRoom);
        mBytes.reserve(scRoom * aRecord.size());
    }
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

/// Equal bytes that end a run of different ones: fewer cost no less when they are stored with it.
static constexpr std::size_t scRunBreak = 3;

/// How many bytes from this place on are the same.
static std::size_t sCountSame(std::span<const std::uint8_t> aOne, std::span<const std::uint8_t> aOther,
                              std::size_t aFrom) {
    std::size_t lPlace = aFrom;
    for (std::uint64_t lOne, lOther; lPlace + sizeof(lOne) <= aOne.size(); lPlace += sizeof(lOne)) {
        std::memcpy(&lOne, aOne.data() + lPlace, sizeof(lOne));
        std::memcpy(&lOther, aOther.data() + lPlace, sizeof(lOther));
        if (lOne != lOther) {
            break;
        }
    }
    while (lPlace < aOne.size() && aOne[lPlace] == aOther[lPlace]) {
        ++lPlace;
    }
    return lPlace - aFrom;
}

/// Appends what differs. Both have the same size.
static void sAppendDifferences(ZTCStoreBytes& arChunk, std::span<const std::uint8_t> aBefore,
                               std::span<const std::uint8_t> aRecord) {
    std::size_t lPlace = 0;
    while (lPlace < aRecord.size()) {
        const std::size_t lSame = sCountSame(aRecord, aBefore, lPlace);
        appendVarint(arChunk, lSame);
        lPlace += lSame;
        if (lPlace == aRecord.size()) {
            return;
        }
        std::size_t lEnd = lPlace + 1;
        for (std::size_t i = lEnd; i < aRecord.size() && i < lEnd + scRunBreak; ++i) {
            if (aRecord[i] != aBefore[i]) {
                lEnd = i + 1;
            }
        }
        appendVarint(arChunk, lEnd - lPlace);
        arChunk.insert(arChunk.end(), aRecord.begin() + static_cast<std::ptrdiff_t>(lPlace),
                       aRecord.begin() + static_cast<std::ptrdiff_t>(lEnd));
        lPlace = lEnd;
    }
}

ZTCStoreBytes ZTCPendingRecords::encode() const {
    ZTCStoreBytes lChunk;
    lChunk.reserve(mEntries.empty() ? 0 : 2 * mEntries.front().mSize + 16 * mEntries.size());
    std::uint64_t lSeqBefore = 0;
    std::span<const std::uint8_t> lBefore;
    ZTCStoreBytes lResized;
    for (const Entry& lrEntry : mEntries) {
        appendVarint(lChunk, lrEntry.mSeq - lSeqBefore);
        appendVarint(lChunk, lrEntry.mSize);
        lSeqBefore = lrEntry.mSeq;
        if (lBefore.size() != lrEntry.mSize) {
            lResized.assign(lBefore.begin(), lBefore.end());
            lResized.resize(lrEntry.mSize);
            lBefore = lResized;
        }
        const auto lRecord = std::span(mBytes).subspan(lrEntry.mOffset, lrEntry.mSize);
        sAppendDifferences(lChunk, lBefore, lRecord);
        lBefore = lRecord;
    }
    return lChunk;
}

/// Takes a record's differences off the front and makes them to the record before.
static void sTakeDifferences(std::span<const std::uint8_t>& arChunk, ZTCStoreBytes& arRecord) {
    const std::uint64_t lSize = takeVarint(arChunk);
    if (lSize > scMostRecordBytes) {
        throw ZTCStoreDamagedEx("history: a stored record has " + std::to_string(lSize) + " bytes, wanted at most " +
                                std::to_string(scMostRecordBytes));
    }
    arRecord.resize(static_cast<std::size_t>(lSize));
    std::size_t lPlace = 0;
    while (lPlace < arRecord.size()) {
        const std::uint64_t lSame = takeVarint(arChunk);
        if (lSame >= arRecord.size() - lPlace) {
            if (lSame == arRecord.size() - lPlace) {
                return;
            }
            throw ZTCStoreDamagedEx("history: a stored record repeats more bytes than it has");
        }
        lPlace += static_cast<std::size_t>(lSame);
        const std::uint64_t lCount = takeVarint(arChunk);
        if (lCount == 0 || lCount > arRecord.size() - lPlace || lCount > arChunk.size()) {
            throw ZTCStoreDamagedEx("history: a stored record has a run of " + std::to_string(lCount) + " bytes");
        }
        const auto lRun = arChunk.first(static_cast<std::size_t>(lCount));
        std::ranges::copy(lRun, arRecord.begin() + static_cast<std::ptrdiff_t>(lPlace));
        arChunk = arChunk.subspan(lRun.size());
        lPlace += lRun.size();
    }
}

void ZTCPendingRecords::clear() {
    mEntries = {};
    mBytes = {};
}

void visitChunk(std::span<const std::uint8_t> aChunk,
                const std::function<void(std::uint64_t aSeq, const ZTSRecordView& acrRecord)>& acrVisitor) {
    std::uint64_t lSeq = 0;
    ZTCStoreBytes lRecord;
    try {
        while (!aChunk.empty()) {
            lSeq += takeVarint(aChunk);
            sTakeDifferences(aChunk, lRecord);
            acrVisitor(lSeq, readRecordView(lRecord));
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
