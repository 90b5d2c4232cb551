/// Which outputs do not work now, and since when.
///
/// Each problem is reported once when it is new, and once when it is over. A function of any thread may ask for all of
/// them; the outputs' own thread notes them.
#ifndef SENSOR_OUTLETS_INCLUDE_OUTPUTPROBLEMS_H
#define SENSOR_OUTLETS_INCLUDE_OUTPUTPROBLEMS_H

#include <functional>
#include <map>
#include <mutex>
#include <string>

#include "sensor/store/include/HistoryTime.h"

class ZTCOutputProblems {
public:
    /// `aReport` takes a line for people, on the thread that notes.
    explicit ZTCOutputProblems(std::function<void(const std::string& acrLine)> aReport);

    /// @param acrOutput   its title for people: "the web server"
    /// @param acrProblem  a line for people; empty: the output works
    void note(const std::string& acrOutput, const std::string& acrProblem);

    /// Forgets the problem of an output that is switched off or changed, without a report.
    void forget(const std::string& acrOutput);

    bool has(const std::string& acrOutput) const;

    /// A JSON list of open warnings, as LiveState.h describes it; they are ordered by title.
    std::string describe() const;

private:
    struct ZTSProblem {
        ZTCHistoryTime mSince;
        std::string mText;
    };

    const std::function<void(const std::string&)> mReport;

    // ---- guarded by mMutex ----
    mutable std::mutex mMutex;
    std::map<std::string, ZTSProblem> mProblems;  ///< by title
};

#endif
