/// The ways in which the agent's calls fail.
#ifndef TESTS_FAULTS_FAULTTABLE_H
#define TESTS_FAULTS_FAULTTABLE_H

#include <vector>

struct ZTSFaultWay {
    const char* mpCall;
    const char* mpName;
    int mErrno;        ///< 0: it succeeds, short
    unsigned mCount;   ///< with 0: the bytes that it moves
    bool mIsLasting;   ///< all the later ones fail too
    bool mIsAbsorbed;  ///< nobody must notice: the call is tried again, or its result does not matter
    bool mIsInQuickRun;
};

const std::vector<ZTSFaultWay>& faultWays();

#endif
