#include "tests/faults/FaultPhases.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <map>
#include <optional>

#include "tests/system/AdapterEvents.h"

namespace {

void sNothing(ZTCFaultStage&) {}

void sStart(ZTCFaultStage& arStage) {
    arStage.startUndisturbed();
}

/// So that the agent lifts each descriptor that it gets above those of the standard streams.
void sTakeStandardStreams(ZTCFaultStage& arStage) {
    arStage.setStandardStreams(false);
}

void sStartCollecting(ZTCFaultStage& arStage) {
    arStage.startUndisturbed();
    arStage.agent().startScope();
}

/// The program is run with a failure beside an agent that was started without.
std::function<void(ZTCFaultStage&)> sRunningBeside(const char* apOption) {
    return [=](ZTCFaultStage& arStage) {
        arStage.faults().detach();
        arStage.startUndisturbed();
        arStage.faults().attach();
        arStage.arm();
        const ZTSRunResult lResult = arStage.agent().run({apOption, "-D", "false"});
        arStage.disarm();
        if (lResult.mStatus != 0) {
            throw ZTCFinding("the second one ended with " + std::to_string(lResult.mStatus) + ": " + lResult.mError);
        }
        const bool lWasStopped = lResult.mOutput.find("Stopped the running instance") != std::string::npos;
        if (lWasStopped) {
            arStage.waitForEnd();
        } else {
            try {
                arStage.probe();
                arStage.stop();
            } catch (const ZTCFinding&) {
                throw;
            } catch (const std::runtime_error&) {
                arStage.waitForEnd();  // asked to stop, by one that could not tell
            }
        }
        arStage.checkNextStart();
    };
}

/// One command with a failure in it, and its answer; the agent is as it was afterwards.
std::function<void(ZTCFaultStage&)> sCommanding(const ZTCBytes& acrBody, const std::string& acrAnswer) {
    return [=](ZTCFaultStage& arStage) {
        arStage.arm();
        const std::string lAnswer = hexOf(arStage.agent().pipes().request(acrBody));
        arStage.probe();
        arStage.disarm();
        if (lAnswer != acrAnswer) {
            throw ZTCFinding("answered " + lAnswer + ", not " + acrAnswer);
        }
        arStage.probe();
    };
}

std::string sTexts(const std::vector<std::string>& acrTexts) {
    std::string lAll;
    for (const std::string& lcrText : acrTexts) {
        lAll += "\n        " + lcrText;
    }
    return lAll;
}

std::vector<ZTSLibraryEvent> sMixture() {
    return {ZTSLibraryEvent::scope(0, 4, 0x01, scsiData(gcRemotePort, 3)),
            ZTSLibraryEvent::scope(0, 1, 0x08, lsRjtData(gcRemotePort, 1, 2, 3)),
            ZTSLibraryEvent::scope(1, 1, 0x01, plogiData(gcRemotePort, gcRemoteNode)),
            ZTSLibraryEvent::rscn(1, rscnPayload({0x00010203, 0x00010204})), ZTSLibraryEvent::temperature(0)};
}

/// A retrieval of a mixture with a failure in it.
void sRetrieve(ZTCFaultStage& arStage) {
    arStage.agent().library().deliverAll(sMixture());
    arStage.arm();
    const std::vector<std::string> lTexts = arStage.retrieve();
    arStage.disarm();
    if (lTexts.size() != 6) {
        throw ZTCFinding("the mixture came as" + sTexts(lTexts));
    }
    const std::vector<std::string> lNext = arStage.retrieve();
    if (!lNext.empty()) {
        throw ZTCFinding("delivered twice:" + sTexts(lNext));
    }
}

void sBreakFrames(ZTCFaultStage& arStage) {
    arStage.arm();
    arStage.agent().pipes().sendRaw(bytesOf("00000000 0102"));
    arStage.agent().pipes().waitUntilTaken();
    arStage.probe();
    arStage.disarm();
    arStage.probe();
}

/// The fewest blocks that the agent is seen to hold within a moment: its command thread is done with the last command
/// then.
std::int64_t sFewestBlocks(ZTCFaultStage& arStage, std::chrono::milliseconds aMoment, std::int64_t aWanted) {
    const ZTCDeadline lDeadline(aMoment);
    std::int64_t lFewest = arStage.faults().liveBlocks();
    waitUntil(
        [&] {
            lFewest = std::min(lFewest, arStage.faults().liveBlocks());
            return lFewest <= aWanted || lDeadline.isOver();
        },
        "fewer blocks");
    return lFewest;
}

/// One event with a failure in it, between others. Either it is consolidated, or it is reported and as if it had not
/// been: the others find the pending record and the lists sound.
std::function<void(ZTCFaultStage&)> sDelivering(const ZTSLibraryEvent& acrEvent, bool aIsFirst = false) {
    const ZTSLibraryEvent lOther = ZTSLibraryEvent::scope(0, 4, 0x02, scsiData(gcOtherPort, 9));
    const ZTSLibraryEvent lEvent = acrEvent;
    return [=](ZTCFaultStage& arStage) {
        ZTCScriptedLibrary& lrLibrary = arStage.agent().library();
        const auto lPlay = [&](bool aIsLeftOut, bool aIsArmed) {
            lrLibrary.deliver(lOther);
            if (aIsArmed) {
                arStage.arm();
            }
            if (!aIsLeftOut) {
                lrLibrary.deliver(lEvent);
            }
            arStage.disarm();
            lrLibrary.deliver(lOther);
            lrLibrary.deliver(lEvent);
            lrLibrary.deliver(lEvent);
            return arStage.retrieve();
        };
        const std::string lcReport = ", processing event callback";
        std::int64_t lBlocksBefore = 0;
        if (!aIsFirst) {
            lPlay(false, false);
            lBlocksBefore = sFewestBlocks(arStage, std::chrono::milliseconds(10), 0);
        }
        const std::size_t lReportsBefore = arStage.countInLog(lcReport);
        const std::vector<std::string> lTexts = lPlay(false, true);
        const bool lIsReported = arStage.countInLog(lcReport) > lReportsBefore;
        const std::vector<std::string> lWithout = lPlay(true, false);
        const std::vector<std::string> lWhole = lPlay(false, false);
        if (lTexts != (lIsReported ? lWithout : lWhole)) {
            throw ZTCFinding(std::string("the event was ") + (lIsReported ? "reported, but" : "not reported, and") +
                             " there is" + sTexts(lTexts) + "\n      in place of" +
                             sTexts(lIsReported ? lWithout : lWhole));
        }
        if (!aIsFirst) {
            const std::int64_t lBlocks = sFewestBlocks(arStage, std::chrono::seconds(1), lBlocksBefore);
            if (lBlocks > lBlocksBefore) {
                throw ZTCFinding(std::to_string(lBlocks - lBlocksBefore) + " blocks of memory have leaked");
            }
        }
    };
}

void sReopenLog(ZTCFaultStage& arStage) {
    const std::size_t lBefore = arStage.countInLog("The log file was reopened");
    arStage.arm();
    arStage.agent().process().sendSignal(SIGHUP);
    const auto lIsReopened = [&] { return arStage.countInLog("The log file was reopened") > lBefore; };
    waitUntil([&] { return lIsReopened() || arStage.faults().hasFired() || !arStage.isRunning(); },
              "the log's reopening, or a failure");
    arStage.endFailure();
    arStage.probe();
}

void sRotateLog(ZTCFaultStage& arStage) {
    const std::string lFormer = arStage.agent().agentLogPath() + ".1";
    std::filesystem::remove(lFormer);
    arStage.arm();
    std::filesystem::resize_file(arStage.agent().agentLogPath(), 64u << 20);
    // The agent looks at the file's size now and then.
    do {
        arStage.probe();
    } while (!std::filesystem::exists(lFormer) && !arStage.faults().hasFired());
    arStage.disarm();
    arStage.probe();
}

void sEndBySignal(ZTCFaultStage& arStage) {
    arStage.arm();
    arStage.agent().process().sendSignal(SIGTERM);
    arStage.waitForEnd();
    arStage.disarm();
    arStage.checkNextStart();
}

void sEndByCommand(ZTCFaultStage& arStage) {
    arStage.agent().library().deliverAll(sMixture());
    arStage.arm();
    const std::string lAnswer = arStage.agent().request(gcShutDownHex);
    if (lAnswer != gcSuccessHex) {
        throw ZTCFinding("shut-down was answered " + lAnswer);
    }
    arStage.waitForEnd();
    arStage.disarm();
    arStage.checkNextStart();
}

/// A sensor that lives and does not touch its file: every period asks for its process.
void sStartWithSilentSensor(ZTCFaultStage& arStage) {
    writeFile(arStage.agent().sensorPidFilePath(), std::to_string(::getpid()) + "\n");
    arStage.startUndisturbed({"-b", "1"});
    waitUntil([&] { return arStage.countInLog("Sensor process still running") > 0 || !arStage.isRunning(); },
              "the first question for the sensor's process");
}

/// A period with a failure in it, and one without.
void sBeat(ZTCFaultStage& arStage) {
    const auto lCount = [&] { return arStage.countInLog("Sensor process still running"); };
    const std::size_t lBefore = lCount();
    // Where the agent cannot write, no line tells of the period: it is over when it must be.
    std::optional<ZTCDeadline> lEnd;
    arStage.arm();
    waitUntil(
        [&] {
            if (!lEnd && arStage.faults().hasFired()) {
                lEnd.emplace(std::chrono::seconds(2));
            }
            return lCount() > lBefore || !arStage.isRunning() || (lEnd && lEnd->isOver());
        },
        "the next period");
    arStage.disarm();
    const std::size_t lAfter = lCount();
    waitUntil([&] { return lCount() > lAfter || !arStage.isRunning(); }, "a period without a failure");
    arStage.probe();
}

std::vector<std::string> sPlain(const ZTCFaultStage& acrStage) {
    return acrStage.arguments();
}

std::vector<std::string> sAsDaemon(const ZTCFaultStage& acrStage) {
    return acrStage.arguments({"-D", "true"});
}

}  // namespace

