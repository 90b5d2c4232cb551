#include <chrono>
#include <cstdint>
#include <string>

#include "tests/faults/FaultPhases.h"
#include "tests/support/Waiting.h"

namespace {

/// Longer than the library takes from one look at everything to the next.
constexpr std::chrono::milliseconds scLook{2500};

void sStartCollecting(ZTCFaultStage& arStage) {
    arStage.startUndisturbed();
    arStage.agent().startScope();
}

std::vector<std::string> sPlain(const ZTCFaultStage& acrStage) {
    return acrStage.arguments();
}

/// The running total of what the library says it has lost to failures.
std::uint64_t sLost(ZTCFaultStage& arStage) {
    const std::string lText = arStage.logText();
    const std::string lcWords = "events are lost: they could not be read or handled (";
    const std::size_t lPlace = lText.rfind(lcWords);
    return lPlace == std::string::npos ? 0 : std::stoull(lText.substr(lPlace + lcWords.size()));
}

/// What has come since the phase began.
struct ZTSCame {
    std::uint64_t mFull = 0;
    std::uint64_t mBusy = 0;
    std::uint64_t mLinks = 0;

    void collect(ZTCFaultStage& arStage) {
        const ZTSScopeDataResponse lResponse = arStage.agent().retrieve();
        mFull += lResponse.occurrences(4, 0x01);
        mBusy += lResponse.occurrences(4, 0x02);
        mLinks += lResponse.occurrences(8, 0x02);
    }
};

/// Three outcomes with a failure among them: each comes once or is counted as lost. The one after it comes.
void sReadOutcomes(ZTCFaultStage& arStage) {
    constexpr std::uint64_t lcSent = 3;
    const std::uint64_t lLostBefore = sLost(arStage);
    ZTSCame lCame;
    arStage.arm();
    for (std::uint32_t lLun = 0; lLun < lcSent; ++lLun) {
        arStage.kernel().sendDone({.mLun = lLun, .mResult = 0x28});
    }
    const ZTCDeadline lLook(scLook);
    waitUntil(
        [&] {
            lCame.collect(arStage);
            return lCame.mFull >= lcSent || arStage.faults().hasFired() || lLook.isOver();
        },
        "the outcomes, or a failure");
    arStage.endFailure();
    arStage.kernel().sendDone({.mResult = 0x08});
    const auto lLost = [&] { return sLost(arStage) - lLostBefore; };
    waitUntil(
        [&] {
            lCame.collect(arStage);
            return lCame.mBusy >= 1 && lCame.mFull + lLost() >= lcSent;
        },
        "the outcome after the failure, and the others or their loss");
    if (lCame.mFull > lcSent || lCame.mBusy > 1) {
        throw ZTCFinding("of " + std::to_string(lcSent) + " and 1 outcomes " + std::to_string(lCame.mFull) + " and " +
                         std::to_string(lCame.mBusy) + " came");
    }
}

/// A link that goes down with a failure while the hosts are looked at, and up without: two events.
void sLookAtLink(ZTCFaultStage& arStage) {
    ZTSCame lCame;
    arStage.arm();
    arStage.kernel().setState(0, "Linkdown");
    const ZTCDeadline lLook(scLook);
    waitUntil(
        [&] {
            lCame.collect(arStage);
            return lCame.mLinks >= 1 || arStage.faults().hasFired() || lLook.isOver();
        },
        "the link event, or a failure");
    arStage.endFailure();
    const auto lWait = [&](std::uint64_t aNumber, const char* apWhat) {
        waitUntil(
            [&] {
                lCame.collect(arStage);
                return lCame.mLinks >= aNumber;
            },
            apWhat);
    };
    lWait(1, "the link to be down");
    arStage.kernel().setState(0, "Online");
    lWait(2, "the link to be up");
    arStage.kernel().sendDone({.mResult = 0x08});
    waitUntil(
        [&] {
            lCame.collect(arStage);
            return lCame.mBusy >= 1;
        },
        "the outcome behind it");
    if (lCame.mLinks != 2 || arStage.countInLog("its host is gone") != 0) {
        throw ZTCFinding("the link changed twice, and " + std::to_string(lCame.mLinks) +
                         " events came: " + arStage.logText());
    }
}

}  // namespace

std::vector<ZTSFaultPhase> libraryFaultPhases() {
    return {
        {.mName = "kernel library: start",
         .mIsInQuickRun = true,
         .mLibrary = ZTEFaultLibrary::Kernel,
         .mPrepare = [](ZTCFaultStage&) {},
         .mRun = startWithFailure(&sPlain)},
        {.mName = "kernel library: outcomes",
         .mKeepsAgent = true,
         .mAlwaysGoesOn = true,
         .mIsInQuickRun = true,
         .mLibrary = ZTEFaultLibrary::Kernel,
         .mReadsWholePages = true,
         .mMostFailures = 40,
         .mPrepare = sStartCollecting,
         .mRun = sReadOutcomes},
        {.mName = "kernel library: link",
         .mKeepsAgent = true,
         .mAlwaysGoesOn = true,
         .mLibrary = ZTEFaultLibrary::Kernel,
         .mReadsWholePages = true,
         .mMostFailures = 40,
         .mPrepare = sStartCollecting,
         .mRun = sLookAtLink},
    };
}
