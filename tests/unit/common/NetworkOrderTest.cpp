#include "common/include/NetworkOrder.h"

#include <gtest/gtest.h>

#include <string>

TEST(NetworkOrder, TheMostSignificantByteStandsFirstAtAnyAddress) {
    unsigned char lBytes[1 + 15 + 1] = {};
    unsigned char* lpEnd = storeInNetworkOrder(lBytes + 1, static_cast<unsigned char>(0x01));
    lpEnd = storeInNetworkOrder(lpEnd, static_cast<unsigned short>(0x0203));
    lpEnd = storeInNetworkOrder(lpEnd, 0x04050607u);
    lpEnd = storeInNetworkOrder(lpEnd, 0x08090a0b0c0d0e0ful);
    EXPECT_EQ(lBytes + 16, lpEnd);
    EXPECT_EQ(std::string("\0\1\2\3\4\5\6\7\10\11\12\13\14\15\16\17\0", 17),
              std::string(lBytes, lBytes + sizeof lBytes));
}

TEST(NetworkOrder, WhatWasStoredIsLoaded) {
    unsigned char lBytes[1 + 8] = {};
    storeInNetworkOrder(lBytes + 1, 0xfedcba9876543210ul);
    EXPECT_EQ(0xfedcba9876543210ul, loadFromNetworkOrder<unsigned long>(lBytes + 1));
    EXPECT_EQ(0xfedcba98u, loadFromNetworkOrder<unsigned int>(lBytes + 1));
    EXPECT_EQ(0xfedcu, loadFromNetworkOrder<unsigned short>(lBytes + 1));
    EXPECT_EQ(0xfeu, loadFromNetworkOrder<unsigned char>(lBytes + 1));
}
