#include <gtest/gtest.h>

#include <functional>
#include <vector>

#include "system/include/System.h"
#include "tests/support/VirtualSlot.h"

namespace {

/// A system whose state the test can see.
class ZTCOpenSystem : public ZTCSystem {
public:
    ZTCOpenSystem() : ZTCSystem(ZTCString("a name")) {}

    /// Where each of its members is, in the order in which they are set up.
    std::vector<const void*> addresses() const {
        return {&mName,
                &mInstanceManager,
                &mVersion,
                &mProtocolHelper,
                &mHostName,
                &mIsSetForExit,
                &mLogFilePath,
                &mAddress,
                &mSignalWaiter,
                &mCmdLineArgDescs,
                &mCommandLineParser,
                &mSettings,
                &mBufferManager,
                &mThreadTable,
                &mThreadComponents,
                &mThreadPools,
                &mConditionals,
                &mQueues,
                &mLists,
                &mReaders,
                &mWriters,
                &mNumericIdsLock,
                &mExitLock,
                &mNumericIds};
    }
    std::size_t endOfIds() const {
        return reinterpret_cast<std::size_t>(&mNumericIds) + sizeof mNumericIds - reinterpret_cast<std::size_t>(this);
    }
    std::vector<bool> emptyPointers() const {
        return {mInstanceManager != nullptr, mVersion != nullptr,      mProtocolHelper != nullptr,
                mAddress != nullptr,         mSignalWaiter != nullptr, mCommandLineParser != nullptr,
                mBufferManager != nullptr,   mThreadTable != nullptr,  mNumericIdsLock != nullptr};
    }
    bool hasExitLock() const { return mExitLock != nullptr; }
    bool hasNothingInItsSlots() const {
        return mCmdLineArgDescs.numberOfElements() + mThreadComponents.numberOfElements() +
                   mThreadPools.numberOfElements() + mConditionals.numberOfElements() + mQueues.numberOfElements() +
                   mLists.numberOfElements() + mReaders.numberOfElements() + mWriters.numberOfElements() +
                   mSettings.size() ==
               0;
    }
};

}  // namespace

TEST(SystemState, IsSetUpInItsOrderAndNothingStandsBehindIt) {
    const ZTCOpenSystem lSystem;
    const std::vector<const void*> lAddresses = lSystem.addresses();
    for (std::size_t lIndex = 1; lIndex < lAddresses.size(); ++lIndex) {
        EXPECT_TRUE(std::less<>()(lAddresses[lIndex - 1], lAddresses[lIndex])) << lIndex;
    }
    EXPECT_EQ(sizeof(ZTCSystem), lSystem.endOfIds());
}

TEST(SystemState, ItsPointersAreEmptyAndItsSlotsTooButTheExitLockIsThere) {
    const ZTCOpenSystem lSystem;
    EXPECT_EQ(std::vector<bool>(9, false), lSystem.emptyPointers());
    EXPECT_TRUE(lSystem.hasExitLock());
    EXPECT_TRUE(lSystem.hasNothingInItsSlots());
}

TEST(SystemState, TheSlotsHaveRoomForSoMany) {
    EXPECT_EQ(10, MAX_CMD_ARGUMENTS);
    EXPECT_EQ(7, MAX_THREAD_COMPONENTS);
    EXPECT_EQ(1, MAX_THREADPOOLS);
    EXPECT_EQ(7, MAX_CONDITIONALS);
    EXPECT_EQ(5, MAX_QUEUES);
    EXPECT_EQ(5, MAX_LISTS);
    EXPECT_EQ(5, MAX_READERS);
    EXPECT_EQ(5, MAX_WRITERS);
}

TEST(SystemState, TheOptionTypesAndTheParsersStatesAreOneByteEach) {
    EXPECT_EQ(1u, sizeof(ZTECommandLineArgumentType));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3}),
              (std::vector<int>{ZTCLAT_None, ZTCLAT_OptionOnly, ZTCLAT_OptionValue, ZTCLAT_Max}));
    EXPECT_EQ(1u, sizeof(ZTEParsingState));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3, 4}),
              (std::vector<int>{ZTPS_None, ZTPS_NotStarted, ZTPS_Running, ZTPS_Done, ZTPS_Max}));
    EXPECT_EQ(129u, sizeof(ZTSCommandLineArgumentDesc));
}

