/// How each rule is looked for. The table (RuleTable.cpp) has their words.
#ifndef SENSOR_DIAGNOSIS_SRC_RULES_H
#define SENSOR_DIAGNOSIS_SRC_RULES_H

#include "sensor/diagnosis/src/EvidenceIndex.h"

using ZTCFindings = std::vector<ZTSFinding>;

// Queues.
void lookForPortOverload(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForLunOverload(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);

// Which side of a path.
void lookForTargetSide(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForOnePath(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForHostTimeouts(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);

// Sense data.
void lookForDeviceErrors(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForTransportErrors(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForRestarts(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForChangedLuns(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForChangedParameters(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForScans(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);

// Links and logins.
void lookForUnstableLinks(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForSwitchTrouble(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForZoning(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForFailover(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForLoginLimit(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);
void lookForUnsupportedLogin(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings);

/// Whether a check condition says that data were damaged or lost between host and target.
bool isTransportSense(const ZTSEpisode& acrEpisode);

/// A finding over these episodes (at least one), with the rule's next steps. The caller adds what was seen and what
/// speaks against it.
/// @param acrSubject  as people call it; empty: the remote ports, else the initiators
ZTSFinding beginFinding(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, const ZTCEpisodes& acrEpisodes,
                        const std::string& acrSubject = {});

/// Occurrences of all of them.
std::uint64_t countOccurrences(const ZTCEpisodes& acrEpisodes);

/// The LUNs of the episodes together.
ZTSLunSet unionOfLuns(const ZTCEpisodes& acrEpisodes);

/// "LUN 7", "LUNs 0-2,40", "all LUNs", "LUNs 0-255 and more"; "unnamed LUNs" where none has a number.
std::string describeLuns(const ZTSLunSet& acrLuns);

#endif
