#include "sensor/client/include/TargetText.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "sensor/client/include/ClientErrors.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::ThrowsMessage;

static const char* const scNode = "50:06:01:60:bb:a0:12:34";
static const char* const scPort = "50:06:01:60:3b:a0:12:34";

static ZTSTargetPort sTarget(std::uint32_t aFcId) {
    return {ZTSFcName::fromText(scNode), ZTSFcName::fromText(scPort), aFcId};
}

TEST(TargetText, ReadsNamesAndTheAddressInEitherBase) {
    const std::string lNames = std::string(scNode) + "," + scPort + ",";
    EXPECT_EQ(parseTarget(lNames + "0x010203"), sTarget(0x010203));
    EXPECT_EQ(parseTarget(lNames + "66051"), sTarget(66051));
    EXPECT_EQ(parseTarget(std::string(" ") + scNode + " \t" + scPort + ", 7\r"), sTarget(7));
}

TEST(TargetText, NamesThePartThatIsWrong) {
    const std::string lNames = std::string(scNode) + "," + scPort + ",";
    EXPECT_THAT([] { parseTarget("a,b"); },
                ThrowsMessage<ZTCBadInputEx>(AllOf(HasSubstr("2 parts"), HasSubstr("a,b"))));
    EXPECT_THAT([&] { parseTarget(std::string("x,") + scPort + ",1"); },
                ThrowsMessage<ZTCBadInputEx>(HasSubstr("\"x\" is not a world wide name")));
    EXPECT_THAT([&] { parseTarget(lNames + "0x1000000"); },
                ThrowsMessage<ZTCBadInputEx>(AllOf(HasSubstr("0x1000000"), HasSubstr("16777215"))));
    EXPECT_THAT([&] { parseTarget(lNames + "12z"); }, ThrowsMessage<ZTCBadInputEx>(HasSubstr("\"12z\"")));
    EXPECT_THROW(parseTarget(lNames + "-1"), ZTCBadInputEx);
    EXPECT_THROW(parseTarget(lNames + "0x"), ZTCBadInputEx);
    EXPECT_NO_THROW(parseTarget(lNames + "0xffffff"));
}

TEST(TargetText, AFileHoldsOneTargetALineWithCommentsAndEmptyLines) {
    std::istringstream lFile(std::string("# targets\n\n") + scNode + " " + scPort + " 1  # the first\n   \n" + scNode +
                             "," + scPort + ",0x2");
    EXPECT_EQ(readTargets(lFile, "file"), (std::vector<ZTSTargetPort>{sTarget(1), sTarget(2)}));
}

TEST(TargetText, AnErrorInAFileNamesTheLine) {
    std::istringstream lFile(std::string("#\n") + scNode + "," + scPort + ",1\nrubbish\n");
    EXPECT_THAT([&] { readTargets(lFile, "ports.txt"); },
                ThrowsMessage<ZTCBadInputEx>(AllOf(HasSubstr("ports.txt:3: "), HasSubstr("rubbish"))));
}

TEST(TargetText, ANumberIsHeldAgainstItsLimitExactly) {
    EXPECT_EQ(parseNumber("4294967295", 0xFFFFFFFFU, "n"), 0xFFFFFFFFU);
    EXPECT_THROW(parseNumber("4294967296", 0xFFFFFFFFU, "n"), ZTCBadInputEx);
    EXPECT_EQ(parseNumber("10", 10, "n"), 10U);
    EXPECT_THROW(parseNumber("11", 10, "n"), ZTCBadInputEx);
    EXPECT_THROW(parseNumber("", 10, "n"), ZTCBadInputEx);
    EXPECT_THROW(parseNumber(" 1", 10, "n"), ZTCBadInputEx);
}
