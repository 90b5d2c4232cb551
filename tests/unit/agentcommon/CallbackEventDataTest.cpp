#include "sensor/agentcommon/include/CallbackEventData.h"

#include <gtest/gtest.h>

#include <cstring>

static unsigned char sData[] = {1, 2, 3};
static const unsigned char scName[] = {0x10, 0x00, 0x00, 0x00, 0xc9, 0x00, 0x00, 0x01};

TEST(CallbackEventData, KeepsWhatTheCallbackGot) {
    const ZTCCallbackEventData lEvent(7, scName, 0x12345678, 0x9ABCDEF0, sData, 3);
    EXPECT_EQ(7u, lEvent.getBoardId());
    EXPECT_EQ(0, std::memcmp(scName, lEvent.getWwpn(), sizeof scName));
    EXPECT_EQ(0x12345678u, lEvent.getCategory());
    EXPECT_EQ(0x9ABCDEF0u, lEvent.getSubcategory());
    EXPECT_EQ(sData, lEvent.getEventData());
    EXPECT_EQ(3u, lEvent.getEventDataLength());
}

TEST(CallbackEventData, CopiesTheNameAndBorrowsTheData) {
    unsigned char lName[8];
    std::memcpy(lName, scName, sizeof lName);
    const ZTCCallbackEventData lEvent(0, lName, 1, 1, sData, 3);
    std::memset(lName, 0, sizeof lName);
    EXPECT_EQ(0, std::memcmp(scName, lEvent.getWwpn(), sizeof scName));
}

TEST(CallbackEventData, HasTheZeroNameWhereNoneIsGiven) {
    const ZTCCallbackEventData lEvent(0, nullptr, 8, 2, sData, 3);
    const unsigned char lZero[8] = {};
    EXPECT_EQ(0, std::memcmp(lZero, lEvent.getWwpn(), sizeof lZero));
}

TEST(CallbackEventData, DataWithoutAPointerHaveLengthZero) {
    const ZTCCallbackEventData lEvent(0, scName, 1, 0x20, nullptr, 65535);
    EXPECT_EQ(nullptr, lEvent.getEventData());
    EXPECT_EQ(0u, lEvent.getEventDataLength());
}
