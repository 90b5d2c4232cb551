#include "sensor/tavik/src/Report.h"

#include <sys/utsname.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <fstream>
#include <functional>
#include <memory>
#include <nlohmann/json.hpp>
#include <system_error>

#include "sensor/client/include/RecordJson.h"
#include "sensor/settings/include/SettingsList.h"
#include "sensor/views/include/CheckView.h"
#include "sensor/views/include/EpisodeJson.h"
#include "sensor/views/include/PathsView.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TimeText.h"

using ZTCJson = nlohmann::ordered_json;

static constexpr std::chrono::hours scSpan{7 * 24};
static constexpr std::uint64_t scMostEpisodes = 20000;
static constexpr std::size_t scMostCounters = 200000;
static constexpr std::size_t scMostLogBytes = 1U << 20U;
/// The sensor's messages. A journal that hangs costs ten seconds.
static constexpr const char* scJournal = "timeout 10 journalctl -u tavik -n 2000 --no-pager 2>&1";

static constexpr const char* scReadMe = R"(This archive was made by 'tavik report'.

settings.txt     the settings in force, from the file and the defaults
versions.txt     of tavik, the kernel and the distribution
status.*         as 'tavik status' shows it; check.txt: 'tavik check'
paths.json       LUNs with their paths
history/         the last 7 days: episodes, ports, gaps, changes of the topology, error counters
sysfs/           what the kernel shows about Fibre Channel ports and SCSI devices
logs/            the end of the agent's log and of the service's messages
missing.txt      the parts that are missing, and why

Left out: the configuration file itself with its comments, and the arguments of the programs of [[warn]] tables,
wherever they occur. In it are: the host's name, names and addresses of ports, names of disks, folders that are mounted.
)";

/// Adds parts one by one; one that fails is named in missing.txt and costs no other.
class ZTCReport {
public:
    ZTCReport(const ZTCContext& acrContext, ZTCHistoryTime aNow) : mrContext(acrContext), mNow(aNow) {}

    std::vector<ZTSReportFile> gather() {
        add("README.txt", [] { return std::string(scReadMe); });
        add("settings.txt", [this] { return listSettings(mrContext.getSettings()); });
        add("versions.txt", [] { return describeVersions(); });
        addStatus();
        addHistory();
        for (ZTSReportFile& lrFile : gatherSysfs(mMissing)) {
            mFiles.push_back(std::move(lrFile));
        }
        add("logs/qrv-tvk.log", [this] { return readEnd(mrContext.getSettings().mAgentLog); });
        add("logs/journal.txt", [] { return readJournal(); });
        std::string lMissing;
        for (const std::string& lrLine : mMissing) {
            lMissing += lrLine + "\n";
        }
        mFiles.push_back({.mPath = "missing.txt", .mText = lMissing.empty() ? "nothing\n" : lMissing});
        leaveOut(mFiles, listSecrets(mrContext.getSettings()));
        return std::move(mFiles);
    }

private:
    void add(const std::string& acrPath, const std::function<std::string()>& acrMake) {
        try {
            mFiles.push_back({.mPath = acrPath, .mText = acrMake()});
        } catch (const std::exception& lrEx) {
            mMissing.push_back(acrPath + ": " + lrEx.what());
        }
    }

    static std::string toText(const ZTCJson& acrDocument) { return dumpJson(acrDocument, 1) + "\n"; }

    static std::string describeVersions() {
        utsname lKernel{};
        uname(&lKernel);
        std::string lText = "tavik " TAVIK_VERSION "\n";
        lText += std::string(lKernel.sysname) + " " + lKernel.release + " " + lKernel.version + " " + lKernel.machine;
        std::ifstream lRelease("/etc/os-release");
        lText += "\n";
        for (std::string lLine; std::getline(lRelease, lLine);) {
            lText += lLine + "\n";
        }
        return lText;
    }

    void addStatus() {
        const ZTSStatusFacts lFacts = mrContext.gatherFacts();
        add("status.txt", [&] { return formatStatus(lFacts, {}); });
        add("status.json", [&] { return toText(makeStatusDocument(lFacts)); });
        add("check.txt", [&] { return formatCheck(makeCheck(lFacts, std::nullopt)); });
        for (const std::string& lrUnknown : listUnknown(lFacts)) {
            mMissing.push_back("status: " + lrUnknown);
        }
        mMissing.insert(mMissing.end(), lFacts.mAnswerProblem.empty() ? 0 : 1, "status: " + lFacts.mAnswerProblem);
    }

