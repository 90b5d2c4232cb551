#include "libkpm/linux/src/SysfsText.h"

#include <gtest/gtest.h>

#include <string>

TEST(SysfsText, WorldWideNamesAreReadFromTheirMostSignificantByteOn) {
    const auto lName = parseSysfsWwn("0x1000020000000001\n");
    ASSERT_TRUE(lName.has_value());
    EXPECT_EQ(lName->wwn[0], 0x10);
    EXPECT_EQ(lName->wwn[2], 0x02);
    EXPECT_EQ(lName->wwn[7], 0x01);
    EXPECT_EQ(parseSysfsWwn("0xffffffffffffff00").value().wwn[3], 0xFF);
    EXPECT_EQ(parseSysfsWwn(" 0x1 \n").value().wwn[7], 1);
}

TEST(SysfsText, WhatIsNoWorldWideNameIsNone) {
    for (const char* lpText : {"", "\n", "0x", "1000020000000001", "0x10000200000000012", "0x10 0x20", "0xg", "0x-1",
                               "0x+1", "0x0x1", "<error>", "\xff\xfe"}) {
        EXPECT_FALSE(parseSysfsWwn(lpText).has_value()) << lpText;
    }
    EXPECT_FALSE(parseSysfsWwn(std::string("0x1\0", 4)).has_value());
}

TEST(SysfsText, FcIdsHave24Bits) {
    EXPECT_EQ(parseSysfsFcId("0x010203\n"), 0x010203u);
    EXPECT_EQ(parseSysfsFcId("0xffffff"), 0xFFFFFFu);
    EXPECT_FALSE(parseSysfsFcId("0x1000000").has_value());
    EXPECT_FALSE(parseSysfsFcId("0xffffffff").has_value());
    EXPECT_FALSE(parseSysfsFcId("").has_value());
}

TEST(SysfsText, NumbersMayBeNegative) {
    EXPECT_EQ(parseSysfsNumber("-1\n"), -1);
    EXPECT_EQ(parseSysfsNumber("4294967295\n"), 4294967295);
    EXPECT_FALSE(parseSysfsNumber("12a").has_value());
    EXPECT_FALSE(parseSysfsNumber("99999999999999999999").has_value());
}

TEST(SysfsText, EveryStateOfTheTransportClassIsUpDownOrUnknown) {
    for (const char* lpState : {"Online\n", "Online", "Marginal\n"}) {
        EXPECT_EQ(parseSysfsPortState(lpState), ZTLK_Up) << lpState;
    }
    for (const char* lpState : {"Not Present\n", "Offline\n", "Blocked\n", "Bypassed\n", "Diagnostics\n", "Linkdown\n",
                                "Error\n", "Loopback\n", "Deleted\n"}) {
        EXPECT_EQ(parseSysfsPortState(lpState), ZTLK_Down) << lpState;
    }
    for (const char* lpState : {"Unknown\n", "", "\n", "online", "Onlin", "Online Online", "0", "\xff\xff"}) {
        EXPECT_EQ(parseSysfsPortState(lpState), ZTLK_Unknown) << lpState;
    }
}

TEST(SysfsText, DirectoriesOfHostsHaveANumber) {
    EXPECT_EQ(parseSysfsHostName("host0"), 0u);
    EXPECT_EQ(parseSysfsHostName("host4294967295"), 4294967295u);
    for (const char* lpName : {"", "host", "hos1", "host-1", "host1x", "host4294967296", "xhost1"}) {
        EXPECT_FALSE(parseSysfsHostName(lpName).has_value()) << lpName;
    }
}

TEST(SysfsText, DirectoriesOfRemotePortsHaveHostAndChannel) {
    const auto lName = parseSysfsRportName("rport-12:3-45");
    ASSERT_TRUE(lName.has_value());
    EXPECT_EQ(lName->mHost, 12u);
    EXPECT_EQ(lName->mChannel, 3u);
    for (const char* lpName : {"", "rport-", "rport-1", "rport-1:2", "rport-1-2", "rport-:0-0", "rport-1:-2",
                               "rport-1:2-", "rport-1:2-3x", "rport:1-2", "port-1:2-3"}) {
        EXPECT_FALSE(parseSysfsRportName(lpName).has_value()) << lpName;
    }
}

static const char* const scStats =
    "entries: 12\noverrun: 5\ncommit overrun: 1\nbytes: 976\noldest event ts:   123.456\nnow ts:   124.000\n"
    "dropped events: 2\nread events: 400\n";

TEST(SysfsText, TraceLossesAreTheSumOfTheThreeCounts) {
    EXPECT_EQ(parseTraceLosses(scStats), 8u);
    EXPECT_EQ(parseTraceLosses("overrun: 0\n"), 0u);
    EXPECT_EQ(parseTraceLosses("overrun: 7"), 7u);
}

TEST(SysfsText, TraceLossesThatAreNotToldAreNone) {
    EXPECT_FALSE(parseTraceLosses("").has_value());
    EXPECT_FALSE(parseTraceLosses("entries: 12\n").has_value());
    EXPECT_FALSE(parseTraceLosses("overrun: many\n").has_value());
    EXPECT_FALSE(parseTraceLosses("overrun: 18446744073709551615\n").has_value());
    EXPECT_FALSE(parseTraceLosses("overrun: 18446744073709551614\ndropped events: 2\n").has_value());
    EXPECT_FALSE(parseTraceLosses("overrun: 99999999999999999999999\n").has_value());
}

TEST(SysfsText, AllOnesIsNoName) {
    EXPECT_FALSE(parseSysfsWwn("0xffffffffffffffff\n").has_value());
    EXPECT_TRUE(parseSysfsWwn("0xfffffffffffffffe\n").has_value());
}

TEST(SysfsText, ALunsNameIsReadAndWrittenInFull) {
    const auto lName = parseSysfsLunName("12:1:70000:18446744073709551615");
    ASSERT_TRUE(lName.has_value());
    EXPECT_EQ(lName->mHost, 12u);
    EXPECT_EQ(lName->mChannel, 1u);
    EXPECT_EQ(lName->mTarget, 70000u);
    EXPECT_EQ(lName->mLun, 18446744073709551615u);
    EXPECT_EQ(formatSysfsLunName(*lName), "12:1:70000:18446744073709551615");
    for (const char* lpText : {"", "1", "1:2:3", "1:2:3:", ":2:3:4", "1:2:3:4:5", "1:2:3:x", "4294967296:0:0:0",
                               "0:0:0:18446744073709551616", "-1:0:0:0", "target0:0:0"}) {
        EXPECT_FALSE(parseSysfsLunName(lpText).has_value()) << lpText;
    }
}
