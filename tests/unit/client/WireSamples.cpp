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
    ZTCBytes lField(32, 0);
    for (const unsigned lBit : acrBits) {
        lField[lBit / 8] = static_cast<unsigned char>(lField[lBit / 8] | 1U << (lBit % 8));
    }
    ZTCByteWriter lWriter;
    return lWriter.le32(256).raw(lField).bytes();
}

std::vector<ZTSSampleKind> makeSampleKinds() {
    const std::string lPort = std::string(R"("version":1,"portName":")") + gcSamplePortText + "\"";
    const std::string lNode = std::string("\"") + gcSampleNodeText + "\"";
    const ZTCBytes lVersion = sStart().bytes();
    const ZTCBytes lPortOnly = sStartWithPort().bytes();
    const ZTCBytes lPortAndNode = sStartWithPort().wwn(makeWwn(gcSampleNode)).bytes();
    const std::string lVersionJson = R"({"version":1})";
    return {
        {1, 0x01, "plogi", lPortAndNode, "{" + lPort + ",\"nodeName\":" + lNode + "}",
         std::string("nodeName=") + gcSampleNodeText, 0},
        {1, 0x02, "prlo", lPortOnly, "{" + lPort + "}", "-", 0},
        {1, 0x04, "adisc", lPortAndNode, "{" + lPort + ",\"nodeName\":" + lNode + "}",
         std::string("nodeName=") + gcSampleNodeText, 0},
        {1, 0x08, "lsrjt",
         sStartWithPort().le32(0x03).le32(0x09).le32(0x2A).le32(0x09).le32(0x2A).le32(0x55).le32(0x00).bytes(),
         "{" + lPort +
             R"(,"originalCommand":3,"originalCommandName":"PLOGI","rejections":[)"
             R"({"reasonCode":9,"reasonCodeName":"unable to perform","explanation":42},)"
             R"({"reasonCode":9,"reasonCodeName":"unable to perform","explanation":42},)"
             R"({"reasonCode":85,"reasonCodeName":null,"explanation":0}]})",
         "originalCommand=0x03(PLOGI) rejections=[0x09(unable to perform)/0x2a*2 0x55/0x00]", 16},
        {1, 0x10, "logo", lPortAndNode, "{" + lPort + ",\"payloadPortName\":" + lNode + "}",
         std::string("payloadPortName=") + gcSampleNodeText, 0},
        {1, 0x20, "rscn", sStart().le32(0x01010200).bytes(),
         R"({"version":1,"page":16843264,"addressFormat":1,"addressFormatName":"area","fcAddress":66048})",
         "addressFormat=1(area) fcAddress=0x010200", 0},
        {2, 0x01, "fabric-busy", lVersion, lVersionJson, "-", 0},
        {2, 0x02, "port-busy", lPortOnly, "{" + lPort + "}", "-", 0},
        {2, 0x04, "fcp-read-check", sStartWithPort().le32(0x28).le32(7).le32(512).le32(1024).bytes(),
         "{" + lPort + R"(,"opCode":40,"lun":7,"parameters":[{"fcpiParameter":512},{"fcpiParameter":1024}]})",
         "opCode=0x28 lun=7 parameters=[0x200 0x400]", 4},
        {4, 0x01, "queue-full", sStartWithPort().raw(sBits({3, 9})).bytes(), "{" + lPort + R"(,"luns":[3,9]})",
         "luns=3,9", 0},
        {4, 0x02, "device-busy", sStartWithPort().raw(sBits({0, 1, 2, 255})).bytes(),
         "{" + lPort + R"(,"luns":[0,1,2,255]})", "luns=0-2,255", 0},
        {4, 0x04, "check-condition",
         sStartWithPort().le32(5).le32(0x24).raw(sBits({4})).raw(sBits({0x28, 0x2A})).raw(sBits({})).bytes(),
         "{" + lPort +
             R"(,"senseKey":5,"senseKeyName":"illegal request","asc":36,"luns":[4],"commandCodes":[40,42],"ascqs":[]})",
         "senseKey=0x05(illegal request) asc=0x24 luns=4 commandCodes=0x28,0x2a ascqs=none", 0},
        {4, 0x08, "lun-reset", sStartWithPort().le32(6).le32(0xFFFFFFFF).bytes(),
         "{" + lPort + R"(,"resets":[{"lun":6},{"lun":4294967295}]})", "resets=[6 all]", 4},
        {4, 0x10, "target-reset", sStartWithPort().le32(0).le32(1).le32(1).bytes(),
         "{" + lPort + R"(,"resets":[{"lun":0},{"lun":1},{"lun":1}]})", "resets=[0 1*2]", 8},
        {4, 0x20, "bus-reset", lVersion, lVersionJson, "-", 0},
        {4, 0x40, "queue-depth", sStartWithPort().le32(2).le32(32).le32(3).le32(16).bytes(),
         "{" + lPort + R"(,"changes":[{"lun":2,"newDepth":32},{"lun":3,"newDepth":16}]})", "changes=[2/32 3/16]", 8},
        {8, 0x01, "port-interrupt", lVersion, lVersionJson, "-", 0},
        {8, 0x02, "link", lVersion, lVersionJson, "-", 0},
        {8, 0x04, "temperature", lVersion, lVersionJson, "-", 0},
        {16, 0x01, "adapter-arrival", lVersion, lVersionJson, "-", 0},
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
