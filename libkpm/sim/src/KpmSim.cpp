// kpm-sim: speaks to a running simulated library, and reads scenarios without one. docs/simulated-library.md is its
// manual.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <exception>
#include <iostream>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "libkpm/sim/src/ControlClient.h"
#include "libkpm/sim/src/KindTable.h"
#include "libkpm/sim/src/ScenarioFile.h"

enum ZTESimExit : int { ZTSE_Done = 0, ZTSE_Refused = 1, ZTSE_WrongUse = 2, ZTSE_NobodyListens = 3 };

static bool sIsRefused(const std::string& acrAnswer) {
    return !acrAnswer.starts_with("ok");
}

/// Prints an answer where it belongs: refusals on standard error.
static ZTESimExit sPrint(const std::string& acrAnswer) {
    (sIsRefused(acrAnswer) ? std::cerr : std::cout) << acrAnswer << std::endl;
    return sIsRefused(acrAnswer) ? ZTSE_Refused : ZTSE_Done;
}

static ZTESimExit sAsk(const std::string& acrSocket, const std::string& acrLine) {
    ZTCSimControlClient lClient(acrSocket);
    return sPrint(lClient.ask(acrLine));
}

/// Puts the words of a command line together to lines: every word without `=` begins a new one.
static std::vector<std::string> sLines(const std::vector<std::string>& acrWords) {
    std::vector<std::string> lLines;
    for (const std::string& lrWord : acrWords) {
        const std::string_view lFirst = std::string_view(lrWord).substr(0, lrWord.find(' '));
        if (lLines.empty() || lFirst.find('=') == std::string_view::npos) {
            lLines.push_back(lrWord);
        } else {
            lLines.back() += " " + lrWord;
        }
    }
    return lLines;
}

static ZTESimExit sInject(const std::string& acrSocket, const std::vector<std::string>& acrWords) {
    ZTCSimControlClient lClient(acrSocket);
    for (const std::string& lrLine : sLines(acrWords)) {
        if (sPrint(lClient.ask(lrLine)) != ZTSE_Done) {
            return ZTSE_Refused;
        }
    }
    return ZTSE_Done;
}

static bool sIsEventLine(std::string_view aLine) {
    const std::size_t lBegin = aLine.find_first_not_of(" \t\r");
    return lBegin != std::string_view::npos && aLine[lBegin] != '#';
}

static ZTESimExit sRun(const std::string& acrSocket, const std::string& acrFile) {
    const std::string lText = readSimFile(acrFile);
    ZTCSimControlClient lClient(acrSocket);
    std::uint64_t lDelivered = 0;
    std::size_t lNumber = 0;
    for (std::size_t lPlace = 0; lPlace < lText.size();) {
        const std::size_t lEnd = std::min(lText.find('\n', lPlace), lText.size());
        const std::string lLine = lText.substr(lPlace, lEnd - lPlace);
        lPlace = lEnd + 1;
        ++lNumber;
        if (!sIsEventLine(lLine)) {
            continue;
        }
        const std::string lAnswer = lClient.ask(lLine);
        if (sIsRefused(lAnswer)) {
            const std::string_view lReason = std::string_view(lAnswer).substr(lAnswer.starts_with("error: ") ? 7 : 0);
            std::cerr << acrFile << ':' << lNumber << ": " << lReason << std::endl;
            return ZTSE_Refused;
        }
        lDelivered += std::stoull(lAnswer.substr(3));
    }
    std::cout << "ok " << lDelivered << std::endl;
    return ZTSE_Done;
}

static void sPrintPorts(const char* apWhat, const std::vector<ZTSSimPort>& acrPorts) {
    std::cout << apWhat << ": " << acrPorts.size();
    for (const ZTSSimPort& lrPort : acrPorts) {
        std::cout << ' ' << lrPort.mName;
    }
    std::cout << '\n';
}

