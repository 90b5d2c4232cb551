/// The evidence, sorted for the rules: episodes by kind and port, and what the topology knows of ports.
///
/// Refers to the evidence, which has to live longer.
#ifndef SENSOR_DIAGNOSIS_SRC_EVIDENCEINDEX_H
#define SENSOR_DIAGNOSIS_SRC_EVIDENCEINDEX_H

#include <array>
#include <chrono>
#include <map>
#include <set>
#include <string_view>

#include "sensor/diagnosis/include/Diagnosis.h"

using ZTCEpisodes = std::vector<const ZTSEpisode*>;
using ZTCWwnBytes = std::array<std::uint8_t, 8>;

/// Events so near to each other belong together: the default of `episode.gap`, within which episodes cannot be told
/// apart either.
inline constexpr std::chrono::seconds gcTogether{60};

/// Whether two episodes overlap, or lie at most so far apart.
bool areTogether(const ZTSEpisode& acrOne, const ZTSEpisode& acrOther, std::chrono::seconds aApart = gcTogether);

/// Whether `acrLater` went on after `acrEarlier` had begun, and began soon after its end.
bool isFollowedBy(const ZTSEpisode& acrEarlier, const ZTSEpisode& acrLater);

/// Runs of episodes that are together, each sorted by its first event.
std::vector<ZTCEpisodes> splitIntoRuns(ZTCEpisodes aEpisodes, std::chrono::seconds aApart = gcTogether);

/// "host7 and host8", "a, b and c", "a, b and 4 more".
std::string joinNames(const std::vector<std::string>& acrNames);

class ZTCEvidenceIndex {
public:
    explicit ZTCEvidenceIndex(const ZTSEvidence& acrEvidence);

    const ZTSEvidence& getEvidence() const { return mrEvidence; }

    /// Episodes of that kind, by their first event; empty where there are none. Malformed ones are left out.
    const ZTCEpisodes& of(std::string_view aKind) const;
    /// Episodes of these kinds (names with blanks between) that name a remote port, by its WWPN.
    std::map<ZTCWwnBytes, ZTCEpisodes> byRemotePort(std::string_view aKinds) const;

    std::string nameOf(const ZTSRemotePort& acrPort) const;
    std::string nameOf(const ZTSInitiator& acrInitiator) const;
    /// The initiators of the episodes, each once, by name.
    std::vector<ZTSInitiator> initiatorsOf(const ZTCEpisodes& acrEpisodes) const;
    std::vector<ZTSRemotePort> remotePortsOf(const ZTCEpisodes& acrEpisodes) const;
    std::vector<std::string> namesOf(const std::vector<ZTSInitiator>& acrInitiators) const;
    std::vector<std::string> namesOf(const std::vector<ZTSRemotePort>& acrPorts) const;

    /// The node name of a remote port, from its events or the topology.
    std::optional<ZTSFcName> findNode(const ZTSRemotePort& acrPort) const;
    /// The ports that are known of a node.
    std::set<ZTCWwnBytes> portsOfNode(const ZTSFcName& acrNode) const;

    /// hostN of an initiator, from the events or the topology; empty: not known.
    std::string findHost(const ZTSInitiator& acrInitiator) const;
    /// All initiators that events, coverage or the topology name.
    const std::vector<ZTSInitiator>& getInitiators() const { return mInitiators; }
    std::optional<ZTSFcName> findFabric(const ZTSInitiator& acrInitiator) const;
    /// The kernel's word for the state of an initiator's link; absent: not known.
    std::optional<std::string> findState(const ZTSInitiator& acrInitiator) const;
    /// Other initiators that are logged in to that port.
    std::vector<ZTSInitiator> findOtherUsers(const ZTSRemotePort& acrPort,
                                             const std::vector<ZTSInitiator>& acrExcept) const;
    /// Whether events of that kind reach Tavik from the initiator.
    bool isObserved(const ZTSInitiator& acrInitiator, ZTCKindKey aKind) const;
    /// The topology's paths to a remote port.
    std::vector<const ZTSTopologyPath*> pathsTo(const ZTSRemotePort& acrPort) const;

private:
    const ZTSTopologyInitiator* findInTopology(const ZTSInitiator& acrInitiator) const;
    void addInitiator(const ZTSInitiator& acrInitiator);

    const ZTSEvidence& mrEvidence;
    std::map<ZTCKindKey, ZTCEpisodes> mByKind;
    std::vector<ZTSInitiator> mInitiators;
    std::map<ZTCWwnBytes, ZTSFcName> mNodes;  ///< by WWPN of the remote port
};

#endif
