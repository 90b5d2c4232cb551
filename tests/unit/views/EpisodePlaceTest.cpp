// Episodes in the names of their time: host, port, disks, mounts; the ports of an RSCN's area; counters beside.
#include "sensor/views/include/EpisodePlace.h"

#include <gmock/gmock.h>

#include "sensor/store/include/Store.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/EpisodeText.h"
#include "sensor/views/include/Explanation.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/views/ViewSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using ZTCJson = nlohmann::ordered_json;

/// The array's port of the sample episode, as host7 sees it.
static ZTSTopologyRemotePort sArrayPort() {
    return {.mName = "rport-7:0-3",
            .mHost = "host7",
            .mWwpn = wwnOf("50:06:01:60:3b:a0:12:34"),
            .mWwnn = wwnOf("50:06:01:60:bb:a0:12:34"),
            .mState = "Online",
            .mFcId = 0x010203};
}

static ZTSTopologyPath sPath(std::uint64_t aLun, const std::string& acrDisk) {
    return {.mAddress = "7:0:3:" + std::to_string(aLun),
            .mHost = "host7",
            .mRemotePort = "rport-7:0-3",
            .mLun = aLun,
            .mVendor = "ACME",
            .mModel = "Array",
            .mWwid = "naa.6000" + std::to_string(aLun),
            .mDisk = acrDisk};
}

static ZTSTopology sTopology() {
    ZTSTopology lTopology;
    lTopology.mInitiators = {{.mHost = "host7",
                              .mWwpn = wwnOf("10:00:00:00:c9:00:00:01"),
                              .mWwnn = wwnOf("20:00:00:00:c9:00:00:01"),
                              .mSymbolicName = "db07 upper slot"}};
    lTopology.mRemotePorts = {sArrayPort()};
    lTopology.mPaths = {sPath(0, "sdb"), sPath(40, "sdd"), sPath(41, "sde")};
    lTopology.mPaths[0].mHolders = {"dm-0"};
    lTopology.mMappings["dm-0"] = {.mDevice = "dm-0", .mName = "mpatha", .mUuid = "mpath-60000", .mSlaves = {"sdb"}};
    lTopology.mMounts["dm-0"] = {"/srv/data"};
    return lTopology;
}

/// One topology up to the end of 2026-11-20, another from then on.
class EpisodePlace : public LocalTime {
protected:
    EpisodePlace() {
        mNames.setTopology(
            [this](ZTCHistoryTime aTime) { return aTime < timeOf("2026-11-21T00:00:00+01:00") ? &mBefore : &mNow; });
    }

    ZTSTopology mBefore;
    ZTSTopology mNow = sTopology();
    ZTCNameBook mNames;
};

TEST_F(EpisodePlace, TheDisksBehindTheLunsAreNamedWithWhatIsBuiltOnThem) {
    const ZTCJson lJson = toJson(makeQueueFullEpisode(), mNames);  // LUNs 0, 1, 40
    EXPECT_EQ(lJson["devices"].dump(),
              R"([{"lun":0,"address":"7:0:3:0","vendor":"ACME","model":"Array","wwid":"naa.60000","disk":"sdb",)"
              R"("multipath":"mpatha","mounts":["/srv/data"]},)"
              R"({"lun":40,"address":"7:0:3:40","vendor":"ACME","model":"Array","wwid":"naa.600040","disk":"sdd",)"
              R"("multipath":null,"mounts":[]}])");
    EXPECT_EQ(lJson["remotePort"].dump(),
              R"({"wwpn":"50:06:01:60:3b:a0:12:34","wwnn":"50:06:01:60:bb:a0:12:34","fcId":"010203","name":null,)"
              R"("rport":"rport-7:0-3"})");
    ZTCTextTable lTable = makeEpisodeTable(0);
    addRow(lTable, makeQueueFullEpisode(), mNames, timeOf("2026-11-21T10:04:12+01:00"));
    EXPECT_THAT(lTable.takeText(), HasSubstr("LUNs 0,1,40; mpatha (/srv/data), sdd"));
    EXPECT_THAT(formatExplanation(explainEpisode(makeQueueFullEpisode(), {}, {}, mNames, {}), {}, {}),
                HasSubstr("\n  LUN 0: mpatha (sdb), ACME Array, on /srv/data.\n  LUN 40: sdd, ACME Array.\n"));
}

