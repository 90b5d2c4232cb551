#include "tests/unit/views/ViewSamples.h"

#include <cstdlib>
#include <ctime>
#include <stdexcept>

#include "sensor/views/include/TimeText.h"

LocalTime::LocalTime() {
    setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1);
    tzset();
}

LocalTime::~LocalTime() {
    unsetenv("TZ");
    tzset();
}

ZTCHistoryTime timeOf(const std::string& acrText) {
    const auto lTime = fromRfc3339(acrText);
    if (!lTime) {
        throw std::runtime_error("no time: " + acrText);
    }
    return *lTime;
}

ZTSFcName wwnOf(const std::string& acrText) {
    return ZTSFcName::fromText(acrText);
}

static nlohmann::json sKinds(const std::string& acrHost, const std::string& acrWwpn) {
    nlohmann::json lStates;
    for (const char* lpKind : {"plogi", "logo", "rscn", "link", "queue-full", "check-condition"}) {
        lStates[lpKind] = "listening";
    }
    for (const char* lpKind :
         {"prlo", "adisc", "lsrjt", "fabric-busy", "port-busy", "fcp-read-check", "device-busy", "lun-reset",
          "target-reset", "bus-reset", "queue-depth", "port-interrupt", "temperature", "adapter-arrival"}) {
        lStates[lpKind] = "no_source";
    }
    return {{"initiator", {{"wwpn", acrWwpn}, {"wwnn", nullptr}, {"host", acrHost}}},
            {"kinds", lStates},
            {"words", nlohmann::json::object()}};
}

nlohmann::json makeHealthyJson() {
    const std::string lOne = "10:00:00:00:c9:00:00:01";
    const std::string lTwo = "10:00:00:00:c9:00:00:02";
    return {{"schema", "tavik.live/1"},
            {"storeId", "00112233445566778899aabbccddeeff"},
            {"keeper", {{"pid", 811}, {"state", "running"}, {"since", "2026-11-14T08:12:00+01:00"}}},
            {"agent",
             {{"running", true},
              {"pid", 813},
              {"generation", "a1"},
              {"since", "2026-11-14T08:12:00+01:00"},
              {"restarts", 0},
              {"adapters", 2},
              {"adaptersAtStart", 2},
              {"heldBytes", 0},
              {"heldRecords", 0},
              {"limitBytes", 262144}}},
            {"collector",
             {{"pid", 812},
              {"lastAsked", "2026-11-21T10:04:10+01:00"},
              {"lastEvent", "2026-11-21T06:59:00+01:00"},
              {"lastEventKind", "rscn"},
              {"disk", "ok"}}},
            {"adapters",
             {{{"wwpn", lOne}, {"host", "host7"}, {"portState", "Online"}},
              {{"wwpn", lTwo}, {"host", "host8"}, {"portState", "Online"}}}},
            {"kinds", {sKinds("host7", lOne), sKinds("host8", lTwo)}},
            {"losses", {{"since", "2026-11-20T10:04:12+01:00"}, {"refused", {{"total-limit", 0}}}, {"dropped", 0}}}};
}

ZTSStatusFacts makeFacts(const nlohmann::json& acrLive) {
    ZTSStatusFacts lFacts;
    lFacts.mHost = "db07";
    lFacts.mNow = timeOf("2026-11-21T10:04:12+01:00");
    lFacts.mAnswer = ZTAN_Answered;
    lFacts.mLive = readLiveState(acrLive);
    lFacts.mHistory.emplace();
    lFacts.mHistory->mStoreId = "00112233445566778899aabbccddeeff";
    lFacts.mHistory->mLastRun = ZTSRun{
        .mFrom = timeOf("2026-11-14T08:12:00+01:00"), .mTo = timeOf("2026-11-21T10:04:00+01:00"), .mIsOpen = true};
    setSan(lFacts, makeSan({.mLuns = 96}));
    return lFacts;
}

void setSan(ZTSStatusFacts& arFacts, const ZTSTopology& acrTopology, const ZTSSanPast& acrPast) {
    arFacts.mHistory->mSan = ZTSSanView{.mTopology = acrTopology,
                                        .mFacts = findSanFacts(acrTopology, acrPast),
                                        .mScanned = arFacts.mNow,
                                        .mIsStale = !acrTopology.mBlocked.empty()};
}

ZTSStatusFacts makeHealthyFacts() {
    return makeFacts(makeHealthyJson());
}

ZTSEpisode makeQueueFullEpisode() {
    ZTSEpisode lEpisode;
    lEpisode.mSeq = 41;
    lEpisode.mEpisode = 12;
    lEpisode.mPhase = ZTP_Closed;
    lEpisode.mKind = *findKind("queue-full");
    lEpisode.mInitiator = {wwnOf("10:00:00:00:c9:00:00:01"), wwnOf("20:00:00:00:c9:00:00:01"), "host7"};
    lEpisode.mRemotePort = ZTSRemotePort{wwnOf("50:06:01:60:3b:a0:12:34"), std::nullopt, 0x010200};
    lEpisode.mCount = 20000;
    lEpisode.mRecords = 3;
    lEpisode.mFirst = timeOf("2026-11-21T09:58:03.555216+01:00");
    lEpisode.mLast = timeOf("2026-11-21T09:58:40+01:00");
    lEpisode.mDetail.mLuns = ZTSLunSet{.mIsAll = false, .mNumbers = {0, 1, 40}, .mHasMore = false};
    return lEpisode;
}
