#include "sensor/store/src/EpisodeBody.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <tuple>

/// A LUN that stands for every LUN.
static constexpr std::uint32_t scEveryLun = 0xFFFFFFFFU;

/// Flags of the stored form.
static constexpr std::uint64_t scAllLuns = 1;
static constexpr std::uint64_t scMoreLuns = 2;

static void sSetBit(ZTCBits256& arBits, std::uint32_t aBit) {
    arBits[aBit / 64] |= std::uint64_t{1} << (aBit % 64);
}

/// The bit field as words; bits from the count on are left out.
static ZTCBits256 sReadBits(std::span<const std::uint8_t> aBytes, std::uint32_t aBitCount) {
    ZTCBits256 lBits{};
    static_assert(sizeof(lBits) == gcBitFieldBytes);
    std::memcpy(lBits.data(), aBytes.data(), gcBitFieldBytes);
    if constexpr (std::endian::native == std::endian::big) {
        std::ranges::transform(lBits, lBits.begin(), [](std::uint64_t aWord) { return __builtin_bswap64(aWord); });
    }
    for (std::uint32_t i = 0; i < 4; ++i) {
        const std::uint32_t lFirst = 64 * i;
        if (aBitCount <= lFirst) {
            lBits[i] = 0;
        } else if (aBitCount - lFirst < 64) {
            lBits[i] &= (std::uint64_t{1} << (aBitCount - lFirst)) - 1;
        }
    }
    return lBits;
}

static void sUnite(ZTCBits256& arBits, const ZTCBits256& acrOther) {
    for (std::size_t i = 0; i < arBits.size(); ++i) {
        arBits[i] |= acrOther[i];
    }
}

static std::vector<std::uint32_t> sNumbers(const ZTCBits256& acrBits) {
    std::vector<std::uint32_t> lNumbers;
    for (std::uint32_t i = 0; i < acrBits.size(); ++i) {
        for (std::uint64_t lWord = acrBits[i]; lWord != 0; lWord &= lWord - 1) {
            lNumbers.push_back(64 * i + static_cast<std::uint32_t>(std::countr_zero(lWord)));
        }
    }
    return lNumbers;
}

/// The number of bits stands in the four bytes before each bit field.
static std::uint32_t sBitCount(std::span<const std::uint8_t> aData, std::uint32_t aOffset) {
    return readLittleEndian32(aData, aOffset - 4);
}

void ZTCEpisodeBody::addLun(std::uint32_t aLun) {
    if (aLun == scEveryLun) {
        mIsAllLuns = true;
    } else if (aLun < 256) {
        sSetBit(mLuns, aLun);
    } else {
        const auto lPlace = std::ranges::lower_bound(mOtherLuns, aLun);
        if (lPlace != mOtherLuns.end() && *lPlace == aLun) {
            return;
        }
        if (mOtherLuns.size() >= gcMostOtherLuns) {
            mHasMoreLuns = true;
        } else {
            mOtherLuns.insert(lPlace, aLun);
        }
    }
}

void ZTCEpisodeBody::addLunBits(std::span<const std::uint8_t> aBits, std::uint32_t aBitCount) {
    const ZTCBits256 lBits = sReadBits(aBits, aBitCount);
    if (std::ranges::all_of(lBits, [](std::uint64_t aWord) { return aWord == ~std::uint64_t{0}; })) {
        mIsAllLuns = true;
    } else {
        sUnite(mLuns, lBits);
    }
}

void ZTCEpisodeBody::addReason(std::uint32_t aValue, std::uint32_t aExplanation, std::uint64_t aCount) {
    const auto lPlace = std::ranges::lower_bound(
        mReasons, std::tuple(aValue, aExplanation), {},
        [](const ZTSReasonCount& acrReason) { return std::tuple(acrReason.mValue, acrReason.mExplanation); });
    if (lPlace != mReasons.end() && lPlace->mValue == aValue && lPlace->mExplanation == aExplanation) {
        lPlace->mCount += aCount;
    } else if (mReasons.size() >= gcMostReasons) {
        mOtherReasons += aCount;
    } else {
        mReasons.insert(lPlace, {.mValue = aValue, .mExplanation = aExplanation, .mCount = aCount});
    }
}

void ZTCEpisodeBody::add(const ZTSKindShape& acrShape, std::span<const std::uint8_t> aData) {
    if (acrShape.mLunForm == ZTLF_Number) {
        addLun(readLittleEndian32(aData, acrShape.mLunOffset));
    } else if (acrShape.mLunForm == ZTLF_Bits) {
        addLunBits(aData.subspan(acrShape.mLunOffset, gcBitFieldBytes), sBitCount(aData, acrShape.mLunOffset));
    }
    if (acrShape.mCommandCodesOffset != 0) {
        sUnite(mCommandCodes, sReadBits(aData.subspan(acrShape.mCommandCodesOffset, gcBitFieldBytes),
                                        sBitCount(aData, acrShape.mCommandCodesOffset)));
    }
    if (acrShape.mAscqsOffset != 0) {
        sUnite(mAscqs, sReadBits(aData.subspan(acrShape.mAscqsOffset, gcBitFieldBytes),
                                 sBitCount(aData, acrShape.mAscqsOffset)));
    }
    if (acrShape.mEntrySize == 0) {
        return;
    }
    for (std::size_t i = acrShape.mEntriesOffset; i + acrShape.mEntrySize <= aData.size(); i += acrShape.mEntrySize) {
        if (acrShape.mLunForm == ZTLF_Entries) {
            addLun(readLittleEndian32(aData, i));
        }
        if (acrShape.mReasonSize != 0) {
            const std::size_t lReason = i + acrShape.mReasonOffset;
            addReason(readLittleEndian32(aData, lReason),
                      acrShape.mReasonSize == 8 ? readLittleEndian32(aData, lReason + 4) : 0, 1);
        }
    }
}

