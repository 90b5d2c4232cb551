/// The raw records of an episode: its first and its last ones, as many as the limit says at each end.
///
/// Records are stored in chunks, a row each. A transaction begins a new chunk, and so does a record that comes when the
/// chunk is full: a larger row would need a page of its own. Like records differ in few bytes, so each is stored as
/// what differs from the one before it in the chunk: the difference of its number to the number before; its size; then,
/// until the size is reached, bytes that are the same (a count) and bytes that are not (a count and the bytes). Bytes
/// behind the end of the record before count as 0. The record's bytes are those on the wire.
///
/// A record is put into its chunk when it comes: keeping copies until the end of the transaction would take more time
/// than all else that is done with it, because of the fresh memory that they need.
///
/// Chunks that fall out at the back are deleted whole; readers cut what is left to the limit.
#ifndef SENSOR_STORE_SRC_RECORDWINDOW_H
#define SENSOR_STORE_SRC_RECORDWINDOW_H

#include <cstdint>
#include <functional>
#include <span>
#include <vector>

#include "sensor/client/include/RecordView.h"
#include "sensor/store/src/Varint.h"

/// Records that are not stored yet, in a row, as the chunk that they become.
class ZTCPendingRecords {
public:
    void add(std::uint64_t aSeq, std::span<const std::uint8_t> aRecord);
    std::size_t size() const { return mCount; }
    const ZTCStoreBytes& getChunk() const { return mChunk; }

private:
    ZTCStoreBytes mChunk;
    ZTCStoreBytes mBefore;  ///< the last record
    std::uint64_t mSeqBefore = 0;
    std::size_t mCount = 0;
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
    struct Pending {
        std::uint64_t mOrdinal = 0;  ///< of its first record
        ZTCPendingRecords mRecords;
    };
    std::vector<Pending> mPending;  ///< rising
    std::vector<Chunk> mStored;     ///< rising
};

#endif
