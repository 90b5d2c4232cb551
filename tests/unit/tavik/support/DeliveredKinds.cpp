#include "tests/unit/tavik/support/DeliveredKinds.h"

#include <algorithm>
#include <stdexcept>

ZTCBytes makeNamesPayload(std::uint64_t aPort, std::uint64_t aSecond) {
    return ZTCByteWriter().host32(0).wwn(makeWwn(aPort)).wwn(makeWwn(aSecond)).bytes();
}

ZTCBytes makePortPayload(std::uint64_t aPort) {
    return makePortPayload(aPort, {});
}

ZTCBytes makePortPayload(std::uint64_t aPort, const std::vector<std::uint32_t>& acrNumbers) {
    ZTCByteWriter lPayload;
    lPayload.host32(0).wwn(makeWwn(aPort));
    for (const std::uint32_t lNumber : acrNumbers) {
        lPayload.host32(lNumber);
    }
    return lPayload.bytes();
}

std::string bitFieldHex(const std::vector<unsigned>& acrBits) {
    ZTCBytes lField(32, 0);
    for (const unsigned lBit : acrBits) {
        lField.at(lBit / 8) = static_cast<unsigned char>(lField.at(lBit / 8) + (1u << lBit % 8));
    }
    return hexOf(lField);
}

bool ZTSDeliveredKind::isIdentityByte(std::size_t aByte) const {
    return std::any_of(mIdentity.begin(), mIdentity.end(), [aByte](const ZTSByteRange& acrRange) {
        return aByte >= acrRange.mBegin && aByte < acrRange.mEnd;
    });
}

static std::string sHex(const char* apHex) {
    return hexOf(bytesOf(apHex));
}

const std::vector<ZTSDeliveredKind>& kindsWithData() {
    static const std::string& srBits5 = *new std::string(bitFieldHex({5}));
    static const auto& srKinds = *new std::vector<ZTSDeliveredKind>{
        {"PLOGI",
         1,
         0x01,
         20,
         "Not enough data in ELS PLOGI Event ",
         "Processing PLOGI event Cat=1 SubCat=1",
         makeNamesPayload(gcKindPort, gcKindNode),
         sHex("01000000 500601603ba01234 500601603ba09999"),
         {{4, 20}},
         ZTEOnMatch::Counts,
         ""},
        {"PRLO",
         1,
         0x02,
         12,
         "Not enough data in ELS PRLO Event ",
         "Processing PRLO event Cat=1 SubCat=2",
         makePortPayload(gcKindPort),
         sHex("01000000 500601603ba01234"),
         {{4, 12}},
         ZTEOnMatch::Counts,
         ""},
        {"ADISC",
         1,
         0x04,
         20,
         "Not enough data in ELS ADISC Event ",
         "Processing ADISC event Cat=1 SubCat=4",
         makeNamesPayload(gcKindPort, gcKindNode),
         sHex("01000000 500601603ba01234 500601603ba09999"),
         {{4, 20}},
         ZTEOnMatch::Counts,
         ""},
        {"LS_RJT",
         1,
         0x08,
         24,
         "Not enough data in ELS LSRJT Event ",
         "Processing LsRjt Event Category=1 SubCat=8",
         makePortPayload(gcKindPort, {0x03, 0x0A0B0C0D, 0x29}),
         sHex("01000000 500601603ba01234 03000000 0d0c0b0a 29000000"),
         {{4, 16}},
         ZTEOnMatch::Appends,
         sHex("0d0c0b0a 29000000")},
        {"LOGO",
         1,
         0x10,
         20,
         "Not enough data in ELS LOGO Event ",
         "Processing LOGO event Cat=1 SubCat=16",
         makeNamesPayload(gcKindPort, gcKindNode),
         sHex("01000000 500601603ba01234 500601603ba09999"),
         {{4, 20}},
         ZTEOnMatch::Counts,
         ""},
        {"port busy",
         2,
         0x02,
         12,
         "Not enough event data in FABRIC PORT BUSY event",
         "Processing PORTBUSY event Cat=2 SubCat=2",
         makePortPayload(gcKindPort),
         sHex("01000000 500601603ba01234"),
         {{4, 12}},
         ZTEOnMatch::Counts,
         ""},
        // Payload: LUN, operation code, parameter; record: operation code, LUN, parameter.
        {"FCP read check",
         2,
         0x04,
         24,
         "Not enough data in FCPRDCHECKERR event ",
         "Processing FCPRDCHKERR event Cat=2 SubCat=4",
         makePortPayload(gcKindPort, {0x11121314, 0x28, 0x01020304}),
         sHex("01000000 500601603ba01234 28000000 14131211 04030201"),
         {{4, 20}},
         ZTEOnMatch::Appends,
         sHex("04030201")},
        {"QFULL",
         4,
         0x01,
         16,
         "Not enough data in SCSI Event ",
         "Processing QFULL event Cat=4 SubCat=1",
         makePortPayload(gcKindPort, {5}),
         sHex("01000000 500601603ba01234 00010000") + srBits5,
         {{4, 12}},
         ZTEOnMatch::SetsBits,
         ""},
        {"DEVBSY",
         4,
         0x02,
         16,
         "Not enough data in SCSI Event ",
         "Processing DEVBSY event Cat=4 SubCat=2",
         makePortPayload(gcKindPort, {5}),
         sHex("01000000 500601603ba01234 00010000") + srBits5,
         {{4, 12}},
         ZTEOnMatch::SetsBits,
         ""},
        // Payload: LUN, command code, sense key, ASC, ASCQ.
        {"check condition",
         4,
         0x04,
         32,
         "Not enough data in SCSI CHECKCOND Event ",
         "Processing CHECKCOND event Cat=4 SubCat=4",
         makePortPayload(gcKindPort, {5, 0x28, 0x06, 0x01020304, 0x11}),
         sHex("01000000 500601603ba01234 06000000 04030201 00010000") + srBits5 + "00010000" + bitFieldHex({0x28}) +
             "00010000" + bitFieldHex({0x11}),
         {{4, 12}, {20, 28}},
         ZTEOnMatch::SetsBits,
         ""},
        {"LUN reset",
         4,
         0x08,
         16,
         "Not enough data in SCSI TGTRESET Event ",
         "Processing LUN RESET Cat=4 SubCat=8",
         makePortPayload(gcKindPort, {0x01020304}),
         sHex("01000000 500601603ba01234 04030201"),
         {{4, 12}},
         ZTEOnMatch::Appends,
         sHex("04030201")},
        {"target reset",
         4,
         0x10,
         16,
         "Not enough data in SCSI TGTRESET Event ",
         "Processing TGT RESET Cat=4 SubCat=16",
         makePortPayload(gcKindPort, {0x01020304}),
         sHex("01000000 500601603ba01234 04030201"),
         {{4, 12}},
         ZTEOnMatch::Appends,
         sHex("04030201")},
        // Payload: LUN, old value, new value; the old one is not kept.
        {"queue depth",
         4,
         0x40,
         24,
         "Not enough data in SCSI VARQUEDEPTH Event ",
         "Processing VARQDEPTH event Cat=4 SubCat=64",
         makePortPayload(gcKindPort, {0x01020304, 0x7777, 0x0B0A0908}),
         sHex("01000000 500601603ba01234 04030201 08090a0b"),
         {{4, 12}},
         ZTEOnMatch::Appends,
         sHex("04030201 08090a0b")},
    };
    return srKinds;
}

