/// What the scripted adapters' library says to the agent when a test tells it to: lines for the log, states of kinds,
/// totals of losses.
#ifndef TESTS_SUPPORT_SCRIPTEDREPORTS_H
#define TESTS_SUPPORT_SCRIPTEDREPORTS_H

#include <istream>
#include <string>

#include "libkpm/include/libkpm.h"

class ZTCScriptedReports {
public:
    void setLog(KPM_LogFunction apLog) { mpLog = apLog; }
    void setReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss);

    /// Says the configuration line, if it is one of "log", "state" and "loss"; returns whether it is. Throws
    /// std::runtime_error where it is incomplete, or the agent has handed over no function for it.
    bool say(const std::string& acrLine) const;

private:
    void writeLog(std::istream& arLine) const;
    void reportState(std::istream& arLine) const;
    void reportLoss(std::istream& arLine) const;

    KPM_LogFunction mpLog = nullptr;
    void* mpContext = nullptr;
    KPM_StateFunction mpState = nullptr;
    KPM_LossFunction mpLoss = nullptr;
};

#endif
