#include "sensor/keeper/include/Environment.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>

using testing::Contains;
using testing::Not;
using testing::StartsWith;

TEST(Environment, KeepsTheOwnButForWhatIsTheServicesAndSetsMore) {
    setenv("TAVIK_TEST_KEPT", "1", 1);
    setenv("TAVIK_TEST_SET", "old", 1);
    setenv("NOTIFY_SOCKET", "/n", 1);
    setenv("LISTEN_FDS", "3", 1);
    setenv("NOTIFY_SOCKET_OF_MINE", "x", 1);
    const std::vector<std::string> lMade = makeChildEnvironment({{"TAVIK_TEST_SET", "new"}});
    EXPECT_THAT(lMade, Contains("TAVIK_TEST_KEPT=1"));
    EXPECT_THAT(lMade, Contains("TAVIK_TEST_SET=new"));
    EXPECT_THAT(lMade, Not(Contains("TAVIK_TEST_SET=old")));
    EXPECT_THAT(lMade, Not(Contains(StartsWith("NOTIFY_SOCKET="))));
    EXPECT_THAT(lMade, Not(Contains(StartsWith("LISTEN_FDS="))));
    EXPECT_THAT(lMade, Contains("NOTIFY_SOCKET_OF_MINE=x"));
    for (const char* lpName : {"TAVIK_TEST_KEPT", "TAVIK_TEST_SET", "NOTIFY_SOCKET", "LISTEN_FDS"}) {
        unsetenv(lpName);
    }
}
