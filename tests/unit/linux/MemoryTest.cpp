// A program of its own: its operator new fails on demand, on the library's thread alone.
#include <gtest/gtest.h>
#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <new>

#include "tests/unit/linux/EngineFixture.h"

static const pthread_t scMain = pthread_self();
static std::atomic<bool> sIsShort{false};
static std::atomic<unsigned> sDenied{0};

static void* sAllocate(std::size_t aSize) {
    if (sIsShort.load() && pthread_equal(pthread_self(), scMain) == 0 && !ZTCTestsOwn::isHere()) {
        sDenied.fetch_add(1);
        throw std::bad_alloc();
    }
    void* lpBlock = std::malloc(aSize == 0 ? 1 : aSize);
    if (lpBlock == nullptr) {
        throw std::bad_alloc();
    }
    return lpBlock;
}

void* operator new(std::size_t aSize) {
    return sAllocate(aSize);
}
void* operator new[](std::size_t aSize) {
    return sAllocate(aSize);
}
void operator delete(void* apBlock) noexcept {
    std::free(apBlock);
}
void operator delete[](void* apBlock) noexcept {
    std::free(apBlock);
}
void operator delete(void* apBlock, std::size_t) noexcept {
    std::free(apBlock);
}
void operator delete[](void* apBlock, std::size_t) noexcept {
    std::free(apBlock);
}

class LinuxMemory : public LinuxEngine {
protected:
    ~LinuxMemory() override { sIsShort = false; }

    /// Until the library has failed so many times more.
    void runShort(unsigned aTimes) {
        const unsigned lBefore = sDenied;
        sIsShort = true;
        waitUntil([&] { return sDenied >= lBefore + aTimes; }, "allocations to fail");
    }
};

TEST_F(LinuxMemory, WithoutMemoryTheThreadLivesOnAndWhatHappenedToHostsIsFoundAfterwards) {
    mKernel.addHost(0);
    start();
    runShort(3);
    mKernel.addHost(1);
    mKernel.setState(0, "Linkdown");
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_Rscn, .mData = rscnData(1)});
    runShort(10);
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 1u);
    sIsShort = false;
    waitUntil([&] { return mpEngine->getNumberOfAdapters() == 2; }, "the host that has come");
    waitForLog("events are lost: they could not be read or handled");
    mKernel.sendDone({.mLun = 4, .mResult = 0x28});
    mKernel.sendFc({.mNumber = 2, .mCode = ZTLFC_Rscn, .mData = rscnData(2)});
    const auto lHasCome = [&](const char* apText) {
        const std::vector<std::string> lSoFar = mRecorder.events();
        return std::find(lSoFar.begin(), lSoFar.end(), apText) != lSoFar.end();
    };
    waitUntil([&] { return lHasCome("0 queue-full 0 4") && lHasCome("0 rscn 6104000800000002"); },
              "the events after it");
    mpEngine->stop();
    const std::vector<std::string> lEvents = mRecorder.events();
    const auto lCount = [&](const char* apText) { return std::count(lEvents.begin(), lEvents.end(), apText); };
    EXPECT_EQ(lCount("0 arrival"), 1);
    EXPECT_EQ(lCount("0 link down tag=1 up=0 down=1 id=0 1 1"), 1);
    EXPECT_EQ(lCount("0 queue-full 0 4"), 1);
    EXPECT_EQ(lCount("0 rscn 6104000800000002"), 1);
}

TEST_F(LinuxMemory, WithoutMemoryTheLibraryStillCloses) {
    mKernel.addHost(0);
    start();
    runShort(3);
    mKernel.sendDone({.mLun = 4, .mResult = 0x28});
    mpEngine->stop();
    sIsShort = false;
    mpEngine.reset();
    EXPECT_TRUE(mKernel.instances().empty());
}

TEST_F(LinuxMemory, CheckConditionsThatWaitForTheirSenseDataAreDeliveredWhateverHappensToMemory) {
    mKernel.mFormat = doneFormat(false);
    mKernel.addTypes();
    mKernel.addHost(0);
    startWithoutLooks();  // a look forgets the port's name, and looking it up needs memory
    mKernel.sendDone({.mResult = 2, .mDriverTag = 1, .mHasSense = false});
    mRecorder.waitFor(1);
    for (std::uint32_t lTag = 2; lTag < 10; ++lTag) {
        mKernel.sendDone({.mResult = 2, .mDriverTag = lTag, .mHasSense = false});
    }
    sDenied = 0;
    sIsShort = true;
    for (std::uint32_t lTag = 10; lTag < 20; ++lTag) {
        mKernel.sendDone({.mResult = 2, .mDriverTag = lTag, .mHasSense = false});
    }
    mRecorder.waitFor(19);
    sIsShort = false;
    EXPECT_GE(sDenied, 1u);
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), 19u) << "each once";
}

TEST_F(LinuxMemory, EachSingleFailureLeavesItServingTheNextEvent) {
    mKernel.addHost(0);
    start();
    for (std::uint32_t lRound = 1; lRound <= 20; ++lRound) {
        runShort(1);
        sIsShort = false;
        const std::size_t lBefore = mRecorder.count();
        mKernel.sendDone({.mLun = lRound, .mResult = 0x28});
        mRecorder.waitFor(lBefore + 1);
    }
    EXPECT_EQ(mRecorder.count(), 20u);
}
