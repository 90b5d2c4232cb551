#include "libkpm/linux/src/EventSequence.h"

void ZTCLinuxEventSequence::note(std::uint32_t aNumber) {
    static constexpr std::uint32_t scHalf = 0x80000000u;
    static constexpr std::uint32_t scLate = 1024;  // more than can be on their way at once
    static constexpr std::size_t scMostGaps = 64;
    if (!mNext) {
        mNext = aNumber + 1;
        return;
    }
    const std::uint32_t lAhead = aNumber - *mNext;
    if (lAhead < scHalf) {
        if (lAhead != 0) {
            if (mGaps.size() == scMostGaps) {
                mLost += mGaps.front().mCount;
                mGaps.erase(mGaps.begin());
            }
            mGaps.push_back({*mNext, lAhead});
        }
        mNext = aNumber + 1;
        return;
    }
    if (*mNext - aNumber > scLate) {
        mNext = aNumber + 1;
        return;
    }
    for (std::size_t lGap = 0; lGap < mGaps.size(); ++lGap) {
        const Gap lFound = mGaps[lGap];
        const std::uint32_t lInside = aNumber - lFound.mFirst;
        if (lInside >= lFound.mCount) {
            continue;
        }
        mGaps.erase(mGaps.begin() + static_cast<std::ptrdiff_t>(lGap));
        if (lInside != 0) {
            mGaps.push_back({lFound.mFirst, lInside});
        }
        if (lInside + 1 != lFound.mCount) {
            mGaps.push_back({aNumber + 1, lFound.mCount - lInside - 1});
        }
        return;
    }
}

std::uint64_t ZTCLinuxEventSequence::takeLost() {
    std::uint64_t lLost = mLost;
    for (const Gap& lrGap : mGaps) {
        lLost += lrGap.mCount;
    }
    mGaps.clear();
    mLost = 0;
    return lLost;
}
