/// What the keeper does at its start, with its files, and in an orderly stop.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>

#include "sensor/client/include/FileDescriptor.h"
#include "tests/sensor/KeeperProcess.h"

using testing::AllOf;
using testing::Each;
using testing::HasSubstr;
using testing::Not;

static unsigned sMode(const std::string& acrPath) {
    struct stat lStatus {};
    return stat(acrPath.c_str(), &lStatus) == 0 ? lStatus.st_mode & 0777U : 0;
}

/// What the descriptors of a process lead to.
static std::vector<std::string> sOpenFiles(pid_t aPid) {
    std::vector<std::string> lFiles;
    for (const auto& lcrEntry : std::filesystem::directory_iterator("/proc/" + std::to_string(aPid) + "/fd")) {
        std::error_code lError;
        lFiles.push_back(std::filesystem::read_symlink(lcrEntry.path(), lError));
    }
    return lFiles;
}

static std::string sEnvironment(pid_t aPid) {
    std::string lText = readFile("/proc/" + std::to_string(aPid) + "/environ");
    std::replace(lText.begin(), lText.end(), '\0', '\n');
    return lText;
}

/// The service manager's socket: what a sensor that is launched with it says there.
class ZTCNotifications {
public:
    explicit ZTCNotifications(ZTCKeeperProcess& arSensor)
        : mSocket(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0)) {
        const std::string lPath = arSensor.path("notify");
        sockaddr_un lAddress{};
        lAddress.sun_family = AF_UNIX;
        EXPECT_LT(lPath.size(), sizeof(lAddress.sun_path));
        lPath.copy(lAddress.sun_path, sizeof(lAddress.sun_path) - 1);
        EXPECT_EQ(bind(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)), 0);
        arSensor.setEnvironment("NOTIFY_SOCKET", lPath);
    }

    /// Waits until this was said since the beginning, or since the last call of forget().
    void waitFor(const std::string& acrWanted) {
        waitUntil(
            [&] {
                char lBytes[4096];
                ssize_t lRead;
                while ((lRead = recv(mSocket.get(), lBytes, sizeof(lBytes), 0)) > 0) {
                    mText.append(lBytes, static_cast<std::size_t>(lRead)).append("\n");
                }
                return mText.find(acrWanted) != std::string::npos;
            },
            "the notification " + acrWanted);
    }
    void forget() { mText.clear(); }

private:
    const ZTCFileDescriptor mSocket;
    std::string mText;
};

TEST(KeeperStart, MakesItsFilesWithTheirModesAndStopsInOrder) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    EXPECT_EQ(sMode(lSensor.agentFolder()), 0700U);
    EXPECT_EQ(sMode(lSensor.path("run/control")), 0660U);
    EXPECT_EQ(sMode(lSensor.agentFolder() + "/qrvtvkout.fifo"), 0600U);
    EXPECT_EQ(readFile(lSensor.agentFolder() + "/qrv-sn.pid"), std::to_string(lSensor.process().getPid()) + "\n");
    const pid_t lAgent = lSensor.agentPid();
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
    waitForEnd(lAgent);
    EXPECT_EQ(lSensor.count("Finished"), 1U);
    EXPECT_EQ(lSensor.count("AgentEnded 1 status=0"), 1U);
    EXPECT_FALSE(exists(lSensor.agentFolder() + "/qrv-sn.pid"));
    EXPECT_FALSE(exists(lSensor.path("run/control")));
}

TEST(KeeperStart, SigintStopsInOrderToo) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    lSensor.process().sendSignal(SIGINT);
    EXPECT_EQ(lSensor.waitForExit(), 0);
    EXPECT_EQ(lSensor.count("Finished"), 1U);
}

TEST(KeeperStart, AgentAndCollectorGetWhatTheyNeedAndNothingElse) {
    ZTCKeeperProcess lSensor;
    lSensor.setEnvironment("NOTIFY_SOCKET", lSensor.path("notify"));
    lSensor.setEnvironment("WATCHDOG_USEC", "60000000");
    lSensor.setEnvironment("KEPT", "yes");
    lSensor.startAndWait();
    const std::string lAgent = sEnvironment(lSensor.agentPid());
    EXPECT_THAT(lAgent,
                AllOf(HasSubstr("ZT_QRV_SENSOR_DIR=" + lSensor.agentFolder() + "\n"), HasSubstr("KEPT=yes\n"),
                      HasSubstr("ZT_TVK_STATUS_PAGE=" + lSensor.agentFolder() + "/page."), HasSubstr("ZT_TVK_BELL_FD="),
                      Not(HasSubstr("NOTIFY_SOCKET")), Not(HasSubstr("WATCHDOG_USEC"))));
    EXPECT_THAT(sEnvironment(lSensor.collectorPid()), AllOf(Not(HasSubstr("NOTIFY_SOCKET")), HasSubstr("KEPT=yes\n")));
    EXPECT_THAT(sOpenFiles(lSensor.agentPid()),
                Each(AllOf(Not(HasSubstr("qrv-sn.")), Not(HasSubstr("control")), Not(HasSubstr("tavik-settings")),
                           Not(HasSubstr("pidfd")), Not(HasSubstr("timerfd")))));
    EXPECT_THAT(sOpenFiles(lSensor.collectorPid()),
                Each(AllOf(Not(HasSubstr("qrv-sn.")), Not(HasSubstr("pidfd")), Not(HasSubstr("signalfd")))));
    const std::string lStatus = readFile("/proc/" + std::to_string(lSensor.collectorPid()) + "/status");
    for (const char* lpSet : {"CapInh", "CapPrm", "CapEff", "CapAmb"}) {
        EXPECT_THAT(lStatus, HasSubstr(std::string(lpSet) + ":\t0000000000000000\n"));
    }
    EXPECT_THAT(lStatus, HasSubstr("NoNewPrivs:\t1\n"));
}