const std::vector<ZTSDeliveredKind>& kindsWithoutData() {
    static const auto& srKinds = *new std::vector<ZTSDeliveredKind>{
        {"fabric busy",
         2,
         0x01,
         0,
         "",
         "Processing Fabric BUSY event Cat=2 SubCat=1",
         {},
         "01000000",
         {},
         ZTEOnMatch::Counts,
         ""},
        {"bus reset",
         4,
         0x20,
         0,
         "",
         "Processing BUSRESET event Cat=4 SubCat=32",
         {},
         "01000000",
         {},
         ZTEOnMatch::Counts,
         ""},
        {"port interrupt",
         8,
         0x01,
         0,
         "",
         "Processing PORTINTERR event Cat=8 SubCat=1",
         {},
         "01000000",
         {},
         ZTEOnMatch::Counts,
         ""},
        {"link", 8, 0x02, 0, "", "Processing LINK event Cat=8 SubCat=2", {}, "01000000", {}, ZTEOnMatch::Counts, ""},
        {"temperature",
         8,
         0x04,
         0,
         "",
         "Processing TEMP event Cat=8 SubCat=4",
         {},
         "01000000",
         {},
         ZTEOnMatch::Counts,
         ""},
        {"adapter arrival",
         16,
         0x01,
         0,
         "",
         "Processing ADAPTER ARRIVAL Event Cat=16 SubCat=1",
         {},
         "01000000",
         {},
         ZTEOnMatch::Counts,
         ""},
    };
    return srKinds;
}

const std::vector<ZTSDeliveredKind>& allKinds() {
    static const auto& srKinds = *[] {
        auto* const lpKinds = new std::vector<ZTSDeliveredKind>(kindsWithData());
        lpKinds->insert(lpKinds->end(), kindsWithoutData().begin(), kindsWithoutData().end());
        return lpKinds;
    }();
    return srKinds;
}

const ZTSDeliveredKind& kindNamed(const std::string& acrName) {
    const auto lFound = std::find_if(allKinds().begin(), allKinds().end(),
                                     [&](const ZTSDeliveredKind& acrKind) { return acrKind.mpName == acrName; });
    if (lFound == allKinds().end()) {
        throw std::runtime_error("no such kind: " + acrName);
    }
    return *lFound;
}
