#include "sensor/outlets/include/OutputProblems.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "sensor/client/include/RecordJson.h"
#include "sensor/views/include/TimeText.h"

ZTCOutputProblems::ZTCOutputProblems(std::function<void(const std::string&)> aReport) : mReport(std::move(aReport)) {}

void ZTCOutputProblems::note(const std::string& acrOutput, const std::string& acrProblem) {
    std::string lFormer;
    {
        const std::lock_guard lLock(mMutex);
        const auto lFound = mProblems.find(acrOutput);
        if (lFound != mProblems.end()) {
            lFormer = lFound->second.mText;
        }
        if (acrProblem.empty()) {
            mProblems.erase(acrOutput);
        } else if (lFound != mProblems.end()) {
            lFound->second.mText = acrProblem;
        } else {
            mProblems.emplace(acrOutput, ZTSProblem{.mSince = getHistoryTime(), .mText = acrProblem});
        }
    }
    if (acrProblem != lFormer) {
        mReport(acrProblem.empty() ? acrOutput + " works again" : acrProblem + "; trying on");
    }
}

void ZTCOutputProblems::forget(const std::string& acrOutput) {
    const std::lock_guard lLock(mMutex);
    mProblems.erase(acrOutput);
}

bool ZTCOutputProblems::has(const std::string& acrOutput) const {
    const std::lock_guard lLock(mMutex);
    return mProblems.contains(acrOutput);
}

std::string ZTCOutputProblems::describe() const {
    nlohmann::ordered_json lWarnings = nlohmann::ordered_json::array();
    const std::lock_guard lLock(mMutex);
    for (const auto& [lOutput, lrProblem] : mProblems) {
        lWarnings.push_back({{"kind", "output"},
                             {"text", lOutput + " does not work: " + lrProblem.mText},
                             {"since", toRfc3339(lrProblem.mSince)},
                             {"given", nullptr},
                             {"next", nullptr}});
    }
    return dumpJson(lWarnings, -1);
}
