#include "tests/unit/tavik/support/TavikFixture.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include "common/include/Log.h"
#include "os/common/include/ProcessEvents.h"
#include "system/include/SystemGlobals.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"

void ZTCTestTavikSystem::waitForActivity(unsigned aReader, unsigned aSeconds) {
    mWaitForActivity ? mWaitForActivity(aReader, aSeconds) : ZTCTavikSystem::waitForActivity(aReader, aSeconds);
}

void ZTCTestTavikSystem::timedWait(unsigned aConditional, unsigned aSeconds) {
    mTimedWait ? mTimedWait(aConditional, aSeconds) : ZTCTavikSystem::timedWait(aConditional, aSeconds);
}

void ZTCTestTavikSystem::makeThreadsToExit() {
    mMakeThreadsToExit ? mMakeThreadsToExit() : ZTCTavikSystem::makeThreadsToExit();
}

bool ZTCTestTavikSystem::hasPendingRecord() {
    const ZTCPrevDataHold lHold(*this);
    return isPrevScopeDataSet();
}

unsigned ZTCTestTavikSystem::pendingBoard() {
    const ZTCPrevDataHold lHold(*this);
    return getPrevBoardId();
}

std::string ZTCTestTavikSystem::pendingDataHex() {
    const ZTCPrevDataHold lHold(*this);
    ZTCScopeData& lrData = *getPrevScopeData();
    return hexOf(ZTCBytes(lrData.getEventData(), lrData.getEventData() + lrData.getEventDataSize()));
}

unsigned ZTCTestTavikSystem::pendingCapacity() {
    const ZTCPrevDataHold lHold(*this);
    return getPrevScopeData()->getCapacity();
}

bool ZTCTestTavikSystem::hasRecordList(unsigned aBoard) {
    const ZTCPrevDataHold lHold(*this);
    return isRecordListExist(aBoard);
}

unsigned ZTCTestTavikSystem::recordListSize(unsigned aBoard) {
    const ZTCPrevDataHold lHold(*this);
    return getRecordList(aBoard)->size();
}

bool ZTCTestTavikSystem::canAddToPendingRecord(unsigned aLength) {
    const ZTCPrevDataHold lHold(*this);
    return canAddEventDataPerRecord(aLength);
}

static std::string sTextOf(const ZTCTavikTarget& acrTarget) {
    return std::string(acrTarget.getWwnn()->getString().get()) + ", " + acrTarget.getWwpn()->getString().get() + ", " +
           std::to_string(acrTarget.getFcId());
}

std::string ZTCTestTavikSystem::targetByFcId(unsigned aFcId) {
    const ZTCPrevDataHold lHold(*this);
    try {
        return sTextOf(*getFcTarget(aFcId));
    } catch (const ZTCNotFoundEx&) {
        return "";
    }
}

std::string ZTCTestTavikSystem::targetByPortName(const ZTSWwn& acrPortName) {
    const ZTCPrevDataHold lHold(*this);
    try {
        return sTextOf(*getWwpnTarget(ZTCWorldWideName(acrPortName.mBytes.data()).getKey()));
    } catch (const ZTCNotFoundEx&) {
        return "";
    }
}

void ZTCTestTavikSystem::makePendingRecord(unsigned aBoard, unsigned aSize) {
    const ZTCPointer<ZTCScopeEvent> lEvent(new ZTCScopeEvent(0xEE, 0xEE));
    const ZTCBytes lBytes(aSize, 0xEE);
    auto lData = ZTCPointer<ZTCScopeData>::make(lEvent, lBytes.data(), aSize, getMaxEventDataSize());
    const ZTCPrevDataHold lHold(*this);
    setPrevScopeData(aBoard, lData);
}

void ZTCTestTavikSystem::appendToPendingRecord(const ZTCBytes& acrBytes) {
    ZTCBytes lBytes = acrBytes;
    const ZTCPrevDataHold lHold(*this);
    appendEventData(lBytes.data(), static_cast<unsigned>(lBytes.size()));
}

void ZTCTestTavikSystem::countOnPendingRecord() {
    const ZTCPrevDataHold lHold(*this);
    incrementOccurences();
}

