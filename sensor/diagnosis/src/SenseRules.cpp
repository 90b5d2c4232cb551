#include <algorithm>
#include <array>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"
#include "sensor/diagnosis/src/SenseCodes.h"

/// Qualifiers that are named one by one.
static constexpr std::size_t scMostCodes = 4;

static bool sHasSense(const ZTSEpisode& acrEpisode, std::uint32_t aKey, std::uint32_t aAsc) {
    return acrEpisode.mDetail.mSenseKey == aKey && acrEpisode.mDetail.mAsc == aAsc;
}

bool isTransportSense(const ZTSEpisode& acrEpisode) {
    // Communication, data protection, parity and CRC, messages, data phase.
    static constexpr std::array<std::uint32_t, 6> scCodes{0x08, 0x10, 0x47, 0x48, 0x49, 0x4B};
    return acrEpisode.mDetail.mSenseKey == ZTSK_AbortedCommand && acrEpisode.mDetail.mAsc &&
           std::ranges::find(scCodes, *acrEpisode.mDetail.mAsc) != scCodes.end();
}

/// Check conditions that fit, by the node of their port; by the port where the node is not known.
template <typename Fits>
static std::map<ZTCWwnBytes, ZTCEpisodes> sByNode(const ZTCEvidenceIndex& acrEvidence, Fits aFits) {
    std::map<ZTCWwnBytes, ZTCEpisodes> lByNode;
    for (const auto& [lPort, lrEpisodes] : acrEvidence.byRemotePort("check-condition")) {
        for (const ZTSEpisode* lpEpisode : lrEpisodes) {
            if (aFits(*lpEpisode)) {
                const auto lNode = acrEvidence.findNode(*lpEpisode->mRemotePort);
                lByNode[lNode ? lNode->mBytes : lPort].push_back(lpEpisode);
            }
        }
    }
    return lByNode;
}

/// "29/00 power on ... and 29/04 device internal reset": what the check conditions among the episodes say.
static std::string sDescribeCodes(const ZTCEpisodes& acrEpisodes) {
    std::set<std::pair<std::uint32_t, std::uint32_t>> lCodes;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        for (const std::uint32_t lAscq : lpEpisode->mDetail.mAscqs) {
            lCodes.emplace(lpEpisode->mDetail.mAsc.value_or(0), lAscq);
        }
    }
    std::string lText;
    std::size_t lCount = 0;
    for (const auto& [lAsc, lAscq] : lCodes) {
        if (++lCount > scMostCodes) {
            return lText + "; and " + std::to_string(lCodes.size() - scMostCodes) + " more codes";
        }
        lText += (lText.empty() ? "" : "; ") + describeSenseCode(lAsc, lAscq);
    }
    return lText;
}

/// "12 check conditions on LUNs 0-3, seen by host7: 29/00 power on."
static void sAddSeen(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrEpisodes, ZTSFinding& arFinding) {
    const std::string lCodes = sDescribeCodes(acrEpisodes);
    arFinding.mSeen.push_back(formatCount(countOccurrences(acrEpisodes), "check condition") + " on " +
                              describeLuns(unionOfLuns(acrEpisodes)) + ", seen by " +
                              joinNames(acrEvidence.namesOf(acrEvidence.initiatorsOf(acrEpisodes))) +
                              (lCodes.empty() ? "." : ": " + lCodes + "."));
}

static void sLookForAttention(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings,
                              std::uint32_t aAsc) {
    for (const auto& [lNode, lrEpisodes] : sByNode(acrEvidence, [aAsc](const ZTSEpisode& acrEpisode) {
             return sHasSense(acrEpisode, ZTSK_UnitAttention, aAsc);
         })) {
        arFindings.push_back(beginFinding(acrEvidence, acrRule, lrEpisodes));
        sAddSeen(acrEvidence, lrEpisodes, arFindings.back());
    }
}

/// Whether this host itself reset the device just before.
static bool sIsOwnReset(const ZTSEpisode& acrReset, const ZTSEpisode& acrAttention) {
    const bool lIsSamePort = !acrReset.mRemotePort || (acrAttention.mRemotePort &&
                                                       acrReset.mRemotePort->mWwpn == acrAttention.mRemotePort->mWwpn);
    return lIsSamePort && acrReset.mInitiator.mWwpn == acrAttention.mInitiator.mWwpn &&
           isFollowedBy(acrReset, acrAttention);
}

