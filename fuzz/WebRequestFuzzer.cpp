// A request as the web server hands it over: whatever host, path and parameters are, no answer is an error of the
// server, every document is JSON, and a host that is accepted is one of the server's own.
//
// Input: lines: the Host header, the path, and then one parameter each, a name, "=" and its value.
#include <nlohmann/json.hpp>
#include <sstream>
#include <string>

#include "fuzz/support/FuzzInput.h"
#include "sensor/metrics/include/Metrics.h"
#include "sensor/store/include/Store.h"
#include "sensor/web/include/Api.h"
#include "sensor/web/src/HostCheck.h"
#include "tests/support/TemporaryDirectory.h"

/// The interface over a history without events, made once.
static ZTCApi& sApi() {
    static const ZTCTemporaryDirectory* const spDirectory = new ZTCTemporaryDirectory();
    static const ZTCStore* const spStore = new ZTCStore(spDirectory->path(), {}, [](const std::string&) {});
    static ZTCApi* const spApi = [] {
        ZTSApiSources lSources;
        lSources.mStateDirectory = spDirectory->path();
        lSources.mHost = "db07";
        lSources.mVersion = "1";
        lSources.mMayRead = [] { return spStore != nullptr; };
        lSources.mReadLive = [] { return nlohmann::json::object(); };
        lSources.mGiveSeries = [](ZTSMetricFacts&) {};
        lSources.mAddNames = [](ZTCNameBook&) {};
        return new ZTCApi(lSources);
    }();
    return *spApi;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    std::istringstream lLines(std::string(reinterpret_cast<const char*>(apData), aSize));
    std::string lHost;
    std::getline(lLines, lHost);
    const bool lIsAccepted = isHostAccepted(lHost, {"db07.example.net"});
    ZT_FUZZ_REQUIRE(!lIsAccepted || lHost.size() <= std::string("db07.example.net:65535").size(), lHost);
    ZTSWebRequest lRequest;
    std::getline(lLines, lRequest.mPath);
    for (std::string lLine; std::getline(lLines, lLine) && lRequest.mParameters.size() < 64;) {
        const std::size_t lEqual = std::min(lLine.find('='), lLine.size());
        lRequest.mParameters.emplace_back(lLine.substr(0, lEqual), lLine.substr(std::min(lEqual + 1, lLine.size())));
    }
    const ZTSWebResponse lAnswer = sApi().answer(lRequest);
    ZT_FUZZ_REQUIRE(lAnswer.mStatus == 200 || lAnswer.mStatus == 400 || lAnswer.mStatus == 404 ||
                        (lAnswer.mStatus == 503 && lRequest.mPath == "/healthz"),
                    std::to_string(lAnswer.mStatus) + " " + lAnswer.mBody);
    if (lAnswer.mType == "application/json") {
        ZT_FUZZ_REQUIRE(nlohmann::json::accept(lAnswer.mBody), lAnswer.mBody);
    }
    return 0;
}
