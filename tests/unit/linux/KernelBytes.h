/// Bytes and texts as the kernel gives them, built by hand after its public layouts, in either byte order.
#ifndef TESTS_UNIT_LINUX_KERNELBYTES_H
#define TESTS_UNIT_LINUX_KERNELBYTES_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

using ZTCBytes = std::vector<std::uint8_t>;

/// Appends a number of so many bytes.
void putNumber(ZTCBytes& arBytes, std::uint64_t aNumber, std::size_t aSize, std::endian aOrder = std::endian::native);

/// A netlink message with one FC event, padded as the kernel does.
struct ZTSFcMessage {
    std::uint32_t mHost = 0;
    std::uint32_t mNumber = 1;
    std::uint32_t mCode = 1;
    ZTCBytes mData{0, 0, 0, 0};
    std::endian mOrder = std::endian::native;

    ZTCBytes make() const;
};

/// The data of an RSCN event of one page.
ZTCBytes rscnData(std::uint32_t aPage, std::endian aOrder = std::endian::native);

/// The description of finished commands, as kernel 6.12 has it, or 6.1, without sense data.
std::string doneFormat(bool aHasSense = true);
/// The description of a page of 4096 bytes.
std::string headerPage();

inline constexpr std::uint16_t gcDoneId = 385;

/// A record of a finished command after doneFormat.
struct ZTSDoneRecord {
    std::uint32_t mHost = 0;
    std::uint32_t mChannel = 0;
    std::uint32_t mTarget = 0;
    std::uint32_t mLun = 0;
    std::uint32_t mResult = 0;
    std::uint32_t mOpcode = 0x28;
    std::uint32_t mDriverTag = 314;
    std::uint32_t mSchedulerTag = 79;
    std::uint8_t mSenseKey = 0;
    std::uint8_t mAsc = 0;
    std::uint8_t mAscq = 0;
    std::uint16_t mId = gcDoneId;
    bool mHasSense = true;
    std::endian mOrder = std::endian::native;

    ZTCBytes make() const;
};

/// The description of the sense data's probe.
std::string senseFormat();
inline constexpr std::uint16_t gcSenseId = 1742;

/// A record of the probe after senseFormat: fixed sense data.
struct ZTSSenseRecordBytes {
    std::uint32_t mHost = 0;
    std::uint32_t mChannel = 0;
    std::uint32_t mTarget = 0;
    std::uint64_t mLun = 0;
    std::uint8_t mOpcode = 0x28;
    std::uint32_t mDriverTag = 314;
    std::uint32_t mSchedulerTag = 79;
    std::uint8_t mSenseKey = 5;
    std::uint8_t mAsc = 0x21;
    std::uint8_t mAscq = 0;
    std::endian mOrder = std::endian::native;

    ZTCBytes make() const;
};

/// A page of the trace ring buffer.
class ZTCPageBuilder {
public:
    explicit ZTCPageBuilder(std::endian aOrder = std::endian::native) : mOrder(aOrder) {}

    /// A record whose length stands in its first word (at most 112 bytes, padded to 4).
    ZTCPageBuilder& addShort(const ZTCBytes& acrData);
    /// A record with a length word of its own.
    ZTCPageBuilder& addLong(const ZTCBytes& acrData);
    /// A first word of this type and time, alone.
    ZTCPageBuilder& addWord(std::uint32_t aType, std::uint32_t aTime);
    ZTCPageBuilder& addNumber(std::uint32_t aNumber);

    /// The page of 4096 bytes; the commit word has these bits more, or this length in place of the true one.
    ZTCBytes make(std::uint64_t aMarks = 0) const;
    ZTCBytes makeWithLength(std::uint64_t aCommit) const;

private:
    std::endian mOrder;
    ZTCBytes mData;
};

inline constexpr std::uint64_t gcMissedEvents = 1u << 31;

#endif
