#include "sensor/agentcommon/include/LibkpmAbs.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>

#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/AdaptersLibraryDouble.h"
#include "tests/unit/agentcommon/support/TestLog.h"

namespace {

class ZTCReportsDouble : public ZTCLibkpmReports {
public:
    void reportState(std::uint32_t aBoardId, std::uint32_t aCategory, std::uint32_t aSubcategory, std::uint32_t aState,
                     const char* apReason) noexcept override {
        mCalls.push_back("state " + std::to_string(aBoardId) + " " + std::to_string(aCategory) + "/" +
                         std::to_string(aSubcategory) + " " + std::to_string(aState) + " " + apReason);
    }
    void reportLoss(const char* apName, std::uint64_t aTotal) noexcept override {
        mCalls.push_back(std::string("loss ") + apName + " " + std::to_string(aTotal));
    }

    std::vector<std::string> mCalls;
};

class LibkpmAbs : public testing::Test {
protected:
    LibkpmAbs() : mLog(mDirectory.path("log")), mDouble(2) {}

    /// Expects that loading is refused, and that the log tells the reason.
    void expectRefusal(const std::string& acrReason) {
        mLog.forget();
        EXPECT_THROW(mLibkpm.LIBKPM_LoadLibrary(), ZTCNotFoundEx);
        EXPECT_TRUE(mLog.has("-W- " + acrReason)) << testing::PrintToString(mLog.texts());
        EXPECT_THROW(mLibkpm.LIBKPM_Init(), ZTCInvalidEx) << "the refused library is in use";
        EXPECT_TRUE(mDouble.callsOf("Init").empty());
    }