TEST_F(EpisodePlace, AnEventOfLastWeekHasTheNamesOfLastWeek) {
    mBefore = sTopology();
    mBefore.mInitiators[0].mHost = mBefore.mRemotePorts[0].mHost = "host3";
    mBefore.mPaths[0].mDisk = "sdz";
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    lEpisode.mFirst = timeOf("2026-11-14T10:00:00+01:00");
    const ZTCJson lThen = toJson(lEpisode, mNames);
    EXPECT_EQ(lThen["initiator"]["host"], "host3");
    EXPECT_EQ(lThen["devices"][0]["disk"], "sdz");
    EXPECT_EQ(toJson(makeQueueFullEpisode(), mNames)["initiator"]["host"], "host7");
}

TEST_F(EpisodePlace, WithoutATopologyOfThatTimeNothingIsMadeUp) {
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    for (const ZTCNameBook& lrNames : {mNames, ZTCNameBook()}) {
        lEpisode.mFirst = timeOf("2026-11-14T10:00:00+01:00");  // before the port was there
        const ZTCJson lJson = toJson(lEpisode, lrNames);
        EXPECT_EQ(lJson["devices"], nullptr);
        EXPECT_EQ(lJson["remotePort"]["rport"], nullptr);
        EXPECT_EQ(lJson["remotePort"]["fcId"], "010200") << "as the history has it";
        EXPECT_EQ(lJson["initiator"]["host"], "host7");
    }
}

TEST_F(EpisodePlace, AnEpisodeOfAllLunsNamesEveryDiskOfThePort) {
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    lEpisode.mDetail.mLuns = ZTSLunSet{.mIsAll = true, .mNumbers = {}, .mHasMore = false};
    EXPECT_EQ(findPlace(lEpisode, mNames).mDevices.size(), 3U);
    EXPECT_EQ(formatDevices(findPlace(lEpisode, mNames).mDevices), "mpatha (/srv/data), sdd, sde");
    mNow.mPaths.push_back(sPath(42, "sdf"));
    EXPECT_EQ(formatDevices(findPlace(lEpisode, mNames).mDevices), "mpatha (/srv/data), sdd, sde ...");
    mNow.mPaths.clear();
    EXPECT_EQ(toJson(lEpisode, mNames)["devices"].dump(), "[]") << "the port is known, and has none";
}

TEST_F(EpisodePlace, TheAreaOrDomainOfAnRscnIsResolvedToThePortsWithinIt) {
    const auto lAdd = [this](const std::string& acrName, const std::string& acrHost, std::uint32_t aFcId) {
        ZTSTopologyRemotePort lPort = sArrayPort();
        lPort.mName = acrName;
        lPort.mHost = acrHost;
        lPort.mWwpn->mBytes[7] = static_cast<std::uint8_t>(aFcId);
        lPort.mFcId = aFcId;
        mNow.mRemotePorts.push_back(lPort);
    };
    lAdd("rport-7:0-4", "host7", 0x010299);  // same area
    lAdd("rport-7:0-5", "host7", 0x010305);  // same domain
    lAdd("rport-7:0-6", "host7", 0x020206);  // another domain
    lAdd("rport-8:0-0", "host8", 0x010207);  // on another fabric
    ZTSEpisode lEpisode = makeQueueFullEpisode();
    lEpisode.mKind = *findKind("rscn");
    lEpisode.mRemotePort.reset();
    lEpisode.mDetail = {};
    const auto lCount = [&](std::uint32_t aPage) {
        lEpisode.mDetail.mPage = aPage;
        const auto lAffected = findPlace(lEpisode, mNames).mAffected;
        return lAffected ? static_cast<int>(lAffected->size()) : -1;
    };
    EXPECT_EQ(lCount(0x01010200), 2);
    EXPECT_EQ(lCount(0x02010000), 3);
    EXPECT_EQ(lCount(0x02030000), 0) << "nothing that the host knows";
    EXPECT_EQ(lCount(0x00010203), -1) << "a port's address names its port itself";
    EXPECT_EQ(lCount(0x03000000), -1);

    lEpisode.mDetail.mPage = 0x01010200;
    const ZTCJson lJson = toJson(lEpisode, mNames);
    ASSERT_EQ(lJson["detail"]["ports"].size(), 2U);
    EXPECT_EQ(lJson["detail"]["ports"][1]["fcId"], "010299");
    ZTCTextTable lTable = makeEpisodeTable(0);
    addRow(lTable, lEpisode, mNames, timeOf("2026-11-21T10:04:12+01:00"));
    EXPECT_THAT(lTable.takeText(), HasSubstr("area 010200; 2 known ports"));
}

