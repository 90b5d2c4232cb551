#include "sensor/client/include/StatusPageReader.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <thread>

#include "libkpm/include/ScopeEventKinds.h"

static_assert(gcScopeEventKinds.size() == gcStatusKinds);

namespace {

/// Copies that are made before one that a retrieval interrupted is taken as it is.
constexpr int scMostCopies = 10;

/// Errors that say that there is no page there, or none for this process. All others say nothing about it.
constexpr int scNoPage[] = {ENOENT, ENOTDIR, ELOOP, ENAMETOOLONG, EACCES, EPERM, ENXIO, ENODEV};

/// Looks at a state that is being written at this moment, before it is taken without its words.
constexpr int scMostLooks = 20;

template <std::size_t Words>
std::string sCopyText(const ZTStatusText<Words>& acrText) {
    std::array<char, 8 * Words> lBytes;
    for (std::size_t lIndex = 0; lIndex < Words; ++lIndex) {
        const std::uint64_t lWord = acrText[lIndex].load(std::memory_order_acquire);
        std::memcpy(lBytes.data() + 8 * lIndex, &lWord, sizeof lWord);
    }
    return std::string(lBytes.data(), strnlen(lBytes.data(), lBytes.size()));
}

/// A number that is out of its range was not written by an agent of this version; the last value says so in words.
template <typename Enumeration>
Enumeration sLimit(std::uint32_t aValue, Enumeration aLast) {
    return static_cast<Enumeration>(std::min<std::uint32_t>(aValue, aLast));
}

void sCopyState(const ZTSStatusRow& acrRow, ZTSStatusRowCopy& arCopy) {
    for (int lLook = 0; lLook < scMostLooks; ++lLook) {
        const std::uint32_t lBefore = acrRow.mStateSequence.load(std::memory_order_acquire);
        arCopy.mState = sLimit(acrRow.mState.load(std::memory_order_acquire), ZTSS_NoSource);
        arCopy.mStateSince = acrRow.mStateSince.load(std::memory_order_acquire);
        arCopy.mStateReason = sCopyText(acrRow.mStateReason);
        if (lBefore % 2 == 0 && acrRow.mStateSequence.load(std::memory_order_relaxed) == lBefore) {
            return;
        }
    }
    // The writer is slow, or was killed in the middle: the words may be a mixture of two.
    arCopy.mStateReason.clear();
}

void sCopyRow(const ZTSStatusRow& acrRow, ZTSStatusRowCopy& arCopy) {
    // In this order: what is consolidated only grows, and is never less than the other two together.
    arCopy.mHandedOver = acrRow.mHandedOver.load(std::memory_order_acquire);
    arCopy.mDropped = acrRow.mDropped.load(std::memory_order_acquire);
    arCopy.mConsolidated = acrRow.mConsolidated.load(std::memory_order_acquire);
    for (std::size_t lIndex = 0; lIndex < gcStatusRefusals; ++lIndex) {
        arCopy.mRefused[lIndex] = acrRow.mRefused[lIndex].load(std::memory_order_acquire);
    }
    arCopy.mLastEvent = std::max(acrRow.mLastConsolidated.load(std::memory_order_acquire),
                                 acrRow.mLastRefused.load(std::memory_order_acquire));
    sCopyState(acrRow, arCopy);
}

void sCopyHeader(const ZTSStatusHeader& acrHeader, ZTSStatusSnapshot& arCopy) {
    char lStartId[2 * 16 + 1];
    std::snprintf(lStartId, sizeof lStartId, "%016llx%016llx", static_cast<unsigned long long>(acrHeader.mStartId[0]),
                  static_cast<unsigned long long>(acrHeader.mStartId[1]));
    arCopy.mStartId = lStartId;
    arCopy.mPid = acrHeader.mPid;
    arCopy.mStartTime = acrHeader.mStartTime;
    arCopy.mAdaptersAtStart = acrHeader.mAdaptersAtStart.load(std::memory_order_acquire);
    arCopy.mAdaptersNow = acrHeader.mAdaptersNow.load(std::memory_order_acquire);
    arCopy.mIsCollecting = acrHeader.mCollecting.load(std::memory_order_acquire) != 0;
    arCopy.mRecordLimit = acrHeader.mRecordLimit.load(std::memory_order_acquire);
    arCopy.mTotalLimit = acrHeader.mTotalLimit.load(std::memory_order_acquire);
    arCopy.mEndReason = sLimit(acrHeader.mEndReason.load(std::memory_order_acquire), ZTSE_Other);
    arCopy.mEndTime = acrHeader.mEndTime.load(std::memory_order_acquire);
    arCopy.mHeldBytes = acrHeader.mHeldBytes.load(std::memory_order_acquire);
    arCopy.mHeldRecords = acrHeader.mHeldRecords.load(std::memory_order_acquire);
    arCopy.mRetrievals = acrHeader.mRetrievals.load(std::memory_order_acquire);
    arCopy.mHandedOverRecords = acrHeader.mHandedOverRecords.load(std::memory_order_acquire);
    arCopy.mHandedOverOccurrences = acrHeader.mHandedOverOccurrences.load(std::memory_order_acquire);
    arCopy.mHandedOverBytes = acrHeader.mHandedOverBytes.load(std::memory_order_acquire);
    arCopy.mLastRetrieval = acrHeader.mLastRetrieval.load(std::memory_order_acquire);
    arCopy.mLossesLost = acrHeader.mLossesLost.load(std::memory_order_acquire);
}

}  // namespace

