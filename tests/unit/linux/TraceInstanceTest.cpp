#include "libkpm/linux/src/TraceInstance.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <string>

#include "libkpm/linux/src/InstanceName.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/Sysfs.h"
#include "tests/support/ResourceLimit.h"
#include "tests/unit/linux/FakeKernel.h"

class TraceInstance : public testing::Test {
protected:
    std::unique_ptr<ZTCTraceInstance> open() {
        mProblem = {};
        return ZTCTraceInstance::open(mPlace, mKernel, mProblem);
    }

    /// Expects that it cannot be opened, for this reason, and that nothing is left.
    void expectProblem(const std::string& acrText) {
        EXPECT_EQ(open(), nullptr);
        EXPECT_NE(mProblem.mText.find(acrText), std::string::npos) << mProblem.mText;
        EXPECT_TRUE(mKernel.instances().empty());
    }

    std::string event(const char* apFile) {
        return mKernel.instanceFile(std::string("events/scsi/scsi_dispatch_cmd_done/") + apFile);
    }

    ZTCLinuxLog mLog;
    ZTCFakeKernel mKernel;
    ZTSTracePlace mPlace{{mKernel.tracefs()}, {}};
    ZTSFeedProblem mProblem;
};

TEST_F(TraceInstance, IsMadeUnderANameOfThisProcessAndRemovedWithItsOwner) {
    {
        const auto lpInstance = open();
        ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
        EXPECT_EQ(mKernel.instances(), std::vector<std::string>{makeTraceInstanceName()});
        EXPECT_TRUE(makeTraceInstanceName().starts_with("libkpm-linux-" + std::to_string(::getpid()) + "-"));
        EXPECT_EQ(lpInstance->getBuffers().size(), 2u);
        EXPECT_TRUE(lpInstance->getBuffers().wakesAtOnce());
        EXPECT_EQ(mKernel.instanceFile("buffer_size_kb"), "256");
        EXPECT_EQ(mKernel.instanceFile("buffer_percent"), "0");
        EXPECT_EQ(mKernel.instanceFile("trace_clock"), "mono") << "one clock for the buffers of all processors";
        EXPECT_EQ(event("enable"), "0") << "nothing is recorded yet";
    }
    EXPECT_TRUE(mKernel.instances().empty());
    EXPECT_EQ(mLog.all(), "");
}

TEST_F(TraceInstance, RecordsTheHostsItIsToldOfAndNoneWithoutAny) {
    const auto lpInstance = open();
    ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
    EXPECT_EQ(lpInstance->watchHosts({1, 3}, mProblem), ZTTF_Set);
    EXPECT_EQ(event("filter"), makeScsiFilter({1, 3}));
    EXPECT_EQ(event("enable"), "1");
    EXPECT_EQ(lpInstance->watchHosts({}, mProblem), ZTTF_Set);
    EXPECT_EQ(event("enable"), "0");
}

TEST_F(TraceInstance, AFirstFilterThatTheKernelRefusesLeavesTheEventOff) {
    mKernel.mHasFilter = false;
    const auto lpInstance = open();
    ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
    EXPECT_EQ(lpInstance->watchHosts({1}, mProblem), ZTTF_Off);
    EXPECT_EQ(mProblem.mText, "the trace event scsi_dispatch_cmd_done cannot be switched on: Is a directory");
    EXPECT_EQ(mProblem.mHappening, ZTFH_Broken);
    EXPECT_EQ(event("enable"), "0");
}

TEST_F(TraceInstance, AFilterThatFailsLaterKeepsTheOneBefore) {
    const auto lpInstance = open();
    ASSERT_EQ(lpInstance->watchHosts({1}, mProblem), ZTTF_Set);
    mKernel.refuseWrites("filter", "host_no == 9", ENOMEM, 1);
    EXPECT_EQ(lpInstance->watchHosts({1, 9}, mProblem), ZTTF_Kept);
    EXPECT_EQ(mProblem.mText,
              "the filter of the trace event scsi_dispatch_cmd_done cannot be set: Cannot allocate memory");
    EXPECT_EQ(event("filter"), makeScsiFilter({1}));
    EXPECT_EQ(event("enable"), "1");
    EXPECT_EQ(lpInstance->watchHosts({1, 9}, mProblem), ZTTF_Set);
    EXPECT_EQ(event("filter"), makeScsiFilter({1, 9}));
}

TEST_F(TraceInstance, WhereTheOldFilterCannotBeSetAgainEitherTheEventIsSwitchedOff) {
    const auto lpInstance = open();
    ASSERT_EQ(lpInstance->watchHosts({1}, mProblem), ZTTF_Set);
    mKernel.refuseWrites("filter", "", EINVAL, 2);
    EXPECT_EQ(lpInstance->watchHosts({1, 9}, mProblem), ZTTF_Off);
    EXPECT_EQ(event("enable"), "0");
}

