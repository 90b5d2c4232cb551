#include "tests/unit/store/Frames.h"

#include <ctime>

ZTSFcName makeName(std::uint64_t aValue) {
    const ZTSWwn lName = makeWwn(aValue);
    ZTSFcName lResult;
    std::copy(lName.mBytes.begin(), lName.mBytes.end(), lResult.mBytes.begin());
    return lResult;
}

static void sAddTime(ZTCByteWriter& arWriter, std::int64_t aTime) {
    const std::time_t lSeconds = aTime / 1000000;
    const auto lRest = static_cast<unsigned>(aTime % 1000000);
    std::tm lTime{};
    gmtime_r(&lSeconds, &lTime);
    arWriter.u16(static_cast<unsigned>(lTime.tm_year + 1900)).u8(static_cast<unsigned>(lTime.tm_mon + 1));
    arWriter.u8(static_cast<unsigned>(lTime.tm_mday)).u8(static_cast<unsigned>(lTime.tm_hour));
    arWriter.u8(static_cast<unsigned>(lTime.tm_min)).u8(static_cast<unsigned>(lTime.tm_sec)).u8('.');
    arWriter.u16(lRest / 1000).u16(lRest % 1000);
    arWriter.u32(static_cast<std::uint64_t>(lSeconds) >> 32).u32(static_cast<std::uint64_t>(lSeconds) & 0xFFFFFFFF);
}

ZTCBytes encodeRecord(const ZTSTestRecord& acrRecord) {
    ZTCByteWriter lWriter;
    lWriter.u32(acrRecord.mOccurrences);
    sAddTime(lWriter, acrRecord.mBegin);
    sAddTime(lWriter, acrRecord.mEnd);
    lWriter.u8(acrRecord.mKind >> 8).u8(acrRecord.mKind & 0xFF).u8(acrRecord.mPortName ? 1 : 0);
    if (acrRecord.mPortName) {
        lWriter.wwn(makeWwn(*acrRecord.mPortName)).wwn(makeWwn(gcNode));
    }
    lWriter.u32(acrRecord.mData.size()).raw(acrRecord.mData);
    return lWriter.bytes();
}

ZTCBytes makeBody(const std::vector<ZTSTestRecord>& acrRecords, std::uint64_t aLocalPort) {
    const std::string lKey = wwnText(makeWwn(gcLocalNode)) + "." + wwnText(makeWwn(aLocalPort));
    ZTCByteWriter lWriter;
    lWriter.u8(2).u32(1).u32(lKey.size()).raw(ZTCBytes(lKey.begin(), lKey.end())).u32(acrRecords.size());
    for (const ZTSTestRecord& lrRecord : acrRecords) {
        lWriter.raw(encodeRecord(lrRecord));
    }
    return lWriter.bytes();
}

static ZTCByteWriter sStart(std::uint64_t aPort) {
    ZTCByteWriter lWriter;
    lWriter.le32(1).wwn(makeWwn(aPort));
    return lWriter;
}

static ZTCBytes sBits(const std::vector<unsigned>& acrNumbers) {
    ZTCBytes lBits(32, 0);
    for (const unsigned lNumber : acrNumbers) {
        lBits[lNumber / 8] = static_cast<unsigned char>(lBits[lNumber / 8] | 1U << lNumber % 8);
    }
    return lBits;
}

ZTCBytes makeGenericData() {
    return ZTCByteWriter().le32(1).bytes();
}

ZTCBytes makeTwoNamesData(std::uint64_t aPort, std::uint64_t aOther) {
    return sStart(aPort).wwn(makeWwn(aOther)).bytes();
}

ZTCBytes makePortData(std::uint64_t aPort) {
    return sStart(aPort).bytes();
}

ZTCBytes makeLsRjtData(std::uint64_t aPort, std::uint32_t aCommand,
                       const std::vector<std::pair<std::uint32_t, std::uint32_t>>& acrReasons) {
    ZTCByteWriter lWriter = sStart(aPort);
    lWriter.le32(aCommand);
    for (const auto& [lReason, lExplanation] : acrReasons) {
        lWriter.le32(lReason).le32(lExplanation);
    }
    return lWriter.bytes();
}

ZTCBytes makeReadCheckData(std::uint64_t aPort, std::uint32_t aOpCode, std::uint32_t aLun,
                           const std::vector<std::uint32_t>& acrParameters) {
    ZTCByteWriter lWriter = sStart(aPort);
    lWriter.le32(aOpCode).le32(aLun);
    for (const std::uint32_t lParameter : acrParameters) {
        lWriter.le32(lParameter);
    }
    return lWriter.bytes();
}

ZTCBytes makeBusyData(std::uint64_t aPort, const std::vector<unsigned>& acrLuns) {
    return sStart(aPort).le32(256).raw(sBits(acrLuns)).bytes();
}

ZTCBytes makeAllLunsBusyData(std::uint64_t aPort) {
    return sStart(aPort).le32(256).fill(32, 0xFF).bytes();
}

ZTCBytes makeCheckConditionData(std::uint64_t aPort, std::uint32_t aSenseKey, std::uint32_t aAsc,
                                const std::vector<unsigned>& acrLuns, const std::vector<unsigned>& acrCommands,
                                const std::vector<unsigned>& acrAscqs) {
    ZTCByteWriter lWriter = sStart(aPort);
    lWriter.le32(aSenseKey).le32(aAsc);
    for (const auto* lpNumbers : {&acrLuns, &acrCommands, &acrAscqs}) {
        lWriter.le32(256).raw(sBits(*lpNumbers));
    }
    return lWriter.bytes();
}

ZTCBytes makeResetData(std::uint64_t aPort, const std::vector<std::uint32_t>& acrLuns) {
    ZTCByteWriter lWriter = sStart(aPort);
    for (const std::uint32_t lLun : acrLuns) {
        lWriter.le32(lLun);
    }
    return lWriter.bytes();
}

ZTCBytes makeQueueDepthData(std::uint64_t aPort,
                            const std::vector<std::pair<std::uint32_t, std::uint32_t>>& acrDepths) {
    ZTCByteWriter lWriter = sStart(aPort);
    for (const auto& [lLun, lDepth] : acrDepths) {
        lWriter.le32(lLun).le32(lDepth);
    }
    return lWriter.bytes();
}

ZTCBytes makeRscnData(std::uint32_t aPage) {
    return ZTCByteWriter().le32(1).le32(aPage).bytes();
}

ZTSTestRecord makeQueueFull(std::uint64_t aPort, std::int64_t aBegin, std::int64_t aEnd, std::uint32_t aOccurrences,
                            unsigned aLun) {
    return {.mKind = gcQueueFull,
            .mData = makeBusyData(aPort, {aLun}),
            .mBegin = aBegin,
            .mEnd = aEnd,
            .mOccurrences = aOccurrences,
            .mPortName = std::nullopt};
}
