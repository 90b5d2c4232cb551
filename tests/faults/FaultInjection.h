/// Makes one of a program's operating-system calls fail. Made before the program starts: it puts the interposed calls
/// in.
#ifndef TESTS_FAULTS_FAULTINJECTION_H
#define TESTS_FAULTS_FAULTINJECTION_H

#include <cstdint>
#include <map>
#include <string>

#include "tests/faults/FaultControl.h"
#include "tests/support/AgentProcess.h"

/// What is to fail, and how.
struct ZTSFaultPlan {
    std::string mCall;          ///< its name, or gcAllocationCall
    unsigned mNth = 1;          ///< which one from the arming on, from 1
    int mErrno = 0;             ///< 0: the call succeeds, short
    unsigned mCount = 0;        ///< with mErrno 0: the bytes that it moves
    bool mIsLasting = false;    ///< the later ones fail too
    unsigned mSpan = 0;         ///< with mIsLasting: for so many milliseconds from the first one on; 0: until disarm()
    bool mIsOfLibrary = false;  ///< calls of the kernel's library are meant, not those of the agent
};

/// What a program needs in its environment to have the interposed calls, and the switch for them.
class ZTCFaultSwitch {
public:
    /// @param aPath  of the file that the processes share; it is made
    explicit ZTCFaultSwitch(std::string aPath);
    ~ZTCFaultSwitch();
    ZTCFaultSwitch(const ZTCFaultSwitch&) = delete;
    ZTCFaultSwitch& operator=(const ZTCFaultSwitch&) = delete;

    const std::string& getPath() const { return mPath; }
    /// @param acrProgram  whose calls may fail; what it starts has the environment too, and nothing fails there
    std::map<std::string, std::string> getEnvironment(const std::string& acrProgram) const;

    void arm(const ZTSFaultPlan& acrPlan);
    void disarm() { mpControl->mIsArmed.store(0); }

    bool isArmed() const { return mpControl->mIsArmed.load() != 0; }
    /// Whether the planned failure came.
    bool hasFired() const { return mpControl->mFired.load() != 0; }
    /// How often the program has made the call since the arming.
    std::uint32_t countCalls() const { return mpControl->mCalls.load(); }
    /// Where from, as an offset into the agent's program.
    std::uint64_t firedAt() const { return mpControl->mPlace.load(); }
    /// Blocks of memory that the agent's process holds now.
    std::int64_t liveBlocks() const { return mpControl->mLiveBlocks.load(); }
    /// Whether an agent has run with the interposed calls.
    bool isAttached() const { return mpControl->mIsAttached.load() != 0; }

private:
    const std::string mPath;
    ZTSFaultControl* mpControl = nullptr;
};

class ZTCFaultInjection : public ZTCFaultSwitch {
public:
    explicit ZTCFaultInjection(ZTCAgentProcess& arAgent);

    /// Whether an agent that is started from now on has them; one made with this object has, until it is told
    /// otherwise.
    void attach();
    void detach();

private:
    ZTCAgentProcess& mrAgent;
};

#endif
