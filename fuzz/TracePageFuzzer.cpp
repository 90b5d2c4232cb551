// Pages of the trace ring buffer: whatever bytes a page has, its records are those that stand in it, lie inside of what
// its commit word gives, and each is a finished command with the values that its layout points at, another event, or is
// counted.
//
// Input: a byte (3: the layout of kernel 6.1, of 6.12, or one of the input's own; 4: big-endian; 8, 16: where the page
// lies in memory); where the layout is the input's own, the number of the event and ten places of fields (offset,
// size), and the page's commit word and data; then the page.
#include <array>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "fuzz/support/FuzzInput.h"
#include "fuzz/support/FuzzKernel.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/TracePage.h"

using ZTSPlace = ZTSScsiDoneLayout::Place;

static ZTSPlace sTakePlace(ZTCFuzzInput& arInput) {
    const std::uint8_t lOffset = arInput.takeByte();
    return {lOffset, std::size_t{1} << (arInput.takeByte() & 3)};
}

static ZTSFuzzKernel sTakeKernel(ZTCFuzzInput& arInput) {
    ZTSFuzzKernel lKernel{"own", {}, {}};
    ZTSScsiDoneLayout& lrDone = lKernel.mDoneLayout;
    lrDone.mId = arInput.takeShort();
    for (ZTSPlace* lpPlace : {&lrDone.mType, &lrDone.mHost, &lrDone.mChannel, &lrDone.mTarget, &lrDone.mLun,
                              &lrDone.mResult, &lrDone.mOpcode, &lrDone.mSenseKey, &lrDone.mAsc, &lrDone.mAscq}) {
        *lpPlace = sTakePlace(arInput);
    }
    ZTSTracePageLayout& lrPage = lKernel.mPageLayout;
    lrPage.mCommitOffset = arInput.takeByte();
    lrPage.mCommitSize = (arInput.takeByte() & 1) != 0 ? 8 : 4;
    lrPage.mDataOffset = lrPage.mCommitOffset + lrPage.mCommitSize + arInput.takeByte();
    lrPage.mPageSize = lrPage.mDataOffset + 4080;
    return lKernel;
}

struct ZTSExpectedPage {
    std::vector<std::pair<std::size_t, std::size_t>> mRecords;  // offset in the page, size
    bool mIsMalformed = false;
    bool mHasLoss = false;
};

/// By the table at the head of the reader.
static ZTSExpectedPage sExpected(ZTCByteSpan aPage, const ZTSTracePageLayout& acrLayout, std::endian aOrder) {
    ZTSExpectedPage lExpected;
    lExpected.mIsMalformed = true;
    if (!isInside(aPage, acrLayout.mCommitOffset, acrLayout.mCommitSize)) {
        return lExpected;
    }
    const std::uint64_t lCommit = fuzzNumber(aPage, acrLayout.mCommitOffset, acrLayout.mCommitSize, aOrder);
    const std::uint64_t lLength = lCommit % (1u << 27);
    if (!isInside(aPage, acrLayout.mDataOffset, lLength)) {
        return lExpected;
    }
    lExpected.mHasLoss = lCommit / (1u << 31) % 2 != 0;
    const ZTCByteSpan lData = aPage.subspan(acrLayout.mDataOffset, lLength);
    for (std::size_t lPlace = 0; lPlace < lData.size();) {
        if (!isInside(lData, lPlace, 4)) {
            return lExpected;
        }
        const std::uint64_t lWord = fuzzNumber(lData, lPlace, 4, aOrder);
        const std::uint64_t lType = aOrder == std::endian::little ? lWord % 32 : lWord / (1u << 27);
        const bool lHasTime = aOrder == std::endian::little ? lWord / 32 != 0 : lWord % (1u << 27) != 0;
        if (lType == 29 && !lHasTime) {
            break;
        }
        std::size_t lHeader = 4;
        std::size_t lSize = lType * 4;
        if (lType >= 30) {
            lSize = 4;
        } else if (lType == 0 || lType == 29) {
            if (!isInside(lData, lPlace + 4, 4) || fuzzNumber(lData, lPlace + 4, 4, aOrder) < 4) {
                return lExpected;
            }
            lHeader = 8;
            lSize = fuzzNumber(lData, lPlace + 4, 4, aOrder) - 4;
        }
        if (!isInside(lData, lPlace + lHeader, lSize)) {
            return lExpected;
        }
        if (lType < 29) {
            lExpected.mRecords.emplace_back(acrLayout.mDataOffset + lPlace + lHeader, lSize);
        }
        lPlace += lHeader + lSize;
    }
    lExpected.mIsMalformed = false;
    return lExpected;
}