static ZTESimExit sCheck(const std::string& acrFile) {
    const std::string lText = readSimFile(acrFile);
    try {
        const ZTSSimScenario lScenario = parseSimScenario(lText);
        sPrintPorts("adapters", lScenario.mAdapters);
        sPrintPorts("remote ports", lScenario.mPorts);
        std::uint64_t lStormEvents = 0;
        for (const ZTSSimStorm& lrStorm : lScenario.mStorms) {
            lStormEvents += lrStorm.mCount;
        }
        std::cout << "event lines: " << lScenario.mEvents.size() << '\n'
                  << "storms: " << lScenario.mStorms.size() << " with " << lStormEvents << " events\n"
                  << "states: " << lScenario.mStates.size() << '\n'
                  << "losses: " << lScenario.mLosses.size() << '\n'
                  << "changes of the number of boards: " << lScenario.mCountChanges.size() << '\n'
                  << "answers set: " << lScenario.mAnswers.size() << '\n'
                  << "Init answers: " << lScenario.mInitStatus << '\n'
                  << "event support: " << (lScenario.mIsZtapiSupported ? "yes" : "no") << std::endl;
        return ZTSE_Done;
    } catch (const ZTCSimRefusal& lrRefusal) {
        std::cerr << describeSimRefusal(acrFile, lrRefusal) << std::endl;
        return ZTSE_Refused;
    }
}

static ZTESimExit sKinds() {
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        const ZTSSimKind& lrKind = getSimKind(lKind);
        const ZTSScopeEventKind& lrPair = gcScopeEventKinds[lKind];
        std::cout << lrKind.mpName << "  (category " << unsigned{lrPair.mDeliveredCategory} << ", subcategory "
                  << unsigned{lrPair.mDeliveredSubcategory} << ")\n";
        for (const ZTSSimField& lrField : lrKind.mFields) {
            std::cout << "    " << lrField.mpName << "=  " << lrField.mpMeaning << '\n';
        }
        if (lrKind.mDelivery == ZTSD_Rscn) {
            std::cout << "    pages=  port:ID, area:ID, domain:ID, fabric, word:NUMBER, or none\n";
        }
    }
    std::cout << std::flush;
    return ZTSE_Done;
}

/// The number or word behind NAME= in a status line.
static std::string sStatusValue(const std::string& acrStatus, const std::string& acrName) {
    const std::size_t lPlace = acrStatus.find(" " + acrName + "=");
    if (lPlace == std::string::npos) {
        throw std::runtime_error("the library's status has no " + acrName + ": " + acrStatus);
    }
    const std::size_t lBegin = lPlace + acrName.size() + 2;
    return acrStatus.substr(lBegin, acrStatus.find(' ', lBegin) - lBegin);
}

struct ZTSSimWaitOptions {
    unsigned mTimeout = 60;  // seconds
    bool mIsStartEnough = false;
    std::uint64_t mDelivered = 0;
};

static bool sIsReached(const std::string& acrStatus, const ZTSSimWaitOptions& acrOptions) {
    const std::string lSchedule = sStatusValue(acrStatus, "schedule");
    const std::uint64_t lDelivered = std::stoull(sStatusValue(acrStatus, "delivered"));
    if (lDelivered < acrOptions.mDelivered) {
        return false;
    }
    if (acrOptions.mIsStartEnough) {
        return lSchedule != "waiting";
    }
    return acrOptions.mDelivered != 0 || lSchedule == "done";
}

static ZTESimExit sWait(const std::string& acrSocket, const ZTSSimWaitOptions& acrOptions) {
    static constexpr std::chrono::milliseconds scPause{20};
    // A library that works may need a moment for its answer, however short the time is that the caller waits.
    static constexpr std::chrono::seconds scAnswerTime{2};
    const auto lDeadline = std::chrono::steady_clock::now() + std::chrono::seconds(acrOptions.mTimeout);
    std::optional<ZTCSimControlClient> lClient;
    while (true) {
        std::string lStatus;
        try {
            if (!lClient) {
                lClient.emplace(acrSocket, std::max(lDeadline, std::chrono::steady_clock::now() + scAnswerTime));
            }
            lStatus = lClient->ask("status");
        } catch (const ZTCSimNoAnswer& lrException) {
            std::cerr << "not reached within " << acrOptions.mTimeout << " s: " << lrException.what() << std::endl;
            return ZTSE_Refused;
        } catch (const ZTCSimNobodyListens&) {
            lClient.reset();
            if (std::chrono::steady_clock::now() >= lDeadline) {
                throw;
            }
        }
        if (!lStatus.empty()) {
            if (sIsReached(lStatus, acrOptions)) {
                return sPrint(lStatus);
            }
            if (std::chrono::steady_clock::now() >= lDeadline) {
                std::cerr << "not reached within " << acrOptions.mTimeout << " s: " << lStatus << std::endl;
                return ZTSE_Refused;
            }
        }
        std::this_thread::sleep_for(scPause);
    }
}

