#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>

#include "tests/unit/commands/FakeSensor.h"
#include "tests/unit/commands/TavikProgram.h"

using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

class StatusCommand : public TavikProgram {};

TEST_F(StatusCommand, CollectingIs0) {
    store();
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
    const ZTSFinishedRun lRun = run({});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mOutput, HasSubstr("\n state: COLLECTING; nothing lost\n"));
    EXPECT_EQ(lRun.mErrors, "");
    const nlohmann::json lDocument = runJson({"status"});
    EXPECT_EQ(lDocument["schema"], "tavik.status/1");
    EXPECT_EQ(lDocument["state"], "collecting");
    EXPECT_EQ(lDocument["storeId"], store().getStoreId());
}

TEST_F(StatusCommand, DeafForAKindIs1) {
    nlohmann::json lLive = makeLiveState();
    lLive["kinds"][0]["kinds"]["link"] = "no_rights";
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(lLive));
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 1);
    EXPECT_THAT(lRun.mOutput, HasSubstr("PARTLY DEAF"));
}

TEST_F(StatusCommand, AGapOfTheLast24HoursIs1AndAnOlderOneIsForgiven) {
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
    const auto lNoteGap = [this](const char* apReason, std::chrono::hours aAge) {
        ZTSGap lGap;
        lGap.mFrom = getHistoryTime() - aAge - std::chrono::seconds(1);
        lGap.mTo = getHistoryTime() - aAge;
        lGap.mReason = apReason;
        lGap.mGeneration = "a1";
        ZTCStoreTransaction lTransaction = store().begin();
        ASSERT_TRUE(store().noteGap(lGap));
        lTransaction.commit();
    };
    lNoteGap("long ago", std::chrono::hours(25));
    EXPECT_EQ(run({"status"}).mStatus, 0);
    lNoteGap("the agent was killed", std::chrono::hours(1));
    const ZTSFinishedRun lRun = run({"--json", "status"});
    EXPECT_EQ(lRun.mStatus, 1);
    const nlohmann::json lDocument = nlohmann::json::parse(lRun.mOutput);
    ASSERT_EQ(lDocument["gaps"].size(), 1U);
    EXPECT_EQ(lDocument["gaps"][0]["reason"], "the agent was killed");
}

TEST_F(StatusCommand, NoSensorIs3AndTheHistoryIsStillRead) {
    fill();
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_THAT(lRun.mOutput, HasSubstr("NOT COLLECTING; no sensor is running"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("tavik events still works"));
}

TEST_F(StatusCommand, ASocketThatNobodyListensOnIsNoSensor) {
    { const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState())); }
    ASSERT_TRUE(exists(controlPath()));
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_THAT(lRun.mOutput, HasSubstr("no sensor is running"));
}

