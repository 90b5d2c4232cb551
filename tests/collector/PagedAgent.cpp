#include "tests/collector/PagedAgent.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <random>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "tests/support/Bytes.h"
#include "tests/unit/client/WireSamples.h"

/// Row of the page, and kind of the records: link attentions, which have no remote port.
static constexpr std::uint32_t scRow = 17;
static constexpr std::uint8_t scCategory = 8;
static constexpr std::uint8_t scSubcategory = 2;

static std::int64_t sNow() {
    return std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::system_clock::now().time_since_epoch())
        .count();
}

ZTCPagedAgent::ZTCPagedAgent(ZTCCollectorStage& arStage, const ZTSStagedStart& acrStart)
    : mBell(acrStart.mBell.get()), mPage(acrStart.mPagePath + ".new", 1) {
    std::random_device lRandom;
    ZTSStatusHeader& lrHeader = mPage.header();
    for (std::uint64_t& lrWord : lrHeader.mStartId) {
        lrWord = static_cast<std::uint64_t>(lRandom()) << 32U | lRandom();
    }
    lrHeader.mPid = 0;
    lrHeader.mStartTime = sNow();
    lrHeader.mTotalLimit = 262144;
    const auto lWwpn = makeWwn(0x10000000C9000001).mBytes;
    const auto lWwnn = makeWwn(0x20000000C9000001).mBytes;
    std::ranges::copy(lWwpn, mPage.board(0).mWwpn);
    std::ranges::copy(lWwnn, mPage.board(0).mWwnn);
    for (ZTSStatusRow& lrRow : mPage.board(0).mRows) {
        lrRow.mState = ZTSS_Listening;
    }
    rename((acrStart.mPagePath + ".new").c_str(), acrStart.mPagePath.c_str());
    mAgent = std::make_unique<ZTCFakeAgent>(
        arStage.agentDirectory(),
        std::deque<ZTCFakeAgent::ZTCStep>{
            [this](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) { serve(arAgent, acrRequest); }});
}

ZTCPagedAgent::~ZTCPagedAgent() = default;

void ZTCPagedAgent::happen(unsigned aRecords, unsigned aOccurrencesEach, bool aRings) {
    {
        const std::lock_guard lLock(mMutex);
        mHeld.insert(mHeld.end(), aRecords, aOccurrencesEach);
        mHappened += static_cast<std::uint64_t>(aRecords) * aOccurrencesEach;
        mPage.row(0, scRow).mConsolidated += static_cast<std::uint64_t>(aRecords) * aOccurrencesEach;
        mPage.row(0, scRow).mLastConsolidated = sNow();
        mPage.header().mHeldRecords += aRecords;
        mPage.header().mHeldBytes += 4 * aRecords;
    }
    const std::uint64_t lOne = 1;
    if (aRings && write(mBell, &lOne, sizeof(lOne)) < 0) {
        throw std::runtime_error("the bell cannot be rung");
    }
}

/// The response's body. What it holds is handed over from now on, whatever becomes of the bytes.
ZTCWireBytes ZTCPagedAgent::takeAll() {
    const std::lock_guard lLock(mMutex);
    ZTCByteWriter lTime;
    const auto lSeconds = static_cast<std::uint64_t>(sNow() / 1000000);
    lTime.u16(2026)
        .u8(1)
        .u8(1)
        .u8(0)
        .u8(0)
        .u8(0)
        .u8(0x2E)
        .u16(0)
        .u16(0)
        .u32(lSeconds >> 32U)
        .u32(lSeconds & 0xFFFFFFFFU);
    std::vector<ZTCBytes> lRecords;
    std::uint64_t lTaken = 0;
    for (const unsigned lOccurrences : mHeld) {
        lTaken += lOccurrences;
        ZTCByteWriter lData;
        lData.le32(1).fill(mPadding / mHeld.size(), 0x5A);
        ZTCByteWriter lRecord;
        lRecord.u32(lOccurrences).raw(lTime.bytes()).raw(lTime.bytes()).u8(scCategory).u8(scSubcategory).u8(0);
        lRecord.u32(lData.bytes().size()).raw(lData.bytes());
        lRecords.push_back(lRecord.bytes());
    }
    mHeld.clear();
    ZTSStatusHeader& lrHeader = mPage.header();
    lrHeader.mRetrievalSequence = lrHeader.mRetrievalSequence + 1;
    mPage.row(0, scRow).mHandedOver += lTaken;
    lrHeader.mRetrievals += 1;
    lrHeader.mHandedOverRecords += lRecords.size();
    lrHeader.mHandedOverOccurrences += lTaken;
    lrHeader.mLastRetrieval = sNow();
    lrHeader.mHeldRecords = 0;
    lrHeader.mHeldBytes = 0;
    lrHeader.mRetrievalSequence = lrHeader.mRetrievalSequence + 1;
    mHandedOver += lTaken;
    return makeSampleResponse(1, {makeSampleList(gcSampleKey, lRecords)});
}

void ZTCPagedAgent::serve(ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
    switch (acrRequest.at(0)) {
        case ZTSTVKC_GetScopeData: {
            const ZTCWireBytes lBody = takeAll();
            if (const std::size_t lCut = mCut) {
                ZTCByteWriter lFrame;
                lFrame.u32(lBody.size()).raw(lBody);
                ZTCWireBytes lBytes = lFrame.bytes();
                lBytes.resize(lBytes.size() - std::min(lCut, lBytes.size()));
                arAgent.sendRaw(lBytes);
                arAgent.die();
                mHasDied = true;
            } else {
                arAgent.sendFrame(lBody);
            }
            break;
        }
        case ZTSTVKC_CollectionPeriod:
            arAgent.sendFrame({ZTRO_Failed, 0, ZTSAPS_Invalid});
            break;
        case ZTSTVKC_ShutDown:
            mPage.header().mEndTime = sNow();
            mPage.header().mEndReason = ZTSE_ShutDown;
            arAgent.sendFrame({ZTRO_Success, 0, 0, 0, 0});
            arAgent.die();
            mHasShutDown = true;
            break;
        default:
            arAgent.sendFrame({ZTRO_Success, 0, 0, 0, 0});
    }
}
