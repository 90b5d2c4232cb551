/// Fails every operating-system call of the agent, one at a time: the first, the second, the third ..., in every phase
/// of its life, in every way it can fail. Prints a table, and ends with status 1 where it found something.
///
/// check-faults [--quick] [--phase TEXT] [--call NAME]
#include <gtest/gtest.h>

#include <cstdio>
#include <iostream>
#include <set>
#include <string>
#include <vector>

#include "tests/faults/FaultPhases.h"
#include "tests/faults/FaultTable.h"

namespace {

struct ZTSRow {
    unsigned mRuns = 0;
    unsigned mWentOn = 0;
    unsigned mEndedInOrder = 0;
    unsigned mAsserted = 0;
    std::vector<std::string> mFindings;
};

/// Whether this program, and so the agent of the same build, is optimised. Without optimisation the compiler makes
/// copies of what may fail to be copied, and the run reports findings that are its own.
#ifdef __OPTIMIZE__
constexpr bool scIsOptimised = true;
#else
constexpr bool scIsOptimised = false;
#endif

struct ZTSOptions {
    bool mIsQuick = false;
    std::string mPhase;
    std::string mCall;
};

/// The n that follows: each one, or, in a quick run, ever fewer.
unsigned sNextNth(unsigned aNth, bool aIsQuick) {
    return aIsQuick ? aNth + 1 + aNth / 2 : aNth + 1;
}

/// One run. Returns whether the failure came.
bool sRun(ZTCFaultStage& arStage, const ZTSFaultPhase& acrPhase, const ZTSFaultWay& acrWay, unsigned aNth,
          ZTSRow& arRow) {
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
        arStage.plan({acrWay.mpCall, aNth, acrWay.mErrno, acrWay.mCount, acrWay.mIsLasting});
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
            if (acrPhase.mKeepsAgent && arStage.openDescriptors() > arStage.descriptorsAtFirst()) {
                throw ZTCFinding("it has " + std::to_string(arStage.openDescriptors()) + " descriptors and had " +
                                 std::to_string(arStage.descriptorsAtFirst()));
            }
        } else {
            const ZTEFaultEnd lEnd = arStage.waitForEnd();
            const std::string lLog = arStage.logText();
            arRow.mEndedInOrder += lEnd == ZTEFaultEnd::InOrder;
            arRow.mAsserted += lEnd == ZTEFaultEnd::Assertion;
            if (!lHasFired) {
                lReport("it ended without any failure (" + lWhy + "): " + lLog);
            } else if (acrPhase.mAlwaysGoesOn || acrWay.mIsAbsorbed) {
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

}  // namespace

int main(int argc, char** argv) {
    testing::InitGoogleTest(&argc, argv);
    ZTSOptions lOptions;
    for (int lIndex = 1; lIndex < argc; ++lIndex) {
        const std::string lArgument = argv[lIndex];
        if (lArgument == "--quick") {
            lOptions.mIsQuick = true;
        } else if (lArgument == "--phase" && lIndex + 1 < argc) {
            lOptions.mPhase = argv[++lIndex];
        } else if (lArgument == "--call" && lIndex + 1 < argc) {
            lOptions.mCall = argv[++lIndex];
        } else {
            std::cerr << "Usage: check-faults [--quick] [--phase TEXT] [--call NAME]\n";
            return 2;
        }
    }

    if (!scIsOptimised) {
        std::cerr
            << "check-faults: this build is not optimised, so that some findings would be of the build and not of "
               "the agent; use the release preset\n";
        return 2;
    }

    ZTCChildProcess::becomeReaper();
    std::set<std::string> lCallsThatFailed;
    std::size_t lFindings = 0;
    unsigned lRuns = 0;
    std::printf("%-32s %-26s %-14s %6s %8s %8s %8s %9s\n", "phase", "call", "fails with", "runs", "went on", "ended 0",
                "ended 1", "findings");
    for (const ZTSFaultPhase& lcrPhase : faultPhases()) {
        if (lcrPhase.mName.find(lOptions.mPhase) == std::string::npos ||
            (lOptions.mIsQuick && !lcrPhase.mIsInQuickRun)) {
            continue;
        }
        ZTCFaultStage lStage;
        for (const ZTSFaultWay& lcrWay : faultWays()) {
            if ((!lOptions.mCall.empty() && lOptions.mCall != lcrWay.mpCall) ||
                (lOptions.mIsQuick && !lcrWay.mIsInQuickRun)) {
                continue;
            }
            ZTSRow lRow;
            unsigned lNth = 1;
            while (lNth <= lcrPhase.mMostFailures && lRow.mFindings.size() < 5 &&
                   sRun(lStage, lcrPhase, lcrWay, lNth, lRow)) {
                lNth = sNextNth(lNth, lOptions.mIsQuick);
            }
            if (lRow.mRuns == 0 && lRow.mFindings.empty()) {
                continue;
            }
            lRuns += lRow.mRuns;
            lCallsThatFailed.insert(lcrWay.mpCall);
            std::printf("%-32s %-26s %-14s %6u %8u %8u %8u %9zu\n", lcrPhase.mName.c_str(), lcrWay.mpCall,
                        lcrWay.mpName, lRow.mRuns, lRow.mWentOn, lRow.mEndedInOrder, lRow.mAsserted,
                        lRow.mFindings.size());
            for (const std::string& lcrFinding : lRow.mFindings) {
                std::printf("    finding: %s\n", sShortened(lcrFinding).c_str());
            }
            std::fflush(stdout);
            lFindings += lRow.mFindings.size();
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

    // A name in the table that no call has would never be noticed otherwise.
    if (!lOptions.mIsQuick && lOptions.mPhase.empty()) {
        for (const ZTSFaultWay& lcrWay : faultWays()) {
            if ((lOptions.mCall.empty() || lOptions.mCall == lcrWay.mpCall) &&
                !lCallsThatFailed.contains(lcrWay.mpCall)) {
                std::printf("    finding: %s was never called\n", lcrWay.mpCall);
                ++lFindings;
            }
        }
    }
    std::printf("%u failures, %zu findings\n", lRuns, lFindings);
    return lFindings == 0 && !testing::UnitTest::GetInstance()->ad_hoc_test_result().Failed() ? 0 : 1;
}