static void sAppendNumbers(ZTCStoreBytes& arBytes, const std::vector<std::uint32_t>& acrNumbers) {
    appendVarint(arBytes, acrNumbers.size());
    std::uint32_t lBefore = 0;
    for (const std::uint32_t lNumber : acrNumbers) {
        appendVarint(arBytes, lNumber - lBefore);
        lBefore = lNumber;
    }
}

static std::vector<std::uint32_t> sTakeNumbers(std::span<const std::uint8_t>& arBytes, std::uint32_t aBound) {
    std::vector<std::uint32_t> lNumbers;
    std::uint64_t lNumber = 0;
    for (std::uint64_t i = takeVarint(arBytes); i > 0; --i) {
        lNumber += takeVarint(arBytes);
        if (lNumber > aBound) {
            throw ZTCStoreDamagedEx("history: an episode holds the number " + std::to_string(lNumber) +
                                    ", wanted at most " + std::to_string(aBound));
        }
        lNumbers.push_back(static_cast<std::uint32_t>(lNumber));
    }
    return lNumbers;
}

static ZTCBits256 sTakeBits(std::span<const std::uint8_t>& arBytes) {
    ZTCBits256 lBits{};
    for (const std::uint32_t lNumber : sTakeNumbers(arBytes, 255)) {
        sSetBit(lBits, lNumber);
    }
    return lBits;
}

void ZTCEpisodeBody::encode(ZTCStoreBytes& arBytes) const {
    appendVarint(arBytes, (mIsAllLuns ? scAllLuns : 0) | (mHasMoreLuns ? scMoreLuns : 0));
    sAppendNumbers(arBytes, sNumbers(mLuns));
    sAppendNumbers(arBytes, mOtherLuns);
    sAppendNumbers(arBytes, sNumbers(mCommandCodes));
    sAppendNumbers(arBytes, sNumbers(mAscqs));
    appendVarint(arBytes, mReasons.size());
    for (const ZTSReasonCount& lrReason : mReasons) {
        appendVarint(arBytes, lrReason.mValue);
        appendVarint(arBytes, lrReason.mExplanation);
        appendVarint(arBytes, lrReason.mCount);
    }
    appendVarint(arBytes, mOtherReasons);
}

ZTCEpisodeBody ZTCEpisodeBody::decode(std::span<const std::uint8_t> aBytes) {
    ZTCEpisodeBody lBody;
    const std::uint64_t lFlags = takeVarint(aBytes);
    lBody.mIsAllLuns = (lFlags & scAllLuns) != 0;
    lBody.mHasMoreLuns = (lFlags & scMoreLuns) != 0;
    lBody.mLuns = sTakeBits(aBytes);
    lBody.mOtherLuns = sTakeNumbers(aBytes, scEveryLun);
    lBody.mCommandCodes = sTakeBits(aBytes);
    lBody.mAscqs = sTakeBits(aBytes);
    for (std::uint64_t i = takeVarint(aBytes); i > 0; --i) {
        ZTSReasonCount lReason;
        lReason.mValue = static_cast<std::uint32_t>(takeVarint(aBytes));
        lReason.mExplanation = static_cast<std::uint32_t>(takeVarint(aBytes));
        lReason.mCount = takeVarint(aBytes);
        lBody.mReasons.push_back(lReason);
    }
    lBody.mOtherReasons = takeVarint(aBytes);
    return lBody;
}

ZTSEpisodeDetail ZTCEpisodeBody::makeDetail(const ZTSKindShape& acrShape, std::uint64_t aIdentity) const {
    ZTSEpisodeDetail lDetail;
    storeIdentity(acrShape, aIdentity, lDetail);
    if (acrShape.mLunForm != ZTLF_None) {
        lDetail.mLuns.emplace();
        lDetail.mLuns->mIsAll = mIsAllLuns;
        lDetail.mLuns->mHasMore = mHasMoreLuns;
        lDetail.mLuns->mNumbers = sNumbers(mLuns);
        lDetail.mLuns->mNumbers.insert(lDetail.mLuns->mNumbers.end(), mOtherLuns.begin(), mOtherLuns.end());
    }
    lDetail.mCommandCodes = sNumbers(mCommandCodes);
    lDetail.mAscqs = sNumbers(mAscqs);
    lDetail.mReasons = mReasons;
    lDetail.mOtherReasons = mOtherReasons;
    return lDetail;
}
