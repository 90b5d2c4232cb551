/// How each kind's event data becomes part of an episode: one row a kind.
#ifndef SENSOR_STORE_SRC_KINDSHAPES_H
#define SENSOR_STORE_SRC_KINDSHAPES_H

#include <cstdint>
#include <span>

#include "sensor/store/include/Episode.h"

/// What the bytes of the identity, or the entries of an appending kind, mean.
enum ZTEIdentityForm : std::uint8_t {
    ZTIF_None,
    ZTIF_NodeName,
    ZTIF_PayloadPortName,
    ZTIF_OriginalCommand,
    ZTIF_OpCode,
    ZTIF_SenseKeyAndAsc,
    ZTIF_Page
};

enum ZTELunForm : std::uint8_t {
    ZTLF_None,
    ZTLF_Number,  ///< one number at the offset
    ZTLF_Bits,    ///< a bit field at the offset
    ZTLF_Entries  ///< the first number of every entry
};

struct ZTSKindShape {
    std::uint8_t mCategory;
    std::uint8_t mSubcategory;
    std::uint32_t mSize;    ///< bytes that a record has at least
    bool mHasPort = false;  ///< the remote port's name stands at gcPortOffset
    ZTEIdentityForm mIdentityForm = ZTIF_None;
    std::uint32_t mIdentityOffset = 0;
    std::uint32_t mIdentitySize = 0;  ///< at most 8
    ZTELunForm mLunForm = ZTLF_None;
    std::uint32_t mLunOffset = 0;
    std::uint32_t mEntriesOffset = 0;       ///< of the first entry; the appended ones follow it without a gap
    std::uint32_t mEntrySize = 0;           ///< 0: the kind has no entries
    std::uint32_t mReasonOffset = 0;        ///< within an entry
    std::uint32_t mReasonSize = 0;          ///< 0: none; 4: a value; 8: a value and its explanation
    std::uint32_t mCommandCodesOffset = 0;  ///< of a bit field; 0: none
    std::uint32_t mAscqsOffset = 0;         ///< of a bit field; 0: none

    constexpr ZTCKindKey getKey() const { return makeKindKey(mCategory, mSubcategory); }
};

inline constexpr std::uint32_t gcPortOffset = 4;
inline constexpr std::uint32_t gcBitFieldBytes = 32;

/// In catalogue order.
std::span<const ZTSKindShape> getKindShapes();

/// The row of the kind, or null.
const ZTSKindShape* findKindShape(ZTCKindKey aKind);

/// A number of event data: little-endian. The bytes are there.
constexpr std::uint32_t readLittleEndian32(std::span<const std::uint8_t> aData, std::size_t aOffset) {
    return static_cast<std::uint32_t>(aData[aOffset]) | static_cast<std::uint32_t>(aData[aOffset + 1]) << 8 |
           static_cast<std::uint32_t>(aData[aOffset + 2]) << 16 | static_cast<std::uint32_t>(aData[aOffset + 3]) << 24;
}

/// The identity's bytes as one number: those of a world wide name as a big-endian number, otherwise the first number in
/// the low half and the second in the high half.
std::uint64_t readIdentity(const ZTSKindShape& acrShape, std::span<const std::uint8_t> aData);

/// Puts an identity into the fields that it stands for.
void storeIdentity(const ZTSKindShape& acrShape, std::uint64_t aIdentity, ZTSEpisodeDetail& arDetail);

#endif
