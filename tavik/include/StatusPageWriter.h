/// Writes the agent's status page (StatusPage.h), where one is wanted.
#ifndef TAVIK_INCLUDE_STATUSPAGEWRITER_H
#define TAVIK_INCLUDE_STATUSPAGEWRITER_H

#include <atomic>
#include <cstdint>

#include "common/include/DateTime.h"
#include "common/include/Log.h"
#include "common/include/Map.h"
#include "common/include/Pointer.h"
#include "os/common/include/SharedFile.h"
#include "sensor/agentcommon/include/StatusPage.h"
#include "tavik/include/TavikInitiator.h"

/// Before open, and for good where it is not called, every operation does nothing. The members are grouped by the
/// writers that StatusPage.h names; those of "lock" are called under the system's previous-data lock.
class ZTCStatusPageWriter {
public:
    ZTCStatusPageWriter() = default;
    ~ZTCStatusPageWriter();
    ZTCStatusPageWriter(const ZTCStatusPageWriter&) = delete;
    ZTCStatusPageWriter& operator=(const ZTCStatusPageWriter&) = delete;

    // ---- Main thread, before the library is loaded; addBoards before events come ----

    /// Makes the page, without boards. From here on a process that ends by exit() says so in it. Throws ZTCClibEx;
    /// there is no page then.
    void open(const char* apPath, std::uint32_t aTotalLimit);

    bool isOpen() const { return mpPage != nullptr; }

    /// Adds a block of rows for each initiator; their board ids are 0, 1, 2 and so on. Throws ZTCClibEx; the page then
    /// has no boards, and events count in the row of unknown boards.
    void addBoards(const ZTCMap<unsigned int, ZTCPointer<ZTCTavikInitiator>>& acrInitiators);

    // ---- Any thread ----

    /// The row of a board's events of this pair; that of unknown boards for another board. Null while there is no page.
    ZTSStatusRow* findRow(unsigned aBoardId, unsigned char aCategory, unsigned char aSubcategory) const noexcept;

    /// Counts so many events that were not consolidated.
    void countRefused(unsigned aBoardId, unsigned char aCategory, unsigned char aSubcategory, ZTEStatusRefusal aReason,
                      std::uint64_t aEvents) const noexcept;

    /// Notes why the agent ends. The first reason stays.
    void setEnd(ZTEStatusEnd aReason) const noexcept;

    // ---- lock ----

    /// Counts one occurrence in a row of findRow.
    static void countConsolidated(ZTSStatusRow& arRow, const ZTCDateTime& acrTime) noexcept {
        ZT_ENTRY();
        add(arRow.mConsolidated, 1);
        arRow.mLastConsolidated.store(getMicroseconds(acrTime), std::memory_order_relaxed);
        ZT_EXIT();
    }

    /// Counts the occurrences of a record that was lost when it was filed.
    void countDropped(ZTSStatusRow& arRow, std::uint64_t aOccurrences) const noexcept;

    /// One record more is held, and so many bytes in all.
    void countRecord(std::uint32_t aHeldBytes) const noexcept {
        ZT_ENTRY();
        add(mpPage->mHeader.mHeldRecords, 1);
        setHeldBytes(aHeldBytes);
        ZT_EXIT();
    }
    void setHeldBytes(std::uint32_t aHeldBytes) const noexcept {
        mpPage->mHeader.mHeldBytes.store(aHeldBytes, std::memory_order_relaxed);
    }

    /// All that is held is handed over, at this moment.
    void countRetrieval() const noexcept;

    // ---- command ----

    void setCollecting(bool aIsCollecting) const noexcept;
    void setRecordLimit(std::uint32_t aBytes) const noexcept;
    void setAdapters(std::uint32_t aNumber) const noexcept;

    // ---- report ----

    /// The row is one of the twenty kinds of a board, or null.
    void setState(ZTSStatusRow* apRow, ZTEStatusState aState, const char* apReason) const noexcept;

    /// The running total of a named loss. A smaller one than before is ignored.
    void setLoss(const char* apName, std::uint64_t aTotal) const noexcept;

    /// The row of one of the twenty kinds by its index; null where the page has no such board.
    ZTSStatusRow* getRow(unsigned aBoardId, unsigned aKind) const noexcept;

private:
    /// Adds to a counter that has one writer at a time.
    static void add(std::atomic<std::uint64_t>& arCounter, std::uint64_t aNumber) noexcept {
        ZT_ENTRY();
        arCounter.store(arCounter.load(std::memory_order_relaxed) + aNumber, std::memory_order_relaxed);
        ZT_EXIT();
    }
    static std::int64_t getMicroseconds(const ZTCDateTime& acrTime) noexcept {
        return static_cast<std::int64_t>(acrTime.getSecondsSinceEpoch() * 1000000 +
                                         acrTime.getMilliSeconds() * std::uint64_t{1000} + acrTime.getMicroSeconds());
    }

    ZTCSharedFile mFile;
    ZTSStatusPage* mpPage = nullptr;
    ZTSStatusBoard* mpBoards = nullptr;
    std::uint32_t mBoards = 0;
};

#endif
