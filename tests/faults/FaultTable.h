/// The ways in which the agent's calls fail.
#ifndef TESTS_FAULTS_FAULTTABLE_H
#define TESTS_FAULTS_FAULTTABLE_H

#include <vector>

/// What a failure does to the agent.
enum class ZTEFaultEffect {
    Felt,      ///< it may end the agent
    Absorbed,  ///< nobody must notice, however often it comes: the call is made again, or its result does not matter
    Passing,   ///< the same, of a failure that the system never gives for good: it is not tried so
};

struct ZTSFaultWay {
    const char* mpCall;
    const char* mpName;
    int mErrno;       ///< 0: it succeeds, short
    unsigned mCount;  ///< with 0: the bytes that it moves
    ZTEFaultEffect mEffect;
    bool mIsInQuickRun;
};

const std::vector<ZTSFaultWay>& faultWays();

#endif