TEST(KeeperStart, TellsTheServiceManagerThatItIsReadyAliveAndStopping) {
    ZTCKeeperProcess lSensor;
    ZTCNotifications lSaid(lSensor);
    lSensor.setEnvironment("WATCHDOG_USEC", "60000000");
    lSensor.launch();
    lSaid.waitFor("READY=1\n");
    lSaid.waitFor("WATCHDOG=1\n");
    lSaid.waitFor("STATUS=running\n");
    lSensor.process().sendSignal(SIGTERM);
    lSaid.waitFor("STOPPING=1\n");
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperStart, TellsTheServiceManagerWhenAReloadBeginsAndEndsWhateverTheFile) {
    ZTCKeeperProcess lSensor;
    ZTCNotifications lSaid(lSensor);
    lSensor.launch();
    lSaid.waitFor("READY=1\n");
    for (const char* lpSettings : {"collect.period = 2\n", "collect.period = 0\n"}) {
        SCOPED_TRACE(lpSettings);
        lSaid.forget();
        lSensor.configure(lpSettings);
        lSensor.process().sendSignal(SIGHUP);
        lSaid.waitFor("RELOADING=1\nMONOTONIC_USEC=");
        lSaid.waitFor("READY=1\n");
    }
    lSensor.waitFor("StartAnswered ");  // an agent that does not listen yet cannot be asked to end
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperStart, ASecondSensorNamesTheFirstAndEndsWith1) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    std::string lError;
    EXPECT_EQ(lSensor.run({"--config", lSensor.configPath()}, &lError), 1);
    EXPECT_THAT(lError, HasSubstr("process " + std::to_string(lSensor.process().getPid())));
    EXPECT_TRUE(exists(lSensor.path("run/control")));
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}

TEST(KeeperStart, TavikctlNamesARunningSensorAtOnce) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = TAVIKCTL_PROGRAM;
    lSetup.mArguments = {"--dir", lSensor.agentFolder(), "--timeout", "3600", "get"};
    lSetup.mWorkingDirectory = lSensor.path("");
    lSetup.mOutputPrefix = lSensor.path("tavikctl");
    ZTCChildProcess lTool(lSetup);
    EXPECT_EQ(lTool.waitForExit(), 3);
    EXPECT_THAT(lTool.standardError(),
                HasSubstr("a sensor runs, process " + std::to_string(lSensor.process().getPid())));
}

TEST(KeeperStart, CheckAndABadStartReportEachErrorAndEndWith2) {
    ZTCKeeperProcess lSensor;
    std::string lError;
    EXPECT_EQ(lSensor.run({"--config", lSensor.configPath(), "--check"}, &lError), 0);
    EXPECT_EQ(lError, "");
    writeFile(lSensor.configPath(), "collect.period = 0\nagent.colour = 1\n");
    for (const std::vector<std::string>& lcrArguments :
         {std::vector<std::string>{"--config", lSensor.configPath(), "--check"}, {"--config", lSensor.configPath()}}) {
        EXPECT_EQ(lSensor.run(lcrArguments, &lError), 2);
        EXPECT_THAT(lError, HasSubstr(lSensor.configPath() + ":1: collect.period: out of range: 0, must be "));
        EXPECT_THAT(lError, HasSubstr(lSensor.configPath() + ":2: agent.colour: unknown key: 1, must be "));
    }
    EXPECT_FALSE(exists(lSensor.path("run")));
}

TEST(KeeperStart, WrongUseIs2InOneLine) {
    ZTCKeeperProcess lSensor;
    std::string lError;
    EXPECT_EQ(lSensor.run({"--colour"}, &lError), 2);
    EXPECT_EQ(std::count(lError.begin(), lError.end(), '\n'), 1);
    EXPECT_EQ(lSensor.run({"--version"}), 0);
}

TEST(KeeperStart, AReloadGivesTheCollectorTheNewTextAndABadFileChangesNothing) {
    ZTCKeeperProcess lSensor;
    lSensor.startAndWait();
    lSensor.configure("collect.period = 0\n");
    lSensor.process().sendSignal(SIGHUP);
    lSensor.waitForMessage("the settings stay as they were");
    EXPECT_THAT(lSensor.standardError(), HasSubstr("collect.period: out of range: 0"));
    EXPECT_EQ(lSensor.count("Reload"), 0U);
    lSensor.configure("collect.period = 2\nagent.log_level = 1\n");
    lSensor.process().sendSignal(SIGHUP);
    EXPECT_EQ(lSensor.waitFor("Reload"), "Reload " + std::to_string(readFile(lSensor.configPath()).size()));
    EXPECT_THAT(lSensor.standardError(), AllOf(HasSubstr("collect.period has changed\n"),
                                               HasSubstr("agent.log_level has changed; it takes effect at the agent's "
                                                         "next start")));
    lSensor.process().sendSignal(SIGTERM);
    EXPECT_EQ(lSensor.waitForExit(), 0);
}
