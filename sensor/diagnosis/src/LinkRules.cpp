#include <algorithm>
#include <array>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"

/// Links that go down within so long of each other go down together.
static constexpr std::chrono::seconds scSameMoment{30};

/// Counters are sampled once a minute, and errors come before the link gives up.
static constexpr std::chrono::minutes scCounterReach{5};

/// Counters that speak for a bad cable or transceiver.
static constexpr std::array<std::string_view, 6> scLinkCounters{"invalid_crc_count",           "invalid_tx_word_count",
                                                                "loss_of_sync_count",          "loss_of_signal_count",
                                                                "prim_seq_protocol_err_count", "link_failure_count"};

/// Link episodes that began at the same moment.
static std::vector<ZTCEpisodes> sMoments(const ZTCEvidenceIndex& acrEvidence) {
    std::vector<ZTCEpisodes> lMoments;
    for (const ZTSEpisode* lpEpisode : acrEvidence.of("link")) {
        if (lMoments.empty() || lpEpisode->mFirst > lMoments.back().front()->mFirst + scSameMoment) {
            lMoments.emplace_back();
        }
        lMoments.back().push_back(lpEpisode);
    }
    return lMoments;
}

static bool sIsAmong(const ZTCEvidenceIndex& acrEvidence, const ZTSInitiator& acrInitiator,
                     const ZTCEpisodes& acrEpisodes) {
    return std::ranges::any_of(acrEpisodes, [&](const ZTSEpisode* apEpisode) {
        return acrEvidence.nameOf(apEpisode->mInitiator) == acrEvidence.nameOf(acrInitiator);
    });
}

/// A group of initiators that lost their links together although only a switch has to do with all of them.
struct ZTSCommonLoss {
    std::optional<ZTSFcName> mFabric;  ///< absent: it is not known which fabric each belongs to
    ZTCEpisodes mEpisodes;
};

/// Of one moment: the fabrics of which every initiator lost its link, and had company.
static std::vector<ZTSCommonLoss> sCommonLosses(const ZTCEvidenceIndex& acrEvidence, const ZTCEpisodes& acrMoment) {
    std::map<std::optional<ZTCWwnBytes>, std::vector<ZTSInitiator>> lByFabric;
    for (const ZTSInitiator& lrInitiator : acrEvidence.getInitiators()) {
        const auto lFabric = acrEvidence.findFabric(lrInitiator);
        lByFabric[lFabric ? std::optional(lFabric->mBytes) : std::nullopt].push_back(lrInitiator);
    }
    std::vector<ZTSCommonLoss> lLosses;
    for (const auto& lrGroup : lByFabric) {
        const std::optional<ZTCWwnBytes>& lrFabric = lrGroup.first;
        const std::vector<ZTSInitiator>& lrInitiators = lrGroup.second;
        // An initiator without a fabric may belong to any: only where none has one do they count as one group.
        const bool lIsUsable = lrFabric || lByFabric.size() == 1;
        const bool lAreAllDown = std::ranges::all_of(lrInitiators, [&](const ZTSInitiator& acrInitiator) {
            return sIsAmong(acrEvidence, acrInitiator, acrMoment);
        });
        if (!lIsUsable || lrInitiators.size() < 2 || !lAreAllDown) {
            continue;
        }
        ZTSCommonLoss lLoss;
        if (lrFabric) {
            lLoss.mFabric = ZTSFcName{*lrFabric};
        }
        std::ranges::copy_if(acrMoment, std::back_inserter(lLoss.mEpisodes), [&](const ZTSEpisode* apEpisode) {
            return std::ranges::any_of(lrInitiators, [&](const ZTSInitiator& acrInitiator) {
                return acrEvidence.nameOf(apEpisode->mInitiator) == acrEvidence.nameOf(acrInitiator);
            });
        });
        lLosses.push_back(std::move(lLoss));
    }
    return lLosses;
}

/// How the link is now, where that is known. A link that is down makes it a problem.
static void sAddState(const ZTCEvidenceIndex& acrEvidence, ZTSFinding& arFinding) {
    for (const ZTSInitiator& lrInitiator : arFinding.mInitiators) {
        if (const auto lState = acrEvidence.findState(lrInitiator)) {
            arFinding.mSeen.push_back(acrEvidence.nameOf(lrInitiator) + " is " + *lState + " now.");
            arFinding.mSeverity = *lState == "Online" ? arFinding.mSeverity : ZTSV_Problem;
        }
    }
}

