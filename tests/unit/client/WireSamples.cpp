#include "tests/unit/client/WireSamples.h"

static ZTCByteWriter sStart() {
    ZTCByteWriter lWriter;
    lWriter.le32(1);
    return lWriter;
}

static ZTCByteWriter sStartWithPort() {
    ZTCByteWriter lWriter = sStart();
    lWriter.wwn(makeWwn(gcSamplePort));
    return lWriter;
}

/// A bit field of 256 bits with its length in front.
static ZTCBytes sBits(const std::vector<unsigned>& acrBits) {
    return ZTCByteWriter().le32(256).bitField(acrBits).bytes();
}

std::vector<ZTSSampleKind> makeSampleKinds() {
    const std::string lPort = std::string(R"("version":1,"portName":")") + gcSamplePortText + "\"";
    const std::string lNode = std::string("\"") + gcSampleNodeText + "\"";
    const ZTCBytes lVersion = sStart().bytes();
    const ZTCBytes lPortOnly = sStartWithPort().bytes();
    const ZTCBytes lPortAndNode = sStartWithPort().wwn(makeWwn(gcSampleNode)).bytes();
    const std::string lVersionJson = R"({"version":1})";
    return {
        {testKind("plogi"),
         {.mData = lPortAndNode,
          .mJson = "{" + lPort + ",\"nodeName\":" + lNode + "}",
          .mDetails = std::string("nodeName=") + gcSampleNodeText}},
        {testKind("prlo"), {.mData = lPortOnly, .mJson = "{" + lPort + "}", .mDetails = "-"}},
        {testKind("adisc"),
         {.mData = lPortAndNode,
          .mJson = "{" + lPort + ",\"nodeName\":" + lNode + "}",
          .mDetails = std::string("nodeName=") + gcSampleNodeText}},
        {testKind("lsrjt"),
         {.mData =
              sStartWithPort().le32(0x03).le32(0x09).le32(0x2A).le32(0x09).le32(0x2A).le32(0x55).le32(0x00).bytes(),
          .mJson = "{" + lPort +
                   R"(,"originalCommand":3,"originalCommandName":"PLOGI","rejections":[)"
                   R"({"reasonCode":9,"reasonCodeName":"unable to perform","explanation":42},)"
                   R"({"reasonCode":9,"reasonCodeName":"unable to perform","explanation":42},)"
                   R"({"reasonCode":85,"reasonCodeName":null,"explanation":0}]})",
          .mDetails = "originalCommand=0x03(PLOGI) rejections=[0x09(unable to perform)/0x2a*2 0x55/0x00]"}},
        {testKind("logo"),
         {.mData = lPortAndNode,
          .mJson = "{" + lPort + ",\"payloadPortName\":" + lNode + "}",
          .mDetails = std::string("payloadPortName=") + gcSampleNodeText}},
        {testKind("rscn"),
         {.mData = sStart().le32(0x01010200).bytes(),
          .mJson = R"({"version":1,"page":16843264,"addressFormat":1,"addressFormatName":"area","fcAddress":66048})",
          .mDetails = "addressFormat=1(area) fcAddress=0x010200"}},
        {testKind("fabric-busy"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
        {testKind("port-busy"), {.mData = lPortOnly, .mJson = "{" + lPort + "}", .mDetails = "-"}},
        {testKind("fcp-read-check"),
         {.mData = sStartWithPort().le32(0x28).le32(7).le32(512).le32(1024).bytes(),
          .mJson = "{" + lPort + R"(,"opCode":40,"lun":7,"parameters":[{"fcpiParameter":512},{"fcpiParameter":1024}]})",
          .mDetails = "opCode=0x28 lun=7 parameters=[0x200 0x400]"}},
        {testKind("queue-full"),
         {.mData = sStartWithPort().raw(sBits({3, 9})).bytes(),
          .mJson = "{" + lPort + R"(,"luns":[3,9]})",
          .mDetails = "luns=3,9"}},
        {testKind("device-busy"),
         {.mData = sStartWithPort().raw(sBits({0, 1, 2, 255})).bytes(),
          .mJson = "{" + lPort + R"(,"luns":[0,1,2,255]})",
          .mDetails = "luns=0-2,255"}},
        {testKind("check-condition"),
         {.mData = sStartWithPort().le32(5).le32(0x24).raw(sBits({4})).raw(sBits({0x28, 0x2A})).raw(sBits({})).bytes(),
          .mJson =
              "{" + lPort +
              R"(,"senseKey":5,"senseKeyName":"illegal request","asc":36,"luns":[4],"commandCodes":[40,42],"ascqs":[]})",
          .mDetails = "senseKey=0x05(illegal request) asc=0x24 luns=4 commandCodes=0x28,0x2a ascqs=none"}},
        {testKind("lun-reset"),
         {.mData = sStartWithPort().le32(6).le32(0xFFFFFFFF).bytes(),
          .mJson = "{" + lPort + R"(,"resets":[{"lun":6},{"lun":4294967295}]})",
          .mDetails = "resets=[6 all]"}},
        {testKind("target-reset"),
         {.mData = sStartWithPort().le32(0).le32(1).le32(1).bytes(),
          .mJson = "{" + lPort + R"(,"resets":[{"lun":0},{"lun":1},{"lun":1}]})",
          .mDetails = "resets=[0 1*2]"}},
        {testKind("bus-reset"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
        {testKind("queue-depth"),
         {.mData = sStartWithPort().le32(2).le32(32).le32(3).le32(16).bytes(),
          .mJson = "{" + lPort + R"(,"changes":[{"lun":2,"newDepth":32},{"lun":3,"newDepth":16}]})",
          .mDetails = "changes=[2/32 3/16]"}},
        {testKind("port-interrupt"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
        {testKind("link"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
        {testKind("temperature"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
        {testKind("adapter-arrival"), {.mData = lVersion, .mJson = lVersionJson, .mDetails = "-"}},
    };
}

ZTCBytes makeSampleTime() {
    ZTCByteWriter lWriter;
    return lWriter.u16(2026).u8(3).u8(4).u8(5).u8(6).u8(7).u8(0x2E).u16(89).u16(12).u32(0).u32(1772600767).bytes();
}

ZTCBytes makeSampleRecord(std::uint8_t aCategory, std::uint8_t aSubcategory, const ZTCBytes& acrData, bool aHasNames,
                          std::uint32_t aOccurrences) {
    ZTCByteWriter lWriter;
    lWriter.u32(aOccurrences).raw(makeSampleTime()).raw(makeSampleTime()).u8(aCategory).u8(aSubcategory);
    lWriter.u8(aHasNames ? 1 : 0);
    if (aHasNames) {
        lWriter.wwn(makeWwn(gcSamplePort)).wwn(makeWwn(gcSampleNode));
    }
    return lWriter.u32(acrData.size()).raw(acrData).bytes();
}

ZTCBytes makeSampleList(const std::string& acrKey, const std::vector<ZTCBytes>& acrRecords) {
    ZTCByteWriter lWriter;
    lWriter.u32(acrKey.size()).raw(ZTCBytes(acrKey.begin(), acrKey.end())).u32(acrRecords.size());
    for (const ZTCBytes& lrRecord : acrRecords) {
        lWriter.raw(lrRecord);
    }
    return lWriter.bytes();
}

ZTCBytes makeSampleResponse(std::uint32_t aAnnouncedLists, const std::vector<ZTCBytes>& acrLists) {
    ZTCByteWriter lWriter;
    lWriter.u8(2).u32(aAnnouncedLists);
    for (const ZTCBytes& lrList : acrLists) {
        lWriter.raw(lrList);
    }
    return lWriter.bytes();
}

ZTCBytes makeFullSampleResponse() {
    std::vector<ZTCBytes> lRecords;
    for (const ZTSSampleKind& lrKind : makeSampleKinds()) {
        lRecords.push_back(
            makeSampleRecord(lrKind.mCategory, lrKind.mSubcategory, lrKind.mData, lRecords.size() % 2 == 1));
    }
    return makeSampleResponse(2, {makeSampleList(gcSampleKey, lRecords), makeSampleList("other.key", {})});
}
