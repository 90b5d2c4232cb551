// Events of any kind, size and shape, from any board, between start, stop, targets and retrievals: nothing beside the
// bytes that an event has is read, every response decodes and prints, and what was consolidated is what is delivered.
//
// Input: the number of adapters, a byte that chooses the log code, then steps: a byte that says what
// happens, and what that needs.
#include <cstddef>
#include <cstring>
#include <nlohmann/json.hpp>
#include <vector>

#include "fuzz/support/FuzzAgent.h"
#include "fuzz/support/FuzzInput.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "libkpm/include/libkpm.h"
#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/RecordFields.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "tavik/include/TavikCore.h"
#include "tavik/include/TavikProtocolHandler.h"

static constexpr std::uint32_t scMaxAdapters = 4;

/// Bytes that an event of the kind needs to be consolidated. An RSCN is counted by its pages instead.
static constexpr std::size_t sLeastSize(const ZTSScopeEventKind& acrKind) {
    return acrKind.isScope() ? acrKind.mDataSize : 0;
}

static constexpr unsigned scRscnPair = 1 << 8 | 0x20;

/// The agent, with the count that its responses are compared with.
class ZTCConservation {
public:
    ZTCConservation(std::uint32_t aAdapters, unsigned aLogCode)
        : mAdapters(aAdapters), mLists(aAdapters), mAgent(aAdapters, aLogCode) {}

    void play(ZTCFuzzInput& arInput);
    void retrieve();

private:
    void command(ZTCFuzzInput& arInput, std::uint8_t aWhich);
    void scope(ZTCFuzzInput& arInput, std::uint8_t aShape);
    void rscn(ZTCFuzzInput& arInput);
    void link(ZTCFuzzInput& arInput);
    bool isAdmitted(std::uint32_t aBoard);

    const std::uint32_t mAdapters;  ///< initiators
    std::uint32_t mLists;           ///< boards with a record list
    ZTCFuzzAgent mAgent;
    bool mIsCollecting = false;
    std::uint64_t mExpected = 0;
};

bool ZTCConservation::isAdmitted(std::uint32_t aBoard) {
    return mIsCollecting && mAgent.getSystem().getTotalEventDataSize() < gcMaxScopeDataSize && aBoard < mAdapters &&
           aBoard < mLists;
}

/// An RSCN whose own length field is honest; what is missing of it is put behind it. At most 511 bytes, so that a run
/// takes no time: long ones have a fuzzer of their own.
static std::vector<std::uint8_t> sHonestRscn(std::span<const std::uint8_t> aBytes) {
    std::vector<std::uint8_t> lPayload(aBytes.begin(), aBytes.end());
    if (lPayload.size() >= 4) {
        lPayload[2] &= 1;
        const std::size_t lLength = lPayload[2] * 256u + lPayload[3];
        lPayload.resize(std::max(lPayload.size(), lLength), 0xA5);
    }
    return lPayload;
}

static std::uint64_t sPages(std::span<const std::uint8_t> aPayload, std::size_t aLength) {
    if (aLength < 8) {
        return 0;
    }
    const std::size_t lWords = (aPayload[2] * 256u + aPayload[3]) / 4;
    return lWords == 0 ? 0 : lWords - 1;
}

