#include "sensor/metrics/include/Metrics.h"

#include <prometheus/text_serializer.h>
#include <sys/stat.h>

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/views/include/Judgement.h"
#include "sensor/views/include/SanView.h"

using prometheus::ClientMetric;
using prometheus::MetricFamily;
using prometheus::MetricType;

using ZTCLabels = std::vector<ClientMetric::Label>;

/// One family while it is filled. Samples of the same labels are added up.
class ZTCFamily {
public:
    ZTCFamily(const char* apName, MetricType aType, const char* apHelp) : mFamily{apName, apHelp, aType, {}} {}

    void add(const ZTCLabels& acrLabels, double aValue) { mValues[acrLabels] += aValue; }
    void addKnown(const ZTCLabels& acrLabels, const std::optional<std::uint64_t>& acrValue) {
        if (acrValue) {
            add(acrLabels, static_cast<double>(*acrValue));
        }
    }
    void addTime(const std::optional<ZTCHistoryTime>& acrTime) {
        if (acrTime) {
            add({}, static_cast<double>(toMicroseconds(*acrTime)) / 1e6);
        }
    }

    void moveTo(std::vector<MetricFamily>& arFamilies) {
        for (const auto& [lrLabels, lValue] : mValues) {
            ClientMetric& lrMetric = mFamily.metric.emplace_back();
            lrMetric.label = lrLabels;
            (mFamily.type == MetricType::Counter ? lrMetric.counter.value : lrMetric.gauge.value) = lValue;
        }
        if (!mFamily.metric.empty()) {
            arFamilies.push_back(std::move(mFamily));
        }
    }

private:
    MetricFamily mFamily;
    std::map<ZTCLabels, double> mValues;
};

static std::string sName(const std::optional<ZTSFcName>& acrName) {
    return acrName ? acrName->toText() : std::string();
}

/// The label of a local port: its WWPN, or what its events are filed under without one.
static std::string sInitiator(const ZTSInitiator& acrInitiator) {
    return acrInitiator.mWwpn ? acrInitiator.mWwpn->toText() : "unknown";
}

static void sAddEvents(const ZTSMetricFacts& acrFacts, std::vector<MetricFamily>& arFamilies) {
    ZTCFamily lEvents("tavik_events_total", MetricType::Counter,
                      "Events in the history since it was begun, retired ones included.");
    std::set<std::array<std::uint8_t, 8>> lOthers;
    for (const ZTSTotal& lrTotal : acrFacts.mTotals) {
        std::string lPort;
        if (lrTotal.mRemotePort) {
            const bool lHasSeries = acrFacts.mSeriesPorts.has(lrTotal.mRemotePort->mWwpn);
            lPort = lHasSeries ? lrTotal.mRemotePort->mWwpn.toText() : "other";
            if (!lHasSeries) {
                lOthers.insert(lrTotal.mRemotePort->mWwpn.mBytes);
            }
        }
        lEvents.add({{"initiator", sInitiator(lrTotal.mInitiator)},
                     {"kind", getKindName(lrTotal.mKind)},
                     {"remote_port", lPort}},
                    static_cast<double>(lrTotal.mOccurrences));
    }
    lEvents.moveTo(arFamilies);
    ZTCFamily lOther("tavik_remote_ports_other", MetricType::Gauge,
                     "Remote ports that share the series remote_port=\"other\".");
    lOther.add({}, static_cast<double>(lOthers.size()));
    lOther.moveTo(arFamilies);
}

/// Refusals by initiator and reason: every reason of an initiator that has a row, so that an increase from zero shows.
static void sAddRefusals(const std::vector<ZTSLedgerRow>& acrLedger, std::vector<MetricFamily>& arFamilies) {
    ZTCFamily lRefused("tavik_refused_events_total", MetricType::Counter, "Events that the agent refused, by reason.");
    for (const ZTSLedgerRow& lrRow : acrLedger) {
        for (std::uint8_t i = 0; i < ZTRF_Count; ++i) {
            lRefused.add(
                {{"initiator", sInitiator(lrRow.mInitiator)}, {"reason", getRefusalName(static_cast<ZTERefusal>(i))}},
                static_cast<double>(lrRow.mRefused[i]));
        }
    }
    lRefused.moveTo(arFamilies);
}