    std::string cannotBeUsed(const std::string& acrReason) {
        return "Libkpm '" + ZTCAdaptersLibraryDouble::modulePath() + "' cannot be used: " + acrReason;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCTestLog mLog;
    ZTCAdaptersLibraryDouble mDouble;
    ZTCLibkpmAbs mLibkpm;
    ZTCReportsDouble mReports;
};

ZTCPointer<ZTCWorldWideName> sMakeName(const ZTSWwn& acrName) {
    return ZTCPointer<ZTCWorldWideName>(new ZTCWorldWideName(acrName.mBytes.data()));
}

void sScopeCallback(unsigned, HBA_wwn, unsigned, unsigned, void*, ZT_event*) {}
void sEventCallback(unsigned, ...) {}

}  // namespace

TEST_F(LibkpmAbs, LoadsTheLibraryThatTheEnvironmentNames) {
    mLibkpm.LIBKPM_LoadLibrary();
    EXPECT_EQ(std::vector<std::string>{"KPM_GetFunctionList 1"}, mDouble.calls());
    EXPECT_TRUE(mLog.texts().empty());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, AMissingLibraryIsRefusedWithTheLoadersReason) {
    const std::string lPath = mDirectory.path("nowhere.so");
    setenv("ZT_LIBKPM_PATH", lPath.c_str(), 1);
    expectRefusal("Libkpm '" + lPath + "' cannot be loaded: " + lPath +
                  ": cannot open shared object file: No such file or directory");
}

TEST_F(LibkpmAbs, AFileThatIsNoLibraryIsRefusedWithTheLoadersReason) {
    const std::string lPath = mDirectory.path("text.so");
    writeFile(lPath, "this is no shared object");
    setenv("ZT_LIBKPM_PATH", lPath.c_str(), 1);
    expectRefusal("Libkpm '" + lPath + "' cannot be loaded: " + lPath + ": file too short");
}

TEST_F(LibkpmAbs, ALibraryThatNeedsAFunctionThatIsNowhereIsRefusedWhenItIsLoaded) {
    const std::string lPath = ZTCAdaptersLibraryDouble::incompleteModulePath();
    setenv("ZT_LIBKPM_PATH", lPath.c_str(), 1);
    expectRefusal("Libkpm '" + lPath + "' cannot be loaded: " + lPath + ": undefined symbol: functionThatIsNowhere");
}

TEST_F(LibkpmAbs, AnEmptyPathDisablesTheLibrary) {
    setenv("ZT_LIBKPM_PATH", "", 1);
    expectRefusal("Libkpm is disabled: ZT_LIBKPM_PATH is set and empty");
    EXPECT_TRUE(mDouble.calls().empty());
}

TEST_F(LibkpmAbs, WithoutThePathTheLoaderSearchesForTheDefaultName) {
    unsetenv("ZT_LIBKPM_PATH");
    mLog.forget();
    EXPECT_THROW(mLibkpm.LIBKPM_LoadLibrary(), ZTCNotFoundEx);
    ASSERT_EQ(1u, mLog.texts().size());
    EXPECT_EQ(0u, mLog.texts()[0].rfind("-W- Libkpm 'libkpm.so.1' cannot be loaded: libkpm.so.1: ", 0))
        << mLog.texts()[0];
    EXPECT_TRUE(mDouble.calls().empty());
}

TEST_F(LibkpmAbs, ALibraryWithoutTheEntryIsRefused) {
    const std::string lPath = ZTCAdaptersLibraryDouble::moduleWithoutEntryPath();
    setenv("ZT_LIBKPM_PATH", lPath.c_str(), 1);
    expectRefusal("Libkpm '" + lPath + "' cannot be used: it has no function KPM_GetFunctionList");
}

TEST_F(LibkpmAbs, ALibraryThatDoesNotSpeakTheVersionIsRefused) {
    mDouble.mFunctionListStatus = 7;
    expectRefusal(cannotBeUsed("it does not speak version 1 (status 7)"));
}

TEST_F(LibkpmAbs, ALibraryThatGivesNoTableIsRefused) {
    mDouble.mGivesTable = false;
    expectRefusal(cannotBeUsed("it gave no table of functions"));
}

TEST_F(LibkpmAbs, ATableOfAnotherVersionIsRefused) {
    for (const std::uint32_t lVersion : {0u, 2u, 0xFFFFFFFFu}) {
        mDouble.mShape = [lVersion](KPM_FunctionList& arList) { arList.version = lVersion; };
        expectRefusal(cannotBeUsed("its table of functions has version " + std::to_string(lVersion) + ", wanted 1"));
    }
}

TEST_F(LibkpmAbs, ATableOf79BytesIsRefusedAndOneOf80IsAccepted) {
    mDouble.mShape = [](KPM_FunctionList& arList) { arList.size = 79; };
    expectRefusal(cannotBeUsed("its table of functions has 79 bytes, wanted at least 80"));
    mDouble.mShape = [](KPM_FunctionList& arList) { arList.size = 80; };
    EXPECT_NO_THROW(mLibkpm.LIBKPM_LoadLibrary());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, ALargerTableOfALaterHeaderIsAccepted) {
    mDouble.mShape = [](KPM_FunctionList& arList) { arList.size = 4096; };
    EXPECT_NO_THROW(mLibkpm.LIBKPM_LoadLibrary());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, ALibraryThatTakesALogIsGivenItOnceBeforeInit) {
    mDouble.mTakesLog = true;
    mLibkpm.LIBKPM_LoadLibrary();
    mLibkpm.LIBKPM_Init();
    EXPECT_EQ((std::vector<std::string>{"KPM_GetFunctionList 1", "SetLog", "Init"}), mDouble.calls());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, ALibraryWithAnEmptyEntryForTheLogWorksWithoutOne) {
    mLibkpm.LIBKPM_LoadLibrary();
    EXPECT_EQ(std::vector<std::string>{"KPM_GetFunctionList 1"}, mDouble.calls());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, AnOlderTableThatDoesNotCoverTheEntryForTheLogIsNeverAskedForIt) {
    mDouble.mTakesLog = true;
    for (const std::uint32_t lSize : {80u, 84u, 87u}) {
        SCOPED_TRACE(lSize);
        mDouble.forgetCalls();
        mDouble.mShape = [lSize](KPM_FunctionList& arList) { arList.size = lSize; };
        mLibkpm.LIBKPM_LoadLibrary();
        EXPECT_EQ(std::vector<std::string>{"KPM_GetFunctionList 1"}, mDouble.calls());
        mLibkpm.LIBKPM_FreeLibrary();
    }
}

TEST_F(LibkpmAbs, ARefusedLibraryIsGivenNoLog) {
    mDouble.mTakesLog = true;
    mDouble.mShape = [](KPM_FunctionList& arList) { arList.Close = nullptr; };
    EXPECT_THROW(mLibkpm.LIBKPM_LoadLibrary(), ZTCNotFoundEx);
    EXPECT_TRUE(mDouble.callsOf("SetLog").empty());
}

TEST_F(LibkpmAbs, ALibraryThatTakesReportsIsGivenTheirFunctionsAfterTheLogAndBeforeInit) {
    mDouble.mTakesLog = true;
    mDouble.mTakesReport = true;
    mLibkpm.LIBKPM_LoadLibrary(&mReports);
    mLibkpm.LIBKPM_Init();
    EXPECT_EQ((std::vector<std::string>{"KPM_GetFunctionList 1", "SetLog", "SetReport", "Init"}), mDouble.calls());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, ALibraryIsGivenNoFunctionsForReportsWhereItHasNoEntryForThemOrNobodyTakesThem) {
    mDouble.mTakesLog = true;
    mLibkpm.LIBKPM_LoadLibrary(&mReports);
    mLibkpm.LIBKPM_FreeLibrary();
    mDouble.mTakesReport = true;
    mLibkpm.LIBKPM_LoadLibrary();
    mLibkpm.LIBKPM_FreeLibrary();
    for (const std::uint32_t lSize : {80u, 88u, 95u}) {
        mDouble.mShape = [lSize](KPM_FunctionList& arList) { arList.size = lSize; };
        mLibkpm.LIBKPM_LoadLibrary(&mReports);
        mLibkpm.LIBKPM_FreeLibrary();
    }
    EXPECT_TRUE(mDouble.callsOf("SetReport").empty());
}

TEST_F(LibkpmAbs, TheLibrarysReportsReachTheirReceiver) {
    mDouble.mTakesReport = true;
    mLibkpm.LIBKPM_LoadLibrary(&mReports);
    ASSERT_NE(nullptr, mDouble.mpReportState);
    mDouble.mpReportState(mDouble.mpReportContext, 3, 1, 0x20, KPM_STATE_NO_RIGHTS, "needs a right");
    mDouble.mpReportState(mDouble.mpReportContext, 3, 1, 0x20, KPM_STATE_WORKING, nullptr);
    mDouble.mpReportLoss(mDouble.mpReportContext, "messages", 0x100000000);
    mDouble.mpReportLoss(mDouble.mpReportContext, nullptr, 1);
    EXPECT_EQ((std::vector<std::string>{"state 3 1/32 3 needs a right", "state 3 1/32 1 ", "loss messages 4294967296",
                                        "loss  1"}),
              mReports.mCalls);
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, TheLibrarysLinesStandInTheLogAtTheirLevels) {
    mDouble.mTakesLog = true;
    mLibkpm.LIBKPM_LoadLibrary();
    ASSERT_NE(nullptr, mDouble.mpLog);
    mDouble.mpLog(KPM_LOG_ERROR, "one");
    mDouble.mpLog(KPM_LOG_WARNING, "two %s%n 50%");
    mDouble.mpLog(KPM_LOG_NOTICE, "three");
    mDouble.mpLog(KPM_LOG_INFO, "below the level of the log");
    mDouble.mpLog(4711, "five");
    mDouble.mpLog(KPM_LOG_NOTICE, nullptr);
    EXPECT_EQ((std::vector<std::string>{"-E- Libkpm: one", "-W- Libkpm: two %s%n 50%", "-N- Libkpm: three",
                                        "-W- Libkpm: five", "-N- Libkpm: (no text)"}),
              mLog.texts());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, ATableWithAnyEmptyEntryIsRefused) {
    for (unsigned lEntry = 0; lEntry < 9; ++lEntry) {
        SCOPED_TRACE(lEntry);
        mDouble.mShape = [lEntry](KPM_FunctionList& arList) {
            std::memset(reinterpret_cast<unsigned char*>(&arList) + 8 + 8 * lEntry, 0, 8);
        };
        expectRefusal(cannotBeUsed("its table of functions has an empty entry"));
    }
}

TEST_F(LibkpmAbs, ARefusedLibraryIsUnloaded) {
    mDouble.mFunctionListStatus = 1;
    mDouble.mShape = [this](KPM_FunctionList&) { mDouble.releaseModule(); };
    EXPECT_THROW(mLibkpm.LIBKPM_LoadLibrary(), ZTCNotFoundEx);
    EXPECT_FALSE(ZTCAdaptersLibraryDouble::isModuleLoaded());
}

TEST_F(LibkpmAbs, ARefusedLoadCanBeFollowedByOneThatSucceeds) {
    mDouble.mFunctionListStatus = 1;
    EXPECT_THROW(mLibkpm.LIBKPM_LoadLibrary(), ZTCNotFoundEx);
    mDouble.mFunctionListStatus = 0;
    mLibkpm.LIBKPM_LoadLibrary();
    EXPECT_EQ(2u, mLibkpm.LIBKPM_GetNumberOfAdapters());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, FreeingUnloadsTheLibraryAndFreeingAgainDoesNothing) {
    mLibkpm.LIBKPM_LoadLibrary();
    mDouble.releaseModule();
    ASSERT_TRUE(ZTCAdaptersLibraryDouble::isModuleLoaded());
    mLibkpm.LIBKPM_FreeLibrary();
    EXPECT_FALSE(ZTCAdaptersLibraryDouble::isModuleLoaded());
    mLibkpm.LIBKPM_FreeLibrary();
    EXPECT_THROW(mLibkpm.LIBKPM_Close(), ZTCInvalidEx);
}

TEST_F(LibkpmAbs, FreeingAgainTakesTheLibraryFromNobodyElse) {
    mLibkpm.LIBKPM_LoadLibrary();
    mLibkpm.LIBKPM_FreeLibrary();
    mLibkpm.LIBKPM_FreeLibrary();
    EXPECT_TRUE(ZTCAdaptersLibraryDouble::isModuleLoaded()) << "the double has loaded it too";
}

TEST_F(LibkpmAbs, EveryOperationIsInvalidWhileNothingIsLoaded) {
    ZTCPointer<ZTCWorldWideName> lNode;
    ZTCPointer<ZTCWorldWideName> lPort;
    const ZTCPointer<ZTCWorldWideName> lName = sMakeName(makeWwn(1));
    const ZTCPointer<ZTCScopeEvent> lEvent(new ZTCScopeEvent(1, 1));
    unsigned lHandle = 77;
    const std::function<void()> lOperations[] = {
        [&] { mLibkpm.LIBKPM_Init(); },
        [&] { mLibkpm.LIBKPM_Close(); },
        [&] { mLibkpm.LIBKPM_GetNumberOfAdapters(); },
        [&] { mLibkpm.LIBKPM_IsZtapiSupported(); },
        [&] { mLibkpm.LIBKPM_GetAdapterInfo(0, lNode, lPort); },
        [&] { mLibkpm.LIBKPM_ZtapiRegEvent(0, lName, lEvent, nullptr, &lHandle, &sScopeCallback); },
        [&] { mLibkpm.LIBKPM_ZtapiUnregEvent(0, lName, 1); },
        [&] { mLibkpm.LIBKPM_KpmRegEvent(0, 1, nullptr, 168, &sEventCallback); },
        [&] { mLibkpm.LIBKPM_KpmUnregEvent(0, 1); },
    };
    for (const auto& lcrOperation : lOperations) {
        try {
            lcrOperation();
            ADD_FAILURE() << "no exception";
        } catch (const ZTCInvalidEx& lcrException) {
            EXPECT_STREQ("Libkpm is not loaded", lcrException.what());
        }
    }
    EXPECT_EQ(77u, lHandle);
    EXPECT_FALSE(lNode != nullptr);
}

TEST_F(LibkpmAbs, AFailedInitNamesTheOperationAndTheStatus) {
    mLibkpm.LIBKPM_LoadLibrary();
    mDouble.mInitStatus = 4711;
    try {
        mLibkpm.LIBKPM_Init();
        ADD_FAILURE() << "no exception";
    } catch (const ZTCLibkpmFailedEx& lcrException) {
        EXPECT_STREQ("LIBKPM_Init failed with status 4711", lcrException.what());
    }
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, FailedAdapterInfoNamesTheOperationTheAdapterAndTheStatusAndLeavesTheNames) {
    mLibkpm.LIBKPM_LoadLibrary();
    mDouble.mInfoStatuses[1] = 42;
    ZTCPointer<ZTCWorldWideName> lNode = sMakeName(makeWwn(1));
    ZTCPointer<ZTCWorldWideName> lPort = sMakeName(makeWwn(2));
    try {
        mLibkpm.LIBKPM_GetAdapterInfo(1, lNode, lPort);
        ADD_FAILURE() << "no exception";
    } catch (const ZTCLibkpmFailedEx& lcrException) {
        EXPECT_STREQ("LIBKPM_GetAdapterInfo failed for adapter 1 with status 42", lcrException.what());
    }
    EXPECT_STREQ("00:00:00:00:00:00:00:01", lNode->getString().get());
    EXPECT_STREQ("00:00:00:00:00:00:00:02", lPort->getString().get());
    mLibkpm.LIBKPM_FreeLibrary();
}

TEST_F(LibkpmAbs, EachOperationReachesTheFunctionOfItsName) {
    mLibkpm.LIBKPM_LoadLibrary();
    mLibkpm.LIBKPM_Init();
    EXPECT_EQ(2u, mLibkpm.LIBKPM_GetNumberOfAdapters());
    EXPECT_TRUE(mLibkpm.LIBKPM_IsZtapiSupported());
    mDouble.mIsZtapiSupported = 0;
    EXPECT_FALSE(mLibkpm.LIBKPM_IsZtapiSupported());

    ZTCPointer<ZTCWorldWideName> lNode;
    ZTCPointer<ZTCWorldWideName> lPort;
    mLibkpm.LIBKPM_GetAdapterInfo(1, lNode, lPort);
    EXPECT_EQ(wwnText(ZTCAdaptersLibraryDouble::nodeName(1)), lNode->getString().get());
    EXPECT_EQ(wwnText(ZTCAdaptersLibraryDouble::portName(1)), lPort->getString().get());

    int lContext = 0;
    unsigned lHandle = 9;
    mDouble.mRegisterStatuses[{1, 4, 0x40}] = 6;
    mDouble.mRegisterHandles[{1, 4, 0x40}] = 321;
    const ZTCPointer<ZTCScopeEvent> lEvent(new ZTCScopeEvent(4, 0x40));
    EXPECT_EQ(6u, mLibkpm.LIBKPM_ZtapiRegEvent(1, lPort, lEvent, &lContext, &lHandle, &sScopeCallback));
    EXPECT_EQ(321u, lHandle);
    EXPECT_EQ(&lContext, (mDouble.mContexts[{1, 4, 0x40}]));
    EXPECT_EQ(&sScopeCallback, (mDouble.mScopeCallbacks[{1, 4, 0x40}]));
    mDouble.mUnregisterStatuses[321] = 5;
    EXPECT_EQ(5u, mLibkpm.LIBKPM_ZtapiUnregEvent(1, lPort, 321));

    mDouble.mRegisterHandles[{1, 0, 0x20}] = 654;
    EXPECT_EQ(654u, mLibkpm.LIBKPM_KpmRegEvent(1, 0x20, reinterpret_cast<void*>(std::uintptr_t{0xFFFF}), 16,
                                               &sEventCallback));
    EXPECT_EQ(&sEventCallback, (mDouble.mEventCallbacks[{1, 0, 0x20}]));
    EXPECT_EQ(0u, mLibkpm.LIBKPM_KpmUnregEvent(1, 654));
    mLibkpm.LIBKPM_Close();
    EXPECT_EQ((std::vector<std::string>{
                  "KPM_GetFunctionList 1", "Init", "GetNumberOfAdapters", "IsZtapiSupported", "IsZtapiSupported",
                  "GetAdapterInfo 1", "ZtapiRegEvent board 1 port 10:00:00:00:c9:00:00:01 kind 4/64 preset 9",
                  "ZtapiUnregEvent board 1 port 10:00:00:00:c9:00:00:01 handle 321",
                  "KpmRegEvent board 1 type 32 context 65535 size 16", "KpmUnregEvent board 1 handle 654", "Close"}),
              mDouble.calls());
    mLibkpm.LIBKPM_FreeLibrary();
}
