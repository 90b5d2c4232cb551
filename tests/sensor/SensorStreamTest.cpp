// A reader of the real sensor's stream that stops reading is hung up on, and holds nobody up.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>

#include "tests/sensor/SensorProcess.h"
#include "tests/unit/web/HttpClient.h"

using testing::HasSubstr;

/// A port and kind each is an episode of its own, of about half a kilobyte: many times what may wait for a reader and
/// what the kernel keeps for it.
static constexpr unsigned scPorts = 400;

static std::string sManyPorts() {
    std::string lText = "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80 fcid=0x010000\n";
    for (unsigned i = 0; i < scPorts; ++i) {
        char lLine[160];
        std::snprintf(lLine, sizeof lLine,
                      "port disk%u wwpn=30:00:00:00:00:02:%02x:%02x wwnn=30:00:00:00:00:03:%02x:%02x fcid=0x%06x\n", i,
                      i >> 8, i & 255, i >> 8, i & 255, 0x020000 + i);
        lText += lLine;
    }
    return lText;
}

static std::size_t sCountEpisodes(const std::string& acrLines) {
    std::set<std::uint64_t> lEpisodes;
    std::istringstream lStream(acrLines);
    for (std::string lLine; std::getline(lStream, lLine) && !lStream.eof();) {
        lEpisodes.insert(nlohmann::json::parse(lLine)["episode"].get<std::uint64_t>());
    }
    return lEpisodes.size();
}

TEST(SensorStream, AReaderThatStopsReadingIsHungUpOnAndTheOthersGetAll) {
    ZTCSensorProcess lSensor;
    const std::string lSocket = lSensor.path("http");
    const std::string lLines = lSensor.path("episodes.ndjson");
    lSensor.configure("collect.period = 0.1\nhttp.listen = \"unix:" + lSocket + "\"\nndjson.path = \"" + lLines +
                      "\"\n");
    lSensor.setScenario(sManyPorts());
    lSensor.start();
    waitUntil([&] { return exists(lSocket); }, "the web server");
    ZTCHttpClient lStuck(lSocket);
    ASSERT_TRUE(lStuck.send("GET /api/v1/stream HTTP/1.1\r\nHost: localhost\r\n\r\n"));
    lStuck.readUntil("begins\n\n");

    // Streams are fed before the file: once the file has an episode, the stream gets all that follow.
    lSensor.simulate("link board=hba0");
    waitUntil([&] { return readFile(lLines).find("\"link\"") != std::string::npos; }, "the first line",
              ZTCDeadline(3 * gcTestPatience));
    constexpr std::array scKinds{"plogi", "adisc", "logo", "port-busy", "queue-full", "device-busy"};
    for (const char* const lpKind : scKinds) {
        lSensor.simulate(std::string(lpKind) + " board=hba0 port=all times=" + std::to_string(scPorts));
    }
    lSensor.waitUntilAllIsStored();
    waitUntil([&] { return lStuck.isHungUpOn(); }, "the end of the stream that nobody reads",
              ZTCDeadline(3 * gcTestPatience));

    // Nobody else notices.
    waitUntil([&] { return sCountEpisodes(readFile(lLines)) == 1 + scPorts * scKinds.size(); },
              "the line of each episode", ZTCDeadline(3 * gcTestPatience));
    EXPECT_THAT(ZTCHttpClient::get(lSocket, "/metrics"), HasSubstr("kind=\"device-busy\""));
    ZTCHttpClient lNext(lSocket);
    ASSERT_TRUE(lNext.send("GET /api/v1/stream HTTP/1.1\r\nHost: localhost\r\n\r\n"));
    EXPECT_THAT(lNext.readUntil("begins\n\n"), HasSubstr(" 200 OK"));
    EXPECT_EQ(lSensor.status()["keeper"]["state"], "running");
    EXPECT_EQ(lSensor.stop(), 0);
}