static void sAddLosses(const ZTSMetricFacts& acrFacts, std::vector<MetricFamily>& arFamilies) {
    ZTCFamily lLost("tavik_lost_events_total", MetricType::Counter,
                    "Events that are known to be lost, by where: dropped by the agent, lost with a process that was "
                    "killed (gap), or the name of a loss that the adapters' library counts.");
    std::uint64_t lDropped = 0;
    for (const ZTSLedgerRow& lrRow : acrFacts.mStatus.mHistory->mLedger) {
        lDropped += lrRow.mDropped;
    }
    lLost.add({{"source", "dropped"}}, static_cast<double>(lDropped));
    lLost.add({{"source", "gap"}}, static_cast<double>(acrFacts.mLostInGaps));
    for (const auto& [lName, lCount] : acrFacts.mLostByLibrary) {
        lLost.add({{"source", lName}}, static_cast<double>(lCount));
    }
    lLost.moveTo(arFamilies);
}

static void sAddPorts(const ZTSMetricFacts& acrFacts, std::vector<MetricFamily>& arFamilies) {
    if (acrFacts.mStatus.mLive && acrFacts.mStatus.mLive->mAdapters) {
        ZTCFamily lInitiators("tavik_initiator_info", MetricType::Gauge, "The local ports: 1 each.");
        for (const ZTSLiveAdapter& lrAdapter : *acrFacts.mStatus.mLive->mAdapters) {
            lInitiators.add({{"host", lrAdapter.mInitiator.mHost},
                             {"initiator", sInitiator(lrAdapter.mInitiator)},
                             {"node", sName(lrAdapter.mInitiator.mWwnn)},
                             {"speed", lrAdapter.mSpeed},
                             {"state", lrAdapter.mPortState}},
                            1);
        }
        lInitiators.moveTo(arFamilies);
    }
    ZTCFamily lPorts("tavik_remote_port_info", MetricType::Gauge,
                     "The remote ports that have series of their own: 1 each, with the administrator's name.");
    for (const ZTSRemotePort& lrPort : acrFacts.mRemotePorts) {
        if (acrFacts.mSeriesPorts.has(lrPort.mWwpn)) {
            lPorts.add({{"name", acrFacts.mStatus.mNames.findName(lrPort.mWwpn, lrPort.mWwnn)},
                        {"node", sName(lrPort.mWwnn)},
                        {"remote_port", lrPort.mWwpn.toText()}},
                       1);
        }
    }
    lPorts.moveTo(arFamilies);
}

static void sAddKindStates(const ZTSLiveState& acrLive, std::vector<MetricFamily>& arFamilies) {
    ZTCFamily lStates("tavik_kind_state", MetricType::Gauge,
                      "Whether events of a kind reach the agent: 1 for the state that holds, 0 for the others.");
    for (const ZTSLiveKinds& lrKinds : acrLive.mKinds.value_or(std::vector<ZTSLiveKinds>())) {
        for (const auto& [lKind, lState] : lrKinds.mStates) {
            for (std::uint8_t i = ZTKST_Off; i <= ZTKST_NoSource; ++i) {
                const std::string lName = getKindStateName(static_cast<ZTEKindState>(i));
                lStates.add({{"initiator", sInitiator(lrKinds.mInitiator)}, {"kind", lKind}, {"state", lName}},
                            lName == lState ? 1 : 0);
            }
        }
    }
    lStates.moveTo(arFamilies);
}

static void sAddState(const ZTSStatusFacts& acrStatus, std::vector<MetricFamily>& arFamilies) {
    const ZTSJudgement lJudgement = judge(acrStatus);
    ZTCFamily lState("tavik_state", MetricType::Gauge,
                     "The states of Tavik that `tavik explain` knows: 1 where one holds.");
    for (const ZTSStateRow& lrRow : getStateTable()) {
        lState.add({{"state", lrRow.mpId}}, std::ranges::find(lJudgement.mStates, &lrRow) != lJudgement.mStates.end());
    }
    lState.moveTo(arFamilies);
}

