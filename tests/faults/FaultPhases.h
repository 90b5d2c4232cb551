/// What the agent does while a call fails.
#ifndef TESTS_FAULTS_FAULTPHASES_H
#define TESTS_FAULTS_FAULTPHASES_H

#include <functional>
#include <string>
#include <vector>

#include "tests/faults/FaultStage.h"

struct ZTSFaultPhase {
    std::string mName;
    bool mKeepsAgent = false;    ///< an agent that went on serves for the next failure too
    bool mAlwaysGoesOn = false;  ///< no failure in here may end the agent
    bool mIsInQuickRun = false;
    ZTEFaultLibrary mLibrary = ZTEFaultLibrary::Scripted;
    bool mReadsWholePages = false;    ///< what it reads comes whole or not at all
    unsigned mMostFailures = 100000;  ///< n goes no further; by default further than any phase
    /// Makes the agent ready; leaves it not started where the phase is its start.
    std::function<void(ZTCFaultStage&)> mPrepare;
    /// Arms, acts, disarms, checks. Throws ZTCFinding, or another exception where the agent does not answer: it has to
    /// end then.
    std::function<void(ZTCFaultStage&)> mRun;
};

/// All phases.
std::vector<ZTSFaultPhase> faultPhases();

/// Those of the kernel's library.
std::vector<ZTSFaultPhase> libraryFaultPhases();

/// The agent is started with a failure in it.
std::function<void(ZTCFaultStage&)> startWithFailure(std::vector<std::string> (*apArguments)(const ZTCFaultStage&));

#endif
