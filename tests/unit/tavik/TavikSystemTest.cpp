#include "tavik/include/TavikSystem.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstring>
#include <iostream>
#include <regex>
#include <sstream>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/NamedPipeReaderServer.h"
#include "os/common/include/NamedPipeWriterServer.h"
#include "os/common/include/ProcessEvents.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikCommandHandler.h"
#include "tavik/include/TavikHeartbeatHandler.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class TavikSystem : public ZTCTavikFixture {
protected:
    std::string help() {
        std::ostringstream lOutput;
        std::streambuf* const lpFormer = std::cout.rdbuf(lOutput.rdbuf());
        mSystem->displayHelp();
        std::cout.rdbuf(lpFormer);
        return lOutput.str();
    }

    std::string pathsAfterPreInit(const char* apInstallDir) {
        setenv("ZT_QRV_SENSOR_DIR", apInstallDir, 1);
        ZTCTestTavikSystem lSystem;
        lSystem.preInit();
        return std::string(lSystem.getInstallDir().get()) + " " + lSystem.getTvkCmdIpcPath().get() + " " +
               lSystem.getTvkOutIpcPath().get() + " " + lSystem.getPidFilePathStr().get();
    }
};

}  // namespace

TEST_F(TavikSystem, ConstructionZeroesEverything) {
    EXPECT_STREQ("qrv-tvk", mSystem->getName().get());
    EXPECT_EQ(0u, mSystem->getMaxEventDataSize());
    EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
    EXPECT_FALSE(mSystem->isTotalLimitOnScopeDataReached());
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(0u, mSystem->pendingBoard());
    EXPECT_EQ(0u, mSystem->getNumRecordLists());
    EXPECT_EQ(0u, mSystem->getInitiators().size());
    EXPECT_FALSE(mSystem->isFcInitiatorExist(0));
    EXPECT_FALSE(mSystem->hasRecordList(0));
    EXPECT_STREQ("", mSystem->getTvkCmdIpcPath().get());
    EXPECT_STREQ("", mSystem->getTvkOutIpcPath().get());
    EXPECT_FALSE(mSystem->getLibkpmAbs() != nullptr);
    EXPECT_FALSE(mSystem->getEventCatalogue() != nullptr);
    EXPECT_FALSE(mSystem->getProtocolHandler() != nullptr);
    EXPECT_FALSE(mDoScopeCollection);
    EXPECT_THROW(mSystem->getFcInitiator(0), ZTCNotFoundEx);
}

TEST_F(TavikSystem, ItsFieldsAreDeclaredInTheirOrder) {
    const std::string lHeader = readFile(TAVIK_SOURCE_ROOT "/tavik/include/TavikSystem.h");
    const std::string lPrivate = lHeader.substr(lHeader.find("void filePrevScopeRecord()"));
    const std::regex lField(R"(\n    (?:\[\[maybe_unused\]\] )?[\w:<>, ]+ (m[A-Z]\w*)(?: ZT_GUARDED_BY\(\w+\))?;)");
    std::vector<std::string> lFields;
    for (std::sregex_iterator lMatch(lPrivate.begin(), lPrivate.end(), lField), lcEnd; lMatch != lcEnd; ++lMatch) {
        lFields.push_back((*lMatch)[1]);
    }
    EXPECT_EQ((std::vector<std::string>{"mMaxScopeEventDataSize",
                                        "mMaxTotalEventDataSize",
                                        "mLibkpmAbs",
                                        "mInitiatorsMap",
                                        "mTargetsMap",
                                        "mRecordsMap",
                                        "mProtocolHandler",
                                        "mEventCatalogue",
                                        "mPrevScopeDataSet",
                                        "mPrevScopeData",
                                        "mTargetsWwpnMap",
                                        "mPrevPortName",
                                        "mTotalEventDataSize",
                                        "mPrevBoardId",
                                        "mPrevScopeRecord",
                                        "mPrevDataLock",
                                        "mTvkCmdIpcPath",
                                        "mTvkOutIpcPath",
                                        "mTargetIndex",
                                        "mStatusPage"}),
              lFields);
}

