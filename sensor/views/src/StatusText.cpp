#include <algorithm>
#include <array>

#include "sensor/views/include/SanTroubles.h"
#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"
#include "sensor/views/include/TimeText.h"
#include "sensor/views/src/PageText.h"

/// Adapters that get a line each; of more only the number is shown.
static constexpr std::size_t scMostLinks = 4;
/// Troubles of the SAN that are shown in full, at most.
static constexpr std::size_t scMostSanTroubles = 4;
/// From this width of a line on there is room for whole WWPNs.
static constexpr std::size_t scWholeWwpnWidth = 97;
/// Without an event for this long it counts as quiet.
static constexpr std::chrono::minutes scQuietSpan{1};

static constexpr const char* scGreen = "1;32";
static constexpr const char* scYellow = "1;33";
static constexpr const char* scRed = "1;31";

/// Builds the face line by line.
class ZTCStatusText {
public:
    ZTCStatusText(const ZTSStatusFacts& acrFacts, const ZTSTextStyle& acrStyle)
        : mrFacts(acrFacts), mPage(acrStyle), mJudgement(judge(acrFacts)) {}

    std::string build() {
        const std::vector<ZTSTroubleText> lTroubles = describeTroubles(mrFacts, mJudgement);
        const std::vector<ZTSTroubleText> lSanTroubles = describeSanTroubles(mrFacts);
        const bool lHasSanTroubles = !lSanTroubles.empty();
        addHead();
        addState(!lHasSanTroubles);
        for (const ZTSTroubleText& lrTrouble : lTroubles) {
            mPage.addTrouble(lrTrouble);
        }
        addFailing();
        if (mJudgement.isCollecting() && lTroubles.empty() && !lHasSanTroubles) {
            addLinks();
            addPaths();
            addQuiet();
        }
        if (mJudgement.isCollecting() && (lTroubles.empty() || lHasSanTroubles)) {
            addSan(lSanTroubles);
        }
        if (!mJudgement.isCollecting()) {
            addData();
        }
        for (const std::string& lrText : listUnknown(mrFacts)) {
            mPage.add("note", lrText);
        }
        return mPage.take();
    }

private:
    void addHead() {
        const std::string lTime = formatDateTime(mrFacts.mNow);
        const std::string lHost =
            cutText(escapeControls(mrFacts.mHost), mPage.getLineWidth() - ZTCPageText::scTextColumn - lTime.size() - 1);
        const std::size_t lUsed = ZTCPageText::scTextColumn + countCharacters(lHost) + lTime.size();
        mPage.addRaw(
            "host", lHost + std::string(mPage.getLineWidth() - std::min(mPage.getLineWidth() - 1, lUsed), ' ') + lTime);
    }

    void addState(bool aHasSince) {
        const ZTEVerdict lVerdict = mJudgement.getWorst().mVerdict;
        const char* const lpColor = lVerdict == ZTVD_Collecting ? scGreen
                                    : lVerdict <= ZTVD_NotKnown ? scRed
                                                                : scYellow;
        const std::string lWord = getVerdictWord(lVerdict);
        const std::string lRest = formatHeadline(mrFacts, mJudgement, aHasSince).substr(lWord.size());
        mPage.addRaw("state", mPage.paint(lWord, lpColor) +
                                  cutText(lRest, mPage.getLineWidth() - ZTCPageText::scTextColumn - lWord.size()));
    }