std::function<void(ZTCFaultStage&)> startWithFailure(std::vector<std::string> (*apArguments)(const ZTCFaultStage&)) {
    return [=](ZTCFaultStage& arStage) {
        const std::vector<std::string> lArguments = apArguments(arStage);
        arStage.arm();
        const bool lServes = arStage.start(lArguments);
        arStage.disarm();
        if (!lServes) {
            throw std::runtime_error("it does not start");
        }
        arStage.probe();
        arStage.agent().startScope();
        arStage.stop();
        arStage.checkNextStart();
    };
}

std::vector<ZTSFaultPhase> faultPhases() {
    const ZTCBytes lTargets =
        ZTCAgentProcess::registerTargetsRequest({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203},
                                                 {makeWwn(gcOtherNode), makeWwn(gcOtherPort), 0x010204}});
    std::vector<ZTSFaultPhase> lPhases = {
        {.mName = "start", .mIsInQuickRun = true, .mPrepare = sNothing, .mRun = startWithFailure(&sPlain)},
        {.mName = "start as a daemon",
         .mIsInQuickRun = true,
         .mPrepare = sNothing,
         .mRun = startWithFailure(&sAsDaemon)},
        {.mName = "start without standard streams",
         .mPrepare = sTakeStandardStreams,
         .mRun = startWithFailure(&sPlain)},
        {.mName = "a second start", .mPrepare = sNothing, .mRun = sRunningBeside("-S")},
        {.mName = "option -s", .mPrepare = sNothing, .mRun = sRunningBeside("-s")},
        {.mName = "command start",
         .mIsInQuickRun = true,
         .mPrepare = sStart,
         .mRun = sCommanding(ZTCAgentProcess::startScopeRequest(4096), gcSuccessHex)},
        {.mName = "command start, again",
         .mKeepsAgent = true,
         .mPrepare = sStartCollecting,
         .mRun = sCommanding(ZTCAgentProcess::startScopeRequest(4096), gcSuccessHex)},
        {.mName = "command register-targets",
         .mIsInQuickRun = true,
         .mPrepare = sStart,
         .mRun = sCommanding(lTargets, gcSuccessHex)},
        {.mName = "command stop",
         .mKeepsAgent = true,
         .mPrepare = sStartCollecting,
         .mRun = sCommanding(bytesOf(gcStopScopeHex), gcSuccessHex)},
        {.mName = "command set-collection-period",
         .mKeepsAgent = true,
         .mPrepare = sStart,
         .mRun = sCommanding(bytesOf("0500000001"), gcSuccessHex)},
        {.mName = "broken frames",
         .mKeepsAgent = true,
         .mIsInQuickRun = true,
         .mPrepare = sStart,
         .mRun = sBreakFrames},
        {.mName = "retrieval",
         .mKeepsAgent = true,
         .mIsInQuickRun = true,
         .mPrepare = sStartCollecting,
         .mRun = sRetrieve},
    };
    const std::map<std::string, ZTSLibraryEvent> lEvents = {
        {"generic", ZTSLibraryEvent::bare(0, 2, 0x01)},
        {"link", ZTSLibraryEvent::link(0, ZTCScriptedLibrary::portName(0))},
        {"temperature", ZTSLibraryEvent::temperature(1)},
        {"RSCN", ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203}))},
    };
    for (const auto& [lName, lEvent] : lEvents) {
        lPhases.push_back({.mName = "event: " + lName,
                           .mKeepsAgent = true,
                           .mAlwaysGoesOn = true,
                           .mPrepare = sStartCollecting,
                           .mRun = sDelivering(lEvent)});
    }
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        const ZTSLibraryEvent lEvent =
            ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData);
        const bool lIsInQuickRun = lcrKind.mCategory == 1 && lcrKind.mSubcategory == 0x08;
        lPhases.push_back({.mName = std::string("event: ") + lcrKind.mpName,
                           .mKeepsAgent = true,
                           .mAlwaysGoesOn = true,
                           .mIsInQuickRun = lIsInQuickRun,
                           .mPrepare = sStartCollecting,
                           .mRun = sDelivering(lEvent)});
        lPhases.push_back({.mName = std::string("event, first: ") + lcrKind.mpName,
                           .mAlwaysGoesOn = true,
                           .mIsInQuickRun = lIsInQuickRun,
                           .mPrepare = sStartCollecting,
                           .mRun = sDelivering(lEvent, true)});
    }
    lPhases.push_back({.mName = "heartbeat",
                       .mKeepsAgent = true,
                       .mMostFailures = 12,
                       .mPrepare = sStartWithSilentSensor,
                       .mRun = sBeat});
    lPhases.push_back(
        {.mName = "log reopening", .mKeepsAgent = true, .mIsInQuickRun = true, .mPrepare = sStart, .mRun = sReopenLog});
    lPhases.push_back({.mName = "log rotation", .mIsInQuickRun = true, .mPrepare = sStart, .mRun = sRotateLog});
    lPhases.push_back(
        {.mName = "end by SIGTERM", .mIsInQuickRun = true, .mPrepare = sStartCollecting, .mRun = sEndBySignal});
    lPhases.push_back(
        {.mName = "end by shut-down", .mIsInQuickRun = true, .mPrepare = sStartCollecting, .mRun = sEndByCommand});
    for (const ZTSFaultPhase& lcrPhase : libraryFaultPhases()) {
        lPhases.push_back(lcrPhase);
    }
    return lPhases;
}
