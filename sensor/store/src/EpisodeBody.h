/// What an episode gathers beside its count: LUNs, codes and reasons. Grows record by record, and is stored as bytes.
#ifndef SENSOR_STORE_SRC_EPISODEBODY_H
#define SENSOR_STORE_SRC_EPISODEBODY_H

#include <array>
#include <cstdint>
#include <span>
#include <vector>

#include "sensor/store/include/Episode.h"
#include "sensor/store/src/KindShapes.h"
#include "sensor/store/src/Varint.h"

/// 256 numbers as bits; bit n in word n / 64.
using ZTCBits256 = std::array<std::uint64_t, 4>;

class ZTCEpisodeBody {
public:
    /// Adds the event data of a record that has at least the shape's size.
    void add(const ZTSKindShape& acrShape, std::span<const std::uint8_t> aData);

    /// Appends the stored form: flags, the LUNs, command codes and ASCQs that are set (a count, then differences),
    /// and the reasons (a count, then value, explanation and count of each).
    void encode(ZTCStoreBytes& arBytes) const;
    /// Throws ZTCStoreDamagedEx where the bytes are no such form.
    static ZTCEpisodeBody decode(std::span<const std::uint8_t> aBytes);

    /// The fields for people; those that the kind does not have stay empty.
    ZTSEpisodeDetail makeDetail(const ZTSKindShape& acrShape, std::uint64_t aIdentity) const;

private:
    void addLun(std::uint32_t aLun);
    void addLunBits(std::span<const std::uint8_t> aBits, std::uint32_t aBitCount);
    void addReason(std::uint32_t aValue, std::uint32_t aExplanation, std::uint64_t aCount);

    bool mIsAllLuns = false;
    bool mHasMoreLuns = false;
    ZTCBits256 mLuns{};
    ZTCBits256 mCommandCodes{};
    ZTCBits256 mAscqs{};
    std::vector<std::uint32_t> mOtherLuns;  ///< above 255; rising, each once
    std::vector<ZTSReasonCount> mReasons;   ///< rising by value and explanation
    std::uint64_t mOtherReasons = 0;
};

#endif
