#include "tests/unit/sim/Recorder.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <utility>

#include "tests/support/Waiting.h"

const char* const gcTwoAdapters =
    "adapter hba0 wwpn=30:00:00:00:00:00:00:01 wwnn=30:00:00:00:00:00:00:81 fcid=0x010000\n"
    "adapter hba1 wwpn=30:00:00:00:00:00:00:02 wwnn=30:00:00:00:00:00:00:82 fcid=0x020000\n"
    "port disk0 wwpn=30:00:00:00:00:00:01:01 wwnn=30:00:00:00:00:00:01:81 fcid=0x010203\n"
    "port tape0 wwpn=30:00:00:00:00:00:01:02 wwnn=30:00:00:00:00:00:01:82 fcid=0x040506\n";

static std::atomic<ZTCRecorder*> gpRecorder{nullptr};

static std::string sHex(const std::uint8_t* apBytes, std::size_t aSize) {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    for (std::size_t lByte = 0; lByte < aSize; ++lByte) {
        lText += scDigits[apBytes[lByte] >> 4];
        lText += scDigits[apBytes[lByte] & 15];
    }
    return lText;
}

std::string ZTSRecordedEvent::describe() const {
    return std::to_string(mBoard) + ' ' + sHex(mLocal.wwn, sizeof mLocal.wwn) + ' ' + std::to_string(mCategory) + ' ' +
           std::to_string(mSubcategory) + ' ' + std::to_string(mSize) + ' ' + std::to_string(mLength) + ' ' +
           sHex(mData.data(), mData.size());
}

ZTCRecorder::ZTCRecorder() {
    gpRecorder = this;
}

ZTCRecorder::~ZTCRecorder() {
    gpRecorder = nullptr;
}

void ZTCRecorder::record(ZTSRecordedEvent aEvent) {
    if (mHook) {
        mHook();
    }
    const std::lock_guard<std::mutex> lGuard(mLock);
    mEvents.push_back(std::move(aEvent));
    mThreads.insert(std::this_thread::get_id());
}

static std::vector<std::uint8_t> sCopy(const void* apData, std::size_t aSize) {
    std::vector<std::uint8_t> lCopy(aSize);
    if (aSize != 0) {
        std::memcpy(lCopy.data(), apData, aSize);
    }
    return lCopy;
}

void ZTCRecorder::onScope(unsigned aBoard, HBA_wwn aPort, unsigned aCategory, unsigned aSubcategory, void* apContext,
                          ZT_event* apEvent) {
    ZT_event lEvent;
    std::memcpy(&lEvent, static_cast<void*>(apEvent), sizeof lEvent);
    ZTSRecordedEvent lRecorded;
    lRecorded.mBoard = aBoard;
    lRecorded.mLocal = aPort;
    lRecorded.mCategory = aCategory;
    lRecorded.mSubcategory = aSubcategory;
    lRecorded.mpContext = apContext;
    lRecorded.mSize = lEvent.zt_evt_size;
    lRecorded.mHasPayload = lEvent.zt_evt_payload != nullptr;
    if (lRecorded.mHasPayload) {
        ZT_event_payload lPayload;
        std::memcpy(&lPayload, lEvent.zt_evt_payload, sizeof lPayload);
        lRecorded.mHasData = lPayload.zt_payload_data != nullptr;
        if (lRecorded.mHasData) {
            const std::uint32_t lSize = std::max(static_cast<std::uint32_t>(lEvent.zt_evt_size), ZT_EVENT_HEADER_SIZE);
            lRecorded.mData = sCopy(lPayload.zt_payload_data, lSize - ZT_EVENT_HEADER_SIZE);
            lRecorded.mAddress = reinterpret_cast<std::uintptr_t>(lPayload.zt_payload_data);
        }
    }
    gpRecorder.load()->record(std::move(lRecorded));
}

static void sOnLink(unsigned aBoard, void* apInfo) {
    ZTSRecordedEvent lRecorded;
    lRecorded.mBoard = aBoard;
    lRecorded.mSubcategory = FC_REG_LINK_EVENT;
    lRecorded.mData = sCopy(apInfo, sizeof(LINKINFO));
    gpRecorder.load()->record(std::move(lRecorded));
}

