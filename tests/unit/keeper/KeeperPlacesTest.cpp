#include "sensor/keeper/include/KeeperPlaces.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/link/include/Inheritance.h"
#include "tests/support/TemporaryDirectory.h"

class KeeperPlaces : public testing::Test {
protected:
    KeeperPlaces() {
        for (const char* lpName : {"sbin", "own", "libexec/tavik", "path"}) {
            std::filesystem::create_directories(mDirectory.path(lpName));
        }
        setenv("PATH", ("relative::" + mDirectory.path("path")).c_str(), 1);
    }
    ~KeeperPlaces() override { setenv("PATH", mPath.c_str(), 1); }

    void makeProgram(const std::string& acrName, mode_t aMode = 0755) const {
        writeFile(mDirectory.path(acrName), "#!/bin/sh\n");
        chmod(mDirectory.path(acrName).c_str(), aMode);
    }
    std::string findAgent() const {
        return std::filesystem::weakly_canonical(findAgentProgram("qrv-tvk", mDirectory.path("own")));
    }
    static unsigned modeOf(const std::string& acrPath) {
        struct stat lStatus {};
        return stat(acrPath.c_str(), &lStatus) == 0 ? lStatus.st_mode & 07777U : 0;
    }

    const ZTCTemporaryDirectory mDirectory;
    const std::string mPath = std::getenv("PATH");
};

TEST_F(KeeperPlaces, TheAgentIsBesideTheSensorElseInSbinElseInPath) {
    EXPECT_THROW(findAgent(), ZTCBadInputEx);
    makeProgram("path/qrv-tvk");
    EXPECT_EQ(findAgent(), mDirectory.path("path/qrv-tvk"));
    makeProgram("sbin/qrv-tvk");
    EXPECT_EQ(findAgent(), mDirectory.path("sbin/qrv-tvk"));
    makeProgram("own/qrv-tvk", 0644);
    EXPECT_EQ(findAgent(), mDirectory.path("sbin/qrv-tvk")) << "what nobody may execute is no program";
    makeProgram("own/qrv-tvk");
    EXPECT_EQ(findAgent(), mDirectory.path("own/qrv-tvk"));
    EXPECT_EQ(findAgentProgram("/x/y", mDirectory.path("own")), "/x/y");
}

TEST_F(KeeperPlaces, AMissingProgramIsNamedWithThePlacesThatWereSearched) {
    try {
        findCollectorProgram(mDirectory.path("own"));
        ADD_FAILURE();
    } catch (const ZTCBadInputEx& lcrEx) {
        EXPECT_EQ(lcrEx.what(), "no program tavik-collector in " + mDirectory.path("own") + ", " +
                                    mDirectory.path("own/../libexec/tavik"));
    }
    makeProgram("libexec/tavik/tavik-collector");
    EXPECT_EQ(findCollectorProgram(mDirectory.path("own")), mDirectory.path("own/../libexec/tavik/tavik-collector"));
}

TEST_F(KeeperPlaces, DirectoriesAreMadeAndTheAgentsIsClosedToOthers) {
    ZTSSettings lSettings = defaultSettings();
    lSettings.mSensorDirectory = mDirectory.path("a/b/run");
    lSettings.mSensorState = mDirectory.path("c/state");
    makeDirectories(lSettings);
    EXPECT_EQ(modeOf(lSettings.agentDirectory()), 0700U);
    ASSERT_EQ(chmod(lSettings.agentDirectory().c_str(), 0755), 0);
    makeDirectories(lSettings);
    EXPECT_EQ(modeOf(lSettings.agentDirectory()), 0700U);
    ASSERT_EQ(rmdir(lSettings.agentDirectory().c_str()), 0);
    writeFile(lSettings.agentDirectory(), "");
    EXPECT_THROW(makeDirectories(lSettings), ZTCSystemCallEx);
}

