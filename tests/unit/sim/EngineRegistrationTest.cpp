#include <gtest/gtest.h>

#include <string>

#include "libkpm/sim/src/Engine.h"
#include "tests/unit/sim/Recorder.h"

TEST(EngineRegistration, ARegistrationAgainDeliversEachEventOnce) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    const std::uint32_t lOld = lRecorder.registerKind(lEngine, 0, "plogi");
    const std::uint32_t lNew = lRecorder.registerKind(lEngine, 0, "plogi");
    EXPECT_NE(lOld, lNew);
    EXPECT_EQ(injectLine(lEngine, "plogi times=5"), 5u);
    EXPECT_EQ(lRecorder.getCount(), 5u);
}

TEST(EngineRegistration, WhatIsUnregisteredIsNotDelivered) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters());
    const HBA_wwn lPort = lEngine.getScenario().mAdapters[0].mWwpn;
    const HBA_wwn lOther = lEngine.getScenario().mAdapters[1].mWwpn;
    const std::uint32_t lPlogi = lRecorder.registerKind(lEngine, 0, "plogi");
    const std::uint32_t lLink = lRecorder.registerKind(lEngine, 0, "link");
    EXPECT_EQ(lEngine.unregisterForPort(7, lPort, lPlogi), ZTLST_NoSuchBoard);
    EXPECT_EQ(lEngine.unregisterForPort(0, lOther, lPlogi), ZTLST_NotItsPort);
    EXPECT_EQ(lEngine.unregisterForPort(0, lPort, lLink), ZTLST_NoSuchHandle);
    EXPECT_EQ(lEngine.unregisterForBoard(0, lPlogi), ZTLST_NoSuchHandle);
    EXPECT_EQ(lEngine.unregisterForPort(0, lPort, lPlogi), ZTLST_Success);
    EXPECT_EQ(lEngine.unregisterForBoard(0, lLink), ZTLST_Success);
    EXPECT_EQ(lEngine.unregisterForPort(0, lPort, lPlogi), ZTLST_NoSuchHandle);
    EXPECT_EQ(injectLine(lEngine, "plogi") + injectLine(lEngine, "link"), 0u);
}

TEST(EngineRegistration, RegistrationsOfWhatDoesNotExistAreRefused) {
    ZTCSimEngine lEngine(readTwoAdapters());
    const HBA_wwn lPort = lEngine.getScenario().mAdapters[0].mWwpn;
    const HBA_wwn lOther = lEngine.getScenario().mAdapters[1].mWwpn;
    std::uint32_t lHandle = 99;
    const auto lRegister = [&](std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                               std::uint32_t aSubcategory) {
        return lEngine.registerForPort(aBoard, acrPort, aCategory, aSubcategory, nullptr, &lHandle,
                                       ZTCRecorder::onScope);
    };
    EXPECT_EQ(lRegister(2, lPort, 1, 1), ZTLST_NoSuchBoard);
    EXPECT_EQ(lRegister(0, lOther, 1, 1), ZTLST_NotItsPort);
    EXPECT_EQ(lRegister(0, lPort, 1, 0x20), ZTLST_NoSuchKind);
    EXPECT_EQ(lRegister(0, lPort, 0, FC_REG_LINK_EVENT), ZTLST_NoSuchKind);
    EXPECT_EQ(lEngine.registerForPort(0, lPort, 1, 1, nullptr, &lHandle, nullptr), ZTLST_NullPointer);
    EXPECT_EQ(lEngine.registerForPort(0, lPort, 1, 1, nullptr, nullptr, ZTCRecorder::onScope), ZTLST_NullPointer);
    const KPM_EventCallback lpCallback = ZTCRecorder::getEventCallback(FC_REG_LINK_EVENT);
    EXPECT_EQ(lEngine.registerForBoard(2, FC_REG_LINK_EVENT, nullptr, lpCallback), 0u);
    EXPECT_EQ(lEngine.registerForBoard(0, 3, nullptr, lpCallback), 0u);
    EXPECT_EQ(lEngine.registerForBoard(0, FC_REG_LINK_EVENT, nullptr, nullptr), 0u);
    EXPECT_EQ(lHandle, 99u);
    EXPECT_EQ(lEngine.getStatus().mRegistered, 0u);
}

