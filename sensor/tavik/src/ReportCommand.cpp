#include <ctime>
#include <nlohmann/json.hpp>

#include "sensor/tavik/src/Report.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"

/// "tavik-report-db07-20261121-100412": letters, digits and a few signs alone, whatever the host is called.
static std::string sMakeName(const std::string& acrHost, std::time_t aTime) {
    std::string lHost;
    for (const char lSign : acrHost) {
        const bool lIsPlain = (lSign >= 'a' && lSign <= 'z') || (lSign >= 'A' && lSign <= 'Z') ||
                              (lSign >= '0' && lSign <= '9') || lSign == '-' || lSign == '.';
        lHost += lIsPlain ? lSign : '_';
    }
    std::tm lLocal{};
    localtime_r(&aTime, &lLocal);
    std::array<char, 32> lText{};
    std::strftime(lText.data(), lText.size(), "%Y%m%d-%H%M%S", &lLocal);
    return "tavik-report-" + lHost + "-" + lText.data();
}

int runReport(const ZTSTavikOptions& acrOptions) {
    const ZTCContext lContext(acrOptions);
    const ZTCHistoryTime lNow = getHistoryTime();
    const std::int64_t lSeconds = toMicroseconds(lNow) / 1000000;
    const std::string lName = sMakeName(lContext.getHost(), static_cast<std::time_t>(lSeconds));
    const std::string lPath = acrOptions.mOutput.empty() ? lName + ".tar.gz" : acrOptions.mOutput;
    const std::vector<ZTSReportFile> lFiles = gatherReport(lContext, lNow);
    const std::uint64_t lBytes = writeArchive(lPath, lName, lFiles, lSeconds);
    if (acrOptions.mIsJson) {
        nlohmann::ordered_json lDocument = beginDocument("report", lContext.getHost(), lContext.findStoreId());
        lDocument["file"] = lPath;
        lDocument["bytes"] = lBytes;
        lDocument["files"] = lFiles.size();
        writeDocument(lDocument);
    } else {
        writeOutput(lPath + ": " + formatCount(lFiles.size(), "file") + ", " + formatBytes(lBytes) +
                    "; missing.txt in it names what could not be had\n");
    }
    return ZTTX_Done;
}