static void sOnRscn(unsigned aBoard, void* apPayload, unsigned aLength) {
    ZTSRecordedEvent lRecorded;
    lRecorded.mBoard = aBoard;
    lRecorded.mSubcategory = FC_REG_RSCN_EVENT;
    lRecorded.mLength = aLength;
    // An agent trusts the length field of what is long enough to have pages.
    const auto* lpBytes = static_cast<const std::uint8_t*>(apPayload);
    const std::size_t lStated = aLength < 8 ? 0 : lpBytes[2] * 256u + lpBytes[3];
    lRecorded.mData = sCopy(apPayload, std::max<std::size_t>(aLength, lStated));
    gpRecorder.load()->record(std::move(lRecorded));
}

static void sOnTemperature(unsigned aBoard, unsigned aFirst, unsigned aSecond) {
    ZTSRecordedEvent lRecorded;
    lRecorded.mBoard = aBoard;
    lRecorded.mSubcategory = FC_REG_TEMPERATURE_EVENT;
    lRecorded.mData = {static_cast<std::uint8_t>(aFirst), static_cast<std::uint8_t>(aSecond)};
    gpRecorder.load()->record(std::move(lRecorded));
}

KPM_EventCallback ZTCRecorder::getEventCallback(std::uint32_t aEventType) {
    void (*lpCallback)() = nullptr;
    switch (aEventType) {
        case FC_REG_LINK_EVENT:
            lpCallback = reinterpret_cast<void (*)()>(sOnLink);
            break;
        case FC_REG_RSCN_EVENT:
            lpCallback = reinterpret_cast<void (*)()>(sOnRscn);
            break;
        default:
            lpCallback = reinterpret_cast<void (*)()>(sOnTemperature);
            break;
    }
    return reinterpret_cast<KPM_EventCallback>(lpCallback);
}

std::uint32_t ZTCRecorder::registerKind(ZTCSimEngine& arEngine, std::uint32_t aBoard, const char* apKind) {
    const ZTSScopeEventKind& lrKind = gcScopeEventKinds.at(findKindIndex(apKind).value());
    if (lrKind.mRegisteredCategory == 0) {
        return arEngine.registerForBoard(aBoard, lrKind.mRegisteredSubcategory, this,
                                         getEventCallback(lrKind.mRegisteredSubcategory));
    }
    std::uint32_t lHandle = 0;
    const HBA_wwn& lrPort = arEngine.getScenario().mAdapters.at(aBoard).mWwpn;
    arEngine.registerForPort(aBoard, lrPort, lrKind.mRegisteredCategory, lrKind.mRegisteredSubcategory, this, &lHandle,
                             onScope);
    return lHandle;
}

void ZTCRecorder::registerAll(ZTCSimEngine& arEngine, std::uint32_t aBoard) {
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        registerKind(arEngine, aBoard, lrKind.mpName);
    }
}

std::vector<ZTSRecordedEvent> ZTCRecorder::getEvents() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mEvents;
}

std::size_t ZTCRecorder::getCount() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mEvents.size();
}

void ZTCRecorder::waitForCount(std::size_t aCount) const {
    waitUntil([&] { return getCount() >= aCount; }, std::to_string(aCount) + " events");
}

std::multiset<std::string> ZTCRecorder::getDescriptions() const {
    std::multiset<std::string> lDescriptions;
    for (const ZTSRecordedEvent& lrEvent : getEvents()) {
        lDescriptions.insert(lrEvent.describe());
    }
    return lDescriptions;
}

std::set<std::thread::id> ZTCRecorder::getThreads() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mThreads;
}

ZTSSimScenario readScenario(const std::string& acrText) {
    return parseSimScenario(acrText);
}

ZTSSimScenario readTwoAdapters(const std::string& acrLines) {
    return readScenario(gcTwoAdapters + acrLines);
}

std::uint64_t injectLine(ZTCSimEngine& arEngine, const std::string& acrLine) {
    return arEngine.inject(parseSimEventLine(acrLine, arEngine.getScenario()));
}