// ---- The table of virtual functions ----

TEST(SystemState, TheVirtualOperationsStandInTheirOrderBehindTheDestructor) {
    using System = ZTCSystem;
    using ConstIterator = ZTCSynchList::ZTConstIterator (System::*)(unsigned) const;
    using Iterator = ZTCSynchList::ZTIterator (System::*)(unsigned);
    const std::vector<std::size_t> lSlots = {
        virtualSlotOf(&System::getBuffer),
        virtualSlotOf(&System::reuseBuffer),
        virtualSlotOf(&System::clearBuffer),
        virtualSlotOf(&System::generateNumericId),
        virtualSlotOf(&System::signal),
        virtualSlotOf(&System::getAddress),
        virtualSlotOf(&System::isSetForExit),
        virtualSlotOf(&System::setAddress),
        virtualSlotOf(&System::getHostName),
        virtualSlotOf(&System::setForExit),
        virtualSlotOf(&System::getOs),
        virtualSlotOf(&System::getOsVariant),
        virtualSlotOf(&System::getVersion),
        virtualSlotOf(&System::getReader),
        virtualSlotOf(&System::getWriter),
        virtualSlotOf(&System::getProtocolHelper),
        virtualSlotOf(&System::preInit),
        virtualSlotOf(&System::init),
        virtualSlotOf(&System::postDestroy),
        virtualSlotOf(&System::destroy),
        virtualSlotOf(&System::processCommandLine),
        virtualSlotOf(&System::setCmdLineArgDescs),
        virtualSlotOf(&System::processConfigFile),
        virtualSlotOf(&System::displayVersionAndExit),
        virtualSlotOf(&System::displayHelpAndExit),
        virtualSlotOf(&System::displayHelp),
        virtualSlotOf(&System::isAnInstanceRunning),
        virtualSlotOf(&System::markAsRunning),
        virtualSlotOf(&System::killRunningInstance),
        virtualSlotOf(&System::exitInstanceManagement),
        virtualSlotOf(&System::getProcStatus),
        virtualSlotOf(&System::returnNumericId),
        virtualSlotOf(&System::createThreads),
        virtualSlotOf(&System::startThreads),
        virtualSlotOf(&System::startThread),
        virtualSlotOf(&System::postThreadsInit),
        virtualSlotOf(&System::waitForThreads),
        virtualSlotOf(&System::makeThreadsToExit),
        virtualSlotOf(&System::isInited),
        virtualSlotOf(&System::wait),
        virtualSlotOf(&System::timedWait),
        virtualSlotOf(&System::send),
        virtualSlotOf(&System::receive),
        virtualSlotOf(&System::waitForActivity),
        virtualSlotOf(&System::waitOnEmptyQueue),
        virtualSlotOf(&System::enqueue),
        virtualSlotOf(&System::dequeue),
        virtualSlotOf(&System::queueFront),
        virtualSlotOf(&System::queueClear),
        virtualSlotOf(&System::isQueueEmpty),
        virtualSlotOf(&System::waitOnEmptyList),
        virtualSlotOf(&System::enlist),
        virtualSlotOf(&System::enlistFront),
        virtualSlotOf(&System::delist),
        virtualSlotOf(&System::delistBack),
        virtualSlotOf(&System::listFront),
        virtualSlotOf(&System::listClear),
        virtualSlotOf(&System::listSize),
        virtualSlotOf(&System::isListEmpty),
        virtualSlotOf(&System::listErase),
        virtualSlotOf(static_cast<ConstIterator>(&System::listBegin)),
        virtualSlotOf(static_cast<ConstIterator>(&System::listEnd)),
        virtualSlotOf(static_cast<Iterator>(&System::listBegin)),
        virtualSlotOf(static_cast<Iterator>(&System::listEnd)),
        virtualSlotOf(&System::applySettings),
        virtualSlotOf(&System::getSetting),
        virtualSlotOf(&System::addSetting),
        virtualSlotOf(&System::processCommandLineArguments),
        virtualSlotOf(&System::createStartUpEvent),
        virtualSlotOf(&System::createShutDownEvent),
        virtualSlotOf(&System::systemDaemonize),
        virtualSlotOf(&System::destroyThreads),
    };
    EXPECT_EQ(slotsBehindTheDestructor(lSlots.size()), lSlots);
}
