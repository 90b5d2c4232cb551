#include "os/common/include/ThreadComponent.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "common/include/Pointer.h"
#include "os/common/include/ConditionTimedWaitThreadComponent.h"

static void* sProcedure(void*) {
    return nullptr;
}

TEST(ThreadComponent, ItKnowsItsProcedureNameAndSystem) {
    ZTCSystemInterface lSystem;
    ZTCThreadComponent lComponent(sProcedure, ZTCString("a thread"), &lSystem);
    EXPECT_EQ(lComponent.getProcedure(), &sProcedure);
    EXPECT_STREQ(lComponent.getName().get(), "a thread");
    EXPECT_EQ(lComponent.getSystemInterface(), &lSystem);
    lComponent.finish();
}

TEST(ThreadComponent, OnceMarkedForExitItStaysMarked) {
    ZTCSystemInterface lSystem;
    ZTCThreadComponent lComponent(sProcedure, ZTCString("a thread"), &lSystem);
    EXPECT_FALSE(lComponent.isSetForExit());
    lComponent.setForExit();
    EXPECT_TRUE(lComponent.isSetForExit());
    lComponent.setForExit();
    EXPECT_TRUE(lComponent.isSetForExit());
}

TEST(ThreadComponent, ATimedWaitComponentKnowsItsTime) {
    ZTCSystemInterface lSystem;
    ZTCTimedWaitThreadComponent lComponent(sProcedure, ZTCString("timed"), &lSystem, 3);
    EXPECT_EQ(lComponent.getWaitTime(), 3u);
    EXPECT_STREQ(lComponent.getName().get(), "timed");
}

TEST(ThreadComponent, AConditionWaitComponentKnowsItsConditionals) {
    ZTCSystemInterface lSystem;
    unsigned lConditionals[2] = {4, 1};
    ZTCConditionWaitThreadComponent lComponent(sProcedure, ZTCString("waiting"), &lSystem, lConditionals, 2);
    lConditionals[0] = 9;
    ASSERT_EQ(lComponent.getNumberOfConditionals(), 2u);
    EXPECT_EQ(lComponent.getConditional(0), 4u);
    EXPECT_EQ(lComponent.getConditional(1), 1u);
    EXPECT_THROW(lComponent.getConditional(2), ZTCInvalidEx);
}

TEST(ThreadComponent, AConditionTimedWaitComponentIsBothOverOneBase) {
    ZTCSystemInterface lSystem;
    const unsigned lcConditionals[1] = {0};
    const ZTCPointer<ZTCThreadComponent> lComponent(
        NEW ZTCConditionTimedWaitThreadComponent(sProcedure, ZTCString("both"), &lSystem, lcConditionals, 1, 240));
    auto* lpTimed = dynamic_cast<ZTCTimedWaitThreadComponent*>(lComponent.get());
    auto* lpCondition = dynamic_cast<ZTCConditionWaitThreadComponent*>(lComponent.get());
    ASSERT_NE(lpTimed, nullptr);
    ASSERT_NE(lpCondition, nullptr);
    EXPECT_EQ(lpTimed->getWaitTime(), 240u);
    EXPECT_EQ(lpCondition->getConditional(0), 0u);
    lpTimed->setForExit();
    EXPECT_TRUE(lpCondition->isSetForExit());
}
