#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/ProcessEvents.h"
#include "system/include/SystemGlobals.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class AdapterDiscovery : public ZTCTavikFixture {
protected:
    AdapterDiscovery() {
        mSystem->preInit();
        mLog.forget();
    }

    ~AdapterDiscovery() override {
        EXPECT_FALSE(exists(commandFifoPath()));
        EXPECT_FALSE(exists(responseFifoPath()));
    }

    /// Expects init to end as an exit condition of this text, after this notice, with these calls of the library behind
    /// those that load it.
    void expectExitCondition(const std::string& acrNotice, const std::string& acrText,
                             const std::vector<std::string>& acrCalls) {
        try {
            mSystem->init();
            ADD_FAILURE() << "no exception";
        } catch (const ZTCExitConditionEx& lcrException) {
            EXPECT_EQ(acrText, lcrException.what());
            EXPECT_EQ(19u, lcrException.getError());
        }
        EXPECT_EQ(std::vector<std::string>{"-N- " + acrNotice}, mLog.texts("-N-"));
        EXPECT_EQ(acrCalls, mLibrary.calls());
        EXPECT_EQ(0u, mSystem->getInitiators().size());
        EXPECT_EQ(0u, mSystem->conditionals().numberOfElements());
    }

    /// Expects init to fail with the library's own exception.
    void expectLibraryFailure(const std::string& acrText) {
        try {
            mSystem->init();
            ADD_FAILURE() << "no exception";
        } catch (const ZTCLibkpmFailedEx& lcrException) {
            EXPECT_EQ(acrText, lcrException.what());
        }
    }
};

}  // namespace

TEST_F(AdapterDiscovery, ADisabledLibraryIsAnExitCondition) {
    setenv("ZT_LIBKPM_PATH", "", 1);
    expectExitCondition("No Libkpm Found or Disabled.. Tavik would exit", "No Libkpm found", {});
}

TEST_F(AdapterDiscovery, AMissingLibraryIsAnExitConditionAndIsNotClosed) {
    setenv("ZT_LIBKPM_PATH", mDirectory.path("no.so").c_str(), 1);
    expectExitCondition("No Libkpm Found or Disabled.. Tavik would exit", "No Libkpm found", {});
}

TEST_F(AdapterDiscovery, AForeignLibraryIsAnExitConditionAndIsNotClosed) {
    mLibrary.mFunctionListStatus = 1;
    expectExitCondition("No Libkpm Found or Disabled.. Tavik would exit", "No Libkpm found", {"KPM_GetFunctionList 1"});
}

TEST_F(AdapterDiscovery, AHostWithoutAdaptersIsAnExitConditionAfterTheLibraryIsClosedAndUnloaded) {
    mLibrary.mNumberOfAdapters = 0;
    expectExitCondition("No QRV Adapters found.. Tavik would exit", "No QRV Adapters found.. Tavik would exit",
                        {"KPM_GetFunctionList 1", "Init", "GetNumberOfAdapters", "Close"});
    EXPECT_THROW(mSystem->getLibkpmAbs()->LIBKPM_Close(), ZTCInvalidEx);
}

TEST_F(AdapterDiscovery, AnOldDriverIsAnExitConditionAfterTheLibraryIsClosedAndUnloaded) {
    mLibrary.mIsZtapiSupported = 0;
    expectExitCondition("Old incompatible driver found.. Tavik would exit",
                        "Old incompatible driver found.. Tavik would exit",
                        {"KPM_GetFunctionList 1", "Init", "GetNumberOfAdapters", "IsZtapiSupported", "Close"});
    EXPECT_THROW(mSystem->getLibkpmAbs()->LIBKPM_Close(), ZTCInvalidEx);
}