TEST_F(TraceInstance, ABufferPercentThatTheKernelStoresAsOneDoesNotWakeAtOnce) {
    mKernel.mStoredPercent = "1\n";
    EXPECT_FALSE(open()->getBuffers().wakesAtOnce());
    mKernel.mStoredPercent = "0\n";
    EXPECT_TRUE(open()->getBuffers().wakesAtOnce());
    mKernel.mStoredPercent.clear();
    mKernel.mHasBufferPercent = false;
    EXPECT_FALSE(open()->getBuffers().wakesAtOnce());
}

TEST_F(TraceInstance, ItsFilesAreClosedBeforeItIsRemoved) {
    // The double refuses to remove what is still open, as the kernel does.
    ASSERT_NE(open(), nullptr);
    EXPECT_TRUE(mKernel.instances().empty());
    EXPECT_EQ(mLog.count("stays"), 0u);
}

TEST_F(TraceInstance, APreparedInstanceIsUsedAndStays) {
    mPlace.mPrepared = mKernel.tracefs() + "/instances/ours";
    EXPECT_EQ(open(), nullptr);
    EXPECT_NE(mProblem.mText.find("cannot be read below " + mPlace.mPrepared), std::string::npos) << mProblem.mText;
    std::filesystem::create_directory(mPlace.mPrepared);
    mKernel.fillInstance(mPlace.mPrepared);
    {
        const auto lpInstance = open();
        ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
        EXPECT_EQ(lpInstance->watchHosts({1}, mProblem), ZTTF_Set);
        EXPECT_EQ(event("enable"), "1");
    }
    EXPECT_EQ(event("enable"), "0");
    EXPECT_EQ(mKernel.instances(), std::vector<std::string>{"ours"});
    EXPECT_EQ(mLog.all(), "");
}

TEST_F(TraceInstance, WithTooFewDescriptorsForAllProcessorsItSaysHowManyItNeeds) {
    const std::size_t lUsed = listDirectory("/proc/self/fd").value().size() + 2;  // the double opens two of its own
    {
        const ZTCResourceLimit lLimit(RLIMIT_NOFILE, lUsed + 2 + gcTraceDescriptorReserve - 1);
        expectProblem("the trace buffers of 2 possible processors need a descriptor each");
        expectProblem("raise the limit (LimitNOFILE= of the service) to " +
                      std::to_string(lUsed + 2 + gcTraceDescriptorReserve) + " or more");
        EXPECT_EQ(mProblem.mHappening, ZTFH_Broken);
    }
    const ZTCResourceLimit lLimit(RLIMIT_NOFILE, lUsed + 2 + gcTraceDescriptorReserve);
    EXPECT_NE(open(), nullptr) << mProblem.mText;
}

TEST_F(TraceInstance, TheRightsThatCountAreThoseForOpeningAndNotTheRealUsers) {
    if (::geteuid() != 0) {
        GTEST_SKIP() << "needs root, to have another real user";
    }
    std::filesystem::permissions(mKernel.tracefs(), std::filesystem::perms::owner_all);
    ASSERT_EQ(::setresuid(65534, 0, 0), 0);
    const auto lpInstance = open();
    ASSERT_EQ(::setresuid(0, 0, 0), 0);
    EXPECT_NE(lpInstance, nullptr) << mProblem.mText;
}

TEST_F(TraceInstance, TheFirstRootThatHasInstancesIsUsed) {
    mPlace.mRoots = {mKernel.tracefs() + "/nowhere", mKernel.tracefs()};
    EXPECT_NE(open(), nullptr) << mProblem.mText;
}

TEST_F(TraceInstance, PagesAreReadWithoutWaiting) {
    const auto lpInstance = open();
    ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
    ZTCBytes lPage(4096);
    std::size_t lSize = 0;
    EXPECT_EQ(lpInstance->getBuffers().read(0, lPage, lSize), ZTTR_Empty);
    const ZTCBytes lSent = ZTCPageBuilder().addShort({1, 2, 3, 4}).make();
    mKernel.sendPage(lSent, 0);
    mKernel.sendPage(lSent, 1);
    for (std::size_t lBuffer = 0; lBuffer < 2; ++lBuffer) {
        EXPECT_EQ(lpInstance->getBuffers().read(lBuffer, lPage, lSize), ZTTR_Page);
        EXPECT_EQ(lSize, 4096u);
        EXPECT_EQ(lPage, lSent);
        EXPECT_EQ(lpInstance->getBuffers().read(lBuffer, lPage, lSize), ZTTR_Empty);
    }
}

TEST_F(TraceInstance, ABufferWithNothingInItAndOneOfAProcessorThatIsNotUpAreEmptyAndNoFailure) {
    EXPECT_EQ(judgeEmptyTraceRead(0, 0), ZTTR_Empty);
    EXPECT_EQ(judgeEmptyTraceRead(0, EIO), ZTTR_Empty) << "an error number of something else";
    EXPECT_EQ(judgeEmptyTraceRead(-1, EAGAIN), ZTTR_Empty);
    EXPECT_EQ(judgeEmptyTraceRead(-1, ENODEV), ZTTR_Empty);
    for (const int lError : {EIO, EBADF, ENOMEM, EINVAL}) {
        EXPECT_EQ(judgeEmptyTraceRead(-1, lError), ZTTR_Failed) << lError;
    }
}

