#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <utility>
#include <vector>

#include "common/include/Exception.h"
#include "os/common/include/Clib.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/tavik/support/TavikFixture.h"

extern "C" void __real__Z9ClibMkdirPKci(const char*, int);

namespace {

class RuntimeDirectory : public ZTCTavikFixture {};

}  // namespace

TEST_F(RuntimeDirectory, IsMadeWithTheHexadecimalModeWhereItIsMissing) {
    std::vector<std::pair<std::string, int>> lMade;
    const ZTCReplacement lMkdir(gReplaced.mMkdir,
                                [&](const char* apPath, int aMode) { lMade.emplace_back(apPath, aMode); });
    mSystem->preInit();
    EXPECT_EQ((std::vector<std::pair<std::string, int>>{{"/tmp", 03567}}), lMade);
    EXPECT_STREQ("/tmp", gRtDir);
    EXPECT_EQ(std::vector<std::string>{}, mLog.texts("-W-")) << "nothing to warn of";
}

TEST_F(RuntimeDirectory, ItsModeIsSetGroupIdStickyAndTheRights567LessTheUmask) {
    const std::string lPath = mDirectory.path("runtime");
    const ZTCReplacement lMkdir(gReplaced.mMkdir, [&](const char*, int aMode) {
        const mode_t lFormer = umask(0);
        __real__Z9ClibMkdirPKci(lPath.c_str(), aMode);
        umask(lFormer);
    });
    mSystem->preInit();
    struct stat lStatus {};
    ASSERT_EQ(0, stat(lPath.c_str(), &lStatus));
    // mkdir itself does not set the set-group-id bit.
    EXPECT_EQ(01567u, lStatus.st_mode & 05777u);
}

TEST_F(RuntimeDirectory, OneThatIsThereIsAWarning) {
    const ZTCReplacement lMkdir(gReplaced.mMkdir, [](const char*, int) { throw ZTCExistsEx("exists"); });
    mSystem->preInit();
    EXPECT_EQ(std::vector<std::string>{"-W- '/tmp' already exists... continuing"}, mLog.texts("-W-"));
}

TEST_F(RuntimeDirectory, AnotherFailureLeavesPreInit) {
    const ZTCReplacement lMkdir(gReplaced.mMkdir, [](const char*, int) { throw ZTCClibMkdirFailedEx("no room"); });
    try {
        mSystem->preInit();
        FAIL() << "the exception was swallowed";
    } catch (const ZTCClibMkdirFailedEx& acrException) {
        EXPECT_STREQ("no room", acrException.what());
    }
    EXPECT_EQ(std::vector<std::string>{}, mLog.texts("-W-"));
}