static void sAddLive(const ZTSMetricFacts& acrFacts, std::vector<MetricFamily>& arFamilies) {
    const std::optional<ZTSLiveState>& lrLive = acrFacts.mStatus.mLive;
    ZTCFamily lUp("tavik_agent_up", MetricType::Gauge, "1 while an agent runs.");
    lUp.add({}, lrLive && lrLive->mAgent.mIsRunning.value_or(false) ? 1 : 0);
    lUp.moveTo(arFamilies);
    if (!lrLive) {
        return;
    }
    ZTCFamily lHeld("tavik_held_bytes", MetricType::Gauge, "Bytes of event data that the agent holds.");
    lHeld.addKnown({}, lrLive->mAgent.mHeldBytes);
    lHeld.moveTo(arFamilies);
    if (lrLive->mWarnings) {
        ZTCFamily lWarnings("tavik_open_warnings", MetricType::Gauge,
                            "Warnings that are open, by kind of trouble; hook: hooks that failed last; output: outputs "
                            "that cannot be written.");
        lWarnings.add({{"kind", "hook"}}, 0);
        lWarnings.add({{"kind", "output"}}, 0);
        for (const ZTSLiveWarning& lrWarning : *lrLive->mWarnings) {
            lWarnings.add({{"kind", lrWarning.mKind}}, 1);
        }
        lWarnings.moveTo(arFamilies);
    }
    sAddKindStates(*lrLive, arFamilies);
}

static void sAddHistory(const ZTSMetricFacts& acrFacts, std::vector<MetricFamily>& arFamilies) {
    const ZTSHistoryFacts& lrHistory = *acrFacts.mStatus.mHistory;
    const struct {
        const char* mpName;
        const char* mpHelp;
        std::uint64_t mValue;
    } lCounters[] = {
        {"tavik_retrievals_total", "Responses of an agent that were taken into the history.",
         lrHistory.mRetrievals.mRetrievals},
        {"tavik_retrieved_bytes_total", "Bytes of these responses.", lrHistory.mRetrievals.mBytes},
        {"tavik_agent_restarts_total", "Starts of an agent, less the first.", acrFacts.mAgentRestarts},
        {"tavik_gaps_total", "Stretches of time in which events were lost or may have been.",
         lrHistory.mRetrievals.mGaps},
        {"tavik_hook_failures_total", "Runs of warning hooks that failed.", acrFacts.mHookFailures},
    };
    for (const auto& lrCounter : lCounters) {
        ZTCFamily lFamily(lrCounter.mpName, MetricType::Counter, lrCounter.mpHelp);
        lFamily.add({}, static_cast<double>(lrCounter.mValue));
        lFamily.moveTo(arFamilies);
    }
    ZTCFamily lMissed("tavik_output_missed_total", MetricType::Counter,
                      "Changes of episodes that retention removed before an output had them.");
    for (const auto& [lOutput, lCount] : acrFacts.mMissed) {
        lMissed.add({{"output", lOutput}}, static_cast<double>(lCount));
    }
    lMissed.moveTo(arFamilies);
    ZTCFamily lLuns("tavik_luns", MetricType::Gauge,
                    "Logical units by what is left of their paths: whole, reduced, lost (a single path, initiator or "
                    "remote port is left), none, or unknown.");
    for (const auto& [lRedundancy, lCount] : acrFacts.mLuns) {
        lLuns.add({{"redundancy", lRedundancy}}, static_cast<double>(lCount));
    }
    lLuns.moveTo(arFamilies);
    ZTCFamily lOpen("tavik_open_episodes", MetricType::Gauge, "Episodes that go on, by kind.");
    for (const auto& [lKind, lCount] : acrFacts.mOpenEpisodes) {
        lOpen.add({{"kind", getKindName(lKind)}}, static_cast<double>(lCount));
    }
    lOpen.moveTo(arFamilies);
    ZTCFamily lEvent("tavik_last_event_timestamp_seconds", MetricType::Gauge,
                     "When the last event in the history came.");
    lEvent.addTime(lrHistory.mLastEvent);
    lEvent.moveTo(arFamilies);
    ZTCFamily lRetrieval("tavik_last_retrieval_timestamp_seconds", MetricType::Gauge,
                         "When a response was last taken into the history.");
    lRetrieval.addTime(lrHistory.mRetrievals.mLast);
    lRetrieval.moveTo(arFamilies);
}

