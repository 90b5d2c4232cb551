/// BTF built by hand after its public layout, in either byte order.
#ifndef TESTS_UNIT_LINUX_BTFBYTES_H
#define TESTS_UNIT_LINUX_BTFBYTES_H

#include <bit>
#include <cstdint>
#include <string>
#include <vector>

#include "tests/unit/linux/KernelBytes.h"

class ZTCBtfBuilder {
public:
    struct Member {
        std::string mName;
        std::uint32_t mType;
        std::uint32_t mBits;  ///< offset; with bit fields, the size in the highest 8 bits
    };

    explicit ZTCBtfBuilder(std::endian aOrder = std::endian::native) : mOrder(aOrder) { mStrings.push_back(0); }

    /// What continues another description.
    static ZTCBtfBuilder after(const ZTCBtfBuilder& acrBase);

    // Each returns the number of the new type.
    std::uint32_t addInteger(const std::string& acrName, std::uint32_t aSize);
    std::uint32_t addPointer(std::uint32_t aType) { return add("", 2, 0, aType); }
    std::uint32_t addArray(std::uint32_t aType, std::uint32_t aCount);
    std::uint32_t addTypedef(const std::string& acrName, std::uint32_t aType) { return add(acrName, 8, 0, aType); }
    std::uint32_t addConst(std::uint32_t aType) { return add("", 10, 0, aType); }
    std::uint32_t addStructure(const std::string& acrName, std::uint32_t aSize, const std::vector<Member>& acrMembers,
                               bool aHasBitFields = false, std::uint32_t aKind = 4);
    /// A record of any kind, with so many bytes of zeros behind it.
    std::uint32_t addRaw(std::uint32_t aKind, std::uint32_t aCount, std::size_t aRest);

    ZTCBytes make() const;

private:
    std::uint32_t add(const std::string& acrName, std::uint32_t aKind, std::uint32_t aCount, std::uint32_t aSizeOrType,
                      bool aHasBitFields = false);
    std::uint32_t addString(const std::string& acrText);

    std::endian mOrder;
    std::uint32_t mFirstString = 0;
    std::uint32_t mLastType = 0;
    ZTCBytes mTypes;
    ZTCBytes mStrings;
};

/// The four structures that the sense data are found through, with the offsets of one kernel: the SCSI ones in the
/// module's description, the request in the kernel's.
struct ZTSScsiBtf {
    ZTCBytes mKernel;
    ZTCBytes mModule;
};
ZTSScsiBtf scsiBtf(std::endian aOrder = std::endian::native);

#endif
