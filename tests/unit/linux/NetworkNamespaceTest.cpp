#include "libkpm/linux/src/NetworkNamespace.h"

#include <gtest/gtest.h>

#include <string>

static const std::string scHeader =
    "sk               Eth Pid        Groups   Rmem     Wmem     Dump  Locks    Drops    Inode\n";

TEST(NetworkNamespace, TheKernelsOwnSocketOfTheFamilyIsFound) {
    EXPECT_EQ(hasKernelSocket(
                  scHeader + "0000000000000000 0   0          00000000 0        0        0     2        0        20\n"
                             "0000000000000000 18  0          00000000 0        0        0     2        0        50\n",
                  18),
              true);
}

TEST(NetworkNamespace, SocketsOfProcessesAndOfOtherFamiliesAreNotTheKernels) {
    EXPECT_EQ(hasKernelSocket(
                  scHeader + "0000000000000000 18  4711       00000008 0        0        0     2        0        51\n"
                             "0000000000000000 1   0          00000000 0        0        0     2        0        52\n"
                             "0000000000000000 118 0          00000000 0        0        0     2        0        53\n"
                             "garbage\n\n",
                  18),
              false);
    EXPECT_EQ(hasKernelSocket(scHeader, 18), false);
}

TEST(NetworkNamespace, ATextThatIsNoSuchTableSaysNothing) {
    EXPECT_FALSE(hasKernelSocket("", 18).has_value());
    EXPECT_FALSE(hasKernelSocket("18 18 0\n", 18).has_value());
    EXPECT_FALSE(hasKernelSocket("sk Pid Eth\n18 18 0\n", 18).has_value());
}
