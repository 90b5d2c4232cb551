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
    return ZTCByteWriter().bitField(acrBits).hex();
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
        {testKind("plogi"),
         {.mPayload = makeNamesPayload(gcKindPort, gcKindNode),
          .mRecordHex = sHex("01000000 500601603ba01234 500601603ba09999"),
          .mIdentity = {{4, 20}}}},
        {testKind("prlo"),
         {.mPayload = makePortPayload(gcKindPort),
          .mRecordHex = sHex("01000000 500601603ba01234"),
          .mIdentity = {{4, 12}}}},
        {testKind("adisc"),
         {.mPayload = makeNamesPayload(gcKindPort, gcKindNode),
          .mRecordHex = sHex("01000000 500601603ba01234 500601603ba09999"),
          .mIdentity = {{4, 20}}}},
        {testKind("lsrjt"),
         {.mPayload = makePortPayload(gcKindPort, {0x03, 0x0A0B0C0D, 0x29}),
          .mRecordHex = sHex("01000000 500601603ba01234 03000000 0d0c0b0a 29000000"),
          .mIdentity = {{4, 16}},
          .mOnMatch = ZTEOnMatch::Appends,
          .mAppendedHex = sHex("0d0c0b0a 29000000")}},
        {testKind("logo"),
         {.mPayload = makeNamesPayload(gcKindPort, gcKindNode),
          .mRecordHex = sHex("01000000 500601603ba01234 500601603ba09999"),
          .mIdentity = {{4, 20}}}},
        {testKind("port-busy"),
         {.mPayload = makePortPayload(gcKindPort),
          .mRecordHex = sHex("01000000 500601603ba01234"),
          .mIdentity = {{4, 12}}}},
        // Payload: LUN, operation code, parameter. Record: operation code, LUN, parameter.
        {testKind("fcp-read-check"),
         {.mPayload = makePortPayload(gcKindPort, {0x11121314, 0x28, 0x01020304}),
          .mRecordHex = sHex("01000000 500601603ba01234 28000000 14131211 04030201"),
          .mIdentity = {{4, 20}},
          .mOnMatch = ZTEOnMatch::Appends,
          .mAppendedHex = sHex("04030201")}},
        {testKind("queue-full"),
         {.mPayload = makePortPayload(gcKindPort, {5}),
          .mRecordHex = sHex("01000000 500601603ba01234 00010000") + srBits5,
          .mIdentity = {{4, 12}},
          .mOnMatch = ZTEOnMatch::SetsBits}},
        {testKind("device-busy"),
         {.mPayload = makePortPayload(gcKindPort, {5}),
          .mRecordHex = sHex("01000000 500601603ba01234 00010000") + srBits5,
          .mIdentity = {{4, 12}},
          .mOnMatch = ZTEOnMatch::SetsBits}},
        // Payload: LUN, command code, sense key, ASC, ASCQ.
        {testKind("check-condition"),
         {.mPayload = makePortPayload(gcKindPort, {5, 0x28, 0x06, 0x01020304, 0x11}),
          .mRecordHex = sHex("01000000 500601603ba01234 06000000 04030201 00010000") + srBits5 + "00010000" +
                        bitFieldHex({0x28}) + "00010000" + bitFieldHex({0x11}),
          .mIdentity = {{4, 12}, {20, 28}},
          .mOnMatch = ZTEOnMatch::SetsBits}},
        {testKind("lun-reset"),
         {.mPayload = makePortPayload(gcKindPort, {0x01020304}),
          .mRecordHex = sHex("01000000 500601603ba01234 04030201"),
          .mIdentity = {{4, 12}},
          .mOnMatch = ZTEOnMatch::Appends,
          .mAppendedHex = sHex("04030201")}},
        {testKind("target-reset"),
         {.mPayload = makePortPayload(gcKindPort, {0x01020304}),
          .mRecordHex = sHex("01000000 500601603ba01234 04030201"),
          .mIdentity = {{4, 12}},
          .mOnMatch = ZTEOnMatch::Appends,
          .mAppendedHex = sHex("04030201")}},
        // Payload: LUN, old value, new value. The old value is not kept.
        {testKind("queue-depth"),
         {.mPayload = makePortPayload(gcKindPort, {0x01020304, 0x7777, 0x0B0A0908}),
          .mRecordHex = sHex("01000000 500601603ba01234 04030201 08090a0b"),
          .mIdentity = {{4, 12}},
          .mOnMatch = ZTEOnMatch::Appends,
          .mAppendedHex = sHex("04030201 08090a0b")}},
    };
    return srKinds;
}

const std::vector<ZTSDeliveredKind>& kindsWithoutData() {
    static const auto& srKinds = *[] {
        auto* const lpKinds = new std::vector<ZTSDeliveredKind>;
        for (const ZTSTestKind& lcrKind : gcTestKinds) {
            if (lcrKind.mMinimumLength == 0) {
                lpKinds->push_back({lcrKind, {.mPayload = {}, .mRecordHex = "01000000"}});
            }
        }
        return lpKinds;
    }();
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
