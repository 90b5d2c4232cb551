// The lines of JSON of a real sensor whose collector is killed again and again.
#include <gtest/gtest.h>

#include <csignal>
#include <map>
#include <set>
#include <sstream>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"

/// Each change in the file by its number. A line that comes twice has to be the same.
static std::map<std::uint64_t, std::string> sReadChanges(const std::string& acrPath, const std::string& acrStoreId) {
    std::map<std::uint64_t, std::string> lChanges;
    std::istringstream lLines(readFile(acrPath));
    for (std::string lLine; std::getline(lLines, lLine) && !lLines.eof();) {
        const nlohmann::json lDocument = nlohmann::json::parse(lLine, nullptr, false);
        if (!lDocument.is_object()) {
            ADD_FAILURE() << "not a whole line: " << lLine;
            continue;
        }
        EXPECT_EQ(lDocument["storeId"], acrStoreId);
        const auto lAdded = lChanges.emplace(lDocument["seq"].get<std::uint64_t>(), lLine);
        EXPECT_EQ(lAdded.first->second, lLine);
    }
    return lChanges;
}

TEST(SensorNdjson, CollectorsThatAreKilledLeaveNoChangeOut) {
    ZTCSensorProcess lSensor;
    const std::string lPath = lSensor.path("episodes.ndjson");
    lSensor.configure("collect.period = 0.1\nepisode.gap = 1\nhttp.listen = \"\"\nndjson.path = \"" + lPath + "\"\n");
    lSensor.start();
    bool lMayFinish = false;
    for (const char* const lpKind : {"queue-full", "device-busy", "link", "plogi", "logo", "port-busy"}) {
        lSensor.simulate(std::string(lpKind) + " board=hba0 times=20");
        const pid_t lCollector = lSensor.findCollector();
        ASSERT_NE(lCollector, 0);
        // In turn at once, and when it had time to write the lines.
        if (lMayFinish) {
            lSensor.waitUntilAllIsStored();
        }
        lMayFinish = !lMayFinish;
        kill(lCollector, SIGKILL);
        waitUntil([&] { return lSensor.findCollector() != 0 && lSensor.findCollector() != lCollector; },
                  "the next collector", ZTCDeadline(3 * gcTestPatience));
    }
    lSensor.waitUntilAllIsStored();
    const ZTCHistory lHistory(lSensor.stateDirectory());
    std::set<std::uint64_t> lMissing;
    waitUntil(
        [&] {
            lMissing.clear();
            const auto lChanges = sReadChanges(lPath, lHistory.getStoreId());
            lHistory.visitEpisodes({}, [&](const ZTSEpisode& acrEpisode) {
                if (acrEpisode.mPhase != ZTP_Closed || !lChanges.contains(acrEpisode.mSeq)) {
                    lMissing.insert(acrEpisode.mSeq);
                }
                return true;
            });
            return lMissing.empty();
        },
        "the end of each episode in the file", ZTCDeadline(6 * gcTestPatience));
    EXPECT_EQ(lSensor.stop(), 0);
    expectSoundHistory(lSensor.stateDirectory());
    EXPECT_GE(sReadChanges(lPath, lHistory.getStoreId()).size(), 12U) << "six episodes begin and end";
}
