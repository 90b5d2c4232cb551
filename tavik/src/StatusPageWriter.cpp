#include "tavik/include/StatusPageWriter.h"

#include <unistd.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>

#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "os/common/include/Clib.h"
#include "os/common/include/ProcessEvents.h"
#include "tavik/include/KindSlot.h"

static_assert(gcScopeEventKinds.size() == gcStatusKinds);

namespace {

/// The row of each slot; the last slot is that of pairs without one.
constexpr auto scRowBySlot = [] {
    std::array<std::uint8_t, gcKindSlots + 1> lRows{};
    lRows.fill(gcStatusOtherRow);
    for (std::uint32_t lKind = 0; lKind < gcStatusKinds; ++lKind) {
        const ZTSScopeEventKind& lrKind = gcScopeEventKinds[lKind];
        lRows[getKindSlot(lrKind.mDeliveredCategory, lrKind.mDeliveredSubcategory)] = static_cast<std::uint8_t>(lKind);
    }
    return lRows;
}();
static_assert(scRowBySlot[gcKindSlots] == gcStatusOtherRow);

std::int64_t sNow() noexcept {
    ZT_ENTRY();
    std::timespec lNow{};
    clock_gettime(CLOCK_REALTIME, &lNow);
    ZT_EXIT();
    return std::int64_t{lNow.tv_sec} * 1000000 + lNow.tv_nsec / 1000;
}

template <std::size_t Words>
void sStoreText(ZTStatusText<Words>& arText, const char* apText) noexcept {
    ZT_ENTRY();
    std::array<char, 8 * Words> lBytes{};
    // One null byte at least stays behind it.
    std::memcpy(lBytes.data(), apText, strnlen(apText, lBytes.size() - 1));
    for (std::size_t lIndex = 0; lIndex < Words; ++lIndex) {
        std::uint64_t lWord;
        std::memcpy(&lWord, lBytes.data() + 8 * lIndex, sizeof lWord);
        arText[lIndex].store(lWord, std::memory_order_release);
    }
    ZT_EXIT();
}

template <std::size_t Words>
bool sIsText(const ZTStatusText<Words>& acrText, const char* apText) noexcept {
    ZT_ENTRY();
    ZTStatusText<Words> lText{};
    sStoreText(lText, apText);
    bool lIsText = true;
    for (std::size_t lIndex = 0; lIsText && lIndex < Words; ++lIndex) {
        lIsText = lText[lIndex].load(std::memory_order_relaxed) == acrText[lIndex].load(std::memory_order_relaxed);
    }
    ZT_EXIT();
    return lIsText;
}

/// Random where the system gives random bytes; otherwise the time and the process, which differ between two starts of
/// one host.
void sMakeStartId(std::uint64_t (&arId)[2]) noexcept {
    ZT_ENTRY();
    if (::getentropy(arId, sizeof arId) != 0) {
        arId[0] = static_cast<std::uint64_t>(sNow());
        arId[1] = static_cast<std::uint64_t>(::getpid());
    }
    ZT_EXIT();
}

/// The page of this process. The process may end by exit() on any thread, while others still write it.
std::atomic<const ZTCStatusPageWriter*> sgpOpenPage{nullptr};

void sNoteExit() {
    ZT_ENTRY();
    const ZTCStatusPageWriter* lpPage = sgpOpenPage.load();
    if (lpPage != nullptr) {
        lpPage->setEnd(ZTSE_Other);
    }
    ZT_EXIT();
}

}  // namespace

ZTCStatusPageWriter::~ZTCStatusPageWriter() {
    ZT_ENTRY();
    const ZTCStatusPageWriter* lpThis = this;
    sgpOpenPage.compare_exchange_strong(lpThis, nullptr);
    ZT_EXIT();
}