TEST_F(TavikSystem, ThePipePathsCanBeSet) {
    mSystem->setTvkCmdIpcPath(ZTCString("/a"));
    mSystem->setTvkOutIpcPath(ZTCString("/b"));
    EXPECT_STREQ("/a", mSystem->getTvkCmdIpcPath().get());
    EXPECT_STREQ("/b", mSystem->getTvkOutIpcPath().get());
}

TEST_F(TavikSystem, PathsAreTheInstallDirectoryAndTheNames) {
    EXPECT_EQ("/var/x /var/x/qrvtvkcmd.fifo /var/x/qrvtvkout.fifo /var/x/qrv-tvk.pid", pathsAfterPreInit("/var/x"));
}

TEST_F(TavikSystem, ATrailingSlashStays) {
    EXPECT_EQ("/var/x/ /var/x//qrvtvkcmd.fifo /var/x//qrvtvkout.fifo /var/x//qrv-tvk.pid",
              pathsAfterPreInit("/var/x/"));
}

TEST_F(TavikSystem, AnEmptyInstallDirectoryIsAccepted) {
    EXPECT_EQ(" /qrvtvkcmd.fifo /qrvtvkout.fifo /qrv-tvk.pid", pathsAfterPreInit(""));
}

TEST_F(TavikSystem, AnUnsetInstallDirectoryEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            unsetenv("ZT_QRV_SENSOR_DIR");
            mSystem->preInit();
        },
        testing::ExitedWithCode(1), failedAssertion("pQrvSensorDir!=NULL"));
}

TEST_F(TavikSystem, PreInitSetsTheDefaults) {
    setLogCode(255);
    setHbTimeout(1);
    mSystem->preInit();
    unsigned lLogCode = 0;
    getLogCode(lLogCode);
    EXPECT_EQ(63u, lLogCode);
    unsigned lTimeout = 0;
    getHbTimeout(lTimeout);
    EXPECT_EQ(240u, lTimeout);
    EXPECT_STREQ("/tmp", gRtDir);
    EXPECT_STREQ("3.0.1.2", mSystem->getVersion().get());
    EXPECT_EQ(-1, mSystem->getInstanceManager()->getProcessId());
    EXPECT_FALSE(exists(pidFilePath())) << "nothing is marked as running yet";
}

TEST_F(TavikSystem, ARuntimeDirectoryThatExistsIsAWarning) {
    mSystem->preInit();
    EXPECT_EQ(std::vector<std::string>{"-W- '/tmp' already exists... continuing"}, mLog.texts());
    EXPECT_EQ(".//TavikSystem", mLog.lines().at(0).mLabel);
    EXPECT_EQ("sCreateRtdir", mLog.lines().at(0).mFunction);
}

TEST_F(TavikSystem, TheRuntimeDirectoryIsTriedBeforeTheWarning) {
    setLogCode(255);
    mSystem->preInit();
    EXPECT_TRUE(mLog.has("-I- Performing Tavik system initialization"));
    EXPECT_FALSE(mLog.has("-T- Trying to create '/tmp'")) << "the log code is back at its default by then";
}

TEST_F(TavikSystem, InitSaysItsStepsInOrder) {
    mSystem->preInit();
    setLogCode(127);
    mLog.forget();
    mkfifo(responseFifoPath().c_str(), 0600);
    // Told to stop, the wait for a reader of the response pipe ends: what comes before it has been done.
    getStopEvent().raise();
    EXPECT_THROW(mSystem->init(), ZTCExitConditionEx);
    const std::vector<std::string> lTexts = mLog.texts("-I-", ".//TavikSystem");
    EXPECT_EQ((std::vector<std::string>{"-I- Performing Tavik system data initialization",
                                        "-I- Creating HeartbeatHandler Conditional...",
                                        "-I- Creating CommandHandler Conditional...", "-I- Creating Output IPC..."}),
              lTexts);
    EXPECT_FALSE(mSystem->getProtocolHandler() != nullptr);
    EXPECT_EQ(0u, mSystem->threadComponents().numberOfElements());
}