    /// The adapters with their kinds counted by state.
    void addLinks() {
        if (!mrFacts.mLive || !mrFacts.mLive->mKinds) {
            return;
        }
        const std::vector<ZTSLiveKinds>& lrKinds = *mrFacts.mLive->mKinds;
        const std::size_t lShown = lrKinds.size() <= scMostLinks ? lrKinds.size() : scMostLinks - 1;
        std::vector<std::array<std::string, 4>> lRows;
        for (std::size_t i = 0; i < lShown; ++i) {
            const ZTSInitiator& lrInitiator = lrKinds[i].mInitiator;
            const std::string lWwpn = !lrInitiator.mWwpn                        ? "-"
                                      : mPage.getLineWidth() < scWholeWwpnWidth ? abbreviateWwn(*lrInitiator.mWwpn)
                                                                                : lrInitiator.mWwpn->toText();
            lRows.push_back({lrInitiator.mHost, lWwpn, findPortState(lrInitiator), countKinds(lrKinds[i])});
        }
        std::array<std::size_t, 3> lWidths{};
        for (const auto& lrRow : lRows) {
            for (std::size_t i = 0; i < lWidths.size(); ++i) {
                lWidths[i] = std::max(lWidths[i], countCharacters(lrRow[i]));
            }
        }
        for (std::size_t i = 0; i < lRows.size(); ++i) {
            std::string lLine;
            for (std::size_t j = 0; j < lWidths.size(); ++j) {
                if (lWidths[j] == 0) {
                    continue;
                }
                lLine += lRows[i][j] + std::string(lWidths[j] - countCharacters(lRows[i][j]) + 2, ' ');
            }
            mPage.add(i == 0 ? "links" : "", lLine + lRows[i][3]);
        }
        if (lShown < lrKinds.size()) {
            mPage.add("", "and " + std::to_string(lrKinds.size() - lShown) + " more: tavik --json status");
        }
    }

    std::string findPortState(const ZTSInitiator& acrInitiator) const {
        if (mrFacts.mLive->mAdapters) {
            for (const ZTSLiveAdapter& lrAdapter : *mrFacts.mLive->mAdapters) {
                if (lrAdapter.mInitiator.mWwpn == acrInitiator.mWwpn && !lrAdapter.mPortState.empty()) {
                    return lrAdapter.mPortState;
                }
            }
        }
        return "-";
    }

    static std::string countKinds(const ZTSLiveKinds& acrKinds) {
        const auto lCount = [&acrKinds](ZTEKindState aState) {
            return std::count_if(acrKinds.mStates.begin(), acrKinds.mStates.end(),
                                 [aState](const auto& acrPair) { return acrPair.second == getKindStateName(aState); });
        };
        const auto lListening = lCount(ZTKST_Listening);
        const auto lNoSource = lCount(ZTKST_NoSource);
        const auto lOff = lCount(ZTKST_Off);
        std::string lText = "listening to " + std::to_string(lListening) + " kind" + (lListening == 1 ? "" : "s");
        lText +=
            lNoSource == 0 ? "" : ", " + std::to_string(lNoSource) + (lNoSource == 1 ? " has" : " have") + " no source";
        lText += lOff == 0 ? "" : ", " + std::to_string(lOff) + (lOff == 1 ? " is" : " are") + " off";
        return lText;
    }

    const ZTSSanView* findSan() const {
        return mrFacts.mHistory && mrFacts.mHistory->mSan ? &*mrFacts.mHistory->mSan : nullptr;
    }

    void addPaths() {
        if (const ZTSSanView* const lpSan = findSan()) {
            mPage.add("paths", summarizePaths(lpSan->mFacts));
        }
    }

    void addQuiet() {
        const ZTSLastEvent lLast = findLastEvent(mrFacts);
        std::vector<std::string> lParts;
        const auto lAge = [this](ZTCHistoryTime aTime) { return formatSpan(mrFacts.mNow - aTime) + " ago"; };
        lParts.push_back(lLast.mTime ? "last event " + lAge(*lLast.mTime) +
                                           (lLast.mKind.empty() ? "" : " (" + lLast.mKind + ")")
                                     : "no event yet");
        if (mrFacts.mLive) {
            const ZTSLiveState& lrLive = *mrFacts.mLive;
            if (lrLive.mCollector.mLastAsked) {
                lParts.push_back("asked " + lAge(*lrLive.mCollector.mLastAsked));
            }
            if (lrLive.mAgent.mHeldBytes && lrLive.mAgent.mLimitBytes) {
                lParts.push_back(formatHeld(*lrLive.mAgent.mHeldBytes, *lrLive.mAgent.mLimitBytes) + " held");
            }
        }
        std::string lText;
        for (const std::string& lrPart : lParts) {
            lText += (lText.empty() ? "" : "; ") + lrPart;
        }
        const bool lIsQuiet = !lLast.mTime || mrFacts.mNow - *lLast.mTime >= scQuietSpan;
        mPage.add(lIsQuiet ? "quiet" : "events", lText);
    }

