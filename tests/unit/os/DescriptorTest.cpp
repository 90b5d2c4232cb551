#include "os/common/include/Descriptor.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include <cerrno>

namespace {

bool sIsOpen(int aDescriptor) {
    return fcntl(aDescriptor, F_GETFD) >= 0 || errno != EBADF;
}

}  // namespace

TEST(Descriptor, IsClosedWithItsOwner) {
    const int lDescriptor = ClibOpen("/dev/null", O_RDONLY);
    {
        const ZTCDescriptor lOwner(lDescriptor);
        EXPECT_EQ(lDescriptor, lOwner.get());
        EXPECT_TRUE(sIsOpen(lDescriptor));
    }
    EXPECT_FALSE(sIsOpen(lDescriptor));
}

TEST(Descriptor, StaysOpenOnceItIsReleased) {
    const int lDescriptor = ClibOpen("/dev/null", O_RDONLY);
    {
        ZTCDescriptor lOwner(lDescriptor);
        EXPECT_EQ(lDescriptor, lOwner.release());
        EXPECT_EQ(-1, lOwner.get());
    }
    EXPECT_TRUE(sIsOpen(lDescriptor));
    ClibClose(lDescriptor);
}
