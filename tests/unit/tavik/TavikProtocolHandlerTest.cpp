#include "tavik/include/TavikProtocolHandler.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/support/VirtualSlot.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

/// Notes which handler is called instead of calling it.
class ZTCDispatchSpy : public ZTCTavikProtocolHandler {
public:
    using ZTCTavikProtocolHandler::ZTCTavikProtocolHandler;

    std::string mCalled;
    const ZTCPointer<ZTCBuffer>* mpRequest = nullptr;
    ZTCPointer<ZTCBuffer>* mpResponse = nullptr;

    void handleStartScopeCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse) override {
        note("start", acrRequest, arResponse);
    }
    void handleGetScopeDataCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                   ZTCPointer<ZTCBuffer>& arResponse) override {
        note("get", acrRequest, arResponse);
    }
    void handleStopCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse) override {
        note("stop", acrRequest, arResponse);
    }
    void handleRegisterTargetsCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                      ZTCPointer<ZTCBuffer>& arResponse) override {
        note("targets", acrRequest, arResponse);
    }
    void handleSetCollectionPeriodCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                          ZTCPointer<ZTCBuffer>& arResponse) override {
        note("period", acrRequest, arResponse);
    }
    void handleShutDownCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse) override {
        note("shut down", acrRequest, arResponse);
    }

private:
    void note(const char* apName, const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse) {
        mCalled += apName;
        mpRequest = &acrRequest;
        mpResponse = &arResponse;
    }
};

class TavikProtocolHandler : public ZTCTavikFixture {
protected:
    void expectTooShort(const char* apRequestHex) {
        try {
            requestHex(apRequestHex);
            ADD_FAILURE() << "no exception for \"" << apRequestHex << '"';
        } catch (const ZTCInvalidEx& lcrException) {
            EXPECT_STREQ("Not enough data in stream", lcrException.what());
            EXPECT_EQ(6u, lcrException.getError());
        }
    }

    std::string failedResponse(ZTESensorAgentProtocolStatus aStatus) {
        ZTCPointer<ZTCBuffer> lResponse;
        mSystem->getProtocolHandler()->createFailedResponse(aStatus, lResponse);
        return hexOf(contentOf(*lResponse));
    }
};

}  // namespace

TEST_F(TavikProtocolHandler, ConstructionNamesTheSystemToTheCallbacksAndSwitchesCollectionOff) {
    mDoScopeCollection = true;
    gpTavikSystem = nullptr;
    const ZTCTavikProtocolHandler lHandler(mSystem.get());
    EXPECT_EQ(mSystem.get(), gpTavikSystem);
    EXPECT_FALSE(mDoScopeCollection);
}

TEST_F(TavikProtocolHandler, ItsVirtualOperationsStandInTheirOrder) {
    using Handler = ZTCTavikProtocolHandler;
    const std::vector<std::size_t> lSlots = {
        virtualSlotOf(&Handler::process),
        virtualSlotOf(&Handler::handleStartScopeCommand),
        virtualSlotOf(&Handler::handleGetScopeDataCommand),
        virtualSlotOf(&Handler::handleStopCommand),
        virtualSlotOf(&Handler::handleUnregisterEvents),
        virtualSlotOf(&Handler::handleRegisterTargetsCommand),
        virtualSlotOf(&Handler::handleSetCollectionPeriodCommand),
        virtualSlotOf(&Handler::handleShutDownCommand),
        virtualSlotOf(&Handler::createSuccessResponse),
        virtualSlotOf(&Handler::createFailedResponse),
    };
    EXPECT_EQ(slotsBehindTheDestructor(lSlots.size()), lSlots);
}

TEST_F(TavikProtocolHandler, ItsConstantsAreThose) {
    EXPECT_EQ(60u, ZT_COLLECTION_PERIOD_MIN);
    EXPECT_EQ(65535u, ZT_COLLECTION_PERIOD_MAX);
    EXPECT_EQ(3600u, ZT_DEFAULT_COLLECTION_PERIOD);
    EXPECT_EQ(104857600u, ZT_DEFAULT_RESP_LIST_SIZE);
}

