#include "system/include/ThreadTable.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "tests/support/FailingAllocation.h"

static ZTCThreadTable* sTable = nullptr;

static void* sEnd(void* apArguments) {
    static_cast<ZTSThreadArguments*>(apArguments)->mpThreadComponent->setForExit();
    sTable->noteEnd();
    return nullptr;
}

TEST(ThreadTable, AThreadIsStartedOnceAndItsEndIsSeen) {
    ZTCThreadTable lTable;
    sTable = &lTable;
    ZTCSystemInterface lSystem;
    ZTCThreadComponent lComponent(sEnd, ZTCString("a thread"), &lSystem);
    lTable.add(&lComponent, &lSystem);
    EXPECT_EQ(lTable.size(), 1u);
    EXPECT_FALSE(lTable.isStarted(0));
    EXPECT_TRUE(lTable.haveAllEnded());

    lTable.start(0, sEnd);
    EXPECT_TRUE(lTable.isStarted(0));
    EXPECT_THROW(lTable.start(0, sEnd), ZTCInvalidEx);
    EXPECT_TRUE(lTable.getEndEvent().waitFor(20000));
    EXPECT_TRUE(lTable.haveAllEnded());
    EXPECT_TRUE(lComponent.isSetForExit());
    lTable.joinAll();
    lTable.joinAll();
}

TEST(ThreadTable, AThreadThatIsNotThereCannotBeStarted) {
    ZTCThreadTable lTable;
    EXPECT_FALSE(lTable.isStarted(0));
    EXPECT_THROW(lTable.start(0, sEnd), ZTCInvalidEx);
    lTable.joinAll();
}

TEST(ThreadTable, AThreadThatFindsNoMemoryIsNotInTheTable) {
    ZTCThreadTable lTable;
    ZTCSystemInterface lSystem;
    ZTCThreadComponent lComponent(sEnd, ZTCString("a thread"), &lSystem);
    EXPECT_TRUE(failAllocation(1, [&] { EXPECT_THROW(lTable.add(&lComponent, &lSystem), ZTCNoMemoryEx); }));
    EXPECT_EQ(lTable.size(), 0u);
    EXPECT_TRUE(lTable.haveAllEnded());
}