void ZTCConservation::scope(ZTCFuzzInput& arInput, std::uint8_t aShape) {
    const std::uint32_t lBoard = arInput.takeByte() % (scMaxAdapters + 2);
    // Half of the events are of a known kind, so that there is something to consolidate.
    unsigned lCategory;
    unsigned lSubcategory;
    if ((aShape & 1) != 0) {
        const ZTSScopeEventKind& lrKind = gcScopeEventKinds[arInput.takeByte() % gcScopeEventKinds.size()];
        lCategory = lrKind.mDeliveredCategory;
        lSubcategory = lrKind.mDeliveredSubcategory;
    } else {
        lCategory = arInput.takeWord();
        lSubcategory = arInput.takeWord();
    }
    const unsigned lPair = (lCategory & 0xFF) << 8 | (lSubcategory & 0xFF);
    const std::span<const std::uint8_t> lBytes = arInput.take(arInput.takeByte());
    const std::vector<std::uint8_t> lData =
        lPair == scRscnPair ? sHonestRscn(lBytes) : std::vector<std::uint8_t>(lBytes.begin(), lBytes.end());

    const std::size_t lOffset = aShape >> 1 & 7;
    const bool lHasPayload = (aShape >> 4 & 7) != 1;
    const bool lHasData = (aShape >> 4 & 7) != 2;
    const std::uint64_t lSize = ZT_EVENT_HEADER_SIZE + lData.size();
    const bool lHasOddSize = (aShape >> 4 & 7) == 3;
    const std::uint64_t lClaimed = lHasOddSize ? arInput.takeLong() << 32 | arInput.takeByte() % (lSize + 1) : lSize;
    const std::uint64_t lLow = lClaimed & 0xFFFFFFFFu;
    std::size_t lLength = lLow < ZT_EVENT_HEADER_SIZE ? 0 : static_cast<std::size_t>(lLow - ZT_EVENT_HEADER_SIZE);
    lLength = lHasPayload && lHasData ? lLength : 0;

    const ZTCExactBlock lDataBlock(lData, lOffset);
    ZT_event_payload lPayload{};
    lPayload.zt_payload_data = lHasData ? lDataBlock.get() : nullptr;
    const ZTCExactBlock lPayloadBlock({reinterpret_cast<const std::uint8_t*>(&lPayload), sizeof lPayload}, lOffset);
    ZT_event lEvent{};
    lEvent.zt_evt_version = ZT_EVENT_VERSION;
    lEvent.zt_evt_size = lClaimed;
    lEvent.zt_evt_payload = lHasPayload ? lPayloadBlock.get() : nullptr;
    const ZTCExactBlock lEventBlock({reinterpret_cast<const std::uint8_t*>(&lEvent), sizeof lEvent}, lOffset);
    void* lpEvent = lEventBlock.get();

    std::uint64_t lExpected = 0;
    if (isAdmitted(lBoard)) {
        for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
            const unsigned lKindsPair =
                static_cast<unsigned>(lrKind.mDeliveredCategory << 8 | lrKind.mDeliveredSubcategory);
            if (lKindsPair == lPair && lPair != scRscnPair && lLength >= sLeastSize(lrKind)) {
                lExpected = 1;
            }
        }
        if (lPair == scRscnPair) {
            lExpected = sPages(lData, lLength);
        }
    }
    mExpected += lExpected;
    const HBA_wwn lPort{{1, 2, 3, 4, 5, 6, 7, 8}};
    ScopeCb_Generic(lBoard, lPort, lCategory, lSubcategory, nullptr, static_cast<ZT_event*>(lpEvent));
}

void ZTCConservation::rscn(ZTCFuzzInput& arInput) {
    const std::uint32_t lBoard = arInput.takeByte() % (scMaxAdapters + 2);
    const std::vector<std::uint8_t> lPayload = sHonestRscn(arInput.take(arInput.takeByte()));
    const ZTCExactBlock lBlock(lPayload, lPayload.size() & 7);
    mExpected += isAdmitted(lBoard) ? sPages(lPayload, lPayload.size()) : 0;
    ScopeCb_KpmRscn(lBoard, lBlock.get(), static_cast<unsigned>(lPayload.size()));
}

void ZTCConservation::link(ZTCFuzzInput& arInput) {
    const std::uint32_t lBoard = arInput.takeByte() % (scMaxAdapters + 2);
    std::vector<std::uint8_t> lInfo(sizeof(LINKINFO));
    const std::span<const std::uint8_t> lName = arInput.take(sizeof(HBA_wwn));
    std::copy(lName.begin(), lName.end(), lInfo.begin() + offsetof(LINKINFO, a_wwpName));
    const ZTCExactBlock lBlock(lInfo, 1);
    mExpected += isAdmitted(lBoard) ? 1 : 0;
    ScopeCb_KpmLink(lBoard, lName.empty() ? nullptr : lBlock.get());
}

