/// The raw records of an episode: its first and its last ones, as many as the limit says at each end.
///
/// Records are stored in chunks, one row a transaction. Like records differ in few bytes, so each is stored as what
/// differs from the one before it in the chunk: the difference of its number to the number before; its size; then,
/// until the size is reached, bytes that are the same (a count) and bytes that are not (a count and the bytes). Bytes
/// behind the end of the record before count as 0. The record's bytes are those on the wire.
///
/// Chunks that fall out at the back are deleted whole; readers cut what is left to the limit.
#ifndef SENSOR_STORE_SRC_RECORDWINDOW_H
#define SENSOR_STORE_SRC_RECORDWINDOW_H

#include <cstdint>
#include <deque>
#include <functional>
#include <span>
#include <vector>

#include "sensor/client/include/RecordView.h"
#include "sensor/store/src/Varint.h"

/// Records that are not stored yet, in a row.
class ZTCPendingRecords {
public:
    void add(std::uint64_t aSeq, std::span<const std::uint8_t> aRecord);
    /// Keeps the last ones only.
    void keepLast(std::size_t aCount);
    std::size_t size() const { return mEntries.size(); }
    ZTCStoreBytes encode() const;
    void clear();

private:
    struct Entry {
        std::uint64_t mSeq;
        std::size_t mOffset;
        std::size_t mSize;
    };
    ZTCStoreBytes mBytes;
    std::vector<Entry> mEntries;
};

/// Reads a chunk record by record. A view lives as long as the visitor's call. Throws ZTCStoreDamagedEx where it is no
/// chunk.
void visitChunk(std::span<const std::uint8_t> aChunk,
                const std::function<void(std::uint64_t aSeq, const ZTSRecordView& acrRecord)>& acrVisitor);

class ZTCRecordWindow {
public:
    using Insert = std::function<void(std::uint64_t aOrdinal, std::size_t aCount, const ZTCStoreBytes& acrChunk)>;
    using Delete = std::function<void(std::uint64_t aOrdinal)>;

    /// A chunk that is stored, in rising order.
    void noteStored(std::uint64_t aOrdinal, std::uint64_t aCount) { mStored.push_back({aOrdinal, aCount}); }
    /// The record with the next ordinal of the episode.
    void add(std::uint64_t aOrdinal, std::uint64_t aSeq, std::span<const std::uint8_t> aRecord, std::uint64_t aLimit);
    /// Stores what is pending, and deletes what an episode of `aRecords` records no longer keeps.
    void flush(std::uint64_t aRecords, std::uint64_t aLimit, const Insert& acrInsert, const Delete& acrDelete);

private:
    struct Chunk {
        std::uint64_t mOrdinal;
        std::uint64_t mCount;
    };
    ZTCPendingRecords mHead;
    ZTCPendingRecords mTail;
    std::uint64_t mNextHead = 0;  ///< ordinal behind the last pending record of the head
    std::uint64_t mNextTail = 0;
    std::deque<Chunk> mStored;
};

#endif
