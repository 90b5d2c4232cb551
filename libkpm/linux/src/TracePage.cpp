#include "libkpm/linux/src/TracePage.h"

static constexpr std::uint64_t scLengthMask = (1u << 27) - 1;
static constexpr std::uint64_t scTimeStampMask = (std::uint64_t{1} << 59) - 1;
static constexpr std::uint64_t scMissedEvents = 1u << 31;
static constexpr std::size_t scWord = 4;

static constexpr std::uint64_t scTypeWithLengthWord = 0;
static constexpr std::uint64_t scTypePadding = 29;
static constexpr std::uint64_t scTypeTimeExtend = 30;
static constexpr std::uint64_t scTypeTimeStamp = 31;

ZTCTracePage::ZTCTracePage(ZTCByteSpan aPage, const ZTSTracePageLayout& acrLayout, std::endian aOrder)
    : mOrder(aOrder) {
    const std::optional<std::uint64_t> lCommit =
        loadUnsigned(aPage, acrLayout.mCommitOffset, acrLayout.mCommitSize, aOrder);
    const std::uint64_t lLength = lCommit.value_or(0) & scLengthMask;
    if (!lCommit || acrLayout.mDataOffset > aPage.size() || lLength > aPage.size() - acrLayout.mDataOffset) {
        mIsMalformed = true;
        return;
    }
    mHasLossBefore = (*lCommit & scMissedEvents) != 0;
    const std::optional<std::uint64_t> lTime =
        loadUnsigned(aPage, acrLayout.mTime.mOffset, acrLayout.mTime.mSize, aOrder);
    mHasTime = lTime.has_value();
    mTime = lTime.value_or(0);
    mRest = aPage.subspan(acrLayout.mDataOffset, static_cast<std::size_t>(lLength));
}

/// Takes a record's words and its data off the rest.
std::optional<ZTCByteSpan> ZTCTracePage::take(std::size_t aHeader, std::size_t aLength) {
    if (aHeader > mRest.size() || aLength > mRest.size() - aHeader) {
        mIsMalformed = true;
        mRest = {};
        return std::nullopt;
    }
    const ZTCByteSpan lData = mRest.subspan(aHeader, aLength);
    mRest = mRest.subspan(aHeader + aLength);
    return lData;
}

std::optional<ZTCByteSpan> ZTCTracePage::next() {
    while (!mRest.empty()) {
        const std::optional<std::uint64_t> lHeader = loadUnsigned(mRest, 0, scWord, mOrder);
        if (!lHeader) {
            return take(mRest.size() + 1, 0);
        }
        // The field of 5 bits is the first of its word. Which end of the number that is depends on the byte order.
        const bool lIsBig = mOrder == std::endian::big;
        const std::uint64_t lType = lIsBig ? *lHeader >> 27 : *lHeader & 31;
        const std::uint64_t lTime = lIsBig ? *lHeader & scLengthMask : *lHeader >> 5;
        if (lType == scTypeTimeExtend || lType == scTypeTimeStamp) {
            const std::uint64_t lLong = loadUnsigned(mRest, scWord, scWord, mOrder).value_or(0) << 27 | lTime;
            if (!take(2 * scWord, 0)) {
                return std::nullopt;
            }
            mTime = lType == scTypeTimeExtend ? mTime + lLong : (mTime & ~scTimeStampMask) | lLong;
            continue;
        }
        if (lType == scTypePadding && lTime == 0) {
            mRest = {};
            return std::nullopt;
        }
        mTime += lTime;
        if (lType != scTypeWithLengthWord && lType != scTypePadding) {
            return take(scWord, static_cast<std::size_t>(lType) * scWord);
        }
        const std::uint64_t lLength = loadUnsigned(mRest, scWord, scWord, mOrder).value_or(0);
        if (lLength < scWord) {
            return take(mRest.size() + 1, 0);
        }
        const std::optional<ZTCByteSpan> lData = take(2 * scWord, static_cast<std::size_t>(lLength) - scWord);
        if (lType == scTypeWithLengthWord || !lData) {
            return lData;
        }
    }
    return std::nullopt;
}