    /// Hooks and outputs that do not work: Tavik collects all the same.
    void addFailing() {
        if (!mrFacts.mLive || !mrFacts.mLive->mWarnings) {
            return;
        }
        for (const ZTSLiveWarning& lrWarning : *mrFacts.mLive->mWarnings) {
            if (lrWarning.mKind == "hook" || lrWarning.mKind == "output") {
                mPage.add(lrWarning.mKind, lrWarning.mText);
            }
        }
    }

    /// "0 of 256 KiB": the first without a unit where it is nothing.
    static std::string formatHeld(std::uint64_t aHeld, std::uint64_t aLimit) {
        return (aHeld == 0 ? "0" : formatBytes(aHeld)) + " of " + formatBytes(aLimit);
    }

    void addSan(const std::vector<ZTSTroubleText>& acrTroubles) {
        if (!acrTroubles.empty()) {
            mPage.add("SAN", formatCount(acrTroubles.size(), "trouble"));
            mPage.addNumbered(acrTroubles, scMostSanTroubles);
            return;
        }
        std::vector<std::string> lParts;
        if (const ZTSSanView* const lpSan = findSan()) {
            const std::size_t lNotices = lpSan->mFacts.mTroubles.size();
            lParts.push_back("no trouble" + (lNotices == 0 ? std::string()
                                                           : "; " + formatCount(lNotices, "notice") + ": tavik paths"));
        }
        const std::string lOpen = describeOpenEpisodes();
        if (!lOpen.empty()) {
            lParts.push_back(lOpen);
        }
        for (std::size_t i = 0; i < lParts.size(); ++i) {
            mPage.add(i == 0 ? "SAN" : "", lParts[i]);
        }
    }

    /// "3 open episodes, 1 remote port: tavik events --open". Empty where there is nothing to say.
    std::string describeOpenEpisodes() const {
        if (!mrFacts.mHistory) {
            return {};
        }
        const ZTSHistoryFacts& lrHistory = *mrFacts.mHistory;
        if (lrHistory.mOpenEpisodes == 0) {
            return lrHistory.mSan ? "" : "no open episode: tavik events shows what was";
        }
        const bool lIsMore = lrHistory.mOpenEpisodes == gcMostOpenEpisodes;
        return (lIsMore ? "at least " : "") + formatCount(lrHistory.mOpenEpisodes, "open episode") +
               (lrHistory.mOpenPorts == 0 ? "" : ", " + formatCount(lrHistory.mOpenPorts, "remote port")) +
               ": tavik events --open";
    }

    /// Up to when the history is complete.
    void addData() {
        if (!mrFacts.mHistory) {
            return;
        }
        const ZTSHistoryFacts& lrHistory = *mrFacts.mHistory;
        std::optional<ZTCHistoryTime> lComplete = lrHistory.mRetrievals.mLast;
        const bool lMayLack = mrFacts.mAnswer == ZTAN_NoSensor && mrFacts.mLeftPage && mrFacts.mLeftPage->mHeld != 0;
        if (lrHistory.mLastRun && (!lMayLack || !lComplete)) {
            lComplete = std::max(lComplete.value_or(lrHistory.mLastRun->mTo), lrHistory.mLastRun->mTo);
        }
        mPage.add("data", (lComplete ? "complete to " + formatShortTime(*lComplete, mrFacts.mNow) + "; " : "") +
                              "tavik events still works");
    }

    const ZTSStatusFacts& mrFacts;
    ZTCPageText mPage;
    const ZTSJudgement mJudgement;
};

std::string formatStatus(const ZTSStatusFacts& acrFacts, const ZTSTextStyle& acrStyle) {
    return ZTCStatusText(acrFacts, acrStyle).build();
}
