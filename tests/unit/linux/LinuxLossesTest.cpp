#include "libkpm/linux/src/Losses.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

TEST(LinuxLosses, EveryKindHasANameOfItsOwnAndSaysWhatIsLost) {
    std::set<std::string> lNames;
    for (const ZTSLossKind& lrKind : gcLinuxLosses) {
        EXPECT_TRUE(lNames.insert(lrKind.mpName).second) << lrKind.mpName;
        EXPECT_LE(std::string(lrKind.mpName).size(), 55u) << "a longer one is cut by the agent";
        EXPECT_NE(std::string(lrKind.mpText), "");
    }
}
