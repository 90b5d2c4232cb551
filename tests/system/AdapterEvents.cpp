#include "tests/system/AdapterEvents.h"

#include <cstddef>

#include "tests/support/ScriptedLibrary.h"

static ZTCByteWriter sHeader(std::uint64_t aPort) {
    return ZTCByteWriter().host32(0).wwn(makeWwn(aPort));
}

static ZTCByteWriter sRecord(std::uint64_t aPort) {
    return ZTCByteWriter().le32(1).wwn(makeWwn(aPort));
}

ZTCBytes plogiData(std::uint64_t aPort, std::uint64_t aNode) {
    return sHeader(aPort).wwn(makeWwn(aNode)).bytes();
}

ZTCBytes prloData(std::uint64_t aPort) {
    return sHeader(aPort).bytes();
}

ZTCBytes adiscData(std::uint64_t aPort, std::uint64_t aNode) {
    return plogiData(aPort, aNode);
}

ZTCBytes lsRjtData(std::uint64_t aPort, std::uint32_t aCommand, std::uint32_t aReason, std::uint32_t aExplanation) {
    return sHeader(aPort).host32(aCommand).host32(aReason).host32(aExplanation).bytes();
}

ZTCBytes logoData(std::uint64_t aPort, std::uint64_t aPayloadPort) {
    return plogiData(aPort, aPayloadPort);
}

ZTCBytes portBusyData(std::uint64_t aPort) {
    return prloData(aPort);
}

ZTCBytes fcpReadCheckData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aOpCode, std::uint32_t aParameter) {
    return lsRjtData(aPort, aLun, aOpCode, aParameter);
}

ZTCBytes scsiData(std::uint64_t aPort, std::uint32_t aLun) {
    return sHeader(aPort).host32(aLun).bytes();
}

ZTCBytes checkConditionData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aCommandCode,
                            std::uint32_t aSenseKey, std::uint32_t aAsc, std::uint32_t aAscq) {
    return sHeader(aPort).host32(aLun).host32(aCommandCode).host32(aSenseKey).host32(aAsc).host32(aAscq).bytes();
}

ZTCBytes queueDepthData(std::uint64_t aPort, std::uint32_t aLun, std::uint32_t aOldValue, std::uint32_t aNewValue) {
    return lsRjtData(aPort, aLun, aOldValue, aNewValue);
}

ZTCBytes rscnPayload(const std::vector<std::uint32_t>& acrPages) {
    ZTCByteWriter lPayload;
    lPayload.u8(0x61).u8(4).u16(static_cast<unsigned>(4 + 4 * acrPages.size()));
    for (std::uint32_t lPage : acrPages) {
        lPayload.u32(lPage);
    }
    return lPayload.bytes();
}

ZTCBytes bitField(const std::vector<unsigned>& acrBits) {
    ZTCBytes lField(32, 0);
    for (unsigned lBit : acrBits) {
        lField.at(lBit / 8) = static_cast<unsigned char>(lField.at(lBit / 8) | 1u << lBit % 8);
    }
    return lField;
}

std::string qFullRecord(std::uint64_t aPort, const std::vector<unsigned>& acrLunBits) {
    return sRecord(aPort).le32(256).raw(bitField(acrLunBits)).hex();
}

std::string allLunsRecord(std::uint64_t aPort) {
    return sRecord(aPort).le32(256).fill(32, 0xFF).hex();
}

std::string checkConditionRecord(std::uint64_t aPort, std::uint32_t aSenseKey, std::uint32_t aAsc,
                                 const std::vector<unsigned>& acrLunBits, const std::vector<unsigned>& acrCommandBits,
                                 const std::vector<unsigned>& acrAscqBits) {
    return sRecord(aPort)
        .le32(aSenseKey)
        .le32(aAsc)
        .le32(256)
        .raw(bitField(acrLunBits))
        .le32(256)
        .raw(bitField(acrCommandBits))
        .le32(256)
        .raw(bitField(acrAscqBits))
        .hex();
}

std::string rscnRecord(std::uint32_t aPage) {
    return ZTCByteWriter().le32(1).le32(aPage).hex();
}

