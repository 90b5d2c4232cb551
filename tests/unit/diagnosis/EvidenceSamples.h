/// Evidence, written line by line: a host with two ports, an array with two controllers.
#ifndef TESTS_UNIT_DIAGNOSIS_EVIDENCESAMPLES_H
#define TESTS_UNIT_DIAGNOSIS_EVIDENCESAMPLES_H

#include <initializer_list>
#include <string>

#include "sensor/diagnosis/include/Diagnosis.h"

/// Ports by number. The node of remote port N is N / 2.
ZTSFcName initiatorName(unsigned aHost);
ZTSFcName remoteName(unsigned aPort);
ZTSFcName nodeName(unsigned aNode);

class ZTCSampleEvidence {
public:
    /// An episode of one event at that second. Numbered from 1 on.
    ZTSEpisode& add(const std::string& acrKind, unsigned aHost, unsigned aSecond, int aPort = -1);
    ZTSEpisode& addLuns(const std::string& acrKind, unsigned aHost, unsigned aSecond, int aPort,
                        std::initializer_list<std::uint32_t> aLuns);
    ZTSEpisode& addSense(unsigned aHost, unsigned aSecond, int aPort, std::uint32_t aKey, std::uint32_t aAsc,
                         std::uint32_t aAscq, std::uint32_t aCommand = 0x28);
    ZTSEpisode& addRejection(unsigned aHost, unsigned aSecond, int aPort, std::uint32_t aCommand, std::uint32_t aReason,
                             std::uint32_t aExplanation);
    /// A LOGO, and a PLOGI a second later.
    void addRelogin(unsigned aHost, unsigned aSecond, int aPort);

    /// hostN of that fabric.
    void addInitiator(unsigned aHost, std::optional<unsigned> aFabric, const std::string& acrState = "Online");
    /// An Online remote port as hostN sees it.
    void addRemotePort(unsigned aHost, unsigned aPort);
    void addPath(unsigned aHost, unsigned aPort, unsigned aLun, std::uint32_t aQueueDepth);
    void addCounter(unsigned aHost, unsigned aSecond, const std::string& acrCounter, std::uint64_t aDifference);
    void hide(unsigned aHost, const std::string& acrKind, ZTEKindState aState = ZTKST_NoSource);

    /// The findings of that rule.
    std::vector<ZTSFinding> find(const std::string& acrRule) const;
    std::vector<ZTSFinding> diagnoseAll() const { return diagnose(mEvidence); }
    ZTSEvidence& evidence() { return mEvidence; }

private:
    ZTSTopology& topology();

    ZTSEvidence mEvidence;
};

#endif
