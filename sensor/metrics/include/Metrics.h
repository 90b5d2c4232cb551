/// The sensor's figures for Prometheus. docs/metrics.md lists them.
///
/// Counters of events begin at the database's totals, which retention never lowers: a restart of agent, sensor or host
/// resets nothing. What is not known has no sample: it is not zero.
#ifndef SENSOR_METRICS_INCLUDE_METRICS_H
#define SENSOR_METRICS_INCLUDE_METRICS_H

#include <prometheus/metric_family.h>

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "sensor/metrics/include/SeriesPorts.h"
#include "sensor/views/include/StatusFacts.h"

/// Names of stored values that count over restarts: decimal numbers, absent = 0. The collector raises them.
inline constexpr const char* gcAgentRestartsValue = "metrics.agent_restarts";
inline constexpr const char* gcHookFailuresValue = "metrics.hook_failures";
/// Name of the stored value with what the adapters' library lost: {"generation", "last", "total"}, the latter two
/// numbers by name. `last` is what the agent of that start has counted so far.
inline constexpr const char* gcLibraryLossesValue = "metrics.library_losses";

/// All that the metrics are made of.
struct ZTSMetricFacts {
    ZTSStatusFacts mStatus;  ///< live state, ledger, gaps, retrievals, names
    std::vector<ZTSTotal> mTotals;
    std::vector<ZTSRemotePort> mRemotePorts;  ///< with what is known of them, for tavik_remote_port_info
    ZTCSeriesPorts mSeriesPorts;
    std::map<ZTCKindKey, std::uint64_t> mOpenEpisodes;
    std::map<std::string, std::uint64_t> mLostByLibrary;  ///< by the library's name for the loss, of all agents
    std::map<std::string, std::uint64_t> mLuns;           ///< by redundancy; empty: no topology is known
    std::uint64_t mLostInGaps = 0;                        ///< occurrences that all gaps are known to have cost
    std::uint64_t mAgentRestarts = 0;
    std::uint64_t mHookFailures = 0;
    std::map<std::string, std::uint64_t> mMissed;  ///< by output: changes that retention took before it had them
    std::optional<std::uint64_t> mStoreBytes;
    std::optional<std::uint64_t> mWalBytes;
    std::string mVersion;
};

/// Reads what the history holds of the facts. Throws what ZTCHistory
/// throws. @param aStatus  as gathered for `status`
ZTSMetricFacts readMetricFacts(const ZTCHistory& acrHistory, ZTSStatusFacts aStatus,
                               const std::string& acrDatabasePath);

/// The families in a fixed order, each with its samples sorted by label. A family without samples is left out.
std::vector<prometheus::MetricFamily> makeMetrics(const ZTSMetricFacts& acrFacts);

/// The text format of Prometheus.
std::string formatMetrics(const std::vector<prometheus::MetricFamily>& acrFamilies);

/// Replaces a file by this text: written whole beside it, then renamed, so that a reader never sees a part. The file is
/// 0644, for node_exporter. Throws ZTCSystemCallEx; the old file then stays.
void writeMetricsFile(const std::string& acrPath, const std::string& acrText);

#endif
