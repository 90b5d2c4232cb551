#include <gtest/gtest.h>
#include <unistd.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "system/include/SystemGlobals.h"
#include "tests/support/AgentLog.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/system/ForkedProcess.h"

int tavikMain(int aArgc, char** apArgv);

namespace {

using Texts = std::vector<std::string>;

/// The agent's main in a copy of this process, with everything logged, over a driver of the test.
class Main : public testing::Test {
protected:
    /// Its exit status; 7 where a std::runtime_error came out of it.
    int run(const std::function<void()>& acrDriver) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess&) {
                const ZTCReplacement lDriver(gReplaced.mSystemMain, [&](int, char**) { acrDriver(); });
                if (chdir(mDirectory.path().c_str()) != 0) {
                    return 8;
                }
                setLogFilePath("qrv-tvk.log");
                setLogCode(255);
                char lName[] = "qrv-tvk";
                char* lArgv[] = {lName, nullptr};
                try {
                    return tavikMain(1, lArgv);
                } catch (const std::runtime_error&) {
                    return 7;
                }
            },
            mDirectory.path("child"));
        return lChild.waitForExit();
    }

    /// What main itself has logged, as marked texts.
    Texts texts() const {
        Texts lTexts;
        for (const ZTSLogLine& lcrLine : ZTCAgentLog(mDirectory.path("qrv-tvk.log")).lines()) {
            if (lcrLine.mLabel == ".//TavikMain") {
                lTexts.push_back(lcrLine.mMark + " " + lcrLine.mText);
            }
        }
        return lTexts;
    }

    ZTCTemporaryDirectory mDirectory;
};

}  // namespace

TEST_F(Main, ARunThatEndsSaysSoAndIsLeft) {
    EXPECT_EQ(0, run([] { EXPECT_NE(nullptr, getSystemObject()); }));
    EXPECT_EQ((Texts{"-T- Entered", "-N- Starting the Tavik", "-H- Tavik System exiting", "-T- Left"}), texts());
}

TEST_F(Main, AnExitConditionIsStatusZeroItsLineAndThenLeft) {
    EXPECT_EQ(0, run([] { throw ZTCExitConditionEx("No Libkpm found", 19); }));
    EXPECT_EQ((Texts{"-T- Entered", "-N- Starting the Tavik", "-I- Exit condition", "-T- Left"}), texts());
}

TEST_F(Main, AnotherExceptionOfTheFamilyIsStatusZeroItsTextAndThenLeft) {
    EXPECT_EQ(0, run([] { throw ZTCNotImplementedEx("Not Implemented", 13); }));
    EXPECT_EQ((Texts{"-T- Entered", "-N- Starting the Tavik",
                     "-I- Failed with error - Not Implemented, exiting abruptly", "-T- Left"}),
              texts());
}

TEST_F(Main, AnExceptionThatIsNoneOfTheFamilyIsNotCaught) {
    EXPECT_EQ(7, run([] { throw std::runtime_error("foreign"); }));
    EXPECT_EQ((Texts{"-T- Entered", "-N- Starting the Tavik"}), texts());
}