TEST_F(EpisodePlace, APortsRowHasItsStateAndWhoSeesIt) {
    ZTSPortSummary lPort;
    lPort.mPort = *makeQueueFullEpisode().mRemotePort;
    lPort.mLastEvent = timeOf("2026-11-20T09:58:40+01:00");
    mNow.mInitiators.push_back({.mHost = "host8", .mWwpn = wwnOf("10:00:00:00:c9:00:00:02")});
    mNow.mRemotePorts.push_back(sArrayPort());
    mNow.mRemotePorts.back().mName = "rport-8:0-1";
    mNow.mRemotePorts.back().mHost = "host8";
    ZTCJson lJson = toJson(lPort, mNames);
    EXPECT_EQ(lJson["state"], "Online");
    ASSERT_EQ(lJson["initiators"].size(), 2U);
    EXPECT_EQ(lJson["initiators"][1]["host"], "host8");
    EXPECT_EQ(lJson["rports"][1].dump(), R"({"rport":"rport-8:0-1","host":"host8","state":"Online"})");
    mNow.mRemotePorts.back().mState = "Not Present";
    EXPECT_EQ(toJson(lPort, mNames)["state"], "Not Present, Online");
    ZTCTextTable lTable = makePortTable(0);
    addRow(lTable, lPort, mNames, timeOf("2026-11-21T10:04:12+01:00"));
    EXPECT_THAT(lTable.takeText(), HasSubstr("Not Present, Online"));
    mNow.mRemotePorts.clear();
    EXPECT_EQ(toJson(lPort, mNames)["state"], nullptr);
}

TEST_F(EpisodePlace, FiltersTakeTheKernelsNamesOfNow) {
    EXPECT_THAT(mNames.findRemotePorts("rport-7:0-3"), ElementsAre(*sArrayPort().mWwpn));
    EXPECT_THAT(mNames.findRemotePorts("rport-7:0-4"), IsEmpty());
    EXPECT_THAT(mNames.findInitiators("host7"), ElementsAre(wwnOf("10:00:00:00:c9:00:00:01")));
    EXPECT_THAT(mNames.findInitiators("db07 upper slot"), ElementsAre(wwnOf("10:00:00:00:c9:00:00:01")));
    EXPECT_THAT(mNames.findInitiators("host9"), IsEmpty());
}