std::uint64_t ZTSStatusRowCopy::getRefused() const {
    std::uint64_t lSum = 0;
    for (const std::uint64_t lCount : mRefused) {
        lSum += lCount;
    }
    return lSum;
}

std::uint64_t ZTSStatusSnapshot::getHeld() const {
    std::uint64_t lSum = mUnknownBoards.getHeld();
    for (const ZTSStatusBoardCopy& lrBoard : mBoards) {
        for (const ZTSStatusRowCopy& lrRow : lrBoard.mRows) {
            lSum += lrRow.getHeld();
        }
    }
    return lSum;
}

const char* getStatusRowName(std::size_t aRow) {
    return aRow < gcScopeEventKinds.size() ? gcScopeEventKinds[aRow].mpName : "other";
}

ZTCStatusPageReader::~ZTCStatusPageReader() {
    close();
}

void ZTCStatusPageReader::close() noexcept {
    if (mpMapped != nullptr) {
        munmap(mpMapped, mMappedSize);
        mpMapped = nullptr;
        mMappedSize = 0;
    }
    mFile.reset();
}

bool ZTCStatusPageReader::open(const std::string& acrPath) {
    close();
    mPath = acrPath;
    mReason.clear();
    mHasLooked = true;
    // Not blocking: the path may lead to a FIFO.
    mFile = ZTCFileDescriptor::open(acrPath.c_str(), O_RDONLY | O_NONBLOCK | O_NOFOLLOW);
    if (!mFile.isOpen()) {
        return failToLook("cannot be opened: ");
    }
    struct stat lStatus {};
    if (fstat(mFile.get(), &lStatus) != 0) {
        return failToLook("cannot be looked at: ");
    }
    if (!S_ISREG(lStatus.st_mode)) {
        return fail("is not a regular file");
    }
    if (!map(static_cast<std::size_t>(lStatus.st_size)) || !checkHeader()) {
        close();
        return false;
    }
    return true;
}

