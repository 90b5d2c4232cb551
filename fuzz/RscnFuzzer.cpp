// RSCNs whose length field is honest, all from one board: their records are the runs of equal pages, in order, with the
// names of a registered target where the page is a port's address.
//
// Input: the number of targets, their FC ids (32 bits each), then RSCNs: the length argument (16 bits), the length of
// the payload (16 bits), the payload.
#include <algorithm>
#include <vector>

#include "fuzz/support/FuzzAgent.h"
#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/CommandEncoder.h"
#include "tavik/include/TavikCore.h"

struct ZTSRun {
    std::uint32_t mPage;
    std::uint32_t mCount;
};

/// The pages of a payload by the definition: as many whole words as its length field holds, without the first.
static void sAddPages(std::span<const std::uint8_t> aPayload, std::vector<ZTSRun>& arRuns) {
    const std::size_t lLength = aPayload[2] * 256u + aPayload[3];
    for (std::size_t lOffset = 4; lOffset + 4 <= lLength; lOffset += 4) {
        std::uint32_t lPage = 0;
        for (std::size_t lByte = 0; lByte < 4; ++lByte) {
            lPage = lPage << 8 | aPayload[lOffset + lByte];
        }
        if (!arRuns.empty() && arRuns.back().mPage == lPage) {
            ++arRuns.back().mCount;
        } else {
            arRuns.push_back({lPage, 1});
        }
    }
}

static std::uint32_t sPageOf(const ZTSReceivedRecord& acrRecord) {
    ZT_FUZZ_REQUIRE(acrRecord.mEventData.size() == 8, std::to_string(acrRecord.mEventData.size()));
    std::uint32_t lPage = 0;
    for (std::size_t lByte = 8; lByte-- > 4;) {
        lPage = lPage << 8 | acrRecord.mEventData[lByte];
    }
    return lPage;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    ZTCFuzzAgent lAgent(1, gcNoLog);
    lAgent.startScope(4096);
    std::vector<ZTSTargetPort> lTargets(lInput.takeByte() % 8);
    for (ZTSTargetPort& lrTarget : lTargets) {
        lrTarget.mFcId = lInput.takeWord();
    }
    if (!lTargets.empty()) {
        lAgent.request(encodeRegisterTargets(lTargets));
    }

    std::vector<ZTSRun> lRuns;
    while (!lInput.isAtEnd()) {
        const std::uint16_t lArgument = lInput.takeShort();
        const std::span<const std::uint8_t> lBytes = lInput.take(lInput.takeShort());
        std::vector<std::uint8_t> lPayload(lBytes.begin(), lBytes.end());
        lPayload.resize(std::max<std::size_t>(lPayload.size(), 4));
        lPayload.resize(std::max<std::size_t>(lPayload.size(), lPayload[2] * 256u + lPayload[3]));
        const ZTCExactBlock lBlock(lPayload, lArgument & 3);
        if (lArgument >= 8 && lAgent.getSystem().getTotalEventDataSize() < gcMaxScopeDataSize) {
            sAddPages(lPayload, lRuns);
        }
        ScopeCb_KpmRscn(0, lBlock.get(), lArgument);
    }

    const ZTSResponse lResponse = lAgent.retrieve();
    ZT_FUZZ_REQUIRE(lResponse.mLists.size() == 1, std::to_string(lResponse.mLists.size()));
    const std::vector<ZTSReceivedRecord>& lrRecords = lResponse.mLists[0].mRecords;
    ZT_FUZZ_REQUIRE(lrRecords.size() == lRuns.size(),
                    std::to_string(lrRecords.size()) + " records, " + std::to_string(lRuns.size()) + " runs");
    for (std::size_t lRecord = 0; lRecord < lRuns.size(); ++lRecord) {
        const ZTSReceivedRecord& lrRecord = lrRecords[lRecord];
        const std::uint32_t lPage = lRuns[lRecord].mPage;
        ZT_FUZZ_REQUIRE(sPageOf(lrRecord) == lPage, std::to_string(lPage));
        ZT_FUZZ_REQUIRE(lrRecord.mOccurrences == lRuns[lRecord].mCount, std::to_string(lrRecord.mOccurrences));
        const bool lIsTarget = (lPage & 0x03000000) == 0 &&
                               std::any_of(lTargets.begin(), lTargets.end(), [lPage](const ZTSTargetPort& acrTarget) {
                                   return acrTarget.mFcId == (lPage & 0xFFFFFF);
                               });
        ZT_FUZZ_REQUIRE(lrRecord.mNames.has_value() == lIsTarget, std::to_string(lPage));
    }
    return 0;
}
