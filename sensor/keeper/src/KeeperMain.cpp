#include <CLI/CLI.hpp>
#include <cstdio>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/CommandLine.h"
#include "sensor/client/include/StandardStreams.h"
#include "sensor/keeper/include/HostWorld.h"
#include "sensor/keeper/include/KeeperLoop.h"
#include "sensor/keeper/include/Spawn.h"

enum ZTEExitStatus { ZTEX_Done = 0, ZTEX_Failed = 1, ZTEX_BadSettings = 2 };

static void sPrint(const std::vector<ZTSSettingsProblem>& acrProblems) {
    for (const ZTSSettingsProblem& lcrProblem : acrProblems) {
        std::fprintf(stderr, "%s\n", lcrProblem.toText().c_str());
    }
}

static ZTEExitStatus sRun(const std::string& acrConfigOption, bool aIsCheck) {
    const ZTSSettingsReading lReading = readSettings(acrConfigOption);
    sPrint(lReading.mErrors);
    if (!lReading.isGood()) {
        return ZTEX_BadSettings;
    }
    if (aIsCheck) {
        return ZTEX_Done;
    }
    keepCapabilitiesForOthers();
    const ZTCFileDescriptor lSignals = openSignals();
    ZTCHostWorld lWorld(lReading, acrConfigOption);
    return static_cast<ZTEExitStatus>(runKeeper(lWorld, lSignals));
}

int main(int aCount, char** appArguments) {
    reserveStandardStreams();
    std::string lConfigOption;
    bool lIsCheck = false;
    CLI::App lApp{"Keeps the Fibre Channel event agent and the collector running. Stays in the foreground.",
                  "tavik-sensor"};
    lApp.set_version_flag("--version", "tavik-sensor v" TAVIK_VERSION);
    lApp.add_option("--config", lConfigOption,
                    "The configuration file; default: $TAVIK_CONFIG, else " + std::string(gcDefaultSettingsFile))
        ->check(refuseEmptyName);
    lApp.add_flag("--check", lIsCheck, "Report the errors of the configuration file, and start nothing");
    lApp.footer(
        "SIGTERM and SIGINT stop it in order. SIGHUP makes it read the configuration file again.\n"
        "Exit status: 0 done, 1 failed or another sensor runs, 2 wrong use, a bad configuration file, or a\n"
        "history of a newer version.");
    try {
        lApp.parse(aCount, appArguments);
        return sRun(lConfigOption, lIsCheck);
    } catch (const CLI::Success& lcrSuccess) {
        return lApp.exit(lcrSuccess);
    } catch (const CLI::ParseError& lcrError) {
        std::fprintf(stderr, "tavik-sensor: %s\n", lcrError.what());
        return ZTEX_BadSettings;
    } catch (const std::exception& lcrEx) {
        sayLine(lcrEx.what());
        return ZTEX_Failed;
    }
}