TEST_F(TavikProtocolHandler, WithoutASystemEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            const ZTCTavikProtocolHandler lHandler(nullptr);
        },
        testing::ExitedWithCode(1), failedAssertion("__null != this->mpTavikSystem"));
}

TEST_F(TavikProtocolHandler, EveryCodeGoesToItsHandlerWithTheWholeRequest) {
    setLogCode(ZTLL_Debug);
    const char* const lHandlers[] = {"start", "get", "stop", "targets", "shut down", "period"};
    for (unsigned char lCode = 0; lCode < std::size(lHandlers); ++lCode) {
        mLog.forget();
        ZTCDispatchSpy lSpy(mSystem.get());
        const ZTCPointer<ZTCBuffer> lRequest = makeBuffer({lCode, 7});
        ZTCPointer<ZTCBuffer> lResponse;
        lSpy.process(lRequest, lResponse);
        EXPECT_EQ(lHandlers[lCode], lSpy.mCalled);
        EXPECT_EQ(&lRequest, lSpy.mpRequest);
        EXPECT_EQ(&lResponse, lSpy.mpResponse);
        EXPECT_TRUE(mLog.has("-T- Command to handle: " + std::to_string(lCode)));
    }
}

TEST_F(TavikProtocolHandler, AnyOtherCodeEndsTheProcess) {
    for (const char* lpCode : {"06", "07", "80", "ff"}) {
        EXPECT_EXIT(
            {
                prepareToDie();
                bringUp();
                requestHex(lpCode);
            },
            testing::ExitedWithCode(1), failedAssertion("false"));
    }
}

TEST_F(TavikProtocolHandler, ARequestShorterThanItsFieldsIsAnExceptionAndNoResponse) {
    bringUp();
    for (const char* lpRequest : {"", "00", "00ffffff", "03", "03ffffff", "05", "05ffffff"}) {
        expectTooShort(lpRequest);
    }
    EXPECT_FALSE(mDoScopeCollection);
    EXPECT_TRUE(mLibrary.calls().empty());
}

TEST_F(TavikProtocolHandler, AFailedResponseIsItsOutcomeAndTheStatus) {
    bringUp();
    setLogCode(255);
    EXPECT_EQ("010000", failedResponse(ZTSAPS_Success));
    EXPECT_EQ("010004", failedResponse(ZTSAPS_VarCreate));
    EXPECT_EQ("010006", failedResponse(ZTSAPS_Invalid));
    EXPECT_EQ("010008", failedResponse(ZTSAPS_NotFound));
    EXPECT_EQ("010009", failedResponse(ZTSAPS_NotAllowed));
    EXPECT_EQ("01000a", failedResponse(ZTSAPS_Exists));
    EXPECT_EQ("01000b", failedResponse(ZTSAPS_Repeat));
    EXPECT_EQ("01000c", failedResponse(ZTSAPS_NotSupported));
    EXPECT_EQ("010145", failedResponse(ZTSAPS_ConnectFailed));
    EXPECT_EQ("010146", failedResponse(ZTSAPS_OpenFailed));
    EXPECT_EQ("01014f", failedResponse(ZTSAPS_LockFailed));
    EXPECT_EQ("010150", failedResponse(ZTSAPS_UnlockFailed));
    EXPECT_EQ("0101ea", failedResponse(ZTSAPS_RefreshFailed));
    EXPECT_EQ(13u, mLog.count("-T- Creating Failed Response..."));
}

TEST_F(TavikProtocolHandler, AStatusIsCutTo16Bits) {
    bringUp();
    EXPECT_EQ("011234", failedResponse(static_cast<ZTESensorAgentProtocolStatus>(0xABCD1234)));
}

TEST_F(TavikProtocolHandler, AResponseReplacesWhatThePointerHeld) {
    bringUp();
    const ZTCPointer<ZTCBuffer> lFormer = makeBuffer({1, 2, 3});
    ZTCPointer<ZTCBuffer> lResponse = lFormer;
    mSystem->getProtocolHandler()->createSuccessResponse(lResponse);
    EXPECT_EQ(gcSuccessHex, hexOf(contentOf(*lResponse)));
    lResponse = lFormer;
    mSystem->getProtocolHandler()->createFailedResponse(ZTSAPS_Invalid, lResponse);
    EXPECT_EQ(gcInvalidHex, hexOf(contentOf(*lResponse)));
    EXPECT_EQ("010203", hexOf(contentOf(*lFormer)));
}

