#include "tests/support/ScriptedReports.h"

#include <cstdint>
#include <sstream>
#include <stdexcept>
#include <string_view>

#include "tests/support/ScriptedSettings.h"

void ZTCScriptedReports::setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) {
    mpContext = apContext;
    mpState = apState;
    mpLoss = apLoss;
}

bool ZTCScriptedReports::say(const std::string& acrLine) const {
    struct Saying {
        std::string_view mName;
        void (ZTCScriptedReports::*mpSay)(std::istream& arLine) const;
    };
    static constexpr Saying scSayings[] = {{"log", &ZTCScriptedReports::writeLog},
                                           {"state", &ZTCScriptedReports::reportState},
                                           {"loss", &ZTCScriptedReports::reportLoss}};
    std::istringstream lLine(acrLine);
    std::string lName;
    lLine >> lName;
    for (const Saying& lcrSaying : scSayings) {
        if (lcrSaying.mName == lName) {
            (this->*lcrSaying.mpSay)(lLine);
            return true;
        }
    }
    return false;
}

/// The rest of the line.
static std::string sReadText(std::istream& arLine) {
    std::string lText;
    std::getline(arLine >> std::ws, lText);
    return lText;
}

static void sRequire(bool aHasFunction, const char* apWhat) {
    if (!aHasFunction) {
        throw std::runtime_error(std::string("the agent has handed over no function for ") + apWhat);
    }
}

void ZTCScriptedReports::writeLog(std::istream& arLine) const {
    sRequire(mpLog != nullptr, "log lines");
    const std::uint32_t lLevel = readNumber(arLine);
    mpLog(lLevel, sReadText(arLine).c_str());
}

void ZTCScriptedReports::reportState(std::istream& arLine) const {
    sRequire(mpState != nullptr, "states");
    const std::uint32_t lBoard = readNumber(arLine);
    const std::uint32_t lCategory = readNumber(arLine);
    const std::uint32_t lSubcategory = readNumber(arLine);
    const std::uint32_t lState = readNumber(arLine);
    mpState(mpContext, lBoard, lCategory, lSubcategory, lState, sReadText(arLine).c_str());
}

void ZTCScriptedReports::reportLoss(std::istream& arLine) const {
    sRequire(mpLoss != nullptr, "losses");
    const std::uint32_t lTotal = readNumber(arLine);
    mpLoss(mpContext, sReadText(arLine).c_str(), lTotal);
}
