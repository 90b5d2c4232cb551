// The agent with the library over the kernel's FC transport, found under the name of its default library, on a sysfs
// tree of the test's own and without any rights.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "tests/support/AgentProcess.h"
#include "tests/support/Waiting.h"

class KernelLibrary : public testing::Test {
protected:
    KernelLibrary() {
        const std::string lLibraries = mAgent.workingDirectory() + "/libraries";
        std::filesystem::create_directory(lLibraries);
        std::filesystem::create_symlink(TAVIK_LINUX_LIBRARY, lLibraries + "/libkpm.so.1");
        mAgent.unsetEnvironment("ZT_LIBKPM_PATH");
        mAgent.setEnvironment("LD_LIBRARY_PATH", lLibraries);
        mAgent.setEnvironment("KPM_LINUX_SYSFS", mAgent.workingDirectory() + "/sys");
        mAgent.setEnvironment("KPM_LINUX_TRACEFS", mAgent.workingDirectory() + "/tracing");
    }

    std::string host(unsigned aHost) const {
        return mAgent.workingDirectory() + "/sys/class/fc_host/host" + std::to_string(aHost);
    }

    void addHost(unsigned aHost) {
        // Made aside: the library never sees a half of it.
        const std::string lAside = mAgent.workingDirectory() + "/aside";
        std::filesystem::create_directories(lAside);
        std::filesystem::create_directories(std::filesystem::path(host(aHost)).parent_path());
        writeFile(lAside + "/node_name", "0x200000000000000" + std::to_string(aHost) + "\n");
        writeFile(lAside + "/port_name", "0x100000000000000" + std::to_string(aHost) + "\n");
        writeFile(lAside + "/port_state", "Online\n");
        writeFile(lAside + "/port_id", "0x01020" + std::to_string(aHost) + "\n");
        std::filesystem::rename(lAside, host(aHost));
    }

    void setState(unsigned aHost, const char* apState) {
        const std::string lNew = mAgent.workingDirectory() + "/new";
        writeFile(lNew, apState);
        std::filesystem::rename(lNew, host(aHost) + "/port_state");
    }

    void waitForLog(const char* apText) {
        waitUntil([&] { return !mAgent.log().containing(apText).empty(); }, apText);
    }

    ZTCAgentProcess mAgent{0};
};

TEST_F(KernelLibrary, WithoutHostsTheAgentEndsInOrder) {
    mAgent.start();
    EXPECT_EQ(mAgent.waitForExit(), 0);
    EXPECT_EQ(mAgent.log().count("No QRV Adapters found.. Tavik would exit", "-N-"), 1u);
}

TEST_F(KernelLibrary, ItsHostsAreTheAgentsAdaptersAndWhatIsMissingStandsInTheAgentsLog) {
    addHost(7);
    addHost(3);
    mAgent.startAndConnect();
    const auto lLines = mAgent.log().containing("Discovered QRV initiator");
    ASSERT_EQ(lLines.size(), 2u);
    EXPECT_EQ(lLines[0].mText, "Discovered QRV initiator <20:00:00:00:00:00:00:03, 10:00:00:00:00:00:00:03>");
    EXPECT_EQ(lLines[1].mText, "Discovered QRV initiator <20:00:00:00:00:00:00:07, 10:00:00:00:00:00:00:07>");
    const auto lMissing = mAgent.log().containing("Libkpm: no SCSI outcomes: there is no tracefs at ");
    ASSERT_EQ(lMissing.size(), 1u);
    EXPECT_EQ(lMissing[0].mMark, "-W-");
    EXPECT_EQ(mAgent.log().containing("Libkpm: this host cannot deliver: plogi, ").size(), 1u);
}

TEST_F(KernelLibrary, ItsLinkChangesAndArrivalsAreTheAgentsRecords) {
    addHost(1);
    mAgent.startAndConnect();
    mAgent.startScope();
    setState(1, "Linkdown\n");
    waitUntil([&] { return mAgent.retrieve().occurrences(8, 2) == 1; }, "the link to be down");
    addHost(2);
    waitForLog("Libkpm: board 1 is host2, ");
    waitUntil([&] { return mAgent.retrieve().occurrences(16, 1) == 1; }, "the arrival");
    const ZTSScopeDataResponse lResponse = mAgent.retrieve();
    EXPECT_TRUE(lResponse.texts().empty()) << "each was told once";
}

TEST_F(KernelLibrary, AStopSignalEndsTheAgentWithTheLibraryOpen) {
    addHost(1);
    mAgent.startAndConnect();
    mAgent.startScope();
    EXPECT_EQ(mAgent.stop(), 0);
}

TEST_F(KernelLibrary, TheShutDownCommandClosesItAndIsAnswered) {
    addHost(1);
    mAgent.startAndConnect();
    mAgent.startScope();
    EXPECT_EQ(mAgent.request(gcShutDownHex), gcSuccessHex);
    EXPECT_EQ(mAgent.waitForExit(), 0);
}