TEST(EngineRegistration, PlaysRefusedRegistrationsAsOftenAsTold) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("register plogi board=1 status=33 times=2\nregister temperature status=34\n"));
    EXPECT_NE(lRecorder.registerKind(lEngine, 0, "plogi"), 0u);
    EXPECT_EQ(lRecorder.registerKind(lEngine, 1, "plogi"), 0u);
    EXPECT_EQ(lRecorder.registerKind(lEngine, 1, "plogi"), 0u);
    EXPECT_NE(lRecorder.registerKind(lEngine, 1, "plogi"), 0u);
    EXPECT_EQ(lRecorder.registerKind(lEngine, 0, "temperature"), 0u);
    EXPECT_EQ(injectLine(lEngine, "temperature"), 0u);
}

TEST(EngineRegistration, PlaysInformationalStatuses) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(
        readTwoAdapters("register plogi status=5\nregister prlo status=6\nregister adisc status=7 handle=4711\n"
                        "register logo status=0 handle=0\n"));
    const auto lRegister = [&](const char* apKind, std::uint32_t& arHandle) {
        const ZTSScopeEventKind& lrKind = gcScopeEventKinds.at(findKindIndex(apKind).value());
        return lEngine.registerForPort(0, lEngine.getScenario().mAdapters[0].mWwpn, lrKind.mRegisteredCategory,
                                       lrKind.mRegisteredSubcategory, nullptr, &arHandle, ZTCRecorder::onScope);
    };
    std::uint32_t lHandle = 0;
    EXPECT_EQ(lRegister("plogi", lHandle), 5u);
    EXPECT_NE(lHandle, 0u);
    EXPECT_EQ(lRegister("prlo", lHandle), 6u);
    EXPECT_EQ(lRegister("adisc", lHandle), 7u);
    EXPECT_EQ(lHandle, 4711u);
    EXPECT_EQ(lRegister("logo", lHandle), 0u);
    EXPECT_EQ(lHandle, 0u);
    EXPECT_EQ(injectLine(lEngine, "plogi"), 1u);
    EXPECT_EQ(injectLine(lEngine, "prlo"), 0u);
    EXPECT_EQ(injectLine(lEngine, "adisc"), 1u);
    EXPECT_EQ(injectLine(lEngine, "logo"), 0u);
}

TEST(EngineRegistration, PlaysRefusedUnregistrations) {
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(readTwoAdapters("unregister all status=12 times=2\n"));
    const HBA_wwn lPort = lEngine.getScenario().mAdapters[0].mWwpn;
    const std::uint32_t lPlogi = lRecorder.registerKind(lEngine, 0, "plogi");
    const std::uint32_t lLink = lRecorder.registerKind(lEngine, 0, "link");
    EXPECT_EQ(lEngine.unregisterForPort(0, lPort, lPlogi), 12u);
    EXPECT_EQ(lEngine.unregisterForBoard(0, lLink), 12u);
    EXPECT_EQ(lEngine.unregisterForPort(0, lPort, lPlogi), 0u);
}

TEST(EngineRegistration, PlaysAnAdapterWithoutNames) {
    ZTCSimEngine lEngine(readTwoAdapters("info board=1 status=23\n"));
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    EXPECT_EQ(lEngine.getAdapterInfo(0, &lNode, &lPort), ZTLST_Success);
    EXPECT_EQ(lNode.wwn[7], 0x81);
    EXPECT_EQ(lPort.wwn[7], 0x01);
    EXPECT_EQ(lEngine.getAdapterInfo(1, &lNode, &lPort), 23u);
    EXPECT_EQ(lPort.wwn[7], 0x01);
    EXPECT_EQ(lEngine.getAdapterInfo(2, &lNode, &lPort), ZTLST_NoSuchBoard);
    EXPECT_EQ(lEngine.getAdapterInfo(0, nullptr, &lPort), ZTLST_NullPointer);
}
