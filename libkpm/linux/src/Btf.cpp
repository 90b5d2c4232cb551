#include "libkpm/linux/src/Btf.h"

#include <algorithm>
#include <limits>

static constexpr std::uint64_t scMagic = 0xEB9F;
static constexpr std::size_t scShortestHeader = 24;
static constexpr std::size_t scRecord = 12;  // name, kind and count, size or type
static constexpr std::size_t scMember = 12;  // name, type, offset

/// Kinds of types (BTF_KIND_...) that are looked into here.
enum : std::uint32_t {
    BTF_Integer = 1,
    BTF_Pointer = 2,
    BTF_Array = 3,
    BTF_Structure = 4,
    BTF_Union = 5,
    BTF_Enumeration = 6,
    BTF_Typedef = 8,
    BTF_Volatile = 9,
    BTF_Const = 10,
    BTF_Restrict = 11,
    BTF_TypeTag = 18,
    BTF_Enumeration64 = 19
};

/// What follows the first three words of a record of each kind: so many bytes once, and so many for each of its count.
struct ZTSBtfRest {
    std::uint32_t mOnce;
    std::uint32_t mEach;
};
static constexpr ZTSBtfRest scRests[] = {{0, 0}, {4, 0},  {0, 0}, {12, 0}, {0, 12}, {0, 12}, {0, 8},
                                         {0, 0}, {0, 0},  {0, 0}, {0, 0},  {0, 0},  {0, 0},  {0, 8},
                                         {4, 0}, {0, 12}, {0, 0}, {4, 0},  {0, 0},  {0, 12}};

ZTCBtf::ZTCBtf(ZTCByteSpan aKernel, ZTCByteSpan aModule) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        if (loadUnsigned(aKernel, 0, 2, lOrder) == scMagic) {
            mOrder = lOrder;
        }
    }
    mIsWhole = addPart(aKernel) && (aModule.empty() || addPart(aModule));
}

/// Finds the sections and where each record begins.
bool ZTCBtf::addPart(ZTCByteSpan aBytes) {
    const auto lWord = [&](std::size_t aOffset) { return loadUnsigned(aBytes, aOffset, 4, mOrder).value_or(0); };
    const std::uint64_t lHeader = lWord(4);
    if (loadUnsigned(aBytes, 0, 2, mOrder) != scMagic || lHeader < scShortestHeader || lHeader > aBytes.size()) {
        return false;
    }
    const ZTCByteSpan lSections = aBytes.subspan(static_cast<std::size_t>(lHeader));
    const auto lIsInside = [&](std::uint64_t aOffset, std::uint64_t aSize) {
        return aOffset <= lSections.size() && aSize <= lSections.size() - aOffset;
    };
    if (!lIsInside(lWord(8), lWord(12)) || !lIsInside(lWord(16), lWord(20))) {
        return false;
    }
    Part lPart;
    lPart.mTypes = lSections.subspan(static_cast<std::size_t>(lWord(8)), static_cast<std::size_t>(lWord(12)));
    lPart.mStrings = lSections.subspan(static_cast<std::size_t>(lWord(16)), static_cast<std::size_t>(lWord(20)));
    if (!mParts.empty()) {
        const Part& lrBefore = mParts.back();
        lPart.mFirstString = lrBefore.mFirstString + lrBefore.mStrings.size();
        lPart.mFirstType = lrBefore.mFirstType + static_cast<std::uint32_t>(lrBefore.mOffsets.size());
    }
    std::size_t lPlace = 0;
    while (lPlace != lPart.mTypes.size()) {
        lPart.mOffsets.push_back(static_cast<std::uint32_t>(lPlace));
        const std::optional<Type> lType = readType(lPart, lPart.mOffsets.size() - 1);
        if (!lType) {
            return false;
        }
        lPlace += scRecord + lType->mRest.size();
    }
    mParts.push_back(std::move(lPart));
    return true;
}

std::optional<ZTCBtf::Type> ZTCBtf::readType(const Part& acrPart, std::size_t aIndex) const {
    const ZTCByteSpan lBytes = acrPart.mTypes.subspan(acrPart.mOffsets[aIndex]);
    const std::optional<std::uint64_t> lName = loadUnsigned(lBytes, 0, 4, mOrder);
    const std::optional<std::uint64_t> lInfo = loadUnsigned(lBytes, 4, 4, mOrder);
    const std::optional<std::uint64_t> lSize = loadUnsigned(lBytes, 8, 4, mOrder);
    if (!lName || !lInfo || !lSize) {
        return std::nullopt;
    }
    const auto lKind = static_cast<std::uint32_t>(*lInfo >> 24 & 31);
    const auto lCount = static_cast<std::uint32_t>(*lInfo & 0xFFFF);
    if (lKind == 0 || lKind >= std::size(scRests)) {
        return std::nullopt;
    }
    const std::size_t lRest = scRests[lKind].mOnce + std::size_t{lCount} * scRests[lKind].mEach;
    if (lRest > lBytes.size() - scRecord) {
        return std::nullopt;
    }
    return Type{*lName, lKind, lCount, (*lInfo >> 31) != 0, *lSize, lBytes.subspan(scRecord, lRest)};
}

