#include "tavik/include/SetHeartbeat.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <ctime>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/TestLog.h"
#include "tests/unit/tavik/support/FileTimes.h"

TEST(SetHeartbeat, SetsBothTimesToNowAndNothingElse) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCTestLog lLog(lDirectory.path("log"));
    const std::string lPath = lDirectory.path("own.pid");
    writeFile(lPath, "4711\n");
    setFileTime(lPath, 1000);

    const std::time_t lBefore = std::time(nullptr);
    ZTCSetHeartbeat(ZTCPointer<ZTCString>(new ZTCString(lPath.c_str()))).SetHeartbeat();
    const std::time_t lAfter = std::time(nullptr);

    struct stat lStatus {};
    ASSERT_EQ(0, stat(lPath.c_str(), &lStatus));
    EXPECT_LE(lBefore, lStatus.st_mtime + 1);
    EXPECT_GE(lAfter, lStatus.st_mtime);
    EXPECT_LE(lBefore, lStatus.st_atime + 1);
    EXPECT_GE(lAfter, lStatus.st_atime);
    EXPECT_EQ("4711\n", readFile(lPath));
    EXPECT_TRUE(lLog.texts().empty());
}

TEST(SetHeartbeat, TracesThePath) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCTestLog lLog(lDirectory.path("log"));
    const std::string lPath = lDirectory.path("own.pid");
    writeFile(lPath, "");
    setLogCode(ZTLL_Debug);
    ZTCSetHeartbeat(ZTCPointer<ZTCString>(new ZTCString(lPath.c_str()))).SetHeartbeat();
    EXPECT_EQ((std::vector<std::string>{"-T- Entered", "-T- Setting the mod time of " + lPath, "-T- Left"}),
              lLog.texts("", ".//SetHeartbeat"));
}

TEST(SetHeartbeat, AMissingFileIsAFailureAndIsNotMade) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCTestLog lLog(lDirectory.path("log"));
    const std::string lPath = lDirectory.path("own.pid");
    EXPECT_THROW(ZTCSetHeartbeat(ZTCPointer<ZTCString>(new ZTCString(lPath.c_str()))).SetHeartbeat(),
                 ZTCClibUtimeFailedEx);
    EXPECT_FALSE(exists(lPath));
}
