#include "tests/unit/linux/BtfBytes.h"

ZTCBtfBuilder ZTCBtfBuilder::after(const ZTCBtfBuilder& acrBase) {
    ZTCBtfBuilder lBuilder(acrBase.mOrder);
    lBuilder.mFirstString = acrBase.mFirstString + static_cast<std::uint32_t>(acrBase.mStrings.size());
    lBuilder.mLastType = acrBase.mLastType;
    return lBuilder;
}

std::uint32_t ZTCBtfBuilder::addString(const std::string& acrText) {
    if (acrText.empty()) {
        return 0;
    }
    const auto lOffset = mFirstString + static_cast<std::uint32_t>(mStrings.size());
    mStrings.insert(mStrings.end(), acrText.begin(), acrText.end());
    mStrings.push_back(0);
    return lOffset;
}

std::uint32_t ZTCBtfBuilder::add(const std::string& acrName, std::uint32_t aKind, std::uint32_t aCount,
                                 std::uint32_t aSizeOrType, bool aHasBitFields) {
    putNumber(mTypes, addString(acrName), 4, mOrder);
    putNumber(mTypes, aKind << 24 | aCount | (aHasBitFields ? 1u << 31 : 0), 4, mOrder);
    putNumber(mTypes, aSizeOrType, 4, mOrder);
    return ++mLastType;
}

std::uint32_t ZTCBtfBuilder::addRaw(std::uint32_t aKind, std::uint32_t aCount, std::size_t aRest) {
    const std::uint32_t lType = add("", aKind, aCount, 0);
    mTypes.resize(mTypes.size() + aRest);
    return lType;
}

std::uint32_t ZTCBtfBuilder::addInteger(const std::string& acrName, std::uint32_t aSize) {
    const std::uint32_t lType = add(acrName, 1, 0, aSize);
    putNumber(mTypes, aSize * 8, 4, mOrder);
    return lType;
}

std::uint32_t ZTCBtfBuilder::addArray(std::uint32_t aType, std::uint32_t aCount) {
    const std::uint32_t lType = add("", 3, 0, 0);
    for (const std::uint32_t lNumber : {aType, aType, aCount}) {
        putNumber(mTypes, lNumber, 4, mOrder);
    }
    return lType;
}

std::uint32_t ZTCBtfBuilder::addStructure(const std::string& acrName, std::uint32_t aSize,
                                          const std::vector<Member>& acrMembers, bool aHasBitFields,
                                          std::uint32_t aKind) {
    const std::uint32_t lType =
        add(acrName, aKind, static_cast<std::uint32_t>(acrMembers.size()), aSize, aHasBitFields);
    for (const Member& lrMember : acrMembers) {
        putNumber(mTypes, addString(lrMember.mName), 4, mOrder);
        putNumber(mTypes, lrMember.mType, 4, mOrder);
        putNumber(mTypes, lrMember.mBits, 4, mOrder);
    }
    return lType;
}

ZTCBytes ZTCBtfBuilder::make() const {
    ZTCBytes lBytes;
    putNumber(lBytes, 0xEB9F, 2, mOrder);
    putNumber(lBytes, 1, 1, mOrder);
    putNumber(lBytes, 0, 1, mOrder);
    putNumber(lBytes, 24, 4, mOrder);
    putNumber(lBytes, 0, 4, mOrder);
    putNumber(lBytes, mTypes.size(), 4, mOrder);
    putNumber(lBytes, mTypes.size(), 4, mOrder);
    putNumber(lBytes, mStrings.size(), 4, mOrder);
    lBytes.insert(lBytes.end(), mTypes.begin(), mTypes.end());
    lBytes.insert(lBytes.end(), mStrings.begin(), mStrings.end());
    return lBytes;
}

ZTSScsiBtf scsiBtf(std::endian aOrder) {
    ZTCBtfBuilder lKernel(aOrder);
    const std::uint32_t lInt = lKernel.addInteger("int", 4);
    const std::uint32_t lLong = lKernel.addInteger("unsigned long long", 8);
    const std::uint32_t lByte = lKernel.addInteger("unsigned char", 1);
    const std::uint32_t lU64 = lKernel.addTypedef("u64", lLong);
    lKernel.addStructure("request", 264, {{"q", lLong, 0}, {"tag", lInt, 256}, {"internal_tag", lInt, 288}});
    ZTCBtfBuilder lModule = ZTCBtfBuilder::after(lKernel);
    const std::uint32_t lHost = lModule.addStructure("Scsi_Host", 2000, {{"host_no", lInt, 404 * 8}});
    const std::uint32_t lHostPointer = lModule.addPointer(lHost);
    const std::uint32_t lDevice = lModule.addStructure(
        "scsi_device", 3000,
        {{"host", lHostPointer, 0}, {"id", lInt, 144 * 8}, {"channel", lInt, 148 * 8}, {"lun", lU64, 152 * 8}});
    const std::uint32_t lDevicePointer = lModule.addPointer(lDevice);
    const std::uint32_t lBytePointer = lModule.addPointer(lByte);
    lModule.addStructure("scsi_cmnd", 400,
                         {{"device", lDevicePointer, 0},
                          {"cmnd", lModule.addArray(lByte, 32), 164 * 8},
                          {"sense_buffer", lBytePointer, 248 * 8},
                          {"result", lInt, 288 * 8}});
    return {lKernel.make(), lModule.make()};
}