void lookForRestarts(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    static constexpr std::uint32_t scResetOccurred = 0x29;
    const std::size_t lFirstOwn = arFindings.size();
    sLookForAttention(acrEvidence, acrRule, arFindings, scResetOccurred);
    for (std::size_t i = lFirstOwn; i < arFindings.size(); ++i) {
        ZTSFinding& lrFinding = arFindings[i];
        ZTCEpisodes lAttentions;
        for (const ZTSEpisode* lpEpisode : acrEvidence.of("check-condition")) {
            if (lrFinding.isShownBy(lpEpisode->mEpisode)) {
                lAttentions.push_back(lpEpisode);
            }
        }
        const auto lAnyFollows = [&lAttentions](const ZTSEpisode* apReset) {
            return std::ranges::any_of(
                lAttentions, [&](const ZTSEpisode* apAttention) { return sIsOwnReset(*apReset, *apAttention); });
        };
        for (const char* lpKind : {"lun-reset", "target-reset", "bus-reset"}) {
            const auto& lrResets = acrEvidence.of(lpKind);
            const auto lFound = std::ranges::find_if(lrResets, lAnyFollows);
            if (lFound != lrResets.end()) {
                lrFinding.mSeverity = ZTSV_Note;
                lrFinding.mAgainst.push_back("This host sent a reset itself just before (" + std::string(lpKind) +
                                             ", episode " + std::to_string((*lFound)->mEpisode) +
                                             "): the unit attention may only be the answer to it.");
            }
        }
    }
}

void lookForChangedLuns(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    static constexpr std::uint32_t scConditionsChanged = 0x3F;
    sLookForAttention(acrEvidence, acrRule, arFindings, scConditionsChanged);
}

void lookForChangedParameters(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    static constexpr std::uint32_t scParametersChanged = 0x2A;
    sLookForAttention(acrEvidence, acrRule, arFindings, scParametersChanged);
}

void lookForDeviceErrors(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const auto& [lNode, lrEpisodes] : sByNode(acrEvidence, [](const ZTSEpisode& acrEpisode) {
             const std::uint32_t lSenseKey = acrEpisode.mDetail.mSenseKey.value_or(0);
             return lSenseKey == ZTSK_MediumError || lSenseKey == ZTSK_HardwareError;
         })) {
        const auto lLuns = describeLuns(unionOfLuns(lrEpisodes));
        const std::string lPorts = joinNames(acrEvidence.namesOf(acrEvidence.remotePortsOf(lrEpisodes)));
        arFindings.push_back(beginFinding(acrEvidence, acrRule, lrEpisodes, lLuns + " of " + lPorts));
        sAddSeen(acrEvidence, lrEpisodes, arFindings.back());
    }
}

void lookForTransportErrors(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const auto& [lPort, lrAll] : acrEvidence.byRemotePort("check-condition fcp-read-check")) {
        ZTCEpisodes lSenses;
        ZTCEpisodes lReads;
        for (const ZTSEpisode* lpEpisode : lrAll) {
            if (getKindName(lpEpisode->mKind) == "fcp-read-check") {
                lReads.push_back(lpEpisode);
            } else if (isTransportSense(*lpEpisode)) {
                lSenses.push_back(lpEpisode);
            }
        }
        ZTCEpisodes lBoth = lSenses;
        lBoth.insert(lBoth.end(), lReads.begin(), lReads.end());
        if (lBoth.empty()) {
            continue;
        }
        ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, lBoth);
        if (!lSenses.empty()) {
            sAddSeen(acrEvidence, lSenses, lFinding);
        }
        if (!lReads.empty()) {
            lFinding.mSeen.push_back(formatCount(countOccurrences(lReads), "read") + " of " +
                                     describeLuns(unionOfLuns(lReads)) +
                                     " brought other data than the target had sent (FCP read check).");
        }
        arFindings.push_back(std::move(lFinding));
    }
}

void lookForScans(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    // Invalid command, invalid field, no such LUN: answers to a question of what the device can do.
    static constexpr std::array<std::uint32_t, 3> scAnswers{0x20, 0x24, 0x25};
    // TEST UNIT READY, INQUIRY, MODE SENSE, RECEIVE DIAGNOSTIC, READ CAPACITY, LOG SENSE, SERVICE ACTION IN, REPORT
    // LUNS, MAINTENANCE IN.
    static constexpr std::array<std::uint32_t, 11> scQuestions{0x00, 0x12, 0x1A, 0x1C, 0x25, 0x4D,
                                                               0x5A, 0x5E, 0x9E, 0xA0, 0xA3};
    ZTCEpisodes lNoise;
    for (const ZTSEpisode* lpEpisode : acrEvidence.of("check-condition")) {
        const ZTSEpisodeDetail& lrDetail = lpEpisode->mDetail;
        const bool lIsAnswer = lrDetail.mSenseKey == ZTSK_IllegalRequest && lrDetail.mAsc &&
                               std::ranges::find(scAnswers, *lrDetail.mAsc) != scAnswers.end() &&
                               std::ranges::all_of(lrDetail.mAscqs, [](std::uint32_t aAscq) { return aAscq == 0; });
        const bool lIsQuestion =
            !lrDetail.mCommandCodes.empty() && std::ranges::all_of(lrDetail.mCommandCodes, [](std::uint32_t aCommand) {
                return std::ranges::find(scQuestions, aCommand) != scQuestions.end();
            });
        if (lIsAnswer && lIsQuestion) {
            lNoise.push_back(lpEpisode);
        }
    }
    if (!lNoise.empty()) {
        arFindings.push_back(beginFinding(acrEvidence, acrRule, lNoise));
        sAddSeen(acrEvidence, lNoise, arFindings.back());
    }
}
