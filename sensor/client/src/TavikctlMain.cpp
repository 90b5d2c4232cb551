#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <iostream>
#include <iterator>
#include <nlohmann/json.hpp>
#include <system_error>

#include "sensor/client/include/AgentState.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "sensor/client/include/SensorPidFile.h"
#include "sensor/client/include/TargetText.h"
#include "sensor/client/src/Tavikctl.h"

using ZTCJson = nlohmann::ordered_json;

static constexpr double scMaxSeconds = 86400;

/// What the command line holds, as text: read by one set of rules with one kind of error.
struct ZTSCommandLine {
    std::string mDirectory;
    std::string mTimeout = "10";
    bool mIsJson = false;
    std::string mMaxRecordBytes = "900";
    std::string mPeriod;
    std::vector<std::string> mTargets;
    std::string mRawPath;
    std::string mDecodePath;
    std::string mInterval = "60";
    std::string mCount = "0";
};

static std::chrono::milliseconds sParseSeconds(const std::string& acrText, const std::string& acrWhat) {
    double lSeconds = 0;
    const char* lpEnd = acrText.data() + acrText.size();
    const auto [lpStop, lError] = std::from_chars(acrText.data(), lpEnd, lSeconds, std::chars_format::fixed);
    if (lError != std::errc() || lpStop != lpEnd || !(lSeconds >= 0.001 && lSeconds <= scMaxSeconds)) {
        throw ZTCBadInputEx(acrWhat + " \"" + acrText + "\" is no number of seconds from 0.001 to 86400");
    }
    return std::chrono::milliseconds(static_cast<long long>(lSeconds * 1000));
}

static std::uint32_t sParseUnsigned(const std::string& acrText, const std::string& acrWhat) {
    return parseNumber(acrText, 0xFFFFFFFFU, acrWhat);
}

/// "-" is standard input. A file that cannot be opened is wrong use.
static std::ifstream sOpenInput(const std::string& acrPath) {
    std::ifstream lFile(acrPath == "-" ? "/dev/stdin" : acrPath, std::ios::binary);
    if (!lFile) {
        throw ZTCBadInputEx("cannot open " + acrPath + ": " + std::generic_category().message(errno));
    }
    return lFile;
}

static std::vector<ZTSTargetPort> sCollectTargets(const std::vector<std::string>& acrArguments) {
    std::vector<ZTSTargetPort> lTargets;
    for (const std::string& lrArgument : acrArguments) {
        if (lrArgument.find(',') != std::string::npos) {
            lTargets.push_back(parseTarget(lrArgument));
            continue;
        }
        std::ifstream lFile = sOpenInput(lrArgument);
        const std::vector<ZTSTargetPort> lRead = readTargets(lFile, lrArgument);
        if (lRead.empty()) {
            throw ZTCBadInputEx(lrArgument + " holds no target");
        }
        lTargets.insert(lTargets.end(), lRead.begin(), lRead.end());
    }
    return lTargets;
}

static ZTSToolOptions sResolveOptions(const ZTSCommandLine& acrLine) {
    ZTSToolOptions lOptions;
    const char* lpVariable = std::getenv(gcSensorDirVariable);
    lOptions.mDirectory = !acrLine.mDirectory.empty() ? acrLine.mDirectory : lpVariable != nullptr ? lpVariable : "";
    if (lOptions.mDirectory.empty()) {
        throw ZTCBadInputEx(std::string("no directory: give --dir or set ") + gcSensorDirVariable);
    }
    struct stat lStatus {};
    if (stat(lOptions.mDirectory.c_str(), &lStatus) != 0 || !S_ISDIR(lStatus.st_mode)) {
        throw ZTCBadInputEx(lOptions.mDirectory + " is no directory");
    }
    lOptions.mTimeout = sParseSeconds(acrLine.mTimeout, "timeout");
    lOptions.mIsJson = acrLine.mIsJson;
    return lOptions;
}

/// Where `get` keeps the bytes of the answer. Opened before anything is asked, changed only once there is an answer.
class ZTCRawFile {
public:
    explicit ZTCRawFile(const std::string& acrPath) : mPath(acrPath) {
        if (!mPath.empty()) {
            mFile = ZTCFileDescriptor::open(mPath.c_str(), O_WRONLY | O_CREAT, 0666);
            if (!mFile.isOpen()) {
                throw ZTCSystemCallEx("cannot open " + mPath, errno);
            }
        }
    }

