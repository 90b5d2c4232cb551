// The real sensor's outputs where they cannot work: a folder that is gone, full or read-only, a port that is in use.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <filesystem>

#include "tests/sensor/SensorProcess.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/unit/web/HttpClient.h"

using testing::HasSubstr;

/// The texts of the outputs that do not work, by the live state.
static std::vector<std::string> sListFailing(const ZTCSensorProcess& acrSensor) {
    std::vector<std::string> lTexts;
    try {
        const nlohmann::json lStatus = acrSensor.status();
        for (const nlohmann::json& lrWarning : lStatus["warnings"]) {
            if (lrWarning["kind"] == "output") {
                lTexts.push_back(lrWarning["text"].get<std::string>());
            }
        }
    } catch (const std::exception&) {
        // a collector is just starting
    }
    return lTexts;
}

static void sWaitForFailing(const ZTCSensorProcess& acrSensor, const std::vector<std::string>& acrParts) {
    const auto lAreAll = [&] {
        const std::vector<std::string> lTexts = sListFailing(acrSensor);
        if (lTexts.size() != acrParts.size()) {
            return false;
        }
        for (std::size_t i = 0; i < lTexts.size(); ++i) {
            if (lTexts[i].find(acrParts[i]) == std::string::npos) {
                return false;
            }
        }
        return true;
    };
    std::string lParts;
    for (const std::string& lrPart : acrParts) {
        lParts += lrPart + "; ";
    }
    waitUntil(lAreAll, "outputs that do not work: " + lParts, ZTCDeadline(3 * gcTestPatience));
}

TEST(SensorOutput, AFolderThatIsGoneFullOrReadOnlyIsAWarningAndNothingIsMissingAfterwards) {
    ZTCSensorProcess lSensor;
    const std::string lDisk = lSensor.path("disk");
    const std::string lFolder = lDisk + "/outputs";
    const std::string lSocket = lSensor.path("http");
    std::filesystem::create_directory(lDisk);
    ZTCSmallFileSystem lFileSystem(lDisk, 1024);
    if (!lFileSystem.isMounted()) {
        GTEST_SKIP() << "no file system can be mounted here";
    }
    lSensor.configure("collect.period = 0.1\nhttp.listen = \"unix:" + lSocket + "\"\nmetrics.textfile = \"" + lFolder +
                      "/tavik.prom\"\nndjson.path = \"" + lFolder + "/episodes.ndjson\"\n");
    lSensor.start();
    lSensor.simulate("queue-full board=hba0 times=3");
    sWaitForFailing(lSensor, {"No such file or directory", "No such file or directory"});
    waitUntil(
        [&] {
            return ZTCHttpClient::get(lSocket, "/metrics").find("tavik_open_warnings{kind=\"output\"} 2") !=
                   std::string::npos;
        },
        "the metric");
    EXPECT_THAT(lSensor.standardError(), HasSubstr(lFolder + "/tavik.prom"));

    std::filesystem::create_directory(lFolder);
    lFileSystem.fill();
    lSensor.simulate("device-busy board=hba0 times=3");
    sWaitForFailing(lSensor, {"No space left on device", "No space left on device"});
    lFileSystem.makeReadOnly();
    sWaitForFailing(lSensor, {"No space left on device", "Read-only file system"});  // the first one is open already
    lSensor.simulate("queue-full board=hba1 times=3");
    EXPECT_FALSE(exists(lFolder + "/tavik.prom"));

    lFileSystem.makeWritable();
    lFileSystem.empty();
    sWaitForFailing(lSensor, {});
    EXPECT_THAT(lSensor.standardError(), HasSubstr("the metrics file works again"));
    EXPECT_THAT(readFile(lFolder + "/tavik.prom"), HasSubstr("tavik_build_info"));
    lSensor.waitUntilAllIsStored();
    EXPECT_EQ(lSensor.stop(), 0);
    const std::string lLines = readFile(lFolder + "/episodes.ndjson");
    for (const char* const lpEpisode : {"\"episode\":1,", "\"episode\":2,", "\"episode\":3,"}) {
        EXPECT_THAT(lLines, HasSubstr(lpEpisode)) << "an episode from while it could not be written";
    }
}

TEST(SensorOutput, APortThatIsInUseIsAWarningUntilItIsFree) {
    ZTCFileDescriptor lSocket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in lAddress{};
    lAddress.sin_family = AF_INET;
    lAddress.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    ASSERT_EQ(bind(lSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)), 0);
    socklen_t lLength = sizeof(lAddress);
    ASSERT_EQ(getsockname(lSocket.get(), reinterpret_cast<sockaddr*>(&lAddress), &lLength), 0);
    ASSERT_EQ(listen(lSocket.get(), 1), 0);
    const std::string lListen = "127.0.0.1:" + std::to_string(ntohs(lAddress.sin_port));
    ZTCSensorProcess lSensor("collect.period = 0.1\nhttp.listen = \"" + lListen + "\"\n");
    lSensor.start();
    sWaitForFailing(lSensor, {lListen});
    EXPECT_THAT(sListFailing(lSensor).front(), HasSubstr("Address already in use"));
    EXPECT_EQ(lSensor.status()["keeper"]["state"], "running") << "it collects all the same";
    lSocket.reset();
    sWaitForFailing(lSensor, {});
    EXPECT_THAT(ZTCHttpClient::get(ntohs(lAddress.sin_port), "/metrics"), HasSubstr("tavik_open_warnings"));
    EXPECT_EQ(lSensor.stop(), 0);
}
