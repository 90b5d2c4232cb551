#include "sensor/keeper/include/Environment.h"

#include <unistd.h>

#include <algorithm>
#include <string_view>

/// A child that had these would notify in the keeper's name, take its sockets, or take its directories for its own.
static constexpr std::string_view scOfTheService[] = {"NOTIFY_SOCKET",
                                                      "WATCHDOG_PID",
                                                      "WATCHDOG_USEC",
                                                      "LISTEN_PID",
                                                      "LISTEN_FDS",
                                                      "LISTEN_FDNAMES",
                                                      "INVOCATION_ID",
                                                      "JOURNAL_STREAM",
                                                      "MAINPID",
                                                      "MANAGERPID",
                                                      "SYSTEMD_EXEC_PID",
                                                      "RUNTIME_DIRECTORY",
                                                      "STATE_DIRECTORY",
                                                      "CACHE_DIRECTORY",
                                                      "LOGS_DIRECTORY",
                                                      "CONFIGURATION_DIRECTORY",
                                                      "FDSTORE",
                                                      "CREDENTIALS_DIRECTORY",
                                                      "MEMORY_PRESSURE_WATCH",
                                                      "MEMORY_PRESSURE_WRITE"};

std::vector<std::string> makeChildEnvironment(const std::map<std::string, std::string>& acrMore) {
    std::vector<std::string> lEnvironment;
    for (char** lppVariable = environ; lppVariable != nullptr && *lppVariable != nullptr; ++lppVariable) {
        const std::string_view lVariable(*lppVariable);
        const std::string_view lName = lVariable.substr(0, lVariable.find('='));
        const bool lIsOfTheService =
            std::find(std::begin(scOfTheService), std::end(scOfTheService), lName) != std::end(scOfTheService);
        if (!lIsOfTheService && !acrMore.contains(std::string(lName))) {
            lEnvironment.emplace_back(lVariable);
        }
    }
    for (const auto& [lrName, lrValue] : acrMore) {
        lEnvironment.emplace_back(lrName).append("=").append(lrValue);
    }
    return lEnvironment;
}
