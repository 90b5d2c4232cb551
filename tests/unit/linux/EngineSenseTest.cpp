#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "libkpm/linux/src/InstanceName.h"
#include "tests/unit/linux/EngineFixture.h"

/// A kernel whose trace has no sense data.
class LinuxEngineSense : public LinuxEngine {
protected:
    LinuxEngineSense() {
        mKernel.mFormat = doneFormat(false);
        mKernel.addHost(0);
    }

    /// An instance that somebody has made.
    std::string prepare(const std::string& acrName) {
        const std::string lInstance = mKernel.tracefs() + "/instances/" + acrName;
        std::filesystem::create_directory(lInstance);
        mKernel.fillInstance(lInstance);
        return lInstance;
    }

    std::string definitions() { return readFile(mKernel.tracefs() + "/kprobe_events"); }

    const std::string mGroup = [] {
        std::string lName = makeTraceInstanceName();
        std::replace(lName.begin(), lName.end(), '-', '_');
        return lName;
    }();
};

TEST_F(LinuxEngineSense, TheProbeGivesThemAndEachCheckConditionIsDeliveredOnce) {
    mKernel.addTypes();
    start();
    EXPECT_EQ(mKernel.probes(), std::vector<std::string>{mGroup});
    EXPECT_EQ(mKernel.senseFile("events/" + mGroup + "/check_sense/enable"), "1");
    EXPECT_EQ(mKernel.senseFile("events/" + mGroup + "/check_sense/filter"), "host == 0");
    EXPECT_EQ(mLog.source(0, 4, 4), "working");
    EXPECT_EQ(mLog.count("2 "), 0u) << mLog.all();
    mKernel.sendDone({.mResult = 2, .mDriverTag = 1, .mHasSense = false}, 0);
    mKernel.sendSense({.mDriverTag = 1}, 1);
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 5 21 0"});
    // Sent in the other order.
    mKernel.sendSense({.mDriverTag = 2, .mAsc = 0x24});
    mKernel.sendDone({.mResult = 2, .mDriverTag = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 check-condition 0 0 28 5 24 0");
    // One without: the other outcomes do not wait for it.
    mKernel.sendDone({.mResult = 2, .mDriverTag = 3, .mHasSense = false});
    mKernel.sendDone({.mResult = 8, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(4),
              (ZTCTexts{"0 check-condition 0 0 28 5 21 0", "0 check-condition 0 0 28 5 24 0", "0 device-busy 0 0",
                        "0 check-condition 0 0 28 ffffffff ffffffff ffffffff"}));
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), 4u);
    EXPECT_TRUE(mKernel.probes().empty());
    EXPECT_TRUE(mKernel.instances().empty());
}

TEST_F(LinuxEngineSense, ThoseOfAHostThatComesLaterAreRecordedToo) {
    mKernel.addTypes();
    start();
    mKernel.addHost(3);
    waitUntil([&] { return mKernel.senseFile("events/" + mGroup + "/check_sense/filter") == "host == 0 || host == 3"; },
              "the new host in the probe's filter");
}

TEST_F(LinuxEngineSense, WhatWaitsAtTheEndIsDelivered) {
    mKernel.addTypes();
    start();
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    mKernel.sendDone({.mLun = 9, .mResult = 8, .mHasSense = false});
    mRecorder.waitFor(1);
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), 2u);
}

TEST_F(LinuxEngineSense, WithoutWhatItNeedsCheckConditionsComeWithoutThemAndOneLineSaysWhy) {
    start();
    EXPECT_EQ(mLog.count("2 check conditions come with no sense data: this kernel's trace has none, and this kernel "
                         "does not describe its types (no /sys/kernel/btf/vmlinux)"),
              1u)
        << mLog.all();
    EXPECT_TRUE(mLog.source(0, 4, 4).starts_with("working (no sense data: ")) << mLog.source(0, 4, 4);
    EXPECT_EQ(registerPort(0, portName(1), 4, 4), KPM_STATUS_SUCCESS);
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 ffffffff ffffffff ffffffff"});
}

TEST_F(LinuxEngineSense, AProbeThatIsSwitchedOffIsNotDefinedAndOneLineSaysSo) {
    mKernel.addTypes();
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mTracePlace.mProbeUse = ZTPU_Never;
    start(lOptions);
    EXPECT_EQ(mLog.count("2 check conditions come with no sense data: this kernel's trace has none, and the probe is "
                         "switched off (KPM_LINUX_PROBE=0)"),
              1u)
        << mLog.all();
    EXPECT_TRUE(mKernel.probes().empty());
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 ffffffff ffffffff ffffffff"});
}

TEST_F(LinuxEngineSense, WithoutTheRightToDefineAProbeItSaysWhatWouldHelp) {
    mKernel.addTypes();
    mKernel.refuseWrites("kprobe_events", "", EACCES);
    start();
    EXPECT_EQ(mLog.count("the probe for them cannot be defined in kprobe_events: Permission denied; run the agent as "
                         "root, or have root define the probe"),
              1u)
        << mLog.all();
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    mRecorder.waitFor(1);
}

TEST_F(LinuxEngineSense, AKernelThatDoesNotKnowTheGeneralArgumentIsGivenTheRegister) {
    mKernel.addTypes();
    mKernel.refuseWrites("kprobe_events", "$arg1", EINVAL);
    start();
#if defined(__x86_64__)
    EXPECT_NE(definitions().find("host=+404(+0(+0(%di))):u32"), std::string::npos) << definitions();
#endif
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    mKernel.sendSense({});
    mRecorder.waitFor(1);
}

