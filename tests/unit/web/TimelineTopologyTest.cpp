// What the stored topology and counters add to a timeline.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "sensor/views/include/TimeText.h"
#include "sensor/views/include/Timeline.h"
#include "tests/unit/store/StoreFixture.h"

namespace {

constexpr std::int64_t scHour = 60 * gcMinute;

class TimelineTopologyTest : public ZTCStoreTest {
protected:
    static ZTSTopology makeTopology(const std::string& acrState) {
        ZTSTopology lTopology;
        lTopology.mInitiators.push_back({.mHost = "host7", .mWwpn = makeName(gcLocalPort), .mState = acrState});
        lTopology.mRemotePorts.push_back(
            {.mName = "rport-7:0-3", .mHost = "host7", .mWwpn = makeName(gcPortA), .mRoles = "FCP Target"});
        lTopology.mRemotePorts.push_back(
            {.mName = "rport-7:0-4", .mHost = "host7", .mWwpn = makeName(gcPortB), .mRoles = "FCP Initiator"});
        lTopology.mPaths.push_back({.mAddress = "7:0:3:1",
                                    .mHost = "host7",
                                    .mRemotePort = "rport-7:0-3",
                                    .mLun = 1,
                                    .mVendor = "ACME",
                                    .mModel = "Array 7"});
        return lTopology;
    }
    void note(std::int64_t aTime, const std::string& acrState) {
        inTransaction([&] { store().noteTopology(aTime, makeTopology(acrState)); });
    }
    /// Ten hours in ten columns.
    nlohmann::ordered_json timeline() {
        return makeTimelineDocument(
            history(),
            {.mFrom = fromMicroseconds(gcBase), .mTo = fromMicroseconds(gcBase + 10 * scHour), .mColumns = 10}, {},
            "db07");
    }
    /// State, from and to.
    std::vector<std::string> links() {
        std::vector<std::string> lTexts;
        const nlohmann::ordered_json lTimeline = timeline();
        for (const auto& lrLink : lTimeline["links"]) {
            EXPECT_EQ(lrLink["initiator"]["host"], "host7");
            const auto lText = [&lrLink](const char* apName) { return lrLink[apName].get<std::string>(); };
            lTexts.push_back(lText("state") + " " + lText("from") + " " + lText("to"));
        }
        return lTexts;
    }
    static std::string at(int aHours) { return toRfc3339(fromMicroseconds(gcBase + aHours * scHour)); }
};

}  // namespace

TEST_F(TimelineTopologyTest, ALinkHasItsStateFromTheChangeThatTheScanSaw) {
    note(gcBase - scHour, "Online");
    note(gcBase + 3 * scHour, "Linkdown");
    note(gcBase + 4 * scHour, "Online");
    EXPECT_EQ(links(), (std::vector<std::string>{"Online " + at(0) + " " + at(3), "Linkdown " + at(3) + " " + at(4),
                                                 "Online " + at(4) + " " + at(10)}));
}

TEST_F(TimelineTopologyTest, BeforeTheFirstScanALinkHasNoState) {
    note(gcBase + 6 * scHour, "Online");
    EXPECT_EQ(links(), (std::vector<std::string>{"Online " + at(6) + " " + at(10)}));
}

TEST_F(TimelineTopologyTest, AnInitiatorThatWentAwayHasNoStateFromThenOn) {
    note(gcBase - scHour, "Online");
    inTransaction([&] { store().noteTopology(gcBase + 2 * scHour, {}); });
    note(gcBase + 5 * scHour, "Linkdown");
    EXPECT_EQ(links(), (std::vector<std::string>{"Online " + at(0) + " " + at(2), "Linkdown " + at(5) + " " + at(10)}));
}

TEST_F(TimelineTopologyTest, TargetsWithoutEventsAreNamedWithTheirArray) {
    note(gcBase, "Online");
    const auto lPorts = timeline()["remotePorts"];
    ASSERT_EQ(lPorts.size(), 1U) << "another initiator is not a target";
    EXPECT_EQ(lPorts[0]["wwpn"], makeName(gcPortA).toText());
    EXPECT_EQ(lPorts[0]["vendor"], "ACME");
    EXPECT_EQ(lPorts[0]["model"], "Array 7");
}

TEST_F(TimelineTopologyTest, CountersAreSummedUpInTheirColumns) {
    const auto lSample = [](std::int64_t aMinute, std::uint64_t aRise, std::optional<std::uint64_t> aPort) {
        ZTSCounterSample lMade{.mMinute = gcBase + aMinute * gcMinute,
                               .mInitiator = makeName(gcLocalPort),
                               .mRemotePort = {},
                               .mCounter = "invalid_crc_count",
                               .mDifference = aRise};
        if (aPort) {
            lMade.mRemotePort = makeName(*aPort);
        }
        return lMade;
    };
    inTransaction([&] {
        store().noteInitiator({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mHost = "host7"});
        store().noteCounters(std::vector{lSample(0, 2, {}), lSample(59, 3, {}), lSample(61, 4, {}),
                                         lSample(61, 5, gcPortA), lSample(600, 99, {})});
    });
    const auto lCounters = timeline()["counters"];
    ASSERT_EQ(lCounters.size(), 2U);
    EXPECT_EQ(lCounters[0]["initiator"]["host"], "host7");
    EXPECT_EQ(lCounters[0]["remotePort"], nullptr);
    EXPECT_EQ(lCounters[0]["cells"], (nlohmann::ordered_json{{0, 5}, {1, 4}}));
    EXPECT_EQ(lCounters[1]["remotePort"]["wwpn"], makeName(gcPortA).toText());
    EXPECT_EQ(lCounters[1]["cells"], (nlohmann::ordered_json{{1, 5}}));
}

TEST_F(TimelineTopologyTest, WithoutATopologyTheListsAreEmpty) {
    store();
    const auto lTimeline = timeline();
    for (const char* lpName : {"remotePorts", "links", "counters"}) {
        EXPECT_TRUE(lTimeline[lpName].is_array() && lTimeline[lpName].empty()) << lpName;
    }
}