TEST_F(AdapterDiscovery, TheLibraryIsClosedAndUnloadedBeforeTheNotice) {
    for (const bool lHasAdapters : {false, true}) {
        mLibrary.mNumberOfAdapters = lHasAdapters ? 1 : 0;
        mLibrary.mIsZtapiSupported = 0;
        mSystem = std::make_unique<ZTCTestTavikSystem>();
        setSystemObject(mSystem.get());
        mSystem->preInit();
        setLogCode(255);
        mLog.forget();
        EXPECT_THROW(mSystem->init(), ZTCExitConditionEx);
        setLogCode(gcDefaultLogCode);
        std::vector<std::string> lSeen;
        for (const ZTSLogLine& lcrLine : mLog.lines()) {
            if (lcrLine.mMark == "-N-" || (lcrLine.mFunction == "closeLibkpm" && lcrLine.mText == "Left")) {
                lSeen.push_back(lcrLine.mFunction);
            }
        }
        EXPECT_EQ((std::vector<std::string>{"closeLibkpm", "initLibkpm"}), lSeen);
    }
}

TEST_F(AdapterDiscovery, WithoutAdaptersAndWithAnOldDriverTheAdaptersAreReported) {
    mLibrary.mNumberOfAdapters = 0;
    mLibrary.mIsZtapiSupported = 0;
    expectExitCondition("No QRV Adapters found.. Tavik would exit", "No QRV Adapters found.. Tavik would exit",
                        {"KPM_GetFunctionList 1", "Init", "GetNumberOfAdapters", "Close"});
}

TEST_F(AdapterDiscovery, AFailedInitOfTheLibraryGoesOnUnchanged) {
    mLibrary.mInitStatus = 3;
    expectLibraryFailure("LIBKPM_Init failed with status 3");
    EXPECT_EQ((std::vector<std::string>{"KPM_GetFunctionList 1", "Init"}), mLibrary.calls());
}

TEST_F(AdapterDiscovery, FailedAdapterInfoGoesOnUnchanged) {
    mLibrary.mNumberOfAdapters = 3;
    mLibrary.mInfoStatuses[1] = 9;
    expectLibraryFailure("LIBKPM_GetAdapterInfo failed for adapter 1 with status 9");
    EXPECT_EQ(1u, mSystem->getInitiators().size());
}

TEST_F(AdapterDiscovery, EachAdapterGetsAnInitiatorAndAnEmptyListUnderItsIndex) {
    mLibrary.mNumberOfAdapters = 3;
    getStopEvent().raise();
    EXPECT_THROW(mSystem->init(), ZTCExitConditionEx) << "nobody reads the response pipe";
    ASSERT_EQ(3u, mSystem->getInitiators().size());
    ASSERT_EQ(3u, mSystem->getNumRecordLists());
    std::vector<std::string> lNotices;
    for (unsigned lBoard = 0; lBoard < 3; ++lBoard) {
        ASSERT_TRUE(mSystem->isFcInitiatorExist(lBoard));
        const ZTCTavikInitiator& lcrInitiator = *mSystem->getFcInitiator(lBoard);
        EXPECT_EQ(lBoard, lcrInitiator.getBoardId());
        EXPECT_EQ(ZTCAdaptersLibraryDouble::namesText(lBoard), std::string(lcrInitiator.getWwnn()->getString().get()) +
                                                                   ", " + lcrInitiator.getWwpn()->getString().get());
        ASSERT_TRUE(mSystem->hasRecordList(lBoard));
        EXPECT_EQ(0u, mSystem->recordListSize(lBoard));
        lNotices.push_back("-N- Discovered QRV initiator <" + ZTCAdaptersLibraryDouble::namesText(lBoard) + ">");
    }
    EXPECT_FALSE(mSystem->isFcInitiatorExist(3));
    EXPECT_FALSE(mSystem->hasRecordList(3));
    EXPECT_EQ(lNotices, mLog.texts("-N-", ".//TavikSystem"));
    EXPECT_EQ((std::vector<std::string>{"KPM_GetFunctionList 1", "Init", "GetNumberOfAdapters", "IsZtapiSupported",
                                        "GetAdapterInfo 0", "GetAdapterInfo 1", "GetAdapterInfo 2"}),
              mLibrary.calls());
    // A start that was told to stop leaves its FIFOs to the next one.
    unlink(commandFifoPath().c_str());
    unlink(responseFifoPath().c_str());
}
