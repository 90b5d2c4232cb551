/// The scope records of one board, in the order of their creation.
#ifndef TAVIK_INCLUDE_TAVIKRECORDLIST_H
#define TAVIK_INCLUDE_TAVIKRECORDLIST_H

#include "common/include/EncodableStream.h"
#include "common/include/List.h"
#include "common/include/Log.h"
#include "common/include/Pointer.h"
#include "tavik/include/TavikRecord.h"

class ZTCTavikSystem;

/// No lock of its own: guarded by the system's previous-data lock until a retrieval has taken it out of the map.
class ZTCTavikRecordList {
public:
    /// apSystem is not owned and outlives the list.
    ZTCTavikRecordList(unsigned int aBoardId, ZTCTavikSystem* apSystem) : mpSystem(apSystem), mBoardId(aBoardId) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    virtual ~ZTCTavikRecordList() = default;

    /// Appends at the end. Throws ZTCNoMemoryEx and changes nothing then.
    void addRecord(ZTCPointer<ZTCTavikRecord>& arRecord) {
        ZT_ENTRY();
        mRecordList.push_back(arRecord);
        ZT_EXIT();
    }

    void clear() {
        ZT_ENTRY();
        mRecordList.clear();
        ZT_EXIT();
    }

    unsigned int size() const { return mRecordList.size(); }
    unsigned int getBoardId() const { return mBoardId; }

    auto begin() const { return mRecordList.begin(); }
    auto end() const { return mRecordList.end(); }

    /// The number of records, then each record. The owner of the list names the board.
    void encode(ZTCEncodableOutStream& arStream) const;

private:
    ZTCList<ZTCPointer<ZTCTavikRecord>> mRecordList;
    [[maybe_unused]] ZTCTavikSystem* mpSystem;
    [[maybe_unused]] unsigned int mNumRecords = 0;  ///< not maintained: the list's size is authoritative
    unsigned int mBoardId;
};

#endif