bool ZTCStatusPageReader::read(ZTSStatusSnapshot& arSnapshot) {
    mReason.clear();
    mHasLooked = true;
    if (mpMapped == nullptr) {
        return fail("no page is open");
    }
    // The file grows once, when the agent knows its boards.
    struct stat lStatus {};
    if (fstat(mFile.get(), &lStatus) != 0) {
        return failToLook("cannot be looked at: ");
    }
    if (const auto lSize = static_cast<std::size_t>(lStatus.st_size); lSize != mMappedSize) {
        if (lSize < mMappedSize) {
            return fail("is torn: it has become shorter, from " + std::to_string(mMappedSize) + " to " +
                        std::to_string(lSize) + " bytes");
        }
        if (!map(lSize)) {
            return false;
        }
    }

    const ZTSStatusPage& lrPage = getPage();
    const std::uint32_t lBoards = lrPage.mHeader.mBoards.load(std::memory_order_acquire);
    if (lBoards > (mMappedSize - sizeof(ZTSStatusPage)) / sizeof(ZTSStatusBoard)) {
        return fail("is torn: it has " + std::to_string(mMappedSize) + " bytes, too few for " +
                    std::to_string(lBoards) + " boards");
    }
    arSnapshot.mBoards.resize(lBoards);
    for (int lCopy = 0; lCopy < scMostCopies; ++lCopy) {
        const std::uint32_t lBefore = lrPage.mHeader.mRetrievalSequence.load(std::memory_order_acquire);
        sCopyHeader(lrPage.mHeader, arSnapshot);
        sCopyRow(lrPage.mUnknownBoards, arSnapshot.mUnknownBoards);
        for (std::uint32_t lBoard = 0; lBoard < lBoards; ++lBoard) {
            const ZTSStatusBoard& lrBoard = getBoards()[lBoard];
            ZTSStatusBoardCopy& lrCopy = arSnapshot.mBoards[lBoard];
            std::memcpy(lrCopy.mWwnn.data(), lrBoard.mWwnn, sizeof lrBoard.mWwnn);
            std::memcpy(lrCopy.mWwpn.data(), lrBoard.mWwpn, sizeof lrBoard.mWwpn);
            for (std::uint32_t lRow = 0; lRow < gcStatusRowsPerBoard; ++lRow) {
                sCopyRow(lrBoard.mRows[lRow], lrCopy.mRows[lRow]);
            }
        }
        arSnapshot.mIsConsistent =
            lBefore % 2 == 0 && lrPage.mHeader.mRetrievalSequence.load(std::memory_order_relaxed) == lBefore;
        if (arSnapshot.mIsConsistent) {
            break;
        }
        std::this_thread::yield();
    }

    const std::uint32_t lLosses = std::min(lrPage.mHeader.mLossesUsed.load(std::memory_order_acquire), gcStatusLosses);
    arSnapshot.mLosses.resize(lLosses);
    for (std::uint32_t lLoss = 0; lLoss < lLosses; ++lLoss) {
        arSnapshot.mLosses[lLoss].mName = sCopyText(lrPage.mLosses[lLoss].mName);
        arSnapshot.mLosses[lLoss].mTotal = lrPage.mLosses[lLoss].mTotal.load(std::memory_order_acquire);
    }
    return true;
}

/// errno says why.
bool ZTCStatusPageReader::failToLook(const char* apWhat) {
    mHasLooked = std::ranges::find(scNoPage, errno) != std::end(scNoPage);
    return fail(apWhat + std::string(std::strerror(errno)));
}

bool ZTCStatusPageReader::fail(const std::string& acrWhat) {
    mReason = "Status page '" + mPath + "': " + acrWhat;
    return false;
}

/// Maps so many bytes in place of what was mapped.
bool ZTCStatusPageReader::map(std::size_t aSize) {
    if (aSize < sizeof(ZTSStatusPage)) {
        return fail("is too short: it has " + std::to_string(aSize) + " bytes, a page has at least " +
                    std::to_string(sizeof(ZTSStatusPage)));
    }
    void* lpMapped = mmap(nullptr, aSize, PROT_READ, MAP_SHARED, mFile.get(), 0);
    if (lpMapped == MAP_FAILED) {
        return failToLook("cannot be mapped: ");
    }
    if (mpMapped != nullptr) {
        munmap(mpMapped, mMappedSize);
    }
    mpMapped = lpMapped;
    mMappedSize = aSize;
    return true;
}

bool ZTCStatusPageReader::checkHeader() {
    const ZTSStatusHeader& lrHeader = getPage().mHeader;
    std::string lWrong;
    if (lrHeader.mMagic != gcStatusMagic) {
        lWrong = "is not a status page: it begins with other bytes";
    } else if (lrHeader.mVersion != gcStatusVersion) {
        lWrong = "has version " + std::to_string(lrHeader.mVersion) + ", and this program reads version " +
                 std::to_string(gcStatusVersion);
    } else if (lrHeader.mHeaderSize != sizeof(ZTSStatusHeader) || lrHeader.mLossSize != sizeof(ZTSStatusLoss) ||
               lrHeader.mLosses != gcStatusLosses || lrHeader.mRowSize != sizeof(ZTSStatusRow) ||
               lrHeader.mRowsPerBoard != gcStatusRowsPerBoard || lrHeader.mBoardSize != sizeof(ZTSStatusBoard)) {
        lWrong = "is torn: the sizes in its header are not those of its version";
    }
    if (lWrong.empty()) {
        return true;
    }
    return fail(lWrong);
}

const ZTSStatusBoard* ZTCStatusPageReader::getBoards() const {
    return reinterpret_cast<const ZTSStatusBoard*>(static_cast<const unsigned char*>(mpMapped) + sizeof(ZTSStatusPage));
}