TEST_F(StatusCommand, ACollectorThatDoesNotAnswerIs3WithinTheTimeLimit) {
    const ZTCFakeSensor lSensor(controlPath(), [](const nlohmann::json&) { return ""; });
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_THAT(lRun.mOutput, HasSubstr("NOT KNOWN; the collector does not answer"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("within 1.2 s"));
}

TEST_F(StatusCommand, ASocketWhoseQueueIsFullIs3WithinTheTimeLimit) {
    sockaddr_un lAddress{};
    lAddress.sun_family = AF_UNIX;
    controlPath().copy(lAddress.sun_path, sizeof(lAddress.sun_path) - 1);
    const auto* const lpAddress = reinterpret_cast<const sockaddr*>(&lAddress);
    const ZTCFileDescriptor lListener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    ASSERT_EQ(bind(lListener.get(), lpAddress, sizeof(lAddress)), 0);
    ASSERT_EQ(listen(lListener.get(), 0), 0);
    std::vector<ZTCFileDescriptor> lClients;
    do {
        lClients.emplace_back(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    } while (connect(lClients.back().get(), lpAddress, sizeof(lAddress)) == 0);
    ASSERT_EQ(errno, EAGAIN);
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_THAT(lRun.mOutput, HasSubstr("NOT KNOWN; the collector does not answer"));
}

TEST_F(StatusCommand, AnswersThatCannotBeUsedAre3AndSaid) {
    const std::pair<const char*, const char*> lAnswers[] = {
        {"{\"error\":\"too busy\"}\n", "too busy"}, {"[1]\n", "is not a JSON"}, {"{\"a\":\n", "is not a JSON"}};
    for (const auto& [lpAnswer, lpText] : lAnswers) {
        const std::string lAnswer = lpAnswer;
        const ZTCFakeSensor lSensor(controlPath(), [lAnswer](const nlohmann::json&) { return lAnswer; });
        const ZTSFinishedRun lRun = run({"status"});
        EXPECT_EQ(lRun.mStatus, 3);
        EXPECT_THAT(lRun.mOutput, HasSubstr(lpText));
    }
}

TEST_F(StatusCommand, ADamagedDatabaseDoesNotKeepItFromAnswering) {
    writeFile(statePath() + "/history.db", std::string(8192, 'x'));
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mOutput, HasSubstr("  note: "));
    EXPECT_THAT(lRun.mOutput, HasSubstr("history.db"));
}

TEST_F(StatusCommand, ADamagedHistoryThatWasSetAsideIsNamedUntilItIsRemoved) {
    store();
    const std::string lPath = statePath() + "/history.damaged-20261121-100412.db";
    writeFile(lPath, "damaged");
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
    EXPECT_EQ(runJson({"status"})["damagedHistories"], nlohmann::json({lPath}));
    const ZTSFinishedRun lRun = run({"status"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mOutput, HasSubstr("  note: a damaged history was set aside as"));
    ASSERT_EQ(unlink(lPath.c_str()), 0);
    EXPECT_EQ(runJson({"status"})["damagedHistories"], nlohmann::json::array());
    EXPECT_THAT(run({"status"}).mOutput, Not(HasSubstr("damaged")));
}

TEST_F(StatusCommand, MarksGoThroughTheSensor) {
    store();
    const ZTCFakeSensor lSensor(controlPath(), [this](const nlohmann::json& acrRequest) -> std::string {
        if (acrRequest != nlohmann::json{{"request", "mark"}, {"name", "before update"}}) {
            return "{\"error\":\"unexpected\"}\n";
        }
        ZTCStoreTransaction lTransaction = store().begin();
        store().setMark("before update", fromMicroseconds(gcBase));
        lTransaction.commit();
        return "{\"mark\":\"before update\",\"time\":\"2026-03-04T05:06:00Z\"}\n";
    });
    const ZTSFinishedRun lRun = run({"mark", "before update"});
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    EXPECT_EQ(lRun.mOutput, "mark \"before update\" set at 2026-03-04 05:06:00\n");
    const nlohmann::json lDocument = runJson({"mark", "before update"});
    EXPECT_EQ(lDocument["schema"], "tavik.mark/1");
    EXPECT_EQ(lDocument["time"], "2026-03-04T05:06:00.000000+00:00");
    EXPECT_EQ(run({"mark", "something else"}).mStatus, 3);
}

TEST_F(StatusCommand, EveryDocumentBeginsWithSchemaHostAndStoreId) {
    fill();
    const ZTCFakeSensor lSensor(controlPath(), [](const nlohmann::json& acrRequest) -> std::string {
        const std::string lRequest = acrRequest.value("request", "");
        return lRequest == "mark"        ? "{\"mark\":\"x\",\"time\":\"2026-03-04T05:06:00Z\"}\n"
               : lRequest == "warn-test" ? "{\"hooks\":[]}\n"
                                         : "{}\n";
    });
    const std::vector<std::string> lCommands[] = {
        {"status"},    {"events"},         {"events", "--records"}, {"ports"},
        {"paths"},     {"explain"},        {"explain", "deaf"},     {"check"},
        {"mark", "x"}, {"warn", "--test"}, {"diff", "24h"},         {"report", "-o", mDirectory.path("r.tgz")}};
    for (const std::vector<std::string>& lrCommand : lCommands) {
        SCOPED_TRACE(testing::PrintToString(lrCommand));
        std::vector<std::string> lLine{"--json"};
        lLine.insert(lLine.end(), lrCommand.begin(), lrCommand.end());
        const auto lDocument = nlohmann::ordered_json::parse(run(lLine).mOutput);
        auto lMember = lDocument.begin();
        EXPECT_EQ(lMember.key(), "schema");
        EXPECT_EQ(lMember.value(), "tavik." + lrCommand[0] + "/1");
        EXPECT_EQ((++lMember).key(), "host");
        EXPECT_EQ((++lMember).key(), "storeId");
        EXPECT_EQ(lMember.value(), store().getStoreId());
    }
}

TEST_F(StatusCommand, AMarkWithoutASensorIs3) {
    const ZTSFinishedRun lRun = run({"mark", "x"});
    EXPECT_EQ(lRun.mStatus, 3);
    EXPECT_EQ(lRun.mOutput, "");
    expectOneLine(lRun);
}

TEST_F(StatusCommand, CheckIsOneLineWithPerformanceDataAndAPluginsStatus) {
    store();
    {
        const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
        const ZTSFinishedRun lRun = run({"check"});
        EXPECT_EQ(lRun.mStatus, 0);
        EXPECT_EQ(lRun.mOutput, "TAVIK OK - COLLECTING; nothing lost | events=0 open=0 lost=0 held=0B;;;0;262144\n");
        EXPECT_EQ(runJson({"check"})["result"], "OK");
    }
    const ZTSFinishedRun lRun = run({"check", "--since", "1h"});
    EXPECT_EQ(lRun.mStatus, 2);
    EXPECT_THAT(lRun.mOutput, StartsWith("TAVIK CRITICAL - NOT COLLECTING; no sensor is running |"));
    EXPECT_EQ(run({"check", "--since", "nonsense"}).mStatus, 2);
    EXPECT_EQ(run({"check", "--since", "nonsense"}).mOutput, "");
}