void ZTCConservation::command(ZTCFuzzInput& arInput, std::uint8_t aWhich) {
    switch (aWhich) {
        case 0:
            mAgent.startScope(arInput.takeWord());
            mIsCollecting = true;
            break;
        case 1: {
            const std::optional<ZTSResponse> lResponse = mAgent.request(encodeStop());
            ZT_FUZZ_REQUIRE(lResponse && lResponse->mOutcome == ZTRO_Success, "a stop command was refused");
            mIsCollecting = false;
            break;
        }
        case 2: {
            std::vector<ZTSTargetPort> lTargets(1u + arInput.takeByte() % 4);
            for (ZTSTargetPort& lrTarget : lTargets) {
                const std::span<const std::uint8_t> lName = arInput.take(lrTarget.mPortName.mBytes.size());
                std::copy(lName.begin(), lName.end(), lrTarget.mPortName.mBytes.begin());
                lrTarget.mFcId = arInput.takeWord();
            }
            const std::optional<ZTSResponse> lResponse = mAgent.request(encodeRegisterTargets(lTargets));
            ZT_FUZZ_REQUIRE(lResponse && lResponse->mOutcome == ZTRO_Success, "targets were refused");
            break;
        }
        default:
            mAgent.getLibrary().mAdapters = arInput.takeByte() % (scMaxAdapters + 2);
            retrieve();
            break;
    }
}

void ZTCConservation::retrieve() {
    const ZTSResponse lResponse = mAgent.retrieve();
    ZT_FUZZ_REQUIRE(lResponse.countOccurrences() == mExpected, std::to_string(lResponse.countOccurrences()) +
                                                                   " occurrences delivered, " +
                                                                   std::to_string(mExpected) + " consolidated");
    ZT_FUZZ_REQUIRE(lResponse.mAnnouncedLists >= lResponse.mLists.size(), "more lists than announced");
    for (const ZTSReceivedList& lrList : lResponse.mLists) {
        ZT_FUZZ_REQUIRE(lrList.getInitiatorNames().has_value(), lrList.mInitiatorKey);
        for (const ZTSReceivedRecord& lrRecord : lrList.mRecords) {
            const ZTSDecodedData lData =
                decodeEventData(lrRecord.mCategory, lrRecord.mSubcategory, lrRecord.mEventData);
            ZT_FUZZ_REQUIRE(lData.mpRule != nullptr && lData.mProblem.empty(), lData.mProblem);
        }
    }
    ZT_FUZZ_REQUIRE(formatTable(lResponse).ends_with("\n"), "the table's last line does not end");
    ZT_FUZZ_REQUIRE(!dumpJson(toJson(lResponse), -1).empty(), "no JSON");
    mExpected = 0;
    mLists = mAgent.getLibrary().mAdapters;
}

void ZTCConservation::play(ZTCFuzzInput& arInput) {
    const std::uint8_t lStep = arInput.takeByte();
    switch (lStep & 7) {
        case 0:
            command(arInput, static_cast<std::uint8_t>(lStep >> 3 & 3));
            break;
        case 1:
            rscn(arInput);
            break;
        case 2:
            link(arInput);
            break;
        case 3: {
            const std::uint32_t lBoard = arInput.takeByte() % (scMaxAdapters + 2);
            mExpected += isAdmitted(lBoard) ? 1 : 0;
            ScopeCb_KpmTemp(lBoard, 60, 70);
            break;
        }
        default:
            scope(arInput, arInput.takeByte());
            break;
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    const std::uint32_t lAdapters = 1 + lInput.takeByte() % scMaxAdapters;
    const unsigned lLogCode = lInput.takeByte() % 16 == 0 ? gcWholeLog : gcNoLog;
    ZTCConservation lConservation(lAdapters, lLogCode);
    while (!lInput.isAtEnd()) {
        lConservation.play(lInput);
    }
    lConservation.retrieve();
    return 0;
}
