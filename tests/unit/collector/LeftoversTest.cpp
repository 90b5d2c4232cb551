#include "sensor/collector/include/Leftovers.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "tests/support/ResourceLimit.h"
#include "tests/support/StatusPageFile.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/collector/NotingHistory.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class LeftoversTest : public testing::Test {
protected:
    LeftoversTest() {
        std::filesystem::create_directory(mDirectory.path("agent"));
        mSpool.open();
    }
    void writeSpooled(const std::string& acrName, const std::string& acrContent) const {
        writeFile(mDirectory.path("spool/" + acrName), acrContent);
    }
    std::vector<std::string> spooled() const {
        std::vector<std::string> lNames;
        for (const ZTSSpoolEntry& lrEntry : mSpool.list()) {
            lNames.push_back(lrEntry.mName.toText());
        }
        return lNames;
    }
    std::string pagePath(const std::string& acrName) const { return mDirectory.path("agent/" + acrName); }
    /// The page of an agent with this process number that has shut down. Its generation ends with the number.
    void writePage(const std::string& acrName, std::uint32_t aPid) const {
        ZTCStatusPageFile lPage(pagePath(acrName));
        lPage.header().mStartId[1] = aPid;
        lPage.header().mPid = aPid;
        lPage.header().mEndReason = ZTSE_ShutDown;
    }
    bool isThere(const std::string& acrName) const { return std::filesystem::exists(pagePath(acrName)); }
    void expectTooManyOpenFiles(const std::function<void()>& acrAction) {
        const ZTCResourceLimit lNoMore(RLIMIT_NOFILE, 0);
        try {
            acrAction();
            ADD_FAILURE() << "nothing was thrown";
        } catch (const ZTCSpoolTroubleEx& lrEx) {
            EXPECT_EQ(lrEx.getErrno(), EMFILE);
        }
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSpool mSpool{mDirectory.path("spool")};
    ZTCNotingHistory mHistory;
    std::vector<std::string> mLines;
    ZTCLeftovers mLeftovers{mDirectory.path("agent"), mSpool, mHistory,
                            [this](const std::string& acrLine) { mLines.push_back(acrLine); }};
};

TEST_F(LeftoversTest, WhatWaitsIsHandedOverInTheOrderOfItsNumbersAndNewNumbersAreAboveAllOthers) {
    writeSpooled("12.ab.frame", "x");
    writeSpooled("3.aa.torn", "x");
    writeSpooled("14.ab.part", "");
    mLeftovers.takeInWaiting(7);
    EXPECT_THAT(mHistory.mFiles, ElementsAre("3.aa.torn", "12.ab.frame"));
    EXPECT_EQ(mSpool.takeNumber(), 15U);
}