std::optional<ZTCBtf::Type> ZTCBtf::getType(std::uint64_t aNumber) const {
    for (const Part& lrPart : mParts) {
        if (aNumber >= lrPart.mFirstType && aNumber - lrPart.mFirstType < lrPart.mOffsets.size()) {
            return readType(lrPart, static_cast<std::size_t>(aNumber - lrPart.mFirstType));
        }
    }
    return std::nullopt;
}

/// The type without its other names and qualifiers.
std::optional<ZTCBtf::Type> ZTCBtf::resolve(std::uint64_t aNumber) const {
    static constexpr unsigned scDeepest = 32;
    std::optional<Type> lType = getType(aNumber);
    for (unsigned lDepth = 0; lType && lDepth < scDeepest; ++lDepth) {
        const bool lIsOnlyAName =
            (lType->mKind >= BTF_Typedef && lType->mKind <= BTF_Restrict) || lType->mKind == BTF_TypeTag;
        if (!lIsOnlyAName) {
            return lType;
        }
        lType = getType(lType->mSizeOrType);
    }
    return std::nullopt;
}

std::string_view ZTCBtf::getString(std::uint64_t aOffset) const {
    for (const Part& lrPart : mParts) {
        if (aOffset >= lrPart.mFirstString && aOffset - lrPart.mFirstString < lrPart.mStrings.size()) {
            const ZTCByteSpan lRest = lrPart.mStrings.subspan(static_cast<std::size_t>(aOffset - lrPart.mFirstString));
            const auto lEnd = std::find(lRest.begin(), lRest.end(), std::uint8_t{0});
            return {reinterpret_cast<const char*>(lRest.data()), static_cast<std::size_t>(lEnd - lRest.begin())};
        }
    }
    return {};
}

std::optional<ZTSBtfMember> ZTCBtf::findMember(const Type& acrType, std::string_view aName, unsigned aDepth) const {
    static constexpr unsigned scDeepest = 8;
    if (aDepth > scDeepest) {
        return std::nullopt;
    }
    for (std::uint32_t lIndex = 0; lIndex < acrType.mCount; ++lIndex) {
        const ZTCByteSpan lMember = acrType.mRest.subspan(lIndex * scMember, scMember);
        const auto lWord = [&](std::size_t aOffset) { return loadUnsigned(lMember, aOffset, 4, mOrder).value_or(0); };
        const std::string_view lName = getString(lWord(0));
        const std::uint64_t lBits = acrType.mHasBitFields ? lWord(8) & 0xFFFFFF : lWord(8);
        const bool lIsBitField = (acrType.mHasBitFields && lWord(8) >> 24 != 0) || lBits % 8 != 0;
        if (!lName.empty() && lName != aName) {
            continue;
        }
        const std::optional<Type> lType = resolve(lWord(4));
        if (lIsBitField || !lType) {
            continue;
        }
        const auto lOffset = static_cast<std::size_t>(lBits / 8);
        if (lName.empty()) {
            const bool lHasMembers = lType->mKind == BTF_Structure || lType->mKind == BTF_Union;
            std::optional<ZTSBtfMember> lInner = lHasMembers ? findMember(*lType, aName, aDepth + 1) : std::nullopt;
            if (lInner) {
                lInner->mOffset += lOffset;
                return lInner;
            }
            continue;
        }
        switch (lType->mKind) {
            case BTF_Integer:
            case BTF_Enumeration:
            case BTF_Enumeration64:
                return ZTSBtfMember{lOffset, ZTBF_Number, static_cast<std::size_t>(lType->mSizeOrType)};
            case BTF_Pointer:
                return ZTSBtfMember{lOffset, ZTBF_Pointer, 0};
            case BTF_Array:
                return ZTSBtfMember{lOffset, ZTBF_Array, 0};
            default:
                return ZTSBtfMember{lOffset, ZTBF_Other, 0};
        }
    }
    return std::nullopt;
}

std::optional<ZTSBtfStructure> ZTCBtf::describe(const Type& acrType, std::span<const std::string_view> aMembers) const {
    ZTSBtfStructure lStructure{static_cast<std::size_t>(acrType.mSizeOrType), {}};
    for (const std::string_view lName : aMembers) {
        const std::optional<ZTSBtfMember> lMember = findMember(acrType, lName, 0);
        if (!lMember) {
            return std::nullopt;
        }
        lStructure.mMembers.push_back(*lMember);
    }
    return lStructure;
}

std::optional<ZTSBtfStructure> ZTCBtf::find(std::string_view aName, std::span<const std::string_view> aMembers) const {
    if (!mIsWhole) {
        return std::nullopt;
    }
    for (auto lPart = mParts.rbegin(); lPart != mParts.rend(); ++lPart) {
        for (std::size_t lIndex = 0; lIndex < lPart->mOffsets.size(); ++lIndex) {
            const std::optional<Type> lType = readType(*lPart, lIndex);
            if (!lType || lType->mKind != BTF_Structure || getString(lType->mName) != aName) {
                continue;
            }
            if (std::optional<ZTSBtfStructure> lStructure = describe(*lType, aMembers)) {
                return lStructure;
            }
        }
    }
    return std::nullopt;
}
