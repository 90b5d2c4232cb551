#include "sensor/store/src/RecordWindow.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <string>
#include <utility>

/// No record of an agent comes near this: its event data have a limit of their own.
static constexpr std::uint64_t scMostRecordBytes = 64ULL * 1024 * 1024;

/// A chunk of so many bytes is full: with one record more, its row still fits into a page together with others. SQLite
/// gives what lies beyond 1002 bytes a page of its own.
static constexpr std::size_t scFullChunk = 900;

/// Bytes of a chunk for which there is room from its first record on.
static constexpr std::size_t scChunkRoom = 1024;

/// Equal bytes that end a run of different ones: fewer cost no less when they are stored with it.
static constexpr std::size_t scRunBreak = 3;

/// How many bytes from this place on are the same.
static std::size_t sCountSame(std::span<const std::uint8_t> aOne, std::span<const std::uint8_t> aOther,
                              std::size_t aFrom) {
    static constexpr std::size_t scStride = 32;
    std::size_t lPlace = aFrom;
    while (lPlace + scStride <= aOne.size() && std::memcmp(&aOne[lPlace], &aOther[lPlace], scStride) == 0) {
        lPlace += scStride;
    }
    for (std::uint64_t lOne, lOther; lPlace + sizeof(lOne) <= aOne.size(); lPlace += sizeof(lOne)) {
        std::memcpy(&lOne, aOne.data() + lPlace, sizeof(lOne));
        std::memcpy(&lOther, aOther.data() + lPlace, sizeof(lOther));
        if (const std::uint64_t lBits = lOne ^ lOther) {
            const int lSame =
                std::endian::native == std::endian::little ? std::countr_zero(lBits) : std::countl_zero(lBits);
            return lPlace + static_cast<std::size_t>(lSame) / 8 - aFrom;
        }
    }
    while (lPlace < aOne.size() && aOne[lPlace] == aOther[lPlace]) {
        ++lPlace;
    }
    return lPlace - aFrom;
}

/// Where the run of different bytes ends that begins here.
static std::size_t sFindRunEnd(std::span<const std::uint8_t> aOne, std::span<const std::uint8_t> aOther,
                               std::size_t aFrom) {
    std::size_t lEnd = aFrom + 1;
    for (std::size_t i = lEnd; i < aOne.size() && i < lEnd + scRunBreak; ++i) {
        if (aOne[i] != aOther[i]) {
            lEnd = i + 1;
        }
    }
    return lEnd;
}

/// Writes what differs, and makes the record before to this one. Both have the same size. Returns the end of the bytes.
static std::uint8_t* sWriteDifferences(std::uint8_t* apTo, std::span<std::uint8_t> aBefore,
                                       std::span<const std::uint8_t> aRecord) {
    std::size_t lPlace = 0;
    while (lPlace < aRecord.size()) {
        const std::size_t lSame = sCountSame(aRecord, aBefore, lPlace);
        apTo = writeVarint(apTo, lSame);
        lPlace += lSame;
        if (lPlace == aRecord.size()) {
            break;
        }
        const std::size_t lRun = sFindRunEnd(aRecord, aBefore, lPlace) - lPlace;
        apTo = writeVarint(apTo, lRun);
        std::memcpy(apTo, aRecord.data() + lPlace, lRun);
        std::memcpy(aBefore.data() + lPlace, aRecord.data() + lPlace, lRun);
        apTo += lRun;
        lPlace += lRun;
    }
    return apTo;
}

/// The most bytes that a record needs: its bytes, its two numbers, and two numbers for each run.
static std::size_t sMostBytes(std::size_t aRecordBytes) {
    const std::size_t lRuns = aRecordBytes / (scRunBreak + 1) + 1;
    return aRecordBytes + 2 * gcMostVarintBytes + lRuns * 2 * countVarintBytes(aRecordBytes);
}

void ZTCPendingRecords::add(std::uint64_t aSeq, std::span<const std::uint8_t> aRecord) {
    const std::size_t lStart = mChunk.size();
    if (lStart == 0) {
        mChunk.reserve(scChunkRoom);
    }
    mChunk.resize(lStart + sMostBytes(aRecord.size()));
    mBefore.resize(aRecord.size());
    std::uint8_t* lpEnd = writeVarint(mChunk.data() + lStart, aSeq - mSeqBefore);
    lpEnd = writeVarint(lpEnd, aRecord.size());
    lpEnd = sWriteDifferences(lpEnd, mBefore, aRecord);
    mChunk.resize(static_cast<std::size_t>(lpEnd - mChunk.data()));
    mSeqBefore = aSeq;
    ++mCount;
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

/// Whether a chunk behind the head is no longer among the last records.
static bool sHasFallenOut(std::uint64_t aOrdinal, std::uint64_t aCount, std::uint64_t aRecords, std::uint64_t aLimit) {
    return aOrdinal >= aLimit && aOrdinal + aCount + aLimit <= aRecords;
}

void ZTCRecordWindow::add(std::uint64_t aOrdinal, std::uint64_t aSeq, std::span<const std::uint8_t> aRecord,
                          std::uint64_t aLimit) {
    if (aLimit == 0) {
        return;
    }
    if (mPending.empty() || aOrdinal == aLimit || mPending.back().mRecords.getChunk().size() >= scFullChunk) {
        std::erase_if(mPending, [&](const Pending& acrPending) {
            return sHasFallenOut(acrPending.mOrdinal, acrPending.mRecords.size(), aOrdinal, aLimit);
        });
        mPending.push_back({.mOrdinal = aOrdinal, .mRecords = {}});
    }
    mPending.back().mRecords.add(aSeq, aRecord);
}

void ZTCRecordWindow::flush(std::uint64_t aRecords, std::uint64_t aLimit, const Insert& acrInsert,
                            const Delete& acrDelete) {
    for (const Pending& lrPending : std::exchange(mPending, {})) {
        const std::size_t lCount = lrPending.mRecords.size();
        if (!sHasFallenOut(lrPending.mOrdinal, lCount, aRecords, aLimit)) {
            acrInsert(lrPending.mOrdinal, lCount, lrPending.mRecords.getChunk());
            noteStored(lrPending.mOrdinal, lCount);
        }
    }
    std::erase_if(mStored, [&](const Chunk& acrChunk) {
        const bool lHasFallenOut = sHasFallenOut(acrChunk.mOrdinal, acrChunk.mCount, aRecords, aLimit);
        if (lHasFallenOut) {
            acrDelete(acrChunk.mOrdinal);
        }
        return lHasFallenOut || acrChunk.mOrdinal < aLimit;  // the head is kept, and needs no watching
    });
}