TEST_F(KeeperPlaces, TheModesOfMadeDirectoriesAreExactWhateverTheUmaskIs) {
    for (const mode_t lUmask : {0077U, 0027U, 0000U}) {
        const std::string lPlace = mDirectory.path("umask" + std::to_string(lUmask));
        ZTSSettings lSettings = defaultSettings();
        lSettings.mSensorDirectory = lPlace + "/above/run";
        lSettings.mSensorState = lPlace + "/state";
        const mode_t lFormer = umask(lUmask);
        makeDirectories(lSettings);
        EXPECT_EQ(umask(lFormer), lUmask) << "it is as before";
        EXPECT_EQ(modeOf(lPlace), 0755U);
        EXPECT_EQ(modeOf(lPlace + "/above"), 0755U);
        EXPECT_EQ(modeOf(lSettings.mSensorDirectory), 0755U);
        EXPECT_EQ(modeOf(lSettings.agentDirectory()), 0700U);
        EXPECT_EQ(modeOf(lSettings.mSensorState), 0750U);
    }
}

TEST_F(KeeperPlaces, DirectoriesThatWereThereKeepTheirModes) {
    ZTSSettings lSettings = defaultSettings();
    lSettings.mSensorDirectory = mDirectory.path("above/run");
    lSettings.mSensorState = mDirectory.path("above/state");
    for (const std::string& lrPath : {mDirectory.path("above"), lSettings.mSensorDirectory, lSettings.mSensorState}) {
        ASSERT_EQ(mkdir(lrPath.c_str(), 0700), 0);
    }
    makeDirectories(lSettings);
    EXPECT_EQ(modeOf(mDirectory.path("above")), 0700U);
    EXPECT_EQ(modeOf(lSettings.mSensorDirectory), 0700U);
    EXPECT_EQ(modeOf(lSettings.mSensorState), 0700U);
}

TEST_F(KeeperPlaces, ADirectoryThatCannotBeMadeIsNamed) {
    writeFile(mDirectory.path("file"), "");
    ZTSSettings lSettings = defaultSettings();
    lSettings.mSensorDirectory = mDirectory.path("file/run");
    try {
        makeDirectories(lSettings);
        ADD_FAILURE();
    } catch (const ZTCSystemCallEx& lcrEx) {
        EXPECT_THAT(lcrEx.what(), testing::StartsWith("cannot make the directory " + mDirectory.path("file/run")));
    }
}

TEST_F(KeeperPlaces, TheControlSocketTakesTheOldOnesPlaceAndIsForOwnerAndGroup) {
    const std::string lPath = mDirectory.path("control");
    { const ZTCFileDescriptor lOld = openControlSocket(lPath); }
    const ZTCFileDescriptor lSocket = openControlSocket(lPath);
    EXPECT_EQ(modeOf(lPath), 0660U);
    EXPECT_NE(fcntl(lSocket.get(), F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_THROW(openControlSocket(mDirectory.path("missing/control")), ZTCSystemCallEx);
    EXPECT_THROW(openControlSocket("/" + std::string(200, 'x')), ZTCBadInputEx);
}

TEST_F(KeeperPlaces, EachResponseFifoIsANewOne) {
    const std::string lPath = mDirectory.path("fifo");
    const ZTCFileDescriptor lFirst = makeResponseFifo(lPath);
    const ZTCFileDescriptor lSecond = makeResponseFifo(lPath);
    EXPECT_FALSE(lFirst.isAtPath(lPath.c_str()));
    EXPECT_TRUE(lSecond.isAtPath(lPath.c_str()));
    EXPECT_TRUE(isFifo(lPath));
    EXPECT_EQ(modeOf(lPath), 0600U);
    EXPECT_GE(fcntl(lSecond.get(), F_GETPIPE_SZ), 65536);
}

TEST_F(KeeperPlaces, HostNamesAreThoseOfTheSysfsThatTheVariableNames) {
    setenv("TAVIK_SYSFS_ROOT", mDirectory.path().c_str(), 1);
    EXPECT_THAT(listHostNames(), testing::IsEmpty());
    std::filesystem::create_directories(mDirectory.path("class/fc_host/host7"));
    std::filesystem::create_directories(mDirectory.path("class/fc_host/host8"));
    EXPECT_THAT(listHostNames(), testing::ElementsAre("host7", "host8"));
    unsetenv("TAVIK_SYSFS_ROOT");
}

TEST_F(KeeperPlaces, ATextFileHoldsItsText) {
    const std::string lText(100000, 't');
    EXPECT_EQ(readWhole(makeTextFile(lText)), lText);
    EXPECT_EQ(readWhole(makeTextFile("")), "");
}