TEST_F(TavikSystem, TheSlotsAreFixedWhateverTheAdapters) {
    for (const unsigned lAdapters : {1u, 3u}) {
        mSystem = std::make_unique<ZTCTestTavikSystem>();
        setSystemObject(mSystem.get());
        unlink(responseFifoPath().c_str());
        bringUp(lAdapters);
        EXPECT_EQ(2u, mSystem->conditionals().numberOfElements());
        ASSERT_EQ(1u, mSystem->readers().numberOfElements());
        ASSERT_EQ(1u, mSystem->writers().numberOfElements());
        EXPECT_NE(nullptr, dynamic_cast<ZTCNamedPipeReaderServer*>(mSystem->getReader(0).get()));
        EXPECT_NE(nullptr, dynamic_cast<ZTCNamedPipeWriterServer*>(mSystem->getWriter(0).get()));
        ASSERT_EQ(2u, mSystem->threadComponents().numberOfElements());
        auto* const lpHeartbeat = dynamic_cast<ZTCTavikHeartbeatHandler*>(mSystem->threadComponents().get(0).get());
        ASSERT_NE(nullptr, lpHeartbeat);
        EXPECT_STREQ("TavikHeartbeatThread", lpHeartbeat->getName().get());
        EXPECT_EQ(&TavikHeartbeatThread, lpHeartbeat->getProcedure());
        EXPECT_EQ(240u, lpHeartbeat->getWaitTime());
        auto* const lpCommands = dynamic_cast<ZTCTavikCommandHandler*>(mSystem->threadComponents().get(1).get());
        ASSERT_NE(nullptr, lpCommands);
        EXPECT_STREQ("TavikCommandHandler", lpCommands->getName().get());
        EXPECT_EQ(&CommandHandlerThreadProcedure, lpCommands->getProcedure());
        EXPECT_EQ(3u, lpCommands->getWaitTime());
        EXPECT_EQ(lAdapters, mSystem->getNumRecordLists());
    }
}

TEST_F(TavikSystem, TheHeartbeatThreadGetsTheTimeoutThatIsSetByThen) {
    mSystem->preInit();
    setHbTimeout(77);
    setLogCode(ZTLL_Notice);
    mLog.forget();
    // bringUp would call preInit again, which sets the default.
    mkfifo(responseFifoPath().c_str(), 0600);
    const ZTCPointer<ZTCNamedPipeReaderServer> lReader(
        new ZTCNamedPipeReaderServer(ZTCString(responseFifoPath().c_str()), ZTNPS_NonBlock));
    lReader->open();
    mSystem->init();
    EXPECT_TRUE(mLog.has("-N- Creating the Heartbeat Handler Thread object...Timeout = 77"));
    EXPECT_EQ(77u, dynamic_cast<ZTCTavikHeartbeatHandler&>(*mSystem->threadComponents().get(0)).getWaitTime());
}

TEST_F(TavikSystem, InitWithoutASystemObjectEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            setSystemObject(nullptr);
            bringUp();
        },
        testing::ExitedWithCode(1), failedAssertion("lpSystem != __null"));
}

TEST_F(TavikSystem, AnInstallDirectoryThatCannotBeLookedAtIsLeftToThoseWhoUseIt) {
    // Without a library init ends right behind its look at the directory.
    setenv("ZT_LIBKPM_PATH", "", 1);
    for (const std::string& lcrDirectory : {std::string(), mDirectory.path("missing")}) {
        setenv("ZT_QRV_SENSOR_DIR", lcrDirectory.c_str(), 1);
        ZTCTestTavikSystem lSystem;
        lSystem.preInit();
        EXPECT_THROW(lSystem.init(), ZTCExitConditionEx) << '"' << lcrDirectory << '"';
    }
}

TEST_F(TavikSystem, InitMakesTheFifosAndDestroyRemovesThem) {
    bringUp();
    EXPECT_TRUE(isFifo(commandFifoPath()));
    EXPECT_TRUE(isFifo(responseFifoPath()));
    setLogCode(255);
    mSystem->destroy();
    EXPECT_FALSE(exists(commandFifoPath()));
    EXPECT_FALSE(exists(responseFifoPath()));
    EXPECT_EQ((std::vector<std::string>{"-I- Closing and Destroying Command Pipe...",
                                        "-I- Closing and Destroying Output Pipe..."}),
              mLog.texts("-I-", ".//TavikSystem"));
    EXPECT_TRUE(mLog.has("-T- Performing common system data destruction"));
    EXPECT_TRUE(mLibrary.calls().empty()) << "the library is not closed";
    mSystem->postDestroy();
    EXPECT_TRUE(mLog.has("-T- Performing common system destruction"));
}

