#include "sensor/topology/include/PatientReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/support/TemporaryDirectory.h"

using testing::ElementsAre;
using testing::IsEmpty;

TEST(PatientReader, ReturnsTextsInTheOrderOfTheirPathsWithoutBlanksAtTheEnd) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("a"), "one \n");
    writeFile(lDirectory.path("b"), "\n");
    ZTCPatientReader lReader;
    EXPECT_THAT(lReader.readAll({lDirectory.path("b"), lDirectory.path("missing"), lDirectory.path("a")}),
                ElementsAre("", std::nullopt, "one"));
    EXPECT_THAT(lReader.readAll({}), IsEmpty());
}

TEST(PatientReader, ADirectoryHasNoText) {
    const ZTCTemporaryDirectory lDirectory;
    EXPECT_THAT(ZTCPatientReader().readAll({lDirectory.path()}), ElementsAre(std::nullopt));
}

TEST(PatientReader, ALongFileIsCutAtItsLimit) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("long"), std::string(2 * gcMostAttributeBytes, 'x'));
    EXPECT_EQ(ZTCPatientReader().readAll({lDirectory.path("long")}).at(0), std::string(gcMostAttributeBytes, 'x'));
}

TEST(PatientReader, MoreFilesThatBlockThanItWaitsForEndTheReadingAndNotTheCaller) {
    const ZTCTemporaryDirectory lDirectory;
    std::vector<std::string> lPaths;
    for (int i = 0; i < 40; ++i) {
        lPaths.push_back(lDirectory.path("fifo" + std::to_string(i)));
        ASSERT_EQ(mkfifo(lPaths.back().c_str(), 0600), 0);
    }
    ZTCPatientReader lReader(std::chrono::milliseconds(2));
    EXPECT_EQ(lReader.readAll(lPaths), std::vector<std::optional<std::string>>(lPaths.size()));
    EXPECT_EQ(lReader.getBlockedPaths().size(), 32U);
}
