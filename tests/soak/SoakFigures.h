/// What an agent takes of the machine, measured while it has nothing to do, and whether that grows.
#ifndef TESTS_SOAK_SOAKFIGURES_H
#define TESTS_SOAK_SOAKFIGURES_H

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

struct ZTSSoakFigures {
    double mSeconds = 0;       ///< since the load began
    std::int64_t mRss = 0;     ///< KiB
    std::int64_t mPss = 0;     ///< KiB
    std::int64_t mBlocks = 0;  ///< of memory, as allocated
    std::int64_t mDescriptors = 0;
    std::int64_t mThreads = 0;
    std::int64_t mDisk = 0;  ///< KiB, of its logs and of the sensor's directory
};

ZTSSoakFigures takeSoakFigures(pid_t aPid, const std::vector<std::string>& acrFiles);

/// One row of the verdict: the figure over the second quarter of the time, where the agent has warmed up, over the
/// third, and over the last.
struct ZTSSoakVerdict {
    const char* mpName;
    std::int64_t mBegin;
    std::int64_t mMiddle;
    std::int64_t mEnd;
    std::int64_t mMost;  ///< that the end may be
    bool isFine() const { return mEnd <= mMost; }
};

std::vector<ZTSSoakVerdict> judgeSoak(const std::vector<ZTSSoakFigures>& acrFigures, double aSeconds);

#endif
