// deploy/tavik-tracefs, over a tree of the test's own and a program in place of kpm-sense-probe.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "tests/support/TemporaryDirectory.h"

class TracefsScript : public testing::Test {
protected:
    TracefsScript() {
        std::filesystem::create_directories(tracing() + "/instances");
        std::filesystem::create_directories(tracing() + "/events");
        writeFile(tracing() + "/kprobe_events", "p:someone/probe function\n");
        ::chmod(tracing().c_str(), 0700);
        setProbe("[ \"$1\" = remove ] && echo -:libkpm_linux/check_sense || echo p:libkpm_linux/check_sense");
    }

    std::string tracing() const { return mDirectory.path("tracing"); }

    /// The program that prints the probe's line.
    void setProbe(const std::string& acrBody) {
        writeFile(mDirectory.path("probe"), "#!/bin/sh\n" + acrBody + "\n");
        ::chmod(mDirectory.path("probe").c_str(), 0700);
    }

    /// Its status; what it says is in mSaid.
    int run(const std::string& acrArguments) {
        const std::string lCommand = "TAVIK_TRACEFS=" + tracing() + " TAVIK_SENSE_PROBE=" + mDirectory.path("probe") +
                                     " " TAVIK_TRACEFS_SCRIPT " " + acrArguments + " 2>" + mDirectory.path("said");
        const int lStatus = std::system(lCommand.c_str());
        mSaid = readFile(mDirectory.path("said"));
        return WEXITSTATUS(lStatus);
    }

    unsigned mode() const {
        struct stat lStatus {};
        EXPECT_EQ(::stat(tracing().c_str(), &lStatus), 0);
        return lStatus.st_mode & 0777;
    }
    std::string definitions() const { return readFile(tracing() + "/kprobe_events"); }

    ZTCTemporaryDirectory mDirectory;
    std::string mSaid;
};

TEST_F(TracefsScript, PrepareLetsTheUserThroughAndAddsTheProbeBehindThoseOfOthers) {
    EXPECT_EQ(run("prepare " + std::to_string(::geteuid())), 0) << mSaid;
    EXPECT_EQ(mode(), 0711u);
    EXPECT_EQ(definitions(), "p:someone/probe function\np:libkpm_linux/check_sense\n");
}

TEST_F(TracefsScript, WhereTheTraceHasSenseDataNoProbeIsDefined) {
    setProbe("exit 0");
    EXPECT_EQ(run("prepare " + std::to_string(::geteuid())), 0) << mSaid;
    EXPECT_EQ(definitions(), "p:someone/probe function\n");
}

TEST_F(TracefsScript, AKernelThatCannotHaveTheProbeIsSaidAndTheRestIsPrepared) {
    setProbe("echo 'no types' >&2; exit 1");
    EXPECT_EQ(run("prepare " + std::to_string(::geteuid())), 1);
    EXPECT_EQ(mSaid, "no types\ntavik-tracefs: check conditions come without sense data\n");
    EXPECT_EQ(mode(), 0711u);
}

TEST_F(TracefsScript, UndoPutsTheModeBackAndRemovesItsOwnProbeAlone) {
    if (::geteuid() != 0) {
        GTEST_SKIP() << "gives a directory to root";
    }
    ASSERT_EQ(run("prepare 65534"), 0) << mSaid;
    std::filesystem::create_directories(tracing() + "/events/libkpm_linux/check_sense");
    EXPECT_EQ(run("undo"), 0) << mSaid;
    EXPECT_EQ(mode(), 0700u);
    EXPECT_EQ(definitions(), "p:someone/probe function\np:libkpm_linux/check_sense\n-:libkpm_linux/check_sense\n");
    struct stat lStatus {};
    ASSERT_EQ(::stat((tracing() + "/instances").c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_uid, 0u);
}

TEST_F(TracefsScript, WithoutTracefsPrepareSaysHowToMountItAndUndoHasNothingToDo) {
    std::filesystem::remove_all(tracing());
    EXPECT_EQ(run("prepare 0"), 1);
    EXPECT_EQ(mSaid, "tavik-tracefs: there is no tracefs at " + tracing() + "; mount it with: mount -t tracefs nodev " +
                         tracing() + "\n");
    EXPECT_EQ(run("undo"), 0) << mSaid;
}

TEST_F(TracefsScript, AnythingElseIsAnsweredWithItsUsage) {
    for (const char* lpArguments : {"", "prepare", "prepare a b", "undo a", "other"}) {
        EXPECT_EQ(run(lpArguments), 2) << lpArguments;
        EXPECT_EQ(mSaid, "usage: tavik-tracefs prepare USER | undo\n");
    }
    EXPECT_EQ(mode(), 0700u);
}