void ZTCStatusPageWriter::open(const char* apPath, std::uint32_t aTotalLimit) {
    ZT_ENTRY();
    mFile.make(apPath, getStatusPageSize(0));
    auto* lpPage = new (mFile.get()) ZTSStatusPage{};
    ZTSStatusHeader& lrHeader = lpPage->mHeader;
    lrHeader.mMagic = gcStatusMagic;
    lrHeader.mVersion = gcStatusVersion;
    lrHeader.mHeaderSize = sizeof(ZTSStatusHeader);
    lrHeader.mLossSize = sizeof(ZTSStatusLoss);
    lrHeader.mLosses = gcStatusLosses;
    lrHeader.mRowSize = sizeof(ZTSStatusRow);
    lrHeader.mRowsPerBoard = gcStatusRowsPerBoard;
    lrHeader.mBoardSize = sizeof(ZTSStatusBoard);
    lrHeader.mPid = static_cast<std::uint32_t>(::getpid());
    sMakeStartId(lrHeader.mStartId);
    lrHeader.mStartTime = sNow();
    lrHeader.mTotalLimit.store(aTotalLimit, std::memory_order_relaxed);
    mFile.publish();
    mpPage = lpPage;
    if (sgpOpenPage.exchange(this) == nullptr) {
        static const int scIsNoted = std::atexit(sNoteExit);
        static_cast<void>(scIsNoted);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::addBoards(const ZTCMap<unsigned int, ZTCPointer<ZTCTavikInitiator>>& acrInitiators) {
    ZT_ENTRY();
    if (mpPage == nullptr) {
        ZT_EXIT();
        return;
    }
    const auto lBoards = static_cast<std::uint32_t>(acrInitiators.size());
    mpPage->mHeader.mAdaptersAtStart.store(lBoards, std::memory_order_relaxed);
    setAdapters(lBoards);
    mFile.grow(getStatusPageSize(lBoards));
    mpPage = static_cast<ZTSStatusPage*>(mFile.get());
    mpBoards = reinterpret_cast<ZTSStatusBoard*>(static_cast<unsigned char*>(mFile.get()) + sizeof(ZTSStatusPage));
    for (const auto& lrEntry : acrInitiators) {
        auto* lpBoard = new (mpBoards + lrEntry.second->getBoardId()) ZTSStatusBoard{};
        std::memcpy(lpBoard->mWwnn, lrEntry.second->getWwnn()->getBytes(), sizeof lpBoard->mWwnn);
        std::memcpy(lpBoard->mWwpn, lrEntry.second->getWwpn()->getBytes(), sizeof lpBoard->mWwpn);
    }
    mBoards = lBoards;
    mpPage->mHeader.mBoards.store(lBoards, std::memory_order_release);
    ZT_EXIT();
}

ZTSStatusRow* ZTCStatusPageWriter::findRow(unsigned aBoardId, unsigned char aCategory,
                                           unsigned char aSubcategory) const noexcept {
    ZT_ENTRY();
    ZTSStatusRow* lpRow = mpPage != nullptr ? &mpPage->mUnknownBoards : nullptr;
    if (aBoardId < mBoards) [[likely]] {
        lpRow = &mpBoards[aBoardId].mRows[scRowBySlot[getKindSlot(aCategory, aSubcategory)]];
    }
    ZT_EXIT();
    return lpRow;
}

void ZTCStatusPageWriter::countRefused(unsigned aBoardId, unsigned char aCategory, unsigned char aSubcategory,
                                       ZTEStatusRefusal aReason, std::uint64_t aEvents) const noexcept {
    ZT_ENTRY();
    if (ZTSStatusRow* lpRow = findRow(aBoardId, aCategory, aSubcategory); lpRow != nullptr) {
        lpRow->mRefused[aReason].fetch_add(aEvents, std::memory_order_relaxed);
        lpRow->mLastRefused.store(sNow(), std::memory_order_relaxed);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::setEnd(ZTEStatusEnd aReason) const noexcept {
    ZT_ENTRY();
    if (mpPage != nullptr) {
        std::int64_t lRunning = 0;
        if (mpPage->mHeader.mEndTime.compare_exchange_strong(lRunning, sNow())) {
            // Whatever else goes wrong while a signal stops the agent: the signal is the reason.
            bool lIsStopped = false;
            try {
                lIsStopped = aReason != ZTSE_ShutDown && getStopEvent().isRaised();
            } catch (const ZTCException&) {  // no event could be made, so none was raised
            }
            mpPage->mHeader.mEndReason.store(lIsStopped ? ZTSE_Signal : aReason, std::memory_order_release);
        }
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::countDropped(ZTSStatusRow& arRow, std::uint64_t aOccurrences) const noexcept {
    ZT_ENTRY();
    arRow.mDropped.store(arRow.mDropped.load(std::memory_order_relaxed) + aOccurrences, std::memory_order_release);
    std::atomic<std::uint64_t>& lrHeld = mpPage->mHeader.mHeldRecords;
    lrHeld.store(lrHeld.load(std::memory_order_relaxed) - 1, std::memory_order_relaxed);
    ZT_EXIT();
}

void ZTCStatusPageWriter::countRetrieval() const noexcept {
    ZT_ENTRY();
    if (mpPage == nullptr) {
        ZT_EXIT();
        return;
    }
    // Between the two sequence numbers every store has release order: none is seen before the first of them.
    ZTSStatusHeader& lrHeader = mpPage->mHeader;
    const std::uint32_t lSequence = lrHeader.mRetrievalSequence.load(std::memory_order_relaxed);
    lrHeader.mRetrievalSequence.store(lSequence + 1, std::memory_order_relaxed);
    const auto lAdd = [](std::atomic<std::uint64_t>& arCounter, std::uint64_t aNumber) {
        arCounter.store(arCounter.load(std::memory_order_relaxed) + aNumber, std::memory_order_release);
    };
    std::uint64_t lOccurrences = 0;
    const auto lHandOver = [&lOccurrences](ZTSStatusRow& arRow) {
        const std::uint64_t lHandedOver =
            arRow.mConsolidated.load(std::memory_order_relaxed) - arRow.mDropped.load(std::memory_order_relaxed);
        lOccurrences += lHandedOver - arRow.mHandedOver.load(std::memory_order_relaxed);
        arRow.mHandedOver.store(lHandedOver, std::memory_order_release);
    };
    lHandOver(mpPage->mUnknownBoards);
    for (std::uint32_t lBoard = 0; lBoard < mBoards; ++lBoard) {
        for (ZTSStatusRow& lrRow : mpBoards[lBoard].mRows) {
            lHandOver(lrRow);
        }
    }
    lAdd(lrHeader.mHandedOverOccurrences, lOccurrences);
    lAdd(lrHeader.mHandedOverRecords, lrHeader.mHeldRecords.load(std::memory_order_relaxed));
    lAdd(lrHeader.mHandedOverBytes, lrHeader.mHeldBytes.load(std::memory_order_relaxed));
    lAdd(lrHeader.mRetrievals, 1);
    lrHeader.mHeldRecords.store(0, std::memory_order_release);
    lrHeader.mHeldBytes.store(0, std::memory_order_release);
    lrHeader.mLastRetrieval.store(sNow(), std::memory_order_release);
    lrHeader.mRetrievalSequence.store(lSequence + 2, std::memory_order_release);
    ZT_EXIT();
}

void ZTCStatusPageWriter::setCollecting(bool aIsCollecting) const noexcept {
    ZT_ENTRY();
    if (mpPage != nullptr) {
        mpPage->mHeader.mCollecting.store(aIsCollecting ? 1 : 0, std::memory_order_relaxed);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::setRecordLimit(std::uint32_t aBytes) const noexcept {
    ZT_ENTRY();
    if (mpPage != nullptr) {
        mpPage->mHeader.mRecordLimit.store(aBytes, std::memory_order_relaxed);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::setAdapters(std::uint32_t aNumber) const noexcept {
    ZT_ENTRY();
    if (mpPage != nullptr) {
        mpPage->mHeader.mAdaptersNow.store(aNumber, std::memory_order_relaxed);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::setState(ZTSStatusRow* apRow, ZTEStatusState aState, const char* apReason) const noexcept {
    ZT_ENTRY();
    const bool lIsNew = apRow != nullptr && apRow->mState.load(std::memory_order_relaxed) != aState;
    if (lIsNew || (apRow != nullptr && !sIsText(apRow->mStateReason, apReason))) {
        const std::uint32_t lSequence = apRow->mStateSequence.load(std::memory_order_relaxed);
        apRow->mStateSequence.store(lSequence + 1, std::memory_order_relaxed);
        if (lIsNew) {
            apRow->mState.store(aState, std::memory_order_release);
            apRow->mStateSince.store(sNow(), std::memory_order_release);
        }
        sStoreText(apRow->mStateReason, apReason);
        apRow->mStateSequence.store(lSequence + 2, std::memory_order_release);
    }
    ZT_EXIT();
}

void ZTCStatusPageWriter::setLoss(const char* apName, std::uint64_t aTotal) const noexcept {
    ZT_ENTRY();
    if (mpPage == nullptr) {
        ZT_EXIT();
        return;
    }
    ZTSStatusHeader& lrHeader = mpPage->mHeader;
    const std::uint32_t lUsed = lrHeader.mLossesUsed.load(std::memory_order_relaxed);
    std::uint32_t lIndex = 0;
    while (lIndex < lUsed && !sIsText(mpPage->mLosses[lIndex].mName, apName)) {
        ++lIndex;
    }
    if (lIndex < gcStatusLosses) {
        ZTSStatusLoss& lrLoss = mpPage->mLosses[lIndex];
        if (aTotal >= lrLoss.mTotal.load(std::memory_order_relaxed)) {
            lrLoss.mTotal.store(aTotal, std::memory_order_relaxed);
        }
        if (lIndex == lUsed) {
            sStoreText(lrLoss.mName, apName);
            lrHeader.mLossesUsed.store(lUsed + 1, std::memory_order_release);
        }
    } else {
        add(lrHeader.mLossesLost, 1);
    }
    ZT_EXIT();
}

ZTSStatusRow* ZTCStatusPageWriter::getRow(unsigned aBoardId, unsigned aKind) const noexcept {
    return aBoardId < mBoards ? &mpBoards[aBoardId].mRows[aKind] : nullptr;
}