/// With a history of its own.
class PlaceFromHistory : public LocalTime {
protected:
    void change(const std::function<void()>& acrCall) {
        ZTCStoreTransaction lTransaction = mStore.begin();
        acrCall();
        lTransaction.commit();
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCStore mStore{mDirectory.path(), {}, nullptr};
    const ZTSEpisode mEpisode = makeQueueFullEpisode();
};

TEST_F(PlaceFromHistory, TheHistorysTopologyOfTheTimeIsUsedInAnyOrderOfTimes) {
    const std::int64_t lFirst = toMicroseconds(mEpisode.mFirst);
    constexpr std::int64_t scMinute = 60'000'000;
    ZTSTopology lLater = sTopology();
    lLater.mPaths[0].mDisk = "sdx";
    change([&] { mStore.noteTopology(lFirst, sTopology()); });
    change([&] { mStore.noteTopology(lFirst + scMinute, lLater); });
    const ZTCHistory lHistory(mDirectory.path());
    const ZTCTopologyAt lAt = readTopologyOf(lHistory);
    const auto lDiskAt = [&](std::int64_t aTime) -> std::string {
        const ZTSTopology* const lpTopology = lAt(fromMicroseconds(aTime));
        return lpTopology == nullptr ? "none" : lpTopology->mPaths.at(0).mDisk.value();
    };
    EXPECT_EQ(lDiskAt(lFirst + 2 * scMinute), "sdx");
    EXPECT_EQ(lDiskAt(lFirst), "sdb");
    EXPECT_EQ(lDiskAt(lFirst + scMinute), "sdx");
    EXPECT_EQ(lDiskAt(lFirst + scMinute / 2), "sdb");
    EXPECT_EQ(lDiskAt(lFirst + 3 * scMinute), "sdx");
    EXPECT_EQ(lDiskAt(lFirst - scMinute / 2), "sdb") << "the first scan came a moment later";
    EXPECT_EQ(lDiskAt(lFirst - 2 * scMinute), "none");
}

TEST_F(PlaceFromHistory, CountersOfTheSamePortsAndMinutesStandBeside) {
    constexpr std::int64_t scMinute = 60'000'000;
    const std::int64_t lFirst = toMicroseconds(mEpisode.mFirst) / scMinute * scMinute;
    const ZTSFcName lInitiator = *mEpisode.mInitiator.mWwpn;
    const ZTSFcName lOther = wwnOf("10:00:00:00:c9:00:00:02");
    const ZTSFcName lPort = mEpisode.mRemotePort->mWwpn;
    ZTSEpisode lEpisode = mEpisode;
    lEpisode.mLast = lEpisode.mFirst + std::chrono::minutes(1);
    change([&] {
        mStore.noteCounters(std::vector<ZTSCounterSample>{
            {lFirst - scMinute, lInitiator, std::nullopt, "invalid_crc_count", 1000},  // a minute before
            {lFirst, lInitiator, std::nullopt, "invalid_crc_count", 3},
            {lFirst, lInitiator, lPort, "fpin_cn", 2},
            {lFirst, lInitiator, lOther, "fpin_cn", 50},              // of another remote port
            {lFirst, lOther, std::nullopt, "link_failure_count", 9},  // of another initiator
            {lFirst + scMinute, lInitiator, std::nullopt, "invalid_crc_count", 4}});
    });
    const ZTCHistory lHistory(mDirectory.path());
    ZTCNameBook lNames;
    EXPECT_TRUE(countersBeside(lEpisode, lNames).empty());
    EXPECT_FALSE(toJson(lEpisode, lNames).contains("counters")) << "not looked for";
    lNames.setCounters(readCountersOf(lHistory));
    EXPECT_EQ(formatCounters(countersBeside(lEpisode, lNames)), "invalid_crc_count +7, port's fpin_cn +2");
    EXPECT_EQ(toJson(lEpisode, lNames)["counters"].dump(),
              R"([{"of":"initiator","counter":"invalid_crc_count","difference":7},)"
              R"({"of":"remotePort","counter":"fpin_cn","difference":2}])");
    EXPECT_THAT(countersBeside(lEpisode, lNames),
                ElementsAre(ZTSCounterSample{lFirst, lInitiator, std::nullopt, "invalid_crc_count", 7},
                            ZTSCounterSample{lFirst, lInitiator, lPort, "fpin_cn", 2}));
}
