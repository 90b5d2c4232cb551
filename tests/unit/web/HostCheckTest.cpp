#include "sensor/web/src/HostCheck.h"

#include <gtest/gtest.h>

static const std::vector<std::string> scNames = {"db07.example.com", "10.0.0.7"};

TEST(HostCheck, TheHostItselfIsAcceptedWithAnyPortOrNone) {
    for (const char* const lpHeader : {"localhost", "localhost:9632", "LocalHost:1", "127.0.0.1", "127.0.0.1:65535",
                                       "[::1]", "[::1]:9632", "localhost:"}) {
        EXPECT_TRUE(isHostAccepted(lpHeader, {})) << lpHeader;
    }
}

TEST(HostCheck, NamesThatAreGivenAreAcceptedWhateverTheirCase) {
    EXPECT_TRUE(isHostAccepted("DB07.Example.com:9632", scNames));
    EXPECT_TRUE(isHostAccepted("10.0.0.7", scNames));
    EXPECT_FALSE(isHostAccepted("db07.example.com", {}));
}

TEST(HostCheck, NothingElseIsAccepted) {
    for (const char* const lpHeader :
         {"", ":", ":9632", "localhost.example.com", "example.com", "127.0.0.1.example.com", "127.0.0.11", "::1",
          "[::1", "[::2]", "[::1]x", "localhost:80x", "localhost:-1", "localhost:123456", "localhost:80:80",
          " localhost", "localhost ", "db07.example.com.", "xdb07.example.com"}) {
        EXPECT_FALSE(isHostAccepted(lpHeader, scNames)) << lpHeader;
    }
}