static void sAddCounters(const ZTCEvidenceIndex& acrEvidence, ZTSFinding& arFinding) {
    const ZTSEvidence& lrAll = acrEvidence.getEvidence();
    std::string lText;
    for (const std::string_view lCounter : scLinkCounters) {
        ZTSCounterRise lSum;
        for (const ZTSCounterRise& lrRise : lrAll.mCounters) {
            if (lrRise.mCounter == lCounter && !lrRise.mRemotePort &&
                lrRise.mInitiator == arFinding.mInitiators.front().mWwpn &&
                lrRise.mMinute >= arFinding.mFirst - scCounterReach &&
                lrRise.mMinute <= arFinding.mLast + scCounterReach) {
                const std::uint64_t lSoFar = lSum.mDifference;
                lSum = lSoFar == 0 ? lrRise : lSum;
                lSum.mDifference = lSoFar + lrRise.mDifference;
            }
        }
        if (lSum.mDifference != 0) {
            lText += (lText.empty() ? "" : ", ") + lSum.mCounter + " +" + formatNumber(lSum.mDifference);
            arFinding.mCounters.push_back(std::move(lSum));
        }
    }
    if (!lText.empty()) {
        arFinding.mSeen.push_back("Error counters rose around that time: " + lText + ".");
    } else if (!lrAll.mCounters.empty()) {
        arFinding.mAgainst.emplace_back(
            "No error counter rose around that time. A pulled cable or a disabled switch "
            "port looks like this, a dirty connector does not.");
    }
}

void lookForUnstableLinks(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    std::map<std::string, ZTCEpisodes> lByInitiator;
    std::set<std::string> lTogether;  // initiators that did not lose their link alone
    for (const ZTCEpisodes& lrMoment : sMoments(acrEvidence)) {
        const std::vector<ZTSCommonLoss> lLosses = sCommonLosses(acrEvidence, lrMoment);
        for (const ZTSEpisode* lpEpisode : lrMoment) {
            const bool lIsCommon = std::ranges::any_of(lLosses, [lpEpisode](const ZTSCommonLoss& acrLoss) {
                return std::ranges::find(acrLoss.mEpisodes, lpEpisode) != acrLoss.mEpisodes.end();
            });
            if (!lIsCommon) {
                const std::string lName = acrEvidence.nameOf(lpEpisode->mInitiator);
                lByInitiator[lName].push_back(lpEpisode);
                if (acrEvidence.initiatorsOf(lrMoment).size() > 1) {
                    lTogether.insert(lName);
                }
            }
        }
    }
    for (const auto& [lName, lrEpisodes] : lByInitiator) {
        ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, lrEpisodes);
        lFinding.mSeen.push_back(formatCount(lFinding.mOccurrences, "link change") + " at " + lName + " alone.");
        if (lTogether.contains(lName)) {
            lFinding.mSeen.back() = formatCount(lFinding.mOccurrences, "link change") + " at " + lName + ".";
            lFinding.mAgainst.emplace_back(
                "Another port of this host lost its link at the same moment, on another "
                "fabric or alone of its fabric: look at what they share, the adapter, "
                "the host or its power.");
        }
        sAddState(acrEvidence, lFinding);
        sAddCounters(acrEvidence, lFinding);
        arFindings.push_back(std::move(lFinding));
    }
}

void lookForSwitchTrouble(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, ZTCFindings& arFindings) {
    for (const ZTCEpisodes& lrMoment : sMoments(acrEvidence)) {
        for (const ZTSCommonLoss& lrLoss : sCommonLosses(acrEvidence, lrMoment)) {
            ZTSFinding lFinding = beginFinding(acrEvidence, acrRule, lrLoss.mEpisodes);
            lFinding.mSeen.push_back(
                formatCount(lFinding.mOccurrences, "link change") + ", at every port of this host on " +
                (lrLoss.mFabric ? "fabric " + lrLoss.mFabric->toText() : std::string("the fabric")) + ": " +
                joinNames(acrEvidence.namesOf(lFinding.mInitiators)) + ", within " +
                std::to_string(scSameMoment.count()) + " s.");
            sAddState(acrEvidence, lFinding);
            if (!lrLoss.mFabric) {
                lFinding.mAgainst.emplace_back(
                    "It is not known which fabric each port belongs to: ports on "
                    "different switches share only this host.");
            }
            arFindings.push_back(std::move(lFinding));
        }
    }
}
