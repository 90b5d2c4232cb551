#include <algorithm>

#include "sensor/client/include/NumberText.h"
#include "sensor/diagnosis/src/Rules.h"

const char* getFindingSeverityName(ZTESeverity aSeverity) {
    static constexpr std::array<const char*, 4> scNames{"problem", "warning", "note", "noise"};
    return scNames.at(aSeverity);
}

bool ZTSFinding::isShownBy(std::uint64_t aEpisode) const {
    return std::ranges::binary_search(mEpisodes, aEpisode);
}

std::uint64_t countOccurrences(const ZTCEpisodes& acrEpisodes) {
    std::uint64_t lCount = 0;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        lCount += lpEpisode->mCount;
    }
    return lCount;
}

ZTSLunSet unionOfLuns(const ZTCEpisodes& acrEpisodes) {
    ZTSLunSet lLuns;
    std::set<std::uint32_t> lNumbers;
    for (const ZTSEpisode* lpEpisode : acrEpisodes) {
        if (const auto& lrOwn = lpEpisode->mDetail.mLuns) {
            lLuns.mIsAll = lLuns.mIsAll || lrOwn->mIsAll;
            lLuns.mHasMore = lLuns.mHasMore || lrOwn->mHasMore;
            lNumbers.insert(lrOwn->mNumbers.begin(), lrOwn->mNumbers.end());
        }
    }
    lLuns.mNumbers.assign(lNumbers.begin(), lNumbers.end());
    return lLuns;
}

std::string describeLuns(const ZTSLunSet& acrLuns) {
    if (acrLuns.mIsAll) {
        return "all LUNs";
    }
    if (acrLuns.mNumbers.empty()) {
        return "unnamed LUNs";
    }
    return (acrLuns.mNumbers.size() == 1 ? "LUN " : "LUNs ") + formatRanges(acrLuns.mNumbers) +
           (acrLuns.mHasMore ? " and more" : "");
}

/// Puts a value where the name stands. False: the name stands there and there is no value.
static bool sFillIn(std::string& arLine, const std::string& acrName, const std::string& acrValue) {
    for (std::size_t lAt = arLine.find(acrName); lAt != std::string::npos;
         lAt = arLine.find(acrName, lAt + acrValue.size())) {
        if (acrValue.empty()) {
            return false;
        }
        arLine.replace(lAt, acrName.size(), acrValue);
    }
    return true;
}

/// The rule's steps. One that needs a name which the finding does not have is left out.
static std::vector<std::string> sNextSteps(const ZTCEvidenceIndex& acrEvidence, const ZTSFinding& acrFinding) {
    std::vector<std::string> lSteps;
    std::string_view lRest = acrFinding.mpRule->mpNext;
    const std::string lWwpn = acrFinding.mRemotePorts.empty() ? "" : acrFinding.mRemotePorts.front().mWwpn.toText();
    const std::string lInitiator =
        acrFinding.mInitiators.empty() ? "" : acrEvidence.nameOf(acrFinding.mInitiators.front());
    const std::string lHost =
        acrFinding.mInitiators.empty() ? "" : acrEvidence.findHost(acrFinding.mInitiators.front());
    while (!lRest.empty()) {
        const std::size_t lEnd = std::min(lRest.find('\n'), lRest.size());
        std::string lLine(lRest.substr(0, lEnd));
        lRest.remove_prefix(std::min(lEnd + 1, lRest.size()));
        if (sFillIn(lLine, "{port}", acrFinding.mSubject) && sFillIn(lLine, "{wwpn}", lWwpn) &&
            sFillIn(lLine, "{initiator}", lInitiator) && sFillIn(lLine, "{host}", lHost)) {
            lSteps.push_back(std::move(lLine));
        }
    }
    return lSteps;
}

static bool sNamesWord(std::string_view aWords, std::string_view aWord) {
    for (std::size_t lAt = aWords.find(aWord); lAt != std::string_view::npos; lAt = aWords.find(aWord, lAt + 1)) {
        const std::size_t lEnd = lAt + aWord.size();
        if ((lAt == 0 || aWords[lAt - 1] == ' ') && (lEnd == aWords.size() || aWords[lEnd] == ' ')) {
            return true;
        }
    }
    return false;
}

ZTSFinding beginFinding(const ZTCEvidenceIndex& acrEvidence, const ZTSRule& acrRule, const ZTCEpisodes& acrEpisodes,
                        const std::string& acrSubject) {
    ZTSFinding lFinding;
    lFinding.mpRule = &acrRule;
    lFinding.mSeverity = acrRule.mSeverity;
    lFinding.mInitiators = acrEvidence.initiatorsOf(acrEpisodes);
    lFinding.mRemotePorts = acrEvidence.remotePortsOf(acrEpisodes);
    lFinding.mSubject = !acrSubject.empty()              ? acrSubject
                        : !lFinding.mRemotePorts.empty() ? joinNames(acrEvidence.namesOf(lFinding.mRemotePorts))
                                                         : joinNames(acrEvidence.namesOf(lFinding.mInitiators));
    ZTCEpisodes lSorted = acrEpisodes;
    std::ranges::sort(lSorted, {}, &ZTSEpisode::mEpisode);
    lFinding.mFirst = lSorted.front()->mFirst;
    lFinding.mLast = lSorted.front()->mLast;
    for (const ZTSEpisode* lpEpisode : lSorted) {
        lFinding.mEpisodes.push_back(lpEpisode->mEpisode);
        lFinding.mSeqs.push_back(lpEpisode->mSeq);
        lFinding.mOccurrences += lpEpisode->mCount;
        lFinding.mFirst = std::min(lFinding.mFirst, lpEpisode->mFirst);
        lFinding.mLast = std::max(lFinding.mLast, lpEpisode->mLast);
    }
    lFinding.mNext = sNextSteps(acrEvidence, lFinding);
    for (const ZTSUnobserved& lrUnobserved : acrEvidence.getEvidence().mUnobserved) {
        const bool lIsOwn = std::ranges::any_of(lFinding.mInitiators, [&](const ZTSInitiator& acrInitiator) {
            return acrInitiator.mWwpn == lrUnobserved.mInitiator.mWwpn;
        });
        if (lIsOwn && sNamesWord(acrRule.mpKinds, getKindName(lrUnobserved.mKind))) {
            lFinding.mUnobserved.push_back(lrUnobserved);
        }
    }
    return lFinding;
}
