/// Inside of the agent: whether a call is the one that is to fail.
#ifndef TESTS_FAULTS_INTERPOSER_H
#define TESTS_FAULTS_INTERPOSER_H

#include <cstddef>

struct ZTSFault {
    bool mFires = false;
    int mErrno = 0;
    std::size_t mCount = 0;
};

/// To be asked by each interposed call, with its return address. A call counts when the agent's own program made it,
/// itself or through the language's library; with a plan for the kernel's library, when that made it.
ZTSFault takeFault(const char* apCall, const void* apCaller) noexcept;

/// The planned failure's errno; EINTR where none is planned.
int getPlannedErrno() noexcept;

/// Blocks of memory got and given back.
void countBlocks(int aChange) noexcept;

#endif