TEST_F(TavikSystem, TheOptionsStandInTheirOrderZeroFilled) {
    setLogCode(ZTLL_Info);
    mSystem->setCmdLineArgDescs();
    EXPECT_EQ(std::vector<std::string>{"-I- Setting Command line argument descs"}, mLog.texts());
    const struct {
        const char* mpIdentifier;
        ZTECommandLineArgumentType mType;
    } lExpected[] = {{"-h", ZTCLAT_OptionOnly},  {"-v", ZTCLAT_OptionOnly},  {"-s", ZTCLAT_OptionOnly},
                     {"-D", ZTCLAT_OptionValue}, {"-l", ZTCLAT_OptionValue}, {"-d", ZTCLAT_OptionValue},
                     {"-c", ZTCLAT_OptionValue}, {"-S", ZTCLAT_OptionOnly},  {"-b", ZTCLAT_OptionValue}};
    ASSERT_EQ(std::size(lExpected), mSystem->options().numberOfElements());
    for (unsigned lOption = 0; lOption < std::size(lExpected); ++lOption) {
        const ZTSCommandLineArgumentDesc& lcrDesc = mSystem->options().get(lOption);
        EXPECT_EQ(lExpected[lOption].mType, lcrDesc.type);
        char lIdentifier[128] = {};
        std::memcpy(lIdentifier, lExpected[lOption].mpIdentifier, 2);
        static_assert(sizeof lcrDesc.identifier == sizeof lIdentifier);
        EXPECT_EQ(0, std::memcmp(lIdentifier, lcrDesc.identifier, sizeof lIdentifier))
            << lExpected[lOption].mpIdentifier;
    }
}

TEST_F(TavikSystem, TheHelpShowsTheDefaults) {
    mSystem->preInit();
    EXPECT_EQ(
        "qrv-tvk -[hvsDldc] VALUE\n"
        "  -h             : Shows this help\n"
        "  -v             : Prints version\n"
        "  -s             : Shut down running Tavik\n"
        "  -D true|false  : Run as daemon (default: true)\n"
        "  -d {number}    : Debug level - OR of numbers from 0-7 (default: 63)\n"
        "  -c {filename}  : Specify config file (default: )\n"
        "  -S             : Run Tavik in Sniffer Mode\n"
        "  -b {number}    : Heartbeat Timeout (default: 240)\n",
        help());
}

TEST_F(TavikSystem, TheHelpShowsWhatIsSetNow) {
    setLogCode(0);
    setHbTimeout(4294967295u);
    mSystem->setConfFilePathStr(ZTCString("/etc/x.conf"));
    const std::string lHelp = help();
    EXPECT_NE(std::string::npos, lHelp.find("from 0-7 (default: 0)\n"));
    EXPECT_NE(std::string::npos, lHelp.find("config file (default: /etc/x.conf)\n"));
    EXPECT_NE(std::string::npos, lHelp.find("Timeout (default: 4294967295)\n"));
}

TEST_F(TavikSystem, HelpAndVersionEndTheProcessWithStatusZero) {
    EXPECT_EXIT(
        {
            prepareToDie();
            mSystem->displayHelpAndExit();
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EXIT(
        {
            prepareToDie();
            std::cout.rdbuf(std::cerr.rdbuf());
            mSystem->preInit();
            mSystem->displayVersionAndExit();
        },
        testing::ExitedWithCode(0), "(^|\n)qrv-tvk v3\\.0\\.1\\.2\n");
}

TEST_F(TavikSystem, AConfigurationFileIsNotImplemented) {
    try {
        mSystem->processConfigFile(ZTCString("/etc/qrv-tvk.conf"));
        ADD_FAILURE() << "no exception";
    } catch (const ZTCNotImplementedEx& lcrException) {
        EXPECT_STREQ("Not Implemented", lcrException.what());
        EXPECT_EQ(13u, lcrException.getError());
    }
}
