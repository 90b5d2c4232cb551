// The paths of the host's LUNs over HTTP: as `tavik --json paths` shows them, with the same filters.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "sensor/web/include/Api.h"
#include "tests/unit/store/StoreFixture.h"
#include "tests/unit/views/SanSamples.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

class ApiPaths : public ZTCStoreTest {
protected:
    ZTSWebResponse ask(const std::vector<std::pair<std::string, std::string>>& acrParameters) {
        ZTSApiSources lSources;
        lSources.mStateDirectory = mDirectory.path();
        lSources.mHost = "db07";
        lSources.mMayRead = [] { return true; };
        lSources.mReadLive = [] { return nlohmann::json::object(); };
        lSources.mAddNames = [](ZTCNameBook& arNames) {
            arNames.addName(ZTSFcName::fromText("50:06:01:60:00:00:01:01"), "array7 ctrl-B");
        };
        return ZTCApi(lSources).answer({.mPath = "/api/v1/paths", .mParameters = acrParameters});
    }
    nlohmann::json askJson(const std::vector<std::pair<std::string, std::string>>& acrParameters = {}) {
        const ZTSWebResponse lResponse = ask(acrParameters);
        EXPECT_EQ(lResponse.mStatus, 200U) << lResponse.mBody;
        EXPECT_EQ(lResponse.mType, "application/json");
        return nlohmann::json::parse(lResponse.mBody);
    }
    /// A healthy host of two initiators and four LUNs, whose port "rport-8:0-1" has gone a minute ago.
    void fill() {
        ZTSTopology lSan = makeSan({});
        const std::int64_t lNow = toMicroseconds(getHistoryTime());
        inTransaction([&] { store().noteTopology(lNow - gcDay, lSan); });
        losePort(lSan, "rport-8:0-1");
        inTransaction([&] { store().noteTopology(lNow - gcMinute, lSan); });
    }
};

TEST_F(ApiPaths, EachLunHasItsPathsWithStatesPortsAndTrouble) {
    fill();
    const nlohmann::json lAll = askJson();
    EXPECT_EQ(lAll["schema"], "tavik.paths/1");
    EXPECT_EQ(lAll["host"], "db07");
    EXPECT_EQ(lAll["storeId"], store().getStoreId());
    EXPECT_EQ(lAll["stale"], false);
    ASSERT_EQ(lAll["luns"].size(), 4U);
    const nlohmann::json& lrLun = lAll["luns"][0];
    EXPECT_EQ(lrLun["wwid"], "naa.000");
    EXPECT_EQ(lrLun["multipath"], "mpath0");
    EXPECT_EQ(lrLun["vendor"], "ACME");
    EXPECT_EQ(lrLun["model"], "LUNBOX");
    EXPECT_EQ(lrLun["mounts"], nlohmann::json({"/data/0"}));
    EXPECT_EQ(lrLun["redundancy"], "reduced");
    EXPECT_EQ(lrLun["running"], 7);
    EXPECT_EQ(lrLun["expected"], 8);
    ASSERT_EQ(lrLun["paths"].size(), 8U);
    for (const nlohmann::json& lrPath : lrLun["paths"]) {
        const bool lIsLost = lrPath["remotePort"]["name"] == "array7 ctrl-B";
        EXPECT_EQ(lrPath["running"], !lIsLost) << lrPath.dump(1);
        EXPECT_EQ(lrPath["remotePortState"], lIsLost ? "Blocked" : "Online");
        EXPECT_TRUE(lrPath["disk"].is_string());
    }
    ASSERT_EQ(lAll["troubles"].size(), 1U);
    EXPECT_EQ(lAll["troubles"][0]["id"], "path-lost");
    EXPECT_THAT(lAll["troubles"][0]["subject"].get<std::string>(), HasSubstr("array7 ctrl-B"));
}

TEST_F(ApiPaths, FiltersAndATimeThatIsPastAreThoseOfTheCommand) {
    fill();
    EXPECT_EQ(askJson({{"lun", "mpath1"}, {"lun", "2"}})["luns"].size(), 2U);
    EXPECT_EQ(askJson({{"initiator", "host7"}})["luns"].size(), 4U);
    EXPECT_EQ(askJson({{"port", "array7 ctrl-B"}, {"lun", "3"}})["luns"].size(), 1U);
    EXPECT_EQ(askJson({{"trouble", "true"}})["luns"].size(), 4U);
    const nlohmann::json lBefore = askJson({{"at", "1h"}});
    EXPECT_EQ(lBefore["luns"][0]["running"], 8);
    EXPECT_TRUE(lBefore["troubles"].empty());
    EXPECT_EQ(askJson({{"at", "1h"}, {"trouble", "true"}})["luns"].size(), 0U);
    const nlohmann::json lLongAgo = askJson({{"at", "30d"}});
    EXPECT_TRUE(lLongAgo["luns"].is_null()) << "nothing is known of that time";
    EXPECT_TRUE(lLongAgo["scanned"].is_null());
}

TEST_F(ApiPaths, AWrongParameterGets400AndSaysWhyByItsOwnName) {
    fill();
    for (const auto& lrWrong : std::vector<std::pair<std::string, std::string>>{
             {"port", "nowhere"}, {"initiator", "host99"}, {"at", "when?"}, {"trouble", "perhaps"}, {"kind", "link"}}) {
        const ZTSWebResponse lResponse = ask({lrWrong});
        EXPECT_EQ(lResponse.mStatus, 400U) << lrWrong.first;
        EXPECT_THAT(nlohmann::json::parse(lResponse.mBody)["error"].get<std::string>(),
                    AllOf(HasSubstr(lrWrong.first), Not(HasSubstr("--"))));
    }
}
