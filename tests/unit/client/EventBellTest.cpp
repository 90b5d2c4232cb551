#include "sensor/client/include/EventBell.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/resource.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/ResourceLimit.h"

static bool sIsReadable(const ZTCEventBell& acrBell) {
    pollfd lBell{.fd = acrBell.getDescriptor(), .events = POLLIN, .revents = 0};
    return poll(&lBell, 1, 0) == 1;
}

TEST(EventBell, IsReadableFromARingUntilItIsCleared) {
    const ZTCEventBell lBell;
    EXPECT_FALSE(sIsReadable(lBell));
    lBell.ring();
    lBell.ring();
    EXPECT_TRUE(sIsReadable(lBell));
    lBell.clear();
    EXPECT_FALSE(sIsReadable(lBell)) << "two rings need one clearing";
    lBell.clear();
    lBell.ring();
    EXPECT_TRUE(sIsReadable(lBell));
}

TEST(EventBell, IsClosedInPrograms) {
    const ZTCEventBell lBell;
    EXPECT_NE(fcntl(lBell.getDescriptor(), F_GETFD) & FD_CLOEXEC, 0);
}

TEST(EventBell, WithoutADescriptorLeftTheReasonIsThrown) {
    const ZTCResourceLimit lNone(RLIMIT_NOFILE, 0);
    EXPECT_THROW(ZTCEventBell(), ZTCSystemCallEx);
}
