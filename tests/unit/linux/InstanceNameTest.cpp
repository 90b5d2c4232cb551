#include "libkpm/linux/src/InstanceName.h"

#include <gtest/gtest.h>
#include <unistd.h>

TEST(InstanceName, BeginsWithTheLibrarysNameAndTheProcesssNumber) {
    EXPECT_TRUE(makeTraceInstanceName().starts_with("libkpm-linux-" + std::to_string(::getpid()) + "-"));
    EXPECT_EQ(makeTraceInstanceName(), makeTraceInstanceName());
}

TEST(InstanceName, ALivingProcesssInstanceIsNoLeftOver) {
    EXPECT_FALSE(isTraceInstanceLeftOver(makeTraceInstanceName()));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux-"));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux-1-"));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux--1"));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux-../1-1"));
}

TEST(InstanceName, ThatOfSenseDataIsAnotherAndIsJudgedTheSame) {
    EXPECT_TRUE(makeSenseInstanceName().starts_with("libkpm-linux-sense-" + std::to_string(::getpid()) + "-"));
    EXPECT_FALSE(isTraceInstanceLeftOver(makeSenseInstanceName()));
    EXPECT_TRUE(isTraceInstanceLeftOver("libkpm-linux-sense-999999999-1"));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux-sense-"));
    EXPECT_FALSE(isTraceInstanceLeftOver("libkpm-linux-other-999999999-1"));
}
