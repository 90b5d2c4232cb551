#include "tests/unit/linux/LinuxRecorder.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdio>
#include <cstring>

#include "tests/support/Waiting.h"
#include "tests/unit/linux/FakeKernel.h"

static std::atomic<ZTCLinuxRecorder*> gpRecorder{nullptr};

static std::string sHex(std::uint64_t aNumber) {
    char lText[32];
    std::snprintf(lText, sizeof lText, "%llx", static_cast<unsigned long long>(aNumber));
    return lText;
}

static std::string sName(const HBA_wwn& acrName) {
    return sHex(acrName.wwn[7]);
}

ZTCLinuxRecorder::ZTCLinuxRecorder() {
    gpRecorder = this;
}

ZTCLinuxRecorder::~ZTCLinuxRecorder() {
    gpRecorder = nullptr;
}

void ZTCLinuxRecorder::record(const std::string& acrText) {
    {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mEvents.push_back(acrText);
    }
    if (mHook) {
        mHook();
    }
}

/// The data of an event, which must be of this size.
template <class Data>
static Data sData(const ZT_event& acrEvent) {
    Data lData{};
    ZT_event_payload lPayload{};
    EXPECT_EQ(acrEvent.zt_evt_size, ZT_EVENT_HEADER_SIZE + sizeof lData);
    if (acrEvent.zt_evt_payload == nullptr) {
        ADD_FAILURE() << "an event without data";
        return lData;
    }
    std::memcpy(&lPayload, acrEvent.zt_evt_payload, sizeof lPayload);
    std::memcpy(&lData, lPayload.zt_payload_data, sizeof lData);
    return lData;
}

void ZTCLinuxRecorder::onScope(unsigned aBoard, HBA_wwn aPort, unsigned aCategory, unsigned aSubcategory,
                               void* apContext, ZT_event* apEvent) {
    const ZTCTestsOwn lOwn;
    EXPECT_EQ(apContext, gpRecorder.load());
    EXPECT_NE(aPort.wwn[7], 0) << "the board's own name";
    const std::string lBoard = std::to_string(aBoard);
    if (aCategory == 4 && (aSubcategory == 1 || aSubcategory == 2)) {
        const auto lData = sData<ZT_scsi_generic_v0>(*apEvent);
        EXPECT_EQ(lData.zt_scsi_generic_version, 0u);
        gpRecorder.load()->record(lBoard + (aSubcategory == 1 ? " queue-full " : " device-busy ") +
                                  sName(lData.zt_scsi_generic_rport) + " " + sHex(lData.zt_scsi_generic_lun));
    } else if (aCategory == 4 && aSubcategory == 4) {
        const auto lData = sData<zt_scsi_checkcondition_v0>(*apEvent);
        EXPECT_EQ(lData.zt_checkcondition_version, 0u);
        gpRecorder.load()->record(lBoard + " check-condition " + sName(lData.zt_checkcondition_rport) + " " +
                                  sHex(lData.zt_checkcondition_lun) + " " + sHex(lData.zt_checkcondition_cmdcode) +
                                  " " + sHex(lData.zt_checkcondition_senskey) + " " +
                                  sHex(lData.zt_checkcondition_asc) + " " + sHex(lData.zt_checkcondition_ascq));
    } else if (aCategory == 4 && aSubcategory == 0x40) {
        const auto lData = sData<zt_scsi_varquedepth_v0>(*apEvent);
        EXPECT_EQ(lData.zt_varquedepth_version, 0u);
        gpRecorder.load()->record(lBoard + " queue-depth " + sName(lData.zt_varquedepth_rport) + " " +
                                  sHex(lData.zt_varquedepth_lun) + " " + std::to_string(lData.zt_varquedepth_oldval) +
                                  "->" + std::to_string(lData.zt_varquedepth_newval));
    } else if (aCategory == 16 && aSubcategory == 1) {
        EXPECT_EQ(apEvent->zt_evt_payload, nullptr);
        EXPECT_EQ(apEvent->zt_evt_size, ZT_EVENT_HEADER_SIZE);
        gpRecorder.load()->record(lBoard + " arrival");
    } else {
        ADD_FAILURE() << "an event of kind " << aCategory << ", " << aSubcategory;
    }
}

static void sOnLink(unsigned aBoard, void* apInfo) {
    const ZTCTestsOwn lOwn;
    LINKINFO lInfo;
    std::memcpy(&lInfo, apInfo, sizeof lInfo);
    gpRecorder.load()->record(std::to_string(aBoard) + " link " + (lInfo.a_linkState == 1 ? "up" : "down") +
                              " tag=" + std::to_string(lInfo.a_linkEventTag) + " up=" + std::to_string(lInfo.a_linkUp) +
                              " down=" + std::to_string(lInfo.a_linkDown) + " id=" + sHex(lInfo.a_DID) + " " +
                              sName(lInfo.a_wwpName) + " " + sName(lInfo.a_wwnName));
}

static void sOnRscn(unsigned aBoard, void* apPayload, unsigned aLength) {
    const ZTCTestsOwn lOwn;
    std::string lText = std::to_string(aBoard) + " rscn ";
    for (unsigned lByte = 0; lByte < aLength; ++lByte) {
        char lHex[3];
        std::snprintf(lHex, sizeof lHex, "%02x", static_cast<const std::uint8_t*>(apPayload)[lByte]);
        lText += lHex;
    }
    gpRecorder.load()->record(lText);
}

KPM_EventCallback ZTCLinuxRecorder::linkCallback() {
    return reinterpret_cast<KPM_EventCallback>(reinterpret_cast<void (*)()>(sOnLink));
}

KPM_EventCallback ZTCLinuxRecorder::rscnCallback() {
    return reinterpret_cast<KPM_EventCallback>(reinterpret_cast<void (*)()>(sOnRscn));
}

void ZTCLinuxRecorder::registerAll(ZTCLinuxEngine& arEngine, std::uint32_t aBoard) {
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    ASSERT_EQ(arEngine.getAdapterInfo(aBoard, &lNode, &lPort), 0u);
    for (const auto& [lCategory, lSubcategory] : {std::pair{4u, 1u}, {4u, 2u}, {4u, 4u}, {4u, 0x40u}, {16u, 1u}}) {
        std::uint32_t lHandle = 0;
        arEngine.registerForPort(aBoard, lPort, lCategory, lSubcategory, this, &lHandle, &onScope);
        EXPECT_NE(lHandle, 0u);
    }
    EXPECT_NE(arEngine.registerForBoard(aBoard, FC_REG_LINK_EVENT, nullptr, linkCallback()), 0u);
    EXPECT_NE(arEngine.registerForBoard(aBoard, FC_REG_RSCN_EVENT, nullptr, rscnCallback()), 0u);
}

std::vector<std::string> ZTCLinuxRecorder::events() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mEvents;
}

std::vector<std::string> ZTCLinuxRecorder::waitFor(std::size_t aCount) const {
    waitUntil([&] { return count() >= aCount; }, std::to_string(aCount) + " events");
    return events();
}
