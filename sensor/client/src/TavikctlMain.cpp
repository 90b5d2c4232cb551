#include <signal.h>
#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <functional>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/CommandLine.h"
#include "sensor/client/src/Tavikctl.h"
#include "sensor/client/src/TavikctlCommands.h"
#include "sensor/client/src/TavikctlInput.h"

/// What the command line holds, as text: read by one set of rules with one kind of error.
struct ZTSCommandLine {
    std::string mDirectory;
    std::string mTimeout = "10";
    bool mIsJson = false;
    bool mIsWaiting = false;
    std::string mMaxRecordBytes = "900";
    std::string mPeriod;
    std::vector<std::string> mTargets;
    std::string mRawPath;
    std::string mDecodePath;
    std::string mInterval = "60";
    std::string mCount = "0";
};

static ZTSToolOptions sResolveOptions(const ZTSCommandLine& acrLine) {
    ZTSToolOptions lOptions;
    const char* lpVariable = std::getenv(gcSensorDirVariable);
    lOptions.mDirectory = !acrLine.mDirectory.empty() ? acrLine.mDirectory : lpVariable != nullptr ? lpVariable : "";
    if (lOptions.mDirectory.empty()) {
        throw ZTCBadInputEx(std::string("no directory: give --dir or set ") + gcSensorDirVariable);
    }
    struct stat lStatus {};
    if (stat(lOptions.mDirectory.c_str(), &lStatus) != 0) {
        throw ZTCBadInputEx("cannot use the directory " + lOptions.mDirectory + ": " + std::strerror(errno));
    }
    if (!S_ISDIR(lStatus.st_mode)) {
        throw ZTCBadInputEx(lOptions.mDirectory + " is not a directory");
    }
    lOptions.mTimeout = parseSeconds(acrLine.mTimeout, "timeout");
    lOptions.mIsJson = acrLine.mIsJson;
    lOptions.mIsWaiting = acrLine.mIsWaiting;
    return lOptions;
}

static ZTEExitStatus sRunWatch(const ZTSToolOptions& acrOptions, const ZTSCommandLine& acrLine) {
    ZTSWatchOptions lWatch;
    lWatch.mInterval = parseSeconds(acrLine.mInterval, "interval");
    lWatch.mCount = parseUnsigned(acrLine.mCount, "count");
    lWatch.mMaxRecordBytes = parseUnsigned(acrLine.mMaxRecordBytes, "max-record-bytes");
    lWatch.mTargets = collectTargets(acrLine.mTargets);
    return runWatch(acrOptions, lWatch);
}

/// Parses the line and runs its command.
static ZTEExitStatus sRun(int aCount, const char* const* appArguments) {
    ZTSCommandLine lLine;
    std::function<ZTEExitStatus(const ZTSToolOptions&)> lCommand;
    CLI::App lApp{"Talks to the Fibre Channel event agent of a directory, instead of a sensor.", "tavikctl"};
    lApp.require_subcommand(1);
    lApp.fallthrough();
    lApp.set_version_flag("--version", "tavikctl v" TAVIKCTL_VERSION);
    lApp.add_option("--dir", lLine.mDirectory, "The agent's directory; default: $ZT_QRV_SENSOR_DIR");
    lApp.add_option("--timeout", lLine.mTimeout, "How many seconds to wait for an agent and its answer; default: 10");
    lApp.add_flag("--json", lLine.mIsJson, "Print JSON instead of tables");
    lApp.add_flag("--wait", lLine.mIsWaiting, "Wait for an agent that is about to be started, at most for the timeout");
    lApp.footer(
        "Exit status: 0 done, 1 refused by the agent, 2 wrong use, 3 no agent or no usable answer in time,\n"
        "4 a file or standard output cannot be written.");

    const auto lAdd = [&](const char* apName, const char* apText, auto aRun) {
        CLI::App* lpSub = lApp.add_subcommand(apName, apText);
        lpSub->callback([&lCommand, aRun] { lCommand = aRun; });
        return lpSub;
    };
    lAdd("start", "Register for events and start collecting", [&](const ZTSToolOptions& acrOptions) {
        return runCommand(acrOptions, "start",
                          encodeStartScope(parseUnsigned(lLine.mMaxRecordBytes, "max-record-bytes")));
    })->add_option("--max-record-bytes", lLine.mMaxRecordBytes, "Most bytes of event data in one record; default: 900");
    lAdd("stop", "Stop collecting. The records that were collected stay",
         [&](const ZTSToolOptions& acrOptions) { return runCommand(acrOptions, "stop", encodeStop()); });
    lAdd("get", "Take all records from the agent and print them", [&](const ZTSToolOptions& acrOptions) {
        return runGet(acrOptions, lLine.mRawPath);
    })->add_option("--raw", lLine.mRawPath, "Save the answer's bytes in this file too");
    lAdd("targets", "Register remote ports",
         [&](const ZTSToolOptions& acrOptions) {
             return runCommand(acrOptions, "targets", encodeRegisterTargets(collectTargets(lLine.mTargets)));
         })
        ->add_option("TARGET", lLine.mTargets,
                     "WWNN,WWPN,FCID, or a file with one target on each line, or - for standard input")
        ->required();
    lAdd("period", "Send the collection period to the agent",
         [&](const ZTSToolOptions& acrOptions) {
             return runCommand(acrOptions, "period", encodeCollectionPeriod(parseUnsigned(lLine.mPeriod, "period")));
         })
        ->add_option("SECONDS", lLine.mPeriod, "The period in seconds")
        ->required();
    lAdd("shutdown", "End the agent",
         [&](const ZTSToolOptions& acrOptions) { return runCommand(acrOptions, "shutdown", encodeShutDown()); });
    lAdd("status", "Say whether an agent runs and answers",
         [](const ZTSToolOptions& acrOptions) { return runStatus(acrOptions); });
    CLI::App* lpWatch = lAdd("watch", "Act as the sensor: start collecting, then retrieve and print again and again",
                             [&](const ZTSToolOptions& acrOptions) { return sRunWatch(acrOptions, lLine); });
    lpWatch->add_option("--interval", lLine.mInterval, "Seconds between two retrievals; default: 60");
    lpWatch->add_option("--count", lLine.mCount, "End after this many retrievals; default: 0, which means never");
    lpWatch->add_option("--max-record-bytes", lLine.mMaxRecordBytes,
                        "Most bytes of event data in one record; default: 900");
    lpWatch->add_option("--targets", lLine.mTargets, "Register these targets first, as the command targets does");
    const CLI::App* lpDecode =
        lAdd("decode", "Print an answer saved with get --raw",
             [&](const ZTSToolOptions& acrOptions) { return runDecode(acrOptions, lLine.mDecodePath); });
    lApp.get_subcommand("decode")
        ->add_option("FILE", lLine.mDecodePath, "The file, or - for standard input")
        ->required();

    if (const auto lText = parseCommandLine<ZTCBadInputEx>(lApp, aCount, appArguments)) {
        writeOutput(*lText);
        return ZTXS_Done;
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
        requireStandardOutput();
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
