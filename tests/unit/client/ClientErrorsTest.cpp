#include "sensor/client/include/ClientErrors.h"

#include <gtest/gtest.h>

#include <cerrno>

TEST(ClientErrors, AShortageIsALackOfDescriptorsOrMemoryAndNothingElse) {
    for (const int lErrno : {EMFILE, ENFILE, ENOMEM}) {
        EXPECT_TRUE(isShortage(lErrno)) << lErrno;
    }
    for (const int lErrno : {0, ENOENT, EACCES, EIO, ELOOP, ENOSPC, EROFS, EAGAIN}) {
        EXPECT_FALSE(isShortage(lErrno)) << lErrno;
    }
}

TEST(ClientErrors, AFailedCallIsNamedWithItsReason) {
    const ZTCSystemCallEx lEx("cannot open /x", EMFILE);
    EXPECT_STREQ(lEx.what(), "cannot open /x: Too many open files");
    EXPECT_EQ(lEx.getErrno(), EMFILE);
}
