/// Reads BTF, the kernel's description of its own types (linux/btf.h), as far as it takes to find members of
/// structures. Pure: bytes in, offsets out.
///
/// A description is a header, type records and strings. Type numbers count from 1 in the order of the records. The
/// description of a module continues that of the kernel: its type numbers and string offsets begin where those of the
/// kernel end.
#ifndef LIBKPM_LINUX_SRC_BTF_H
#define LIBKPM_LINUX_SRC_BTF_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "libkpm/linux/src/HostBytes.h"

enum ZTEBtfForm : std::uint8_t {
    ZTBF_Number,  ///< an integer or an enumeration
    ZTBF_Pointer,
    ZTBF_Array,
    ZTBF_Other
};

struct ZTSBtfMember {
    std::size_t mOffset = 0;  ///< in bytes, from the beginning of the structure, through members without a name
    ZTEBtfForm mForm = ZTBF_Other;
    std::size_t mSize = 0;  ///< in bytes; of numbers alone
};

struct ZTSBtfStructure {
    std::size_t mSize = 0;
    std::vector<ZTSBtfMember> mMembers;  ///< in the order they were asked for
};

class ZTCBtf {
public:
    /// `aModule` is empty where the kernel's own description is enough. Both outlive the object. The byte order is that
    /// of the kernel's header.
    ZTCBtf(ZTCByteSpan aKernel, ZTCByteSpan aModule);

    /// False where one of the two did not parse to its end; nothing is found then.
    bool isWhole() const { return mIsWhole; }

    /// A structure of this name that has all these members, none of them a bit field. The module's come first.
    std::optional<ZTSBtfStructure> find(std::string_view aName, std::span<const std::string_view> aMembers) const;

private:
    struct Part {
        ZTCByteSpan mTypes;
        ZTCByteSpan mStrings;
        std::uint64_t mFirstString = 0;       // offset of its first string
        std::uint32_t mFirstType = 1;         // number of its first type
        std::vector<std::uint32_t> mOffsets;  // of its type records
    };

    struct Type {
        std::uint64_t mName;
        std::uint32_t mKind;
        std::uint32_t mCount;  // of members
        bool mHasBitFields;
        std::uint64_t mSizeOrType;
        ZTCByteSpan mRest;  // what follows the record's first three words
    };

    bool addPart(ZTCByteSpan aBytes);
    std::optional<Type> readType(const Part& acrPart, std::size_t aIndex) const;
    std::optional<Type> getType(std::uint64_t aNumber) const;
    std::optional<Type> resolve(std::uint64_t aNumber) const;
    std::string_view getString(std::uint64_t aOffset) const;
    std::optional<ZTSBtfMember> findMember(const Type& acrType, std::string_view aName, unsigned aDepth) const;
    std::optional<ZTSBtfStructure> describe(const Type& acrType, std::span<const std::string_view> aMembers) const;

    std::endian mOrder = std::endian::native;
    bool mIsWhole = false;
    std::vector<Part> mParts;
};

#endif
