#include "sensor/client/src/TavikctlCommands.h"

#include <fcntl.h>

#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>

#include "sensor/client/include/AgentState.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "sensor/client/include/SensorPidFile.h"
#include "sensor/client/src/RawFile.h"
#include "sensor/client/src/TavikctlInput.h"

using ZTCJson = nlohmann::ordered_json;

static void sPrintScopeData(const ZTSToolOptions& acrOptions, const std::string& acrCommand,
                            const ZTSDecodeResult& acrDecoded) {
    if (acrOptions.mIsJson) {
        ZTCJson lDocument{{"command", acrCommand}};
        lDocument.update(toJson(acrDecoded.mResponse));
        lDocument["problem"] = acrDecoded.mProblem ? ZTCJson(acrDecoded.mProblem->what()) : ZTCJson(nullptr);
        writeOutput(dumpJson(lDocument, 2) + "\n");
    } else {
        writeOutput(formatTable(acrDecoded.mResponse));
    }
}

/// Answers at once where no agent is there to be asked.
static void sRequireAgent(const ZTSToolOptions& acrOptions) {
    if (!acrOptions.mIsWaiting && lookAtAgent(acrOptions.mDirectory).mPresence == ZTAP_None) {
        throw ZTCNoAnswerEx(ZTNA_NobodyListens, "no agent in " + acrOptions.mDirectory + ": no process holds " +
                                                    acrOptions.mDirectory + gcAgentPidFileName +
                                                    ". Start one with qrv-tvk, or wait for one with --wait");
    }
}

/// Scope data that came too late for its own request is printed all the same: the agent has handed it out.
static void sPrintLateAnswers(const ZTSToolOptions& acrOptions, const std::vector<ZTSAnswer>& acrAnswers) {
    for (const ZTSAnswer& lrAnswer : acrAnswers) {
        complain("got the late answer of an earlier request first");
        if (!acrOptions.mIsJson && lrAnswer.getResponse().mOutcome == ZTRO_ScopeData) {
            writeOutput(formatTable(lrAnswer.getResponse()));
        }
    }
}

static ZTCJson sLateAnswersJson(const std::vector<ZTSAnswer>& acrAnswers) {
    ZTCJson lLate = ZTCJson::array();
    for (const ZTSAnswer& lrAnswer : acrAnswers) {
        lLate.push_back(toJson(lrAnswer.getResponse()));
    }
    return lLate;
}

static void sReportDiscards(const ZTCSensorClient& acrClient) {
    if (acrClient.getDiscardedBytes() != 0) {
        complain("threw away " + std::to_string(acrClient.getDiscardedBytes()) +
                 " bytes of an earlier answer that was not read");
    }
}

ZTEExitStatus runCommand(const ZTSToolOptions& acrOptions, const std::string& acrCommand,
                         const ZTCWireBytes& acrRequest) {
    sRequireAgent(acrOptions);
    ZTCSensorClient lClient(acrOptions.mDirectory, acrOptions.mTimeout);
    const auto lFinish = [&](ZTCJson aDocument) {
        const std::vector<ZTSAnswer> lLate = lClient.takeLateAnswers();
        sReportDiscards(lClient);
        sPrintLateAnswers(acrOptions, lLate);
        if (acrOptions.mIsJson && (!aDocument.is_null() || !lLate.empty())) {
            ZTCJson lDocument{{"command", acrCommand}};
            lDocument.update(aDocument.is_null() ? ZTCJson{{"outcome", "none"}} : aDocument);
            lDocument["lateAnswers"] = sLateAnswersJson(lLate);
            writeOutput(dumpJson(lDocument, 2) + "\n");
        }
    };
    ZTSAnswer lAnswer;
    try {
        lAnswer = lClient.ask(acrRequest);
    } catch (const ZTCNoAnswerEx&) {
        lFinish(nullptr);
        throw;
    }
    const ZTEExitStatus lStatus = reportAnswer(acrOptions, acrCommand, lAnswer);
    lFinish(lStatus == ZTXS_NoAnswer ? ZTCJson(nullptr) : toJson(lAnswer.getResponse()));
    if (lStatus == ZTXS_Done && !acrOptions.mIsJson) {
        writeOutput(acrCommand + ": done\n");
    }
    return lStatus;
}

