#include "os/common/include/SystemInterface.h"

#include <gtest/gtest.h>

TEST(SystemInterface, ItsTextsAreEmptyAtFirst) {
    const ZTCSystemInterface lInterface;
    EXPECT_STREQ(lInterface.getInstallDir().get(), "");
    EXPECT_STREQ(lInterface.getPidFilePathStr().get(), "");
    EXPECT_STREQ(lInterface.getConfFilePathStr().get(), "");
}

TEST(SystemInterface, ItsTextsAreCopiedInAndOut) {
    ZTCSystemInterface lInterface;
    lInterface.setInstallDir(ZTCString("/var/x/"));
    lInterface.setPidFilePathStr(ZTCString("/var/x//a.pid"));
    lInterface.setConfFilePathStr(ZTCString("/etc/a.conf"));
    lInterface.getInstallDir().get()[0] = '?';
    EXPECT_STREQ(lInterface.getInstallDir().get(), "/var/x/");
    EXPECT_STREQ(lInterface.getPidFilePathStr().get(), "/var/x//a.pid");
    EXPECT_STREQ(lInterface.getConfFilePathStr().get(), "/etc/a.conf");
}
