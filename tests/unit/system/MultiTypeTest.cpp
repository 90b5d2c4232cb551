#include "system/include/MultiType.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"

TEST(MultiType, ANumberIsNoText) {
    const ZTCMultiType lcValue(7);
    EXPECT_EQ(lcValue.getType(), ZTMT_Number);
    EXPECT_EQ(lcValue.getNumber(), 7u);
    EXPECT_THROW(lcValue.getText(), ZTCInvalidEx);
}

TEST(MultiType, ATextIsNoNumber) {
    const ZTCMultiType lcValue(ZTCString("seven"));
    EXPECT_EQ(lcValue.getType(), ZTMT_Text);
    EXPECT_STREQ(lcValue.getText().get(), "seven");
    EXPECT_THROW(lcValue.getNumber(), ZTCInvalidEx);
}