ZTEExitStatus runGet(const ZTSToolOptions& acrOptions, const std::string& acrRawPath) {
    sRequireAgent(acrOptions);
    ZTCRawFile lRawFile(acrRawPath);
    ZTCSensorClient lClient(acrOptions.mDirectory, acrOptions.mTimeout);
    ZTSAnswer lAnswer;
    try {
        lAnswer = lClient.getScopeData();
    } catch (const ZTCNoAnswerEx&) {
        sReportDiscards(lClient);
        sPrintLateAnswers(acrOptions, lClient.takeLateAnswers());
        throw;
    }
    lClient.disconnect();
    ZTEExitStatus lStatus = reportAnswer(acrOptions, "get", lAnswer);
    try {
        lRawFile.write(lAnswer.mBody);
    } catch (const ZTCSystemCallEx& lrEx) {
        complain(lrEx.what());
        lStatus = ZTXS_LocalFailure;
    }
    try {
        sPrintScopeData(acrOptions, "get", lAnswer.mDecoded);
    } catch (const ZTCSystemCallEx&) {
        complain("get: " + std::to_string(lAnswer.getResponse().countRecords()) +
                 " records were taken from the agent and could not be printed in full");
        throw;
    }
    sReportDiscards(lClient);
    sPrintLateAnswers(acrOptions, lClient.takeLateAnswers());
    return lStatus;
}

ZTEExitStatus runDecode(const ZTSToolOptions& acrOptions, const std::string& acrPath) {
    std::ifstream lFile = openInput(acrPath);
    ZTSAnswer lAnswer;
    lAnswer.mBody.assign(std::istreambuf_iterator<char>(lFile), std::istreambuf_iterator<char>());
    if (lFile.bad()) {
        throw ZTCBadInputEx(acrPath + ": cannot be read to its end");
    }
    lAnswer.mDecoded = decodeAsFarAsPossible(lAnswer.mBody);
    sPrintScopeData(acrOptions, "decode", lAnswer.mDecoded);
    ZTSToolOptions lNamed = acrOptions;
    lNamed.mDirectory = acrPath;
    return reportAnswer(lNamed, "decode", lAnswer);
}

ZTEExitStatus runStatus(const ZTSToolOptions& acrOptions) {
    const ZTSAgentState lAgent = lookAtAgent(acrOptions.mDirectory);
    // A collection period that is not 0 changes nothing in an agent: it is what can be asked to see whether it answers.
    std::string lProblem = "no agent holds " + acrOptions.mDirectory + gcAgentPidFileName;
    bool lAnswers = false;
    if (lAgent.mPresence != ZTAP_None) {
        try {
            ZTCSensorClient lClient(acrOptions.mDirectory, acrOptions.mTimeout);
            const ZTSAnswer lAnswer = lClient.setCollectionPeriod(3600);
            sReportDiscards(lClient);
            sPrintLateAnswers(acrOptions, lClient.takeLateAnswers());
            lAnswers = reportAnswer(acrOptions, "status", lAnswer) == ZTXS_Done;
            lProblem.clear();  // reportAnswer has said what there is to say
        } catch (const ZTCNoAnswerEx& lrEx) {
            lProblem = lrEx.what();
        }
    }
    static constexpr const char* scPresences[] = {"none", "starting", "running"};
    const char* lpPresence = scPresences[lAgent.mPresence];
    const ZTCFileDescriptor lSensorFile =
        ZTCFileDescriptor::open((acrOptions.mDirectory + gcSensorPidFileName).c_str(), O_RDONLY | O_NONBLOCK);
    const long lSensorPid = lSensorFile.isOpen() ? readPid(lSensorFile.get()) : 0;
    const bool lSensorRuns = isProcessAlive(lSensorPid);
    if (acrOptions.mIsJson) {
        const auto lOrNull = [](long long aNumber) { return aNumber != 0 ? ZTCJson(aNumber) : ZTCJson(nullptr); };
        writeOutput(dumpJson({{"command", "status"},
                              {"agent",
                               {{"state", lpPresence},
                                {"pid", lOrNull(lAgent.mPid)},
                                {"heartbeatEpochSeconds", lOrNull(lAgent.mHeartbeatSeconds)},
                                {"answers", lAnswers}}},
                              {"sensor", {{"pid", lOrNull(lSensorPid)}, {"running", lSensorRuns}}}},
                             2) +
                    "\n");
    } else {
        writeOutput("agent    " + std::string(lpPresence) +
                    (lAgent.mPresence == ZTAP_Running ? ", process " + std::to_string(lAgent.mPid) : "") + "\n" +
                    "answers  " + (lAnswers ? "yes" : "no") + "\n" + "sensor   " +
                    (lSensorRuns       ? "process " + std::to_string(lSensorPid)
                     : lSensorPid != 0 ? "none: process " + std::to_string(lSensorPid) + " has ended"
                                       : "none") +
                    "\n");
    }
    if (!lAnswers && !lProblem.empty()) {
        complain(lProblem);
    }
    return lAnswers ? ZTXS_Done : ZTXS_NoAnswer;
}