    void write(const ZTCWireBytes& acrBytes) {
        if (!mFile.isOpen()) {
            return;
        }
        if (ftruncate(mFile.get(), 0) != 0 && errno != EINVAL) {
            throw ZTCSystemCallEx("cannot empty " + mPath, errno);
        }
        std::size_t lWritten = 0;
        while (lWritten < acrBytes.size()) {
            const ssize_t lCount = ::write(mFile.get(), acrBytes.data() + lWritten, acrBytes.size() - lWritten);
            if (lCount > 0) {
                lWritten += static_cast<std::size_t>(lCount);
            } else if (lCount == 0 || errno != EINTR) {
                throw ZTCSystemCallEx("cannot write " + mPath + ": " + std::to_string(lWritten) + " of " +
                                          std::to_string(acrBytes.size()) + " bytes written",
                                      lCount < 0 ? errno : ENOSPC);
            }
        }
    }

private:
    std::string mPath;
    ZTCFileDescriptor mFile;
};

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
                 " bytes of an answer that nobody had read");
    }
}

/// A command whose answer is success or failure.
static ZTEExitStatus sRunCommand(const ZTSToolOptions& acrOptions, const std::string& acrCommand,
                                 const ZTCWireBytes& acrRequest) {
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

static ZTEExitStatus sRunGet(const ZTSToolOptions& acrOptions, const ZTSCommandLine& acrLine) {
    ZTCRawFile lRawFile(acrLine.mRawPath);
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

static ZTEExitStatus sRunDecode(const ZTSToolOptions& acrOptions, const std::string& acrPath) {
    std::ifstream lFile = sOpenInput(acrPath);
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

static ZTEExitStatus sRunStatus(const ZTSToolOptions& acrOptions) {
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

static ZTEExitStatus sRunWatch(const ZTSToolOptions& acrOptions, const ZTSCommandLine& acrLine) {
    ZTSWatchOptions lWatch;
    lWatch.mInterval = sParseSeconds(acrLine.mInterval, "interval");
    lWatch.mCount = sParseUnsigned(acrLine.mCount, "count");
    lWatch.mMaxRecordBytes = sParseUnsigned(acrLine.mMaxRecordBytes, "max-record-bytes");
    lWatch.mTargets = sCollectTargets(acrLine.mTargets);
    return runWatch(acrOptions, lWatch);
}

/// Descriptors 0 to 2 belong to the standard streams even where the parent has closed them: nothing else may get them.
static void sReserveStandardStreams() {
    const bool lHasOutput = fcntl(STDOUT_FILENO, F_GETFD) >= 0;
    int lDescriptor;
    do {
        lDescriptor = open("/dev/null", O_RDWR | O_CLOEXEC);
    } while (lDescriptor >= 0 && lDescriptor <= STDERR_FILENO);
    if (lDescriptor >= 0) {
        close(lDescriptor);
    }
    if (!lHasOutput) {
        throw ZTCSystemCallEx("cannot write standard output", EBADF);
    }
}

/// Parses the line and runs its command.
static ZTEExitStatus sRun(int aCount, const char* const* appArguments) {
    ZTSCommandLine lLine;
    std::function<ZTEExitStatus(const ZTSToolOptions&)> lCommand;
    CLI::App lApp{"Talks to the Fibre Channel event agent of a directory, in the sensor's place.", "tavikctl"};
    lApp.require_subcommand(1);
    lApp.fallthrough();
    lApp.set_version_flag("--version", "tavikctl v" TAVIKCTL_VERSION);
    lApp.add_option("--dir", lLine.mDirectory, "The agent's directory; default: $ZT_QRV_SENSOR_DIR");
    lApp.add_option("--timeout", lLine.mTimeout, "Longest wait for an agent and its answer, in seconds; default: 10");
    lApp.add_flag("--json", lLine.mIsJson, "Print JSON instead of tables");
    lApp.footer(
        "Exit status: 0 done, 1 refused by the agent, 2 wrong use, 3 no agent or no usable answer in time,\n"
        "4 a file or standard output cannot be written.");

    const auto lAdd = [&](const char* apName, const char* apText, auto aRun) {
        CLI::App* lpSub = lApp.add_subcommand(apName, apText);
        lpSub->callback([&lCommand, aRun] { lCommand = aRun; });
        return lpSub;
    };
    lAdd("start", "Register for events and start collecting", [&](const ZTSToolOptions& acrOptions) {
        return sRunCommand(acrOptions, "start",
                           encodeStartScope(sParseUnsigned(lLine.mMaxRecordBytes, "max-record-bytes")));
    })->add_option("--max-record-bytes", lLine.mMaxRecordBytes, "Most bytes of event data in one record; default: 900");
    lAdd("stop", "Stop collecting; what has been collected stays",
         [&](const ZTSToolOptions& acrOptions) { return sRunCommand(acrOptions, "stop", encodeStop()); });
    lAdd("get", "Take all records from the agent and print them", [&](const ZTSToolOptions& acrOptions) {
        return sRunGet(acrOptions, lLine);
    })->add_option("--raw", lLine.mRawPath, "Save the answer's bytes in this file too");
    lAdd("targets", "Register remote ports",
         [&](const ZTSToolOptions& acrOptions) {
             return sRunCommand(acrOptions, "targets", encodeRegisterTargets(sCollectTargets(lLine.mTargets)));
         })
        ->add_option("TARGET", lLine.mTargets, "WWNN,WWPN,FCID, or a file with one a line, or - for standard input")
        ->required();
    lAdd("period", "Tell the agent the collection period",
         [&](const ZTSToolOptions& acrOptions) {
             return sRunCommand(acrOptions, "period", encodeCollectionPeriod(sParseUnsigned(lLine.mPeriod, "period")));
         })
        ->add_option("SECONDS", lLine.mPeriod, "The period in seconds")
        ->required();
    lAdd("shutdown", "End the agent",
         [&](const ZTSToolOptions& acrOptions) { return sRunCommand(acrOptions, "shutdown", encodeShutDown()); });
    lAdd("status", "Say whether an agent runs and answers",
         [](const ZTSToolOptions& acrOptions) { return sRunStatus(acrOptions); });
    CLI::App* lpWatch = lAdd("watch", "Play the sensor: start collecting, retrieve and print again and again",
                             [&](const ZTSToolOptions& acrOptions) { return sRunWatch(acrOptions, lLine); });
    lpWatch->add_option("--interval", lLine.mInterval, "Seconds between two retrievals; default: 60");
    lpWatch->add_option("--count", lLine.mCount, "End after this many retrievals; default: 0, never");
    lpWatch->add_option("--max-record-bytes", lLine.mMaxRecordBytes, "As of start; default: 900");
    lpWatch->add_option("--targets", lLine.mTargets, "Register these first, as with the command targets");
    const CLI::App* lpDecode =
        lAdd("decode", "Print an answer saved with get --raw",
             [&](const ZTSToolOptions& acrOptions) { return sRunDecode(acrOptions, lLine.mDecodePath); });
    lApp.get_subcommand("decode")
        ->add_option("FILE", lLine.mDecodePath, "The file, or - for standard input")
        ->required();

    try {
        lApp.parse(aCount, appArguments);
    } catch (const CLI::CallForVersion& lrVersion) {
        writeOutput(std::string(lrVersion.what()) + "\n");
        return ZTXS_Done;
    } catch (const CLI::Success&) {
        CLI::App* lpAsked = lApp.get_subcommands().empty() ? &lApp : lApp.get_subcommands().front();
        writeOutput(lpAsked->help(lpAsked == &lApp ? "" : lApp.get_name()));
        return ZTXS_Done;
    } catch (const CLI::ParseError& lrError) {
        throw ZTCBadInputEx(std::string(lrError.what()) + "; see tavikctl --help");
    }
    if (lpDecode->parsed()) {
        ZTSToolOptions lOptions;
        lOptions.mIsJson = lLine.mIsJson;
        return lCommand(lOptions);
    }
    return lCommand(sResolveOptions(lLine));
}

int main(int aCount, char** appArguments) {
    signal(SIGPIPE, SIG_IGN);
    try {
        sReserveStandardStreams();
        return sRun(aCount, appArguments);
    } catch (const ZTCBadInputEx& lrEx) {
        complain(lrEx.what());
        return ZTXS_WrongUse;
    } catch (const ZTCSensorBusyEx& lrEx) {
        complain(lrEx.what());
        return ZTXS_WrongUse;
    } catch (const ZTCNoAnswerEx& lrEx) {
        complain(lrEx.what());
        return ZTXS_NoAnswer;
    } catch (const std::exception& lrEx) {
        complain(lrEx.what());
        return ZTXS_LocalFailure;
    }
}
