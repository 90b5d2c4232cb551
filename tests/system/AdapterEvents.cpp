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

std::string qFullRecord(std::uint64_t aPort, const std::vector<unsigned>& acrLunBits) {
    return sRecord(aPort).le32(256).bitField(acrLunBits).hex();
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
        .bitField(acrLunBits)
        .le32(256)
        .bitField(acrCommandBits)
        .le32(256)
        .bitField(acrAscqBits)
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
        {testKind("plogi"),
         {.mData = plogiData(lOwn, lNode),
          .mRecordHex = lPlogi,
          .mSameIdentity = plogiData(lOwn, lNode),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = lPlogi,
          .mOthers = {plogiData(lOther, lNode), plogiData(lOwn, gcOtherNode)}}},
        {testKind("prlo"),
         {.mData = prloData(lOwn),
          .mRecordHex = lPrlo,
          .mSameIdentity = prloData(lOwn),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = lPrlo,
          .mOthers = {prloData(lOther)}}},
        {testKind("adisc"),
         {.mData = adiscData(lOwn, lNode),
          .mRecordHex = lPlogi,
          .mSameIdentity = adiscData(lOwn, lNode),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = lPlogi,
          .mOthers = {adiscData(lOther, lNode), adiscData(lOwn, gcOtherNode)}}},
        {testKind("lsrjt"),
         {.mData = lsRjtData(lOwn, 0x03, 0x09, 0x29),
          .mRecordHex = lLsRjt,
          .mSameIdentity = lsRjtData(lOwn, 0x03, 0x0B, 0x2A),
          .mContinuation = ZTEContinuation::Appends,
          .mContinuedHex = lLsRjt + ZTCByteWriter().le32(0x0B).le32(0x2A).hex(),
          .mOthers = {lsRjtData(lOther, 0x03, 0x09, 0x29), lsRjtData(lOwn, 0x04, 0x09, 0x29)}}},
        {testKind("logo"),
         {.mData = logoData(lOwn, lNode),
          .mRecordHex = lPlogi,
          .mSameIdentity = logoData(lOwn, lNode),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = lPlogi,
          .mOthers = {logoData(lOther, lNode), logoData(lOwn, gcOtherNode)}}},
        {testKind("port-busy"),
         {.mData = portBusyData(lOwn),
          .mRecordHex = lPrlo,
          .mSameIdentity = portBusyData(lOwn),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = lPrlo,
          .mOthers = {portBusyData(lOther)}}},
        {testKind("fcp-read-check"),
         {.mData = fcpReadCheckData(lOwn, 7, 0x28, 0x01020304),
          .mRecordHex = lReadCheck,
          .mSameIdentity = fcpReadCheckData(lOwn, 7, 0x28, 0x05060708),
          .mContinuation = ZTEContinuation::Appends,
          .mContinuedHex = lReadCheck + ZTCByteWriter().le32(0x05060708).hex(),
          .mOthers = {fcpReadCheckData(lOther, 7, 0x28, 0x01020304), fcpReadCheckData(lOwn, 8, 0x28, 0x01020304),
                      fcpReadCheckData(lOwn, 7, 0x88, 0x01020304)}}},
        {testKind("queue-full"),
         {.mData = scsiData(lOwn, 3),
          .mRecordHex = qFullRecord(lOwn, {3}),
          .mSameIdentity = scsiData(lOwn, 9),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = qFullRecord(lOwn, {3, 9}),
          .mOthers = {scsiData(lOther, 3)}}},
        {testKind("device-busy"),
         {.mData = scsiData(lOwn, 3),
          .mRecordHex = qFullRecord(lOwn, {3}),
          .mSameIdentity = scsiData(lOwn, 9),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = qFullRecord(lOwn, {3, 9}),
          .mOthers = {scsiData(lOther, 3)}}},
        {testKind("check-condition"),
         {.mData = checkConditionData(lOwn, 3, 0x28, 5, 0x24, 1),
          .mRecordHex = checkConditionRecord(lOwn, 5, 0x24, {3}, {0x28}, {1}),
          .mSameIdentity = checkConditionData(lOwn, 9, 0x2A, 5, 0x24, 2),
          .mContinuation = ZTEContinuation::Counts,
          .mContinuedHex = checkConditionRecord(lOwn, 5, 0x24, {3, 9}, {0x28, 0x2A}, {1, 2}),
          .mOthers = {checkConditionData(lOther, 3, 0x28, 5, 0x24, 1), checkConditionData(lOwn, 3, 0x28, 6, 0x24, 1),
                      checkConditionData(lOwn, 3, 0x28, 5, 0x25, 1)}}},
        {testKind("lun-reset"),
         {.mData = scsiData(lOwn, 5),
          .mRecordHex = lReset,
          .mSameIdentity = scsiData(lOwn, 6),
          .mContinuation = ZTEContinuation::Appends,
          .mContinuedHex = lReset + ZTCByteWriter().le32(6).hex(),
          .mOthers = {scsiData(lOther, 5)}}},
        {testKind("target-reset"),
         {.mData = scsiData(lOwn, 5),
          .mRecordHex = lReset,
          .mSameIdentity = scsiData(lOwn, 6),
          .mContinuation = ZTEContinuation::Appends,
          .mContinuedHex = lReset + ZTCByteWriter().le32(6).hex(),
          .mOthers = {scsiData(lOther, 5)}}},
        {testKind("queue-depth"),
         {.mData = queueDepthData(lOwn, 5, 32, 16),
          .mRecordHex = lDepth,
          .mSameIdentity = queueDepthData(lOwn, 6, 16, 8),
          .mContinuation = ZTEContinuation::Appends,
          .mContinuedHex = lDepth + ZTCByteWriter().le32(6).le32(8).hex(),
          .mOthers = {queueDepthData(lOther, 5, 32, 16)}}},
    };
}

std::vector<ZTSBareKind> bareKinds(unsigned aBoard) {
    return {
        {testKind("fabric-busy"), ZTSLibraryEvent::bare(aBoard, 2, 0x01)},
        {testKind("bus-reset"), ZTSLibraryEvent::bare(aBoard, 4, 0x20)},
        {testKind("port-interrupt"), ZTSLibraryEvent::bare(aBoard, 8, 0x01)},
        {testKind("link"), ZTSLibraryEvent::link(aBoard, ZTCScriptedLibrary::portName(aBoard))},
        {testKind("temperature"), ZTSLibraryEvent::temperature(aBoard)},
        {testKind("adapter-arrival"), ZTSLibraryEvent::bare(aBoard, 16, 0x01)},
    };
}