TEST_F(TraceInstance, LossesAreToldOnceAndACountThatGoesBackBeginsAnew) {
    mKernel.mProcessors = 1;
    const auto lpInstance = open();
    ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
    const std::string lStats = mKernel.instance() + "/per_cpu/cpu0/stats";
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 0u);
    writeFile(lStats, "overrun: 7\ncommit overrun: 1\ndropped events: 2\n");
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 10u);
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 0u);
    writeFile(lStats, "overrun: 12\ncommit overrun: 1\ndropped events: 2\n");
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 5u);
    writeFile(lStats, "overrun: 3\n");
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 0u);
    writeFile(lStats, "overrun: 4\n");
    EXPECT_EQ(lpInstance->getBuffers().takeLosses(0), 1u);
    writeFile(lStats, "overrun: 18446744073709551615\n");
    EXPECT_FALSE(lpInstance->getBuffers().takeLosses(0).has_value());
    std::filesystem::remove(lStats);
    EXPECT_FALSE(lpInstance->getBuffers().takeLosses(0).has_value());
}

TEST_F(TraceInstance, WithoutTracefsTheReasonSaysHowToMountIt) {
    std::filesystem::remove_all(mKernel.tracefs());
    EXPECT_EQ(open(), nullptr);
    EXPECT_EQ(mProblem.mText,
              "there is no tracefs at " + mKernel.tracefs() +
                  ": No such file or directory; mount it with: mount -t tracefs nodev /sys/kernel/tracing");
}

TEST_F(TraceInstance, WithoutTheRightTheReasonSaysHowToGetIt) {
    mKernel.mMakeError = EACCES;
    expectProblem("cannot be made: Permission denied; run the agent as root, or with CAP_DAC_OVERRIDE");
    EXPECT_EQ(mProblem.mHappening, ZTFH_NotGranted);
    mKernel.mMakeError = EROFS;
    expectProblem("cannot be made: Read-only file system");
    EXPECT_EQ(mProblem.mHappening, ZTFH_NotGranted);
    mKernel.mMakeError = ENOMEM;
    expectProblem("cannot be made: Cannot allocate memory");
    EXPECT_EQ(mProblem.mHappening, ZTFH_Broken);
}

TEST_F(TraceInstance, AnUnknownKernelsDescriptionsAreRefusedByName) {
    mKernel.mFormat.erase(mKernel.mFormat.find("\tfield:int result"), 55);
    expectProblem("the trace event scsi_dispatch_cmd_done cannot be used: the format has no field result");
    mKernel.mFormat = "";
    expectProblem("events/scsi/scsi_dispatch_cmd_done/format cannot be read");
    mKernel.mFormat = std::string(100000, 'x');
    expectProblem("events/scsi/scsi_dispatch_cmd_done/format cannot be read");
    mKernel.mFormat = doneFormat();
    mKernel.mHeaderPage = "nothing\n";
    expectProblem("trace pages cannot be read: header_page has no field commit");
    mKernel.mHeaderPage = "";
    expectProblem("events/header_page cannot be read");
    mKernel.mHeaderPage = headerPage();
    mKernel.mProcessors = 0;
    expectProblem("no trace buffer");
}

TEST_F(TraceInstance, TheDescriptionOfPagesMayStandAtTheRoot) {
    mKernel.mHeaderPage = "";
    std::filesystem::create_directories(mKernel.tracefs() + "/events");
    writeFile(mKernel.tracefs() + "/events/header_page", headerPage());
    EXPECT_NE(open(), nullptr) << mProblem.mText;
}

TEST_F(TraceInstance, WhatKilledRunsHaveLeftIsRemovedAndNothingElse) {
    // No process has such a number; and this one was not started at that time.
    const std::string lDead = "libkpm-linux-999999999-1";
    const std::string lOther = "libkpm-linux-" + std::to_string(::getpid()) + "-1";
    for (const std::string& lrName :
         {lDead, lOther, std::string("libkpm-linux-sense-999999999-1"), std::string("libkpm-linux-x-1"),
          std::string("libkpm-linux-1"), std::string("someone"), makeTraceInstanceName()}) {
        std::filesystem::create_directories(mKernel.tracefs() + "/instances/" + lrName + "/events");
    }
    const auto lpInstance = open();
    ASSERT_NE(lpInstance, nullptr) << mProblem.mText;
    std::vector<std::string> lLeft = mKernel.instances();
    std::sort(lLeft.begin(), lLeft.end());
    EXPECT_EQ(lLeft,
              (std::vector<std::string>{"libkpm-linux-1", makeTraceInstanceName(), "libkpm-linux-x-1", "someone"}));
    EXPECT_EQ(mLog.count("3 removed the trace instance " + lDead + ", which a killed run has left"), 1u);
}
