#include "sensor/collector/include/TargetBook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

using testing::ElementsAre;
using testing::IsEmpty;

static ZTSTargetPort sTarget(std::uint32_t aFcId) {
    return {.mNodeName = ZTSFcName::fromText("20:00:00:00:00:00:00:01"),
            .mPortName = ZTSFcName::fromText("10:00:00:00:00:00:00:01"),
            .mFcId = aFcId};
}

TEST(TargetBook, EachTargetIsNextOnce) {
    ZTCTargetBook lBook;
    const std::vector<ZTSTargetPort> lTargets{sTarget(1), sTarget(2), sTarget(1), sTarget(3)};
    lBook.offer(lTargets);
    EXPECT_THAT(lBook.getNext(2), ElementsAre(sTarget(1), sTarget(2)));
    lBook.noteRegistered(2);
    EXPECT_TRUE(lBook.hasMore());
    EXPECT_THAT(lBook.getNext(2), ElementsAre(sTarget(3)));
    lBook.noteRegistered(1);
    EXPECT_FALSE(lBook.hasMore());
    lBook.offer(lTargets);
    EXPECT_FALSE(lBook.hasMore());
}

TEST(TargetBook, APortThatComesBackUnderAnotherIdIsNew) {
    ZTCTargetBook lBook;
    lBook.offer(std::vector{sTarget(1)});
    lBook.noteRegistered(1);
    lBook.offer(std::vector{sTarget(2)});
    EXPECT_THAT(lBook.getNext(9), ElementsAre(sTarget(2)));
}

TEST(TargetBook, PortsBecomeTargetsOnceTheyHaveNamesAndAnId) {
    ZTSTopology lPorts;
    EXPECT_THAT(toTargets(lPorts), IsEmpty());
    const ZTSTargetPort lTarget = sTarget(7);
    lPorts.mRemotePorts = {
        {.mWwpn = lTarget.mPortName, .mWwnn = lTarget.mNodeName, .mFcId = 7},
        {.mWwpn = lTarget.mPortName, .mWwnn = lTarget.mNodeName},
        {.mWwpn = lTarget.mPortName, .mFcId = 7},
        {.mWwnn = lTarget.mNodeName, .mFcId = 7},
    };
    EXPECT_THAT(toTargets(lPorts), ElementsAre(lTarget));
}

TEST(TargetFile, IsReadAsTavikctlReadsIt) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("t"), "# ports\n20:00:00:00:00:00:00:01,10:00:00:00:00:00:00:01,0x7\n");
    EXPECT_THAT(readTargetFile(lDirectory.path("t")), ElementsAre(sTarget(7)));
    EXPECT_THAT(readTargetFile(""), IsEmpty());
    EXPECT_THROW(readTargetFile(lDirectory.path("missing")), ZTCBadInputEx);
}
