/// Bytes as tests write and read them: hex texts, big-endian and little-endian fields, world wide names.
#ifndef TESTS_SUPPORT_BYTES_H
#define TESTS_SUPPORT_BYTES_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

using ZTCBytes = std::vector<unsigned char>;

/// A world wide name, in the byte order of the wire.
struct ZTSWwn {
    std::array<unsigned char, 8> mBytes{};

    bool operator==(const ZTSWwn&) const = default;
};

/// The name whose bytes, read as one big-endian number, are `aValue`.
ZTSWwn makeWwn(std::uint64_t aValue);

/// Lower-case hex pairs with colons, as the agent prints names.
std::string wwnText(const ZTSWwn& acrName);

/// Lower-case hex without separators; and back. bytesOf ignores blanks and throws on anything else that is no hex pair.
std::string hexOf(const ZTCBytes& acrBytes);
ZTCBytes bytesOf(std::string_view aHex);

/// Writes typed fields back to back.
class ZTCByteWriter {
public:
    ZTCByteWriter& u8(unsigned aValue);
    ZTCByteWriter& u16(unsigned aValue);
    ZTCByteWriter& u32(std::uint64_t aValue);     ///< network byte order
    ZTCByteWriter& le32(std::uint64_t aValue);    ///< little-endian, as inside event data
    ZTCByteWriter& host32(std::uint64_t aValue);  ///< the host's order, as the library delivers integers
    ZTCByteWriter& wwn(const ZTSWwn& acrName);
    ZTCByteWriter& raw(const ZTCBytes& acrBytes);
    ZTCByteWriter& fill(std::size_t aCount, unsigned char aByte);
    /// A bit field of a record: 32 bytes with these bits set.
    ZTCByteWriter& bitField(const std::vector<unsigned>& acrBits);

    const ZTCBytes& bytes() const { return mBytes; }
    std::string hex() const { return hexOf(mBytes); }

private:
    ZTCBytes mBytes;
};

/// Reads typed fields back to back, in network byte order. Reading past the end throws std::runtime_error.
class ZTCByteReader {
public:
    explicit ZTCByteReader(const ZTCBytes& acrBytes) : mBytes(acrBytes) {}

    std::uint8_t u8() { return static_cast<std::uint8_t>(number(1)); }
    std::uint16_t u16() { return static_cast<std::uint16_t>(number(2)); }
    std::uint32_t u32() { return static_cast<std::uint32_t>(number(4)); }
    std::uint64_t u64() { return number(8); }
    ZTCBytes raw(std::size_t aCount);
    ZTSWwn wwn();
    std::string string();

    std::size_t remaining() const { return mBytes.size() - mPosition; }

private:
    std::uint64_t number(std::size_t aCount);

    ZTCBytes mBytes;
    std::size_t mPosition = 0;
};

#endif