TEST_F(TavikProtocolHandler, OnlyACollectionPeriodOfZeroIsInvalidAndNoneIsKept) {
    collect(1, 77);
    EXPECT_EQ(gcInvalidHex, requestHex("05 00000000"));
    EXPECT_TRUE(mLog.texts().empty());
    for (const char* lpPeriod : {"00000001", "0000001e", "0000003c", "00000e10", "0000ffff", "00010000", "ffffffff"}) {
        mLog.forget();
        EXPECT_EQ(gcSuccessHex, requestHex(std::string("05") + lpPeriod));
        EXPECT_EQ(std::vector<std::string>{"-N- The limit set is 262144"}, mLog.texts()) << lpPeriod;
    }
    EXPECT_EQ(gcSuccessHex, requestHex("05 0000001e ffff")) << "what is left over is ignored";
    EXPECT_TRUE(mDoScopeCollection);
    EXPECT_EQ(77u, mSystem->getMaxEventDataSize());
    EXPECT_TRUE(mLibrary.calls().empty());
}

TEST_F(TavikProtocolHandler, ACollectionPeriodHandlerWithAnotherCodeEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            bringUp();
            ZTCPointer<ZTCBuffer> lResponse;
            mSystem->getProtocolHandler()->handleSetCollectionPeriodCommand(makeBuffer(bytesOf("04 00000001")),
                                                                            lResponse);
        },
        testing::ExitedWithCode(1), failedAssertion("ZTSTVKC_CollectionPeriod == lType"));
}

TEST_F(TavikProtocolHandler, AStopSwitchesCollectionOffAndTouchesNothingElse) {
    collect();
    deliverTemperature(0);
    mLog.forget();
    EXPECT_EQ(gcSuccessHex, requestHex("02 ffff"));
    EXPECT_EQ(std::vector<std::string>{"-N- Stopping Scope Data Collection."}, mLog.texts());
    EXPECT_FALSE(mDoScopeCollection);
    EXPECT_TRUE(mLibrary.calls().empty());
    deliverTemperature(0);
    EXPECT_EQ(std::vector<std::string>{"8/4 x1 01000000"}, retrieveTexts());
}

TEST_F(TavikProtocolHandler, AStopReadsNothingOfItsRequest) {
    bringUp();
    ZTCPointer<ZTCBuffer> lResponse;
    mSystem->getProtocolHandler()->handleStopCommand(makeBuffer({}), lResponse);
    EXPECT_EQ(gcSuccessHex, hexOf(contentOf(*lResponse)));
}

TEST_F(TavikProtocolHandler, AShutDownClosesTheLibraryAndLeavesItsResponseToTheExceptionsCatcher) {
    collect();
    ZTCPointer<ZTCBuffer> lResponse;
    mLibrary.mBeforeClosed = [&] {
        EXPECT_FALSE(lResponse != nullptr) << "the library is closed first";
        // A callback that runs until then needs the record lock, which nobody who holds it can take again.
        deliverTemperature(0);
        EXPECT_TRUE(mSystem->hasPendingRecord());
    };
    try {
        mSystem->getProtocolHandler()->process(makeBuffer({4}), lResponse);
        ADD_FAILURE() << "no exception";
    } catch (const ZTCShutDownEx& lcrException) {
        EXPECT_STREQ("Shutting down Tavik", lcrException.what());
        EXPECT_EQ(19u, lcrException.getError());
    }
    EXPECT_EQ(gcSuccessHex, hexOf(contentOf(*lResponse)));
    EXPECT_EQ(std::vector<std::string>{"Close"}, mLibrary.calls());
    EXPECT_THROW(mSystem->getLibkpmAbs()->LIBKPM_Close(), ZTCInvalidEx) << "it is unloaded";
}
