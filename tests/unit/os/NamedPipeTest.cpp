#include "os/common/include/NamedPipe.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/os/NamedPipeTesting.h"

using std::chrono::milliseconds;

namespace {

using NamedPipe = ZTCNamedPipeFixture;

}  // namespace

TEST_F(NamedPipe, CreatingMakesAFifoForItsOwnerAlone) {
    const mode_t lMask = umask(0);
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    lPipe->create();
    umask(lMask);
    struct stat lStatus {};
    ASSERT_EQ(lstat(mPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode, static_cast<mode_t>(S_IFIFO | 0600));
    lPipe->destroy();
    EXPECT_FALSE(exists(mPath));
    EXPECT_NO_THROW(lPipe->destroy()) << "of a FIFO that is gone";
}

TEST_F(NamedPipe, CreatingTakesOverAFifoThatIsThere) {
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    lPipe->create();
    lPipe->open();
    lPipe->close();
    lPipe->destroy();
    EXPECT_FALSE(exists(mPath));
}

TEST_F(NamedPipe, CreatingRefusesAFileAndLeavesItUntouched) {
    writeFile(mPath, "precious");
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    try {
        lPipe->create();
        FAIL() << "a regular file was taken for a FIFO";
    } catch (const ZTCInvalidEx& acrException) {
        const std::string lText = acrException.what();
        EXPECT_NE(lText.find(mPath), std::string::npos) << lText;
        EXPECT_NE(lText.find("a regular file"), std::string::npos) << lText;
    }
    EXPECT_THROW(lPipe->open(), ZTCInvalidEx);
    lPipe->destroy();
    EXPECT_EQ(readFile(mPath), "precious");
    EXPECT_EQ(mLog.countMark("-W-"), 1u) << "destroying says what it leaves";
}

TEST_F(NamedPipe, CreatingRefusesALinkToAFifo) {
    const std::string lTarget = mDirectory.path("target.fifo");
    ASSERT_EQ(mkfifo(lTarget.c_str(), 0600), 0);
    ASSERT_EQ(symlink(lTarget.c_str(), mPath.c_str()), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    EXPECT_THROW(lPipe->create(), ZTCInvalidEx);
    EXPECT_THROW(lPipe->open(), ZTCInvalidEx);
    lPipe->destroy();
    EXPECT_TRUE(exists(mPath));
}

TEST_F(NamedPipe, CreatingWithoutADirectoryNamesThePath) {
    const std::string lPath = mDirectory.path("no/such.fifo");
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(lPath));
    try {
        lPipe->create();
        FAIL() << "a FIFO without a directory was made";
    } catch (const ZTCClibMkfifoFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find(lPath), std::string::npos);
    }
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
}

TEST_F(NamedPipe, AClientNeitherMakesNorRemovesTheFifo) {
    ZTCNamedPipe lPipe(pathText(mPath), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Client);
    EXPECT_THROW(lPipe.create(), ZTCClibOpenFailedEx);
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    lPipe.create();
    lPipe.open();
    lPipe.accept();
    lPipe.close();
    lPipe.destroy();
    EXPECT_TRUE(isFifo(mPath));
}

TEST_F(NamedPipe, OtherModesAreRefused) {
    for (const ZTEFileMode lMode : {ZTFM_None, ZTFM_ReadWrite, ZTFM_Append}) {
        ZTCNamedPipe lPipe(pathText(mPath), lMode, ZTNPS_NonBlock, ZTCM_Server);
        lPipe.create();
        EXPECT_THROW(lPipe.open(), ZTCNotImplementedEx);
    }
}

TEST_F(NamedPipe, ItIsOpenedOnceAndClosedAsOftenAsOneLikes) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    lPipe->create();
    lPipe->open();
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
    lPipe->close();
    lPipe->close();
    EXPECT_THROW(lPipe->waitForActivity(0u), ZTCClibReadFailedEx);
    EXPECT_NO_THROW(lPipe->open());
}

TEST_F(NamedPipe, TakingOverAFifoThatOthersMayOpenDrawsAWarning) {
    for (const auto& [lMode, lWarnings] :
         {std::pair<mode_t, unsigned>{0600, 0}, {0400, 0}, {0620, 1}, {0602, 1}, {0644, 1}}) {
        ZTCLogCapture lLog;
        ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
        ASSERT_EQ(chmod(mPath.c_str(), lMode), 0);
        ZTCNamedPipe lPipe(ZTCString(mPath.c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
        lPipe.create();
        EXPECT_EQ(lLog.countMark("-W-"), lWarnings) << lMode;
        lPipe.destroy();
    }
}

TEST_F(NamedPipe, AFifoOfItsOwnDrawsNoWarning) {
    ZTCLogCapture lLog;
    ZTCNamedPipe lPipe(ZTCString(mPath.c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
    lPipe.create();
    EXPECT_EQ(lLog.countMark("-W-"), 0u);
}

TEST_F(NamedPipe, OpeningForWritingWaitsForAReader) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    lPipe->create();
    ZTCTestThread lThread([&] { lPipe->open(); });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");
    mSensor = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    lThread.join();
    EXPECT_EQ(mLog.file().count("Waiting for a reader of '" + mPath + "'", "-N-"), 1u);
}

TEST_F(NamedPipe, TheStopEventEndsTheOpeningAsAnExitCondition) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    lPipe->create();
    unsigned lCode = 0;
    ZTCTestThread lThread([&] {
        try {
            lPipe->open();
        } catch (const ZTCExitConditionEx& acrException) {
            lCode = acrException.getError();
        }
    });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");
    getStopEvent().raise();
    lThread.join();
    EXPECT_EQ(lCode, 19u);
    EXPECT_TRUE(isFifo(mPath));
}

TEST_F(NamedPipe, OpeningForWritingWithoutWaitingNeedsAReaderAtOnce) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath, ZTNPS_NonBlock));
    lPipe->create();
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
    mSensor = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    EXPECT_NO_THROW(lPipe->open());
}

TEST_F(NamedPipe, OpeningForWritingDoesNotWaitForAFifoThatWasReplaced) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    lPipe->create();
    ZTCTestThread lThread([&] { EXPECT_THROW(lPipe->open(), ZTCInvalidEx); });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");

    // Opening a socket fails in the same way as opening a FIFO without a reader.
    struct sockaddr_un lAddress {};
    lAddress.sun_family = AF_UNIX;
    ASSERT_LT(mPath.size() + 4, sizeof(lAddress.sun_path));
    std::strcpy(lAddress.sun_path, (mPath + ".new").c_str());
    const int lSocket = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    ASSERT_EQ(bind(lSocket, reinterpret_cast<struct sockaddr*>(&lAddress), sizeof(lAddress)), 0);
    ASSERT_EQ(rename((mPath + ".new").c_str(), mPath.c_str()), 0);
    lThread.join();
    close(lSocket);
}