std::vector<MetricFamily> makeMetrics(const ZTSMetricFacts& acrFacts) {
    std::vector<MetricFamily> lFamilies;
    if (acrFacts.mStatus.mHistory) {
        sAddEvents(acrFacts, lFamilies);
        sAddRefusals(acrFacts.mStatus.mHistory->mLedger, lFamilies);
        sAddLosses(acrFacts, lFamilies);
        sAddHistory(acrFacts, lFamilies);
    }
    sAddPorts(acrFacts, lFamilies);
    sAddLive(acrFacts, lFamilies);
    sAddState(acrFacts.mStatus, lFamilies);
    ZTCFamily lStore("tavik_store_bytes", MetricType::Gauge, "Size of the history's database.");
    lStore.addKnown({}, acrFacts.mStoreBytes);
    lStore.moveTo(lFamilies);
    ZTCFamily lWal("tavik_wal_bytes", MetricType::Gauge, "Size of the database's write-ahead log.");
    lWal.addKnown({}, acrFacts.mWalBytes);
    lWal.moveTo(lFamilies);
    ZTCFamily lBuild("tavik_build_info", MetricType::Gauge, "1, with the version of the sensor.");
    lBuild.add({{"version", acrFacts.mVersion}}, 1);
    lBuild.moveTo(lFamilies);
    return lFamilies;
}

std::string formatMetrics(const std::vector<MetricFamily>& acrFamilies) {
    std::ostringstream lText;
    prometheus::TextSerializer().Serialize(lText, acrFamilies);
    return lText.str();
}

static std::optional<std::uint64_t> sFileSize(const std::string& acrPath) {
    struct stat lStatus {};
    if (stat(acrPath.c_str(), &lStatus) != 0) {
        return std::nullopt;
    }
    return static_cast<std::uint64_t>(lStatus.st_size);
}

static std::uint64_t sStoredNumber(const ZTCHistory& acrHistory, const char* apName) {
    const std::string lText = acrHistory.getValue(apName);
    std::uint64_t lNumber = 0;
    std::from_chars(lText.data(), lText.data() + lText.size(), lNumber);
    return lNumber;
}

static std::map<std::string, std::uint64_t> sReadLibraryLosses(const ZTCHistory& acrHistory) {
    const nlohmann::json lStored = nlohmann::json::parse(acrHistory.getValue(gcLibraryLossesValue), nullptr, false);
    std::map<std::string, std::uint64_t> lLosses;
    if (lStored.is_object() && lStored.contains("total")) {
        for (const auto& [lName, lCount] : lStored["total"].items()) {
            lLosses[lName] = lCount.is_number_unsigned() ? lCount.get<std::uint64_t>() : 0;
        }
    }
    return lLosses;
}

ZTSMetricFacts readMetricFacts(const ZTCHistory& acrHistory, ZTSStatusFacts aStatus,
                               const std::string& acrDatabasePath) {
    ZTSMetricFacts lFacts;
    lFacts.mStatus = std::move(aStatus);
    lFacts.mTotals = acrHistory.readTotals();
    lFacts.mRemotePorts = acrHistory.readRemotePorts();
    lFacts.mSeriesPorts = ZTCSeriesPorts(acrHistory.getValue(gcSeriesPortsValue));
    ZTSHistoryFilter lOpen;
    lOpen.mIsOpenOnly = true;
    lOpen.mLimit = gcMostOpenEpisodes;
    acrHistory.visitEpisodes(lOpen, [&lFacts](const ZTSEpisode& acrEpisode) {
        ++lFacts.mOpenEpisodes[acrEpisode.mKind];
        return true;
    });
    for (const ZTSGap& lrGap : acrHistory.readGaps()) {
        lFacts.mLostInGaps += lrGap.getOccurrences();
    }
    if (const std::optional<ZTSSanView> lSan = readSan(acrHistory, getHistoryTime())) {
        for (std::uint8_t i = 0; i < ZTRD_Count; ++i) {
            const auto lRedundancy = static_cast<ZTERedundancy>(i);
            lFacts.mLuns[getRedundancyName(lRedundancy)] = lSan->mFacts.countLuns(lRedundancy);
        }
    }
    lFacts.mLostByLibrary = sReadLibraryLosses(acrHistory);
    lFacts.mAgentRestarts = sStoredNumber(acrHistory, gcAgentRestartsValue);
    lFacts.mHookFailures = sStoredNumber(acrHistory, gcHookFailuresValue);
    for (const char* const lpOutput : {"ndjson", "journal"}) {
        if (!acrHistory.getValue(std::string("outlet.") + lpOutput + ".seq").empty()) {
            lFacts.mMissed[lpOutput] =
                sStoredNumber(acrHistory, (std::string("outlet.") + lpOutput + ".missed").c_str());
        }
    }
    lFacts.mStoreBytes = sFileSize(acrDatabasePath);
    lFacts.mWalBytes = sFileSize(acrDatabasePath + "-wal");
    return lFacts;
}