TEST_F(LinuxEngineSense, AProbeThatCannotBeUsedIsRemovedAgain) {
    mKernel.addTypes();
    mKernel.mSenseFormat = "ID: 7\n";
    start();
    EXPECT_EQ(mLog.count("the probe's event cannot be used: the format has no field sense of 20 bytes"), 1u)
        << mLog.all();
    EXPECT_TRUE(mKernel.probes().empty());
}

TEST_F(LinuxEngineSense, ProbesOfKilledRunsAreRemovedAndNobodyElses) {
    std::filesystem::create_directories(mKernel.tracefs() + "/events/libkpm_linux_999999999_1/check_sense");
    std::filesystem::create_directories(mKernel.tracefs() + "/events/libkpm_linux/check_sense");
    std::filesystem::create_directories(mKernel.tracefs() + "/events/someone_999999999_1/check_sense");
    start();
    std::vector<std::string> lLeft = mKernel.probes();
    std::sort(lLeft.begin(), lLeft.end());
    EXPECT_EQ(lLeft, (std::vector<std::string>{"libkpm_linux", "someone_999999999_1"}));
    EXPECT_EQ(mLog.count("3 removed the probe libkpm_linux_999999999_1, which a killed run has left"), 1u);
    EXPECT_EQ(definitions(), "-:libkpm_linux_999999999_1/check_sense\n") << "nothing but its own line";
}

TEST_F(LinuxEngineSense, AProbeOfAKilledRunIsSwitchedOffInAPreparedInstanceAndRemoved) {
    const std::string lGroup = "libkpm_linux_999999999_1";
    const std::string lEnable = prepare("ours-sense") + "/events/" + lGroup + "/check_sense/enable";
    mKernel.addProbe(lGroup);
    writeFile(lEnable, "1");
    start();
    EXPECT_EQ(readFile(lEnable), "0");
    EXPECT_EQ(mKernel.probes(), std::vector<std::string>()) << mLog.all();
}

TEST_F(LinuxEngineSense, AProbeThatRootHasDefinedIsUsedInPreparedInstancesAndAllStay) {
    const std::string lInstance = prepare("ours");
    prepare("ours-sense");
    mKernel.addProbe("libkpm_linux");
    mKernel.refuseWrites("kprobe_events", "", EACCES);
    mKernel.mMakeError = EACCES;
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mTracePlace.mPrepared = lInstance;
    start(lOptions);
    EXPECT_EQ(mLog.count("2 "), 0u) << mLog.all();
    EXPECT_EQ(mKernel.senseFile("events/libkpm_linux/check_sense/enable"), "1");
    EXPECT_EQ(mKernel.instanceFile("events/libkpm_linux/check_sense/enable"), "0");
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    mKernel.sendSense({});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 5 21 0"});
    mpEngine->stop();
    EXPECT_EQ(mKernel.probes(), std::vector<std::string>{"libkpm_linux"});
    EXPECT_EQ(mKernel.senseFile("events/libkpm_linux/check_sense/enable"), "0");
    EXPECT_EQ(mKernel.instances().size(), 2u);
}

TEST_F(LinuxEngineSense, APreparedInstanceWithoutOneForSenseDataSaysWhatIsMissing) {
    const std::string lInstance = prepare("ours");
    mKernel.addTypes();
    mKernel.mMakeError = EACCES;
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mTracePlace.mPrepared = lInstance;
    start(lOptions);
    EXPECT_EQ(
        mLog.count("2 check conditions come with no sense data: this kernel's trace has none, and the trace "
                   "instance " +
                   mKernel.tracefs() + "/instances/" + makeSenseInstanceName() + " cannot be made: Permission denied"),
        1u)
        << mLog.all();
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 ffffffff ffffffff ffffffff"});
}

// ---- Losses ----

TEST_F(LinuxEngineSense, LostOutcomesAndLostSenseDataAreCountedApart) {
    mKernel.addTypes();
    start();
    writeFile(mKernel.instance() + "/per_cpu/cpu0/stats", "overrun: 5\n");
    writeFile(mKernel.senseInstance() + "/per_cpu/cpu0/stats", "overrun: 7\n");
    // The record of the first one's outcome is lost, and that of the second one's sense data.
    mKernel.sendSense({.mDriverTag = 1});
    mKernel.sendDone({.mResult = 2, .mDriverTag = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 ffffffff ffffffff ffffffff"});
    waitForLog("2 5 SCSI outcomes are lost: a trace buffer overran (5 since the start)");
    waitForLog(
        "2 7 times sense data are lost: a trace buffer overran; their check conditions come without (7 since the "
        "start)");
    EXPECT_EQ(mLog.loss("scsi-outcomes-lost"), 5u);
    EXPECT_EQ(mLog.loss("scsi-sense-lost"), 7u);
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), 1u);
}

TEST_F(LinuxEngineSense, WhereTheTraceHasThemTheProbeIsUsedOnlyIfItIsForced) {
    mKernel.addTypes();
    mKernel.mFormat = doneFormat(true);
    start();
    EXPECT_TRUE(mKernel.probes().empty());
    mpEngine.reset();
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mTracePlace.mProbeUse = ZTPU_Always;
    start(lOptions);
    EXPECT_EQ(mKernel.probes(), std::vector<std::string>{mGroup});
    mKernel.sendDone({.mResult = 2, .mSenseKey = 1});
    mKernel.sendSense({});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 5 21 0"});
}
