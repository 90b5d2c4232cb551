/// The program tavik-collector. Started by tavik-sensor alone: it inherits all that it needs.
#include <csignal>
#include <exception>

#include "sensor/collector/include/Collector.h"
#include "sensor/collector/include/CollectorLog.h"

int main() {
    // The keeper says when to stop. What a terminal or a service manager sends to all processes at once must not end
    // the collector before the agent is asked for the last time.
    for (const int lSignal : {SIGPIPE, SIGINT, SIGTERM, SIGHUP}) {
        std::signal(lSignal, SIG_IGN);
    }
    try {
        ZTSInheritance lInheritance = takeInheritance();
        const ZTSSettingsReading lReading = parseSettings(readWhole(lInheritance.mSettings), "settings");
        if (!lReading.isGood()) {
            logLine("the settings of the keeper have errors: " + lReading.mErrors.front().toText());
            return 2;
        }
        ZTCCollector lCollector(std::move(lInheritance), lReading.mSettings);
        return lCollector.run();
    } catch (const std::exception& lrEx) {
        logLine(lrEx.what());
        return 1;
    }
}