TEST_F(LeftoversTest, NewNumbersAreAboveThoseOfTheHistoryToo) {
    mLeftovers.takeInWaiting(7);
    EXPECT_EQ(mSpool.takeNumber(), 8U);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(LeftoversTest, WithoutDescriptorsWhatWaitsStaysAndIsHandedOverOnceWhenThereAreSome) {
    writeSpooled("3.ab.frame", "x");
    expectTooManyOpenFiles([this] { mLeftovers.takeInWaiting(0); });
    EXPECT_THAT(mHistory.mFiles, IsEmpty());
    mLeftovers.takeInWaiting(0);
    EXPECT_THAT(mHistory.mFiles, ElementsAre("3.ab.frame"));
}
#endif

TEST_F(LeftoversTest, WithoutAnAgentEachPartIsTornAndOneWithoutAByteIsRemoved) {
    writeSpooled("3.ab.part", std::string("\0\0\0\x09x", 5));
    writeSpooled("4.ac.part", "");
    mLeftovers.tearParts();
    EXPECT_THAT(mHistory.mFiles, ElementsAre("3.ab.torn"));
    EXPECT_THAT(spooled(), ElementsAre("3.ab.torn"));
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(LeftoversTest, WithoutDescriptorsPartsStayAsTheyAreAndAreTornLater) {
    writeSpooled("3.ab.part", std::string("\0\0\0\x09x", 5));
    expectTooManyOpenFiles([this] { mLeftovers.tearParts(); });
    EXPECT_THAT(spooled(), ElementsAre("3.ab.part"));
    EXPECT_THAT(mHistory.mFiles, IsEmpty());
    mLeftovers.tearParts();
    EXPECT_THAT(mHistory.mFiles, ElementsAre("3.ab.torn"));
}
#endif

TEST_F(LeftoversTest, ThePageOfAStartIsFoundByItsGeneration) {
    writePage("page.1", 11);
    writePage("page.2", 12);
    const ZTCPagePointer lpPage = mLeftovers.findPage("0000000000000000000000000000000c");
    ASSERT_NE(lpPage, nullptr);
    EXPECT_EQ(lpPage->mPid, 12U);
    EXPECT_EQ(mLeftovers.findPage("0000000000000000000000000000000d"), nullptr);
}

TEST_F(LeftoversTest, PagesOfEndedAgentsGoToTheHistoryAndTheRunningOnesStays) {
    writePage("page.1", 11);
    writePage("page.2", 12);
    EXPECT_TRUE(mLeftovers.endPages(pagePath("page.2")));
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_EQ(mHistory.mEnded[0].mPagePath, pagePath("page.1"));
    EXPECT_FALSE(mHistory.mEnded[0].mIsVanished);
    EXPECT_TRUE(isThere("page.1")) << "the history removes it, behind its commit";
}

TEST_F(LeftoversTest, AFileThatIsNoPageIsNamedAndRemoved) {
    writeFile(pagePath("page.1"), "x");
    EXPECT_TRUE(mLeftovers.endPages(""));
    EXPECT_THAT(mLines, ElementsAre(HasSubstr("page.1': is too short")));
    EXPECT_FALSE(isThere("page.1"));
    EXPECT_THAT(mHistory.mEnded, IsEmpty());
}

TEST_F(LeftoversTest, ThePageOfAnAgentThatStillRunsWaitsUntilItHasEnded) {
    const auto lPid = static_cast<std::uint32_t>(getpid());
    writePage("page.1", lPid);
    writeFile(pagePath("qrv-tvk.pid"), std::to_string(lPid) + "\n");
    {
        const ZTCFileDescriptor lHeld = ZTCFileDescriptor::open(pagePath("qrv-tvk.pid").c_str(), O_RDWR);
        ASSERT_EQ(flock(lHeld.get(), LOCK_EX | LOCK_NB), 0);
        EXPECT_FALSE(mLeftovers.endPages(""));
        EXPECT_THAT(mHistory.mEnded, IsEmpty());
    }
    EXPECT_TRUE(mLeftovers.endPages(""));
    EXPECT_EQ(mHistory.mEnded.size(), 1U);
}

TEST_F(LeftoversTest, WithoutDescriptorsPagesAreNotTakenForMissing) {
    writePage("page.1", 11);
    {
        const ZTCResourceLimit lNoMore(RLIMIT_NOFILE, 0);
        EXPECT_FALSE(mLeftovers.endPages(""));
    }
    EXPECT_THAT(mLines, ElementsAre(testing::AllOf(HasSubstr("cannot look for status pages in"),
                                                   HasSubstr("Too many open files: tried again"))));
    EXPECT_THAT(mHistory.mEnded, IsEmpty());
    EXPECT_TRUE(mLeftovers.endPages(""));
    EXPECT_EQ(mHistory.mEnded.size(), 1U);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
/// The limit with which the process may open one more file, and not a second one beside it.
static rlim_t sOneMoreFile() {
    return static_cast<rlim_t>(ZTCFileDescriptor::open("/dev/null", O_RDONLY).get()) + 1;
}

TEST_F(LeftoversTest, WhereItCannotBeSeenWhetherAnAgentRunsItsPageStays) {
    writePage("page.1", 11);
    writeFile(pagePath("qrv-tvk.pid"), "11\n");
    {
        const ZTCResourceLimit lOneMore(RLIMIT_NOFILE, sOneMoreFile());  // the page itself
        EXPECT_THROW(mLeftovers.endPages(""), ZTCClientEx);
    }
    EXPECT_TRUE(isThere("page.1"));
    EXPECT_THAT(mHistory.mEnded, IsEmpty());
}
#endif