std::vector<ZTSDataKind> dataKinds() {
    const auto lOwn = gcRemotePort;
    const auto lNode = gcRemoteNode;
    const auto lOther = gcOtherPort;
    const std::string lPlogi = sRecord(lOwn).wwn(makeWwn(lNode)).hex();
    const std::string lPrlo = sRecord(lOwn).hex();
    const std::string lLsRjt = sRecord(lOwn).le32(0x03).le32(0x09).le32(0x29).hex();
    const std::string lReadCheck = sRecord(lOwn).le32(0x28).le32(7).le32(0x01020304).hex();
    const std::string lReset = sRecord(lOwn).le32(5).hex();
    const std::string lDepth = sRecord(lOwn).le32(5).le32(16).hex();
    return {
        {"PLOGI",
         1,
         0x01,
         20,
         "Not enough data in ELS PLOGI Event ",
         "Processing PLOGI event Cat=",
         plogiData(lOwn, lNode),
         lPlogi,
         plogiData(lOwn, lNode),
         ZTEContinuation::Counts,
         lPlogi,
         {plogiData(lOther, lNode), plogiData(lOwn, gcOtherNode)}},
        {"PRLO",
         1,
         0x02,
         12,
         "Not enough data in ELS PRLO Event ",
         "Processing PRLO event Cat=",
         prloData(lOwn),
         lPrlo,
         prloData(lOwn),
         ZTEContinuation::Counts,
         lPrlo,
         {prloData(lOther)}},
        {"ADISC",
         1,
         0x04,
         20,
         "Not enough data in ELS ADISC Event ",
         "Processing ADISC event Cat=",
         adiscData(lOwn, lNode),
         lPlogi,
         adiscData(lOwn, lNode),
         ZTEContinuation::Counts,
         lPlogi,
         {adiscData(lOther, lNode), adiscData(lOwn, gcOtherNode)}},
        {"LS_RJT",
         1,
         0x08,
         24,
         "Not enough data in ELS LSRJT Event ",
         "Processing LsRjt Event Category=",
         lsRjtData(lOwn, 0x03, 0x09, 0x29),
         lLsRjt,
         lsRjtData(lOwn, 0x03, 0x0B, 0x2A),
         ZTEContinuation::Appends,
         lLsRjt + ZTCByteWriter().le32(0x0B).le32(0x2A).hex(),
         {lsRjtData(lOther, 0x03, 0x09, 0x29), lsRjtData(lOwn, 0x04, 0x09, 0x29)}},
        {"LOGO",
         1,
         0x10,
         20,
         "Not enough data in ELS LOGO Event ",
         "Processing LOGO event Cat=",
         logoData(lOwn, lNode),
         lPlogi,
         logoData(lOwn, lNode),
         ZTEContinuation::Counts,
         lPlogi,
         {logoData(lOther, lNode), logoData(lOwn, gcOtherNode)}},
        {"port busy",
         2,
         0x02,
         12,
         "Not enough event data in FABRIC PORT BUSY event",
         "Processing PORTBUSY event Cat=",
         portBusyData(lOwn),
         lPrlo,
         portBusyData(lOwn),
         ZTEContinuation::Counts,
         lPrlo,
         {portBusyData(lOther)}},
        {"FCP read check error",
         2,
         0x04,
         24,
         "Not enough data in FCPRDCHECKERR event ",
         "Processing FCPRDCHKERR event Cat=",
         fcpReadCheckData(lOwn, 7, 0x28, 0x01020304),
         lReadCheck,
         fcpReadCheckData(lOwn, 7, 0x28, 0x05060708),
         ZTEContinuation::Appends,
         lReadCheck + ZTCByteWriter().le32(0x05060708).hex(),
         {fcpReadCheckData(lOther, 7, 0x28, 0x01020304), fcpReadCheckData(lOwn, 8, 0x28, 0x01020304),
          fcpReadCheckData(lOwn, 7, 0x88, 0x01020304)}},
        {"QFULL",
         4,
         0x01,
         16,
         "Not enough data in SCSI Event ",
         "Processing QFULL event Cat=",
         scsiData(lOwn, 3),
         qFullRecord(lOwn, {3}),
         scsiData(lOwn, 9),
         ZTEContinuation::Counts,
         qFullRecord(lOwn, {3, 9}),
         {scsiData(lOther, 3)}},
        {"DEVBSY",
         4,
         0x02,
         16,
         "Not enough data in SCSI Event ",
         "Processing DEVBSY event Cat=",
         scsiData(lOwn, 3),
         qFullRecord(lOwn, {3}),
         scsiData(lOwn, 9),
         ZTEContinuation::Counts,
         qFullRecord(lOwn, {3, 9}),
         {scsiData(lOther, 3)}},
        {"check condition",
         4,
         0x04,
         32,
         "Not enough data in SCSI CHECKCOND Event ",
         "Processing CHECKCOND event Cat=",
         checkConditionData(lOwn, 3, 0x28, 5, 0x24, 1),
         checkConditionRecord(lOwn, 5, 0x24, {3}, {0x28}, {1}),
         checkConditionData(lOwn, 9, 0x2A, 5, 0x24, 2),
         ZTEContinuation::Counts,
         checkConditionRecord(lOwn, 5, 0x24, {3, 9}, {0x28, 0x2A}, {1, 2}),
         {checkConditionData(lOther, 3, 0x28, 5, 0x24, 1), checkConditionData(lOwn, 3, 0x28, 6, 0x24, 1),
          checkConditionData(lOwn, 3, 0x28, 5, 0x25, 1)}},
        {"LUN reset",
         4,
         0x08,
         16,
         "Not enough data in SCSI TGTRESET Event ",
         "Processing LUN RESET Cat=",
         scsiData(lOwn, 5),
         lReset,
         scsiData(lOwn, 6),
         ZTEContinuation::Appends,
         lReset + ZTCByteWriter().le32(6).hex(),
         {scsiData(lOther, 5)}},
        {"target reset",
         4,
         0x10,
         16,
         "Not enough data in SCSI TGTRESET Event ",
         "Processing TGT RESET Cat=",
         scsiData(lOwn, 5),
         lReset,
         scsiData(lOwn, 6),
         ZTEContinuation::Appends,
         lReset + ZTCByteWriter().le32(6).hex(),
         {scsiData(lOther, 5)}},
        {"queue depth change",
         4,
         0x40,
         24,
         "Not enough data in SCSI VARQUEDEPTH Event ",
         "Processing VARQDEPTH event Cat=",
         queueDepthData(lOwn, 5, 32, 16),
         lDepth,
         queueDepthData(lOwn, 6, 16, 8),
         ZTEContinuation::Appends,
         lDepth + ZTCByteWriter().le32(6).le32(8).hex(),
         {queueDepthData(lOther, 5, 32, 16)}},
    };
}

std::vector<ZTSBareKind> bareKinds(unsigned aBoard) {
    return {
        {ZTSLibraryEvent::bare(aBoard, 2, 0x01), 2, 0x01, "Processing Fabric BUSY event Cat="},
        {ZTSLibraryEvent::bare(aBoard, 4, 0x20), 4, 0x20, "Processing BUSRESET event Cat="},
        {ZTSLibraryEvent::bare(aBoard, 8, 0x01), 8, 0x01, "Processing PORTINTERR event Cat="},
        {ZTSLibraryEvent::link(aBoard, ZTCScriptedLibrary::portName(aBoard)), 8, 0x02, "Processing LINK event Cat="},
        {ZTSLibraryEvent::temperature(aBoard), 8, 0x04, "Processing TEMP event Cat="},
        {ZTSLibraryEvent::bare(aBoard, 16, 0x01), 16, 0x01, "Processing ADAPTER ARRIVAL Event Cat="},
    };
}

std::string noticeText(const char* apNotice, unsigned aCategory, unsigned aSubcategory) {
    return apNotice + std::to_string(aCategory) + " SubCat=" + std::to_string(aSubcategory);
}
