/// Asks the sensor for a retrieval: an inherited eventfd that is rung when much is held, and when events are refused.
#ifndef TAVIK_INCLUDE_BELL_H
#define TAVIK_INCLUDE_BELL_H

#include <atomic>
#include <cstdint>

#include "common/include/Log.h"

/// Without a descriptor every operation does nothing. Between two retrievals it is rung once for the bytes held, and
/// once for a refusal. It is rung outside of the locks: a late ring after a retrieval is harmless, a lost one would not
/// be.
class ZTCBell {
public:
    /// aLimit: the bytes held from which on events are refused.
    explicit ZTCBell(std::uint32_t aLimit) : mHalf(aLimit / 2) {
        ZT_ENTRY();
        ZT_EXIT();
    }
    ZTCBell(const ZTCBell&) = delete;
    ZTCBell& operator=(const ZTCBell&) = delete;

    /// Takes over the descriptor whose decimal number the text is (main thread, before events come). Where that is not
    /// possible: one warning, and no bell.
    void open(const char* apText);

    // ---- Under the system's previous-data lock ----

    /// So many bytes are held now.
    void noteHeld(std::uint32_t aBytes) noexcept {
        ZT_ENTRY();
        if (aBytes > mHalf && !mIsHalfNoted && mDescriptor >= 0) [[unlikely]] {
            mIsHalfNoted = true;
            mIsDue.store(true, std::memory_order_relaxed);
        }
        ZT_EXIT();
    }

    /// Everything that was held is handed over.
    void noteRetrieval() noexcept {
        ZT_ENTRY();
        mIsHalfNoted = false;
        mRetrievals.fetch_add(1, std::memory_order_relaxed);
        ZT_EXIT();
    }

    // ---- Any thread, without a lock ----

    /// Rings if noteHeld has found that it is time.
    void ringIfDue() noexcept {
        ZT_ENTRY();
        if (mIsDue.load(std::memory_order_relaxed)) [[unlikely]] {
            ringDue();
        }
        ZT_EXIT();
    }

    /// The number of retrievals so far. Ask for it before you read the bytes held.
    std::uint64_t getRetrievals() const noexcept { return mRetrievals.load(std::memory_order_acquire); }

    /// Rings for an event that was refused after so many retrievals, if it is the first since.
    void ringForRefusal(std::uint64_t aRetrievals) noexcept;

private:
    void ringDue() noexcept;

    const std::uint32_t mHalf;
    int mDescriptor = -1;       ///< set before events come
    bool mIsHalfNoted = false;  ///< guarded by the previous-data lock
    std::atomic<bool> mIsDue{false};
    std::atomic<std::uint64_t> mRetrievals{0};
    std::atomic<std::uint64_t> mRefusalRung{0};  ///< 1 more than the retrievals at the last ring for a refusal
};

#endif
