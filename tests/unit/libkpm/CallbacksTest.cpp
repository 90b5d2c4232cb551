#include "libkpm/common/include/Callbacks.h"

#include <gtest/gtest.h>

static unsigned sSum = 0;
static int sContext = 0;

template <class Callback>
static ZTSLibraryRegistration sRegistration(Callback aCallback) {
    ZTSLibraryRegistration lRegistration;
    lRegistration.mpEventCallback = reinterpret_cast<KPM_EventCallback>(reinterpret_cast<void (*)()>(aCallback));
    return lRegistration;
}

static void sOnScope(unsigned aBoard, HBA_wwn aPort, unsigned aCategory, unsigned aSubcategory, void* apContext,
                     ZT_event* apEvent) {
    EXPECT_EQ(apContext, &sContext);
    sSum = aBoard + aPort.wwn[7] + aCategory + aSubcategory + static_cast<unsigned>(apEvent->zt_evt_size);
}

TEST(Callbacks, AScopeCallbackGetsItsContextAndEvent) {
    ZTSLibraryRegistration lRegistration;
    lRegistration.mpScopeCallback = &sOnScope;
    lRegistration.mpContext = &sContext;
    ZT_event lEvent{};
    lEvent.zt_evt_size = 10000;
    callScope(lRegistration, 1, HBA_wwn{{0, 0, 0, 0, 0, 0, 0, 20}}, 300, 4000, &lEvent);
    EXPECT_EQ(sSum, 14321u);
}

TEST(Callbacks, ALinkCallbackGetsItsBoardAndInfo) {
    LINKINFO lInfo{};
    callLink(sRegistration(+[](unsigned aBoard, void* apInfo) { static_cast<LINKINFO*>(apInfo)->a_DID = aBoard; }), 7,
             &lInfo);
    EXPECT_EQ(lInfo.a_DID, 7u);
}

TEST(Callbacks, AnRscnCallbackGetsItsPayloadAndLength) {
    unsigned char lPayload[4] = {0x61, 4, 0, 8};
    callRscn(sRegistration(+[](unsigned aBoard, void* apPayload, unsigned aLength) {
                 sSum = aBoard + aLength + static_cast<unsigned char*>(apPayload)[0];
             }),
             1, lPayload, 4);
    EXPECT_EQ(sSum, 1u + 4u + 0x61u);
}

TEST(Callbacks, ATemperatureCallbackGetsBothValues) {
    callTemperature(
        sRegistration(+[](unsigned aBoard, unsigned aFirst, unsigned aSecond) { sSum = aBoard + aFirst + aSecond; }), 1,
        20, 300);
    EXPECT_EQ(sSum, 321u);
}