static void sCheckRecord(ZTCByteSpan aRecord, const ZTSScsiDoneLayout& acrLayout, std::endian aOrder) {
    const auto lIsIn = [&](const ZTSPlace& acrPlace) { return isInside(aRecord, acrPlace.mOffset, acrPlace.mSize); };
    const auto lNumber = [&](const ZTSPlace& acrPlace) {
        return fuzzNumber(aRecord, acrPlace.mOffset, acrPlace.mSize, aOrder);
    };
    const auto lId = getTraceRecordId(aRecord, acrLayout, aOrder);
    ZT_FUZZ_REQUIRE(lId.has_value() == lIsIn(acrLayout.mType), std::to_string(aRecord.size()));
    ZT_FUZZ_REQUIRE(!lId || *lId == static_cast<std::uint32_t>(lNumber(acrLayout.mType)), std::to_string(*lId));

    bool lIsWhole = true;
    for (const ZTSPlace* lpPlace : {&acrLayout.mHost, &acrLayout.mChannel, &acrLayout.mTarget, &acrLayout.mLun,
                                    &acrLayout.mResult, &acrLayout.mOpcode}) {
        lIsWhole = lIsWhole && lIsIn(*lpPlace);
    }
    if (acrLayout.hasSense()) {
        lIsWhole = lIsWhole && lIsIn(acrLayout.mSenseKey) && lIsIn(acrLayout.mAsc) && lIsIn(acrLayout.mAscq);
    }
    const auto lOutcome = parseScsiOutcome(aRecord, acrLayout, aOrder);
    ZT_FUZZ_REQUIRE(lOutcome.has_value() == lIsWhole, std::to_string(aRecord.size()));
    if (!lOutcome) {
        return;
    }
    const std::array<std::pair<std::uint32_t, const ZTSPlace*>, 4> lWords{{{lOutcome->mHost, &acrLayout.mHost},
                                                                           {lOutcome->mChannel, &acrLayout.mChannel},
                                                                           {lOutcome->mTarget, &acrLayout.mTarget},
                                                                           {lOutcome->mLun, &acrLayout.mLun}}};
    for (const auto& [lValue, lpPlace] : lWords) {
        ZT_FUZZ_REQUIRE(lValue == static_cast<std::uint32_t>(lNumber(*lpPlace)), std::to_string(lValue));
    }
    ZT_FUZZ_REQUIRE(lOutcome->mStatus == lNumber(acrLayout.mResult) % 256, std::to_string(lOutcome->mStatus));
    ZT_FUZZ_REQUIRE(lOutcome->mOpcode == lNumber(acrLayout.mOpcode) % 256, std::to_string(lOutcome->mOpcode));
    const std::uint32_t lKey =
        acrLayout.hasSense() ? static_cast<std::uint32_t>(lNumber(acrLayout.mSenseKey)) : gcUnknownSense;
    ZT_FUZZ_REQUIRE(lOutcome->mSenseKey == lKey, std::to_string(lOutcome->mSenseKey));
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    const std::uint8_t lOptions = lInput.takeByte();
    const std::endian lOrder = (lOptions & 4) != 0 ? std::endian::big : std::endian::little;
    const std::size_t lWhich = lOptions & 3;
    const ZTSFuzzKernel lKernel = lWhich < gcFuzzKernels ? getFuzzKernel(lWhich) : sTakeKernel(lInput);
    const ZTCByteSpan lTaken = lInput.takeRest();
    const ZTCExactBlock lBlock(lTaken, lOptions >> 3 & 3);
    const ZTCByteSpan lBytes(lBlock.get(), lTaken.size());

    const ZTSExpectedPage lExpected = sExpected(lBytes, lKernel.mPageLayout, lOrder);
    ZTCTracePage lPage(lBytes, lKernel.mPageLayout, lOrder);
    ZT_FUZZ_REQUIRE(lPage.hasLossBefore() == lExpected.mHasLoss, "the mark of a loss");
    std::size_t lCount = 0;
    while (const auto lRecord = lPage.next()) {
        ZT_FUZZ_REQUIRE(lCount < lExpected.mRecords.size(), std::to_string(lCount));
        const auto [lOffset, lSize] = lExpected.mRecords[lCount++];
        ZT_FUZZ_REQUIRE(lRecord->data() == lBytes.data() + lOffset, std::to_string(lOffset));
        ZT_FUZZ_REQUIRE(lRecord->size() == lSize, std::to_string(lSize));
        sCheckRecord(*lRecord, lKernel.mDoneLayout, lOrder);
    }
    ZT_FUZZ_REQUIRE(lCount == lExpected.mRecords.size(), std::to_string(lCount));
    ZT_FUZZ_REQUIRE(lPage.isMalformed() == lExpected.mIsMalformed, lKernel.mpName);
    return 0;
}