    void addHistory() {
        std::unique_ptr<ZTCHistory> lpHistory;
        try {
            lpHistory = mrContext.openHistory();
        } catch (const std::exception& lrEx) {
            mMissing.push_back("history: " + std::string(lrEx.what()));
            return;
        }
        const ZTCHistory& lrHistory = *lpHistory;
        const ZTCNameBook lNames = mrContext.makeNames(&lrHistory);
        ZTSHistoryFilter lFilter;
        lFilter.mSince = mNow - scSpan;
        lFilter.mLimit = scMostEpisodes;
        const auto lBegin = [&](const char* apCommand) {
            return beginDocument(apCommand, mrContext.getHost(), lrHistory.getStoreId());
        };
        add("paths.json", [&] {
            const std::optional<ZTSSanView> lView = readSan(lrHistory, mNow);
            return toText(makePathsDocument(lView ? &*lView : nullptr, {.mFilter = {}, .mTime = mNow}, lNames,
                                            mrContext.getHost(), lrHistory.getStoreId()));
        });
        add("history/events.json", [&] {
            ZTCJson lDocument = lBegin("events");
            lDocument["episodes"] = ZTCJson::array();
            lrHistory.visitEpisodes(lFilter, [&](const ZTSEpisode& acrEpisode) {
                lDocument["episodes"].push_back(toJson(acrEpisode, lNames));
                return true;
            });
            return toText(lDocument);
        });
        add("history/ports.json", [&] {
            ZTSHistoryFilter lAll = lFilter;
            lAll.mLimit = 0;
            ZTCJson lDocument = lBegin("ports");
            lDocument["ports"] = ZTCJson::array();
            for (const ZTSPortSummary& lrPort : lrHistory.readPorts(lAll)) {
                lDocument["ports"].push_back(toJson(lrPort, lNames));
            }
            return toText(lDocument);
        });
        add("history/gaps.json", [&] {
            ZTCJson lGaps = ZTCJson::array();
            for (const ZTSGap& lrGap : lrHistory.readGaps(mNow - scSpan)) {
                lGaps.push_back(toJson(lrGap));
            }
            return toText(lGaps);
        });
        add("history/topology.json", [&] { return toText(makeChanges(lrHistory)); });
        add("history/counters.json", [&] { return toText(makeCounters(lrHistory)); });
    }

    ZTCJson makeChanges(const ZTCHistory& acrHistory) const {
        const auto lValue = [](const std::optional<std::string>& acrText) {
            return acrText ? ZTCJson(*acrText) : ZTCJson(nullptr);
        };
        ZTCJson lChanges = ZTCJson::array();
        for (const ZTSTopologyChange& lrChange :
             acrHistory.readTopologyChanges(toMicroseconds(mNow - scSpan), toMicroseconds(mNow))) {
            lChanges.push_back({{"time", toRfc3339(fromMicroseconds(lrChange.mTime))},
                                {"thing", getTopologyThingName(lrChange.mThing)},
                                {"key", lrChange.mKey},
                                {"attribute", lrChange.mAttribute},
                                {"before", lValue(lrChange.mBefore)},
                                {"after", lValue(lrChange.mAfter)}});
        }
        return lChanges;
    }

    ZTCJson makeCounters(const ZTCHistory& acrHistory) const {
        ZTCJson lCounters = ZTCJson::array();
        for (const ZTSCounterSample& lrSample :
             acrHistory.readCounters(toMicroseconds(mNow - scSpan), toMicroseconds(mNow), scMostCounters)) {
            lCounters.push_back(
                {{"minute", toRfc3339(fromMicroseconds(lrSample.mMinute))},
                 {"initiator", lrSample.mInitiator.toText()},
                 {"remotePort", lrSample.mRemotePort ? ZTCJson(lrSample.mRemotePort->toText()) : ZTCJson(nullptr)},
                 {"counter", lrSample.mCounter},
                 {"rose", lrSample.mDifference}});
        }
        return lCounters;
    }

    /// The last megabyte.
    static std::string readEnd(const std::string& acrPath) {
        std::ifstream lFile(acrPath, std::ios::binary | std::ios::ate);
        if (!lFile) {
            throw std::system_error(errno, std::generic_category(), "cannot open " + acrPath);
        }
        const auto lSize = static_cast<std::size_t>(std::max<std::streamoff>(lFile.tellg(), 0));
        std::string lText(std::min(lSize, scMostLogBytes), '\0');
        lFile.seekg(static_cast<std::streamoff>(lSize - lText.size()));
        lFile.read(lText.data(), static_cast<std::streamsize>(lText.size()));
        lText.resize(static_cast<std::size_t>(lFile.gcount()));
        return lText;
    }

    static std::string readJournal() {
        const std::unique_ptr<FILE, int (*)(FILE*)> lpPipe(popen(scJournal, "re"), &pclose);
        if (lpPipe == nullptr) {
            throw std::system_error(errno, std::generic_category(), "cannot run journalctl");
        }
        std::string lText(scMostLogBytes, '\0');
        lText.resize(std::fread(lText.data(), 1, lText.size(), lpPipe.get()));
        return lText;
    }

    const ZTCContext& mrContext;
    const ZTCHistoryTime mNow;
    std::vector<ZTSReportFile> mFiles;
    std::vector<std::string> mMissing;
};

std::vector<ZTSReportFile> gatherReport(const ZTCContext& acrContext, ZTCHistoryTime aNow) {
    return ZTCReport(acrContext, aNow).gather();
}
