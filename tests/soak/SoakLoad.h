/// The mixed load: events of all kinds from many threads, commands in every order, frames that are none, a sensor that
/// comes and goes.
#ifndef TESTS_SOAK_SOAKLOAD_H
#define TESTS_SOAK_SOAKLOAD_H

#include <cstdint>
#include <vector>

#include "tests/support/AgentProcess.h"

struct ZTSSoakCounts {
    std::uint64_t mEvents = 0;
    std::uint64_t mCommands = 0;
    std::uint64_t mRecords = 0;
    std::uint64_t mBrokenFrames = 0;
    std::uint64_t mReconnections = 0;
};

class ZTCSoakLoad {
public:
    explicit ZTCSoakLoad(ZTCAgentProcess& arAgent, unsigned aBoards);

    /// One round; the agent has nothing to do and holds no record on return. Throws std::runtime_error where an answer
    /// or a count of events is not what it has to be.
    void playRound();

    const ZTSSoakCounts& counts() const { return mCounts; }

private:
    void command(const ZTCBytes& acrBody, const char* apAnswer);
    std::uint64_t retrieve();
    void reconnect();
    void sendBrokenFrame();
    void countExactly();

    ZTCAgentProcess& mrAgent;
    std::vector<ZTSLibraryEvent> mEvents;
    std::vector<ZTSTarget> mTargets;
    ZTSSoakCounts mCounts;
    unsigned mRound = 0;
};

#endif