void ZTCTestTavikSystem::filePendingRecord() {
    const ZTCPrevDataHold lHold(*this);
    clearPrevScopeData();
}

void ZTCTestTavikSystem::exchangeRecordLists(unsigned aBoards) {
    ZTCTavikRecordsMap lTaken;
    ZTCTavikRecordsMap lLists;
    for (unsigned lBoard = 0; lBoard < aBoards; ++lBoard) {
        lLists.insert(lBoard, ZTCPointer<ZTCTavikRecordList>(new ZTCTavikRecordList(lBoard, this)));
    }
    const ZTCPrevDataHold lHold(*this);
    clearRecordsMap(lTaken);
    addNewRecordListsToRecordsMap(lLists);
}

ZTCTavikFixture::ZTCTavikFixture() : mLog(mDirectory.path("log")), mSystem(std::make_unique<ZTCTestTavikSystem>()) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    setenv("ZT_QRV_SENSOR_DIR", mDirectory.path().c_str(), 1);
    setSystemObject(mSystem.get());
}

ZTCTavikFixture::~ZTCTavikFixture() {
    mDoScopeCollection = false;
    gpTavikSystem = nullptr;
    setSystemObject(nullptr);
    getExitEvent().reset();
    getStopEvent().reset();
    if (mResponseReader >= 0) {
        close(mResponseReader);
    }
    unsetenv("ZT_QRV_SENSOR_DIR");
}

void ZTCTavikFixture::bringUp(unsigned aAdapters) {
    mLibrary.mNumberOfAdapters = aAdapters;
    mSystem->preInit();
    if (mkfifo(responseFifoPath().c_str(), 0600) != 0) {
        throw std::runtime_error("mkfifo " + responseFifoPath());
    }
    mResponseReader = open(responseFifoPath().c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (mResponseReader < 0) {
        throw std::runtime_error("open " + responseFifoPath());
    }
    mSystem->init();
    mLog.forget();
    mLibrary.forgetCalls();
}

void ZTCTavikFixture::collect(unsigned aAdapters, unsigned aMaxEventDataSize) {
    bringUp(aAdapters);
    startScope(aMaxEventDataSize);
    mLog.forget();
    mLibrary.forgetCalls();
}

ZTCBytes ZTCTavikFixture::request(const ZTCBytes& acrBody) {
    ZTCPointer<ZTCBuffer> lResponse;
    mSystem->getProtocolHandler()->process(makeBuffer(acrBody), lResponse);
    return contentOf(*lResponse);
}

void ZTCTavikFixture::startScope(unsigned aMaxEventDataSize) {
    EXPECT_EQ(gcSuccessHex, hexOf(request(ZTCByteWriter().u8(0).u32(aMaxEventDataSize).bytes())));
}

std::string ZTCTavikFixture::registerTargets(const std::vector<ZTSTestTarget>& acrTargets) {
    ZTCByteWriter lBody;
    lBody.u8(3).u32(acrTargets.size());
    for (const ZTSTestTarget& lcrTarget : acrTargets) {
        lBody.wwn(lcrTarget.mNodeName).wwn(lcrTarget.mPortName).u32(lcrTarget.mFcId);
    }
    return hexOf(request(lBody.bytes()));
}

ZTSScopeDataResponse ZTCTavikFixture::retrieve() {
    return ZTSScopeDataResponse::decode(request({1}));
}

void ZTCTavikFixture::prepareToDie() const {
    static const std::string& srPath = *new std::string(mDirectory.path());
    std::atexit([] {
        std::error_code lError;
        std::filesystem::remove_all(srPath, lError);
    });
    ZTCTestLog::sendToStandardError();
}

std::string failedAssertion(const std::string& acrCondition) {
    std::string lEscaped;
    for (const char lChar : acrCondition) {
        if (std::string("()[]{}.*+?|^$\\").find(lChar) != std::string::npos) {
            lEscaped += '\\';
        }
        lEscaped += lChar;
    }
    return "-H- .*: Assertion \\[ " + lEscaped + " \\] failed\n";
}
