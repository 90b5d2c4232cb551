/// An agent with its sensor and its library, as the phases of check-faults use it.
#ifndef TESTS_FAULTS_FAULTSTAGE_H
#define TESTS_FAULTS_FAULTSTAGE_H

#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/faults/FaultInjection.h"
#include "tests/support/AgentProcess.h"
#include "tests/unit/linux/FakeKernel.h"

/// Something that must not be, whatever failed.
class ZTCFinding : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// How an agent ended.
enum class ZTEFaultEnd {
    InOrder,    ///< status 0, with one of the lines that tell why
    Assertion,  ///< status 1, with the line of an assertion
};

/// The adapters' library that the agent has.
enum class ZTEFaultLibrary {
    Scripted,  ///< the failures are of the agent's own calls
    Kernel,    ///< the kernel's library over a kernel that is played; the failures are of the library's calls
};

class ZTCFaultStage {
public:
    explicit ZTCFaultStage(ZTEFaultLibrary aLibrary);

    ZTCAgentProcess& agent() { return mAgent; }
    ZTCFaultInjection& faults() { return mFaults; }

    // ---- the failure ----
    void plan(const ZTSFaultPlan& acrPlan);
    void arm() { mFaults.arm(mPlan); }
    void disarm() { mFaults.disarm(); }
    /// Waits until a failure that comes for a span of time comes no more, and disarms it in any case.
    void endFailure();

    /// With the kernel's library: the kernel that it sees, with host 0.
    ZTCFakeKernel& kernel() { return *mpKernel; }

    // ---- the agent ----
    std::vector<std::string> arguments(const std::vector<std::string>& acrMore = {}) const;
    /// Starts one; connects, and returns true, once it serves commands. False where it has ended before.
    bool start() { return start(arguments()); }
    bool start(const std::vector<std::string>& acrArguments);
    /// The same for a start that nothing disturbs.
    void startUndisturbed(const std::vector<std::string>& acrMore = {});
    /// Whether the agents from now on start with standard streams.
    void setStandardStreams(bool aHasThem);
    bool isRunning();
    /// Waits for its end, forgets what it left in logs, and tells how it ended.
    ZTEFaultEnd waitForEnd();
    /// Ends it in order, and throws ZTCFinding where it does not.
    void stop();
    void kill();
    /// With the agent ended: the next one starts, serves and ends as if nothing had been.
    void checkNextStart();
    /// Throws where a command is not answered.
    void probe();

    // ---- what it holds ----
    std::size_t openDescriptors();
    /// What it held when it had started undisturbed.
    std::size_t descriptorsAtFirst() const { return mDescriptorsAtFirst; }
    std::string logText();
    std::size_t countInLog(const std::string& acrText);

    /// The records of all boards, as texts.
    std::vector<std::string> retrieve();

private:
    bool connect();
    void launch(const std::vector<std::string>& acrArguments);

    ZTCAgentProcess mAgent{2};
    ZTCFaultInjection mFaults;
    ZTSFaultPlan mPlan;
    std::unique_ptr<ZTCFakeKernel> mpKernel;  ///< null with the scripted library
    std::size_t mDescriptorsAtFirst = 0;
    bool mIsDaemon = false;
    bool mHasStandardStreams = true;
    bool mHasStandardError = true;
    bool mIsAdopted = false;  ///< the daemon, not the process that made it, is watched
};

#endif