static int sMain(int aCount, char** apArguments) {
    CLI::App lApp{"Talks to a simulated adapters' library that is in use, and checks scenarios."};
    lApp.require_subcommand(1);
    std::string lSocket;
    std::string lFile;
    std::vector<std::string> lWords;
    ZTSSimWaitOptions lWait;
    lApp.add_option("--socket", lSocket, "Path of the library's socket")->envname("KPM_SIM_SOCKET");
    CLI::App* lpInject = lApp.add_subcommand("inject", "Play event, storm, state and loss lines now");
    lpInject
        ->add_option("LINE", lWords, "KIND FIELD=VALUE ..., storm count=N ..., or a state or loss line as one argument")
        ->required();
    CLI::App* lpRun = lApp.add_subcommand("run", "Play the event, storm, state and loss lines of a file now");
    lpRun->add_option("FILE", lFile)->required();
    CLI::App* lpCheck = lApp.add_subcommand("check", "Check a scenario, and print what it holds");
    lpCheck->add_option("FILE", lFile)->required();
    CLI::App* lpKinds = lApp.add_subcommand("kinds", "List the event kinds and their fields");
    CLI::App* lpStatus = lApp.add_subcommand("status", "Print what the library has delivered");
    CLI::App* lpCounts = lApp.add_subcommand("counts", "Print how many events of each kind the library has delivered");
    CLI::App* lpWait = lApp.add_subcommand("wait", "Wait until the schedule is done, then print the status");
    lpWait->add_option("--timeout", lWait.mTimeout, "Seconds to wait at most, including the wait for the library")
        ->capture_default_str();
    lpWait->add_flag("--started", lWait.mIsStartEnough, "Wait only until the schedule has started");
    lpWait->add_option("--delivered", lWait.mDelivered, "Wait only until this many events have been delivered");
    for (CLI::App* lpCommand : lApp.get_subcommands({})) {
        lpCommand->fallthrough();
    }
    try {
        lApp.parse(aCount, apArguments);
    } catch (const CLI::ParseError& lrError) {
        return lApp.exit(lrError) == 0 ? ZTSE_Done : ZTSE_WrongUse;
    }
    if (lpCheck->parsed()) {
        return sCheck(lFile);
    }
    if (lpKinds->parsed()) {
        return sKinds();
    }
    if (lSocket.empty()) {
        std::cerr << "kpm-sim: no socket: set KPM_SIM_SOCKET or use --socket PATH" << std::endl;
        return ZTSE_WrongUse;
    }
    if (lpInject->parsed()) {
        return sInject(lSocket, lWords);
    }
    if (lpRun->parsed()) {
        return sRun(lSocket, lFile);
    }
    if (lpWait->parsed()) {
        return sWait(lSocket, lWait);
    }
    return sAsk(lSocket, lpCounts->parsed() && !lpStatus->parsed() ? "counts" : "status");
}

int main(int aCount, char** apArguments) {
    try {
        return sMain(aCount, apArguments);
    } catch (const ZTCSimNobodyListens& lrException) {
        std::cerr << "kpm-sim: " << lrException.what() << std::endl;
        return ZTSE_NobodyListens;
    } catch (const std::exception& lrException) {
        std::cerr << "kpm-sim: " << lrException.what() << std::endl;
        return ZTSE_Refused;
    }
}
