/// Fails every operating-system call of the agent, and of the kernel's library in it, in every phase of its life, in
/// every way it can fail: the first call, the second, the third ..., each of them alone ("once"), with all later ones
/// ("from then on"), and with all later ones for a while ("for a while"). Prints a table, and ends with status 1 where
/// it found something.
///
/// check-faults [--quick] [--phase TEXT] [--call NAME] [--mode TEXT] [--part I/N]
///
/// With --part it runs every N-th phase, from I = 0 on: N of them beside each other do the whole. --calls lists the
/// names of the calls.
#include <gtest/gtest.h>

#include <chrono>
#include <cstdio>
#include <iostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "tests/faults/FaultPhases.h"
#include "tests/faults/FaultTable.h"

namespace {

struct ZTSRow {
    unsigned mRuns = 0;
    unsigned mWentOn = 0;
    unsigned mEndedInOrder = 0;
    unsigned mAsserted = 0;
    bool mLastWentOn = false;  ///< the agent that has the last failure behind it may still end of it
    std::vector<std::string> mFindings;
};

/// Whether this program, and so the agent of the same build, is optimised. Without optimisation the compiler makes
/// copies of what may fail to be copied, and the run reports findings that are its own.
#ifdef __OPTIMIZE__
constexpr bool scIsOptimised = true;
#else
constexpr bool scIsOptimised = false;
#endif

/// How long calls fail in a row.
struct ZTSMode {
    const char* mpName;
    bool mIsLasting;
    unsigned mSpan;
};

constexpr unsigned scSpan = 50;  // milliseconds; shorter than any time after which the agent gives up
constexpr ZTSMode scModes[] = {{"once", false, 0}, {"from then on", true, 0}, {"for a while", true, scSpan}};

struct ZTSOptions {
    bool mIsQuick = false;
    std::string mPhase;
    std::string mCall;
    std::string mMode;
    bool mListsCalls = false;
    unsigned mPart = 0;
    unsigned mParts = 1;
};

/// The n that follows: each one; fewer where many fail together; ever fewer in a quick run.
unsigned sNextNth(unsigned aNth, const ZTSMode& acrMode, bool aIsQuick) {
    if (aIsQuick) {
        return aNth + 1 + (acrMode.mIsLasting ? aNth : aNth / 2);
    }
    return aNth + 1 + (acrMode.mIsLasting ? aNth / 4 : 0);
}

/// Whether this failure may end the agent.
bool sMayEndAgent(const ZTSFaultPhase& acrPhase, const ZTSFaultWay& acrWay) {
    // No event makes the agent poll: it was another thread's, which waits while the phase runs.
    const bool lIsOfPhase = acrPhase.mLibrary == ZTEFaultLibrary::Kernel || std::string(acrWay.mpCall) != "poll";
    return acrWay.mEffect == ZTEFaultEffect::Felt && !(acrPhase.mAlwaysGoesOn && lIsOfPhase);
}

/// Whether the system can fail so.
bool sIsPossible(const ZTSFaultPhase& acrPhase, const ZTSFaultWay& acrWay, const ZTSMode& acrMode) {
    if (acrPhase.mReadsWholePages && acrWay.mErrno == 0 && std::string(acrWay.mpCall) == "read") {
        return false;
    }
    return acrWay.mEffect != ZTEFaultEffect::Passing || !acrMode.mIsLasting || acrMode.mSpan != 0;
}

/// One run. Returns whether the failure came.
bool sRun(ZTCFaultStage& arStage, const ZTSFaultPhase& acrPhase, const ZTSFaultWay& acrWay, const ZTSMode& acrMode,
          unsigned aNth, ZTSRow& arRow) {
    bool lHasFired = false;
    const auto lReport = [&](const std::string& acrText) {
        char lPlace[32];
        std::snprintf(lPlace, sizeof lPlace, "0x%llx", static_cast<unsigned long long>(arStage.faults().firedAt()));
        arRow.mFindings.push_back("n = " + std::to_string(aNth) + ", called from " + lPlace + ": " + acrText);
        if (arStage.isRunning()) {
            arStage.kill();
        }
    };
    try {
        arStage.disarm();
        if (!arStage.isRunning()) {
            acrPhase.mPrepare(arStage);
        }
        arStage.plan({acrWay.mpCall, aNth, acrWay.mErrno, acrWay.mCount, acrMode.mIsLasting, acrMode.mSpan});
        bool lDoesNotAnswer = false;
        std::string lWhy;
        try {
            acrPhase.mRun(arStage);
        } catch (const ZTCFinding&) {
            throw;
        } catch (const std::runtime_error& lcrError) {
            lDoesNotAnswer = true;
            lWhy = lcrError.what();
        }
        arStage.disarm();
        lHasFired = arStage.faults().hasFired();
        if (!lDoesNotAnswer) {
            arRow.mWentOn += lHasFired;
            arRow.mLastWentOn = lHasFired && sMayEndAgent(acrPhase, acrWay);
            if (acrPhase.mKeepsAgent && arStage.openDescriptors() > arStage.descriptorsAtFirst()) {
                throw ZTCFinding("it has " + std::to_string(arStage.openDescriptors()) + " descriptors and had " +
                                 std::to_string(arStage.descriptorsAtFirst()));
            }
        } else {
            const ZTEFaultEnd lEnd = arStage.waitForEnd();
            const std::string lLog = arStage.logText();
            arRow.mEndedInOrder += lEnd == ZTEFaultEnd::InOrder;
            arRow.mAsserted += lEnd == ZTEFaultEnd::Assertion;
            if (!lHasFired && arRow.mLastWentOn) {
                // The failure before ended it, after the phase.
                arRow.mLastWentOn = false;
                arStage.checkNextStart();
                return sRun(arStage, acrPhase, acrWay, acrMode, aNth, arRow);
            }
            if (!lHasFired) {
                lReport("it ended without any failure (" + lWhy + "): " + lLog);
            } else if (!sMayEndAgent(acrPhase, acrWay)) {
                lReport("it ended (" + lWhy + "): " + lLog);
            }
            arStage.checkNextStart();
        }
        if (!acrPhase.mKeepsAgent && arStage.isRunning()) {
            arStage.stop();
        }
    } catch (const std::exception& lcrError) {
        arStage.disarm();
        lHasFired = arStage.faults().hasFired();
        lReport(lcrError.what());
    }
    arRow.mRuns += lHasFired;
    return lHasFired;
}

std::string sShortened(const std::string& acrText) {
    constexpr std::size_t lcBegin = 160;
    constexpr std::size_t lcEnd = 800;
    return acrText.size() <= lcBegin + lcEnd
               ? acrText
               : acrText.substr(0, lcBegin) + " ...\n" + acrText.substr(acrText.size() - lcEnd);
}

/// The rows of one way to fail, a mode each. Returns the number of failures and of findings.
std::pair<unsigned, std::size_t> sRunWay(ZTCFaultStage& arStage, const ZTSFaultPhase& acrPhase,
                                         const ZTSFaultWay& acrWay, const ZTSOptions& acrOptions) {
    unsigned lRuns = 0;
    std::size_t lFindings = 0;
    for (const ZTSMode& lcrMode : scModes) {
        if (!sIsPossible(acrPhase, acrWay, lcrMode) ||
            std::string(lcrMode.mpName).find(acrOptions.mMode) == std::string::npos) {
            continue;
        }
        ZTSRow lRow;
        const auto lBegin = std::chrono::steady_clock::now();
        unsigned lNth = 1;
        while (lNth <= acrPhase.mMostFailures && lRow.mFindings.size() < 5 &&
               sRun(arStage, acrPhase, acrWay, lcrMode, lNth, lRow)) {
            lNth = sNextNth(lNth, lcrMode, acrOptions.mIsQuick);
        }
        if (lRow.mRuns == 0 && lRow.mFindings.empty()) {
            break;  // the phase does not make this call
        }
        lRuns += lRow.mRuns;
        lFindings += lRow.mFindings.size();
        const std::chrono::duration<double> lTook = std::chrono::steady_clock::now() - lBegin;
        std::printf("%-32s %-26s %-12s %-13s %6u %8u %8u %8u %9zu %7.1f\n", acrPhase.mName.c_str(), acrWay.mpCall,
                    acrWay.mpName, lcrMode.mpName, lRow.mRuns, lRow.mWentOn, lRow.mEndedInOrder, lRow.mAsserted,
                    lRow.mFindings.size(), lTook.count());
        for (const std::string& lcrFinding : lRow.mFindings) {
            std::printf("    finding: %s\n", sShortened(lcrFinding).c_str());
        }
        std::fflush(stdout);
    }
    return {lRuns, lFindings};
}

bool sReadArguments(int aCount, char** appArguments, ZTSOptions& arOptions) {
    for (int lIndex = 1; lIndex < aCount; ++lIndex) {
        const std::string lArgument = appArguments[lIndex];
        const bool lHasValue = lIndex + 1 < aCount;
        if (lArgument == "--quick") {
            arOptions.mIsQuick = true;
        } else if (lArgument == "--calls") {
            arOptions.mListsCalls = true;
        } else if (lArgument == "--phase" && lHasValue) {
            arOptions.mPhase = appArguments[++lIndex];
        } else if (lArgument == "--call" && lHasValue) {
            arOptions.mCall = appArguments[++lIndex];
        } else if (lArgument == "--mode" && lHasValue) {
            arOptions.mMode = appArguments[++lIndex];
        } else if (lArgument == "--part" && lHasValue &&
                   std::sscanf(appArguments[++lIndex], "%u/%u", &arOptions.mPart, &arOptions.mParts) == 2 &&
                   arOptions.mPart < arOptions.mParts) {
            continue;
        } else {
            return false;
        }
    }
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    testing::InitGoogleTest(&argc, argv);
    ZTSOptions lOptions;
    if (!sReadArguments(argc, argv, lOptions)) {
        std::cerr << "Usage: check-faults [--quick] [--phase TEXT] [--call NAME] [--mode TEXT] [--part I/N] | "
                     "--calls\n";
        return 2;
    }
    if (lOptions.mListsCalls) {
        std::set<std::string> lCalls;
        for (const ZTSFaultWay& lcrWay : faultWays()) {
            lCalls.insert(lcrWay.mpCall);
        }
        for (const std::string& lcrCall : lCalls) {
            std::printf("%s\n", lcrCall.c_str());
        }
        return 0;
    }

    if (!scIsOptimised) {
        std::cerr
            << "check-faults: this build is not optimised, so that some findings would be of the build and not of "
               "the agent; use the release preset\n";
        return 2;
    }

    ZTCChildProcess::becomeReaper();
    std::size_t lFindings = 0;
    unsigned lRuns = 0;
    if (lOptions.mPart == 0) {
        std::printf("%-32s %-26s %-12s %-13s %6s %8s %8s %8s %9s %7s\n", "phase", "call", "fails with", "how long",
                    "runs", "went on", "ended 0", "ended 1", "findings", "seconds");
        std::fflush(stdout);
    }
    unsigned lNumber = 0;
    for (const ZTSFaultPhase& lcrPhase : faultPhases()) {
        if (lcrPhase.mName.find(lOptions.mPhase) == std::string::npos ||
            (lOptions.mIsQuick && !lcrPhase.mIsInQuickRun) || lNumber++ % lOptions.mParts != lOptions.mPart) {
            continue;
        }
        ZTCFaultStage lStage(lcrPhase.mLibrary);
        for (const ZTSFaultWay& lcrWay : faultWays()) {
            if ((!lOptions.mCall.empty() && lOptions.mCall != lcrWay.mpCall) ||
                (lOptions.mIsQuick && !lcrWay.mIsInQuickRun)) {
                continue;
            }
            const auto [lRunsOfIt, lFindingsOfIt] = sRunWay(lStage, lcrPhase, lcrWay, lOptions);
            lRuns += lRunsOfIt;
            lFindings += lFindingsOfIt;
        }
        if (lStage.isRunning()) {
            try {
                lStage.stop();
            } catch (const std::exception& lcrError) {
                std::printf("    finding: %s\n", lcrError.what());
                ++lFindings;
            }
        }
    }

    std::printf("%u failures, %zu findings\n", lRuns, lFindings);
    return lFindings == 0 && !testing::UnitTest::GetInstance()->ad_hoc_test_result().Failed() ? 0 : 1;
}
