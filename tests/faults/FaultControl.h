/// What the driver and the interposed calls inside the agent share: a mapped file, named by gcFaultFileVariable. It
/// tells which call is to fail, how, and counts.
#ifndef TESTS_FAULTS_FAULTCONTROL_H
#define TESTS_FAULTS_FAULTCONTROL_H

#include <atomic>
#include <cstdint>

inline constexpr char gcFaultFileVariable[] = "ZT_FAULTS_FILE";
/// Names the program whose calls fail; without it the agent is meant. A sensor's processes share their environment.
inline constexpr char gcFaultProgramVariable[] = "ZT_FAULTS_PROGRAM";

/// The one name that stands for several calls: malloc, calloc, realloc and what is built on them.
inline constexpr char gcAllocationCall[] = "allocation";

/// Plain fields change only while mIsArmed is false.
struct ZTSFaultControl {
    char mCall[32];            ///< name of the call
    std::uint32_t mNth;        ///< which of its calls from the arming on, from 1
    std::int32_t mErrno;       ///< what it fails with; 0: it succeeds, short by what mCount says
    std::uint32_t mCount;      ///< with mErrno 0: the bytes that it moves; a wait ends with nothing
    std::uint32_t mIsLasting;  ///< not 0: the later ones fail too
    std::uint32_t mSpan;  ///< with mIsLasting: for so many milliseconds from the first one on; 0: until the disarming
    std::uint32_t mIsOfLibrary;  ///< not 0: calls of the kernel's library are meant, not those of the agent

    std::atomic<std::uint32_t> mIsArmed;
    std::atomic<std::uint32_t> mCalls;  ///< of that name by the agent since the arming
    std::atomic<std::uint32_t> mFired;  ///< those of them that failed
    std::atomic<std::uint64_t>
        mPlace;  ///< where the first one was called from, as an offset into the program or library
    std::atomic<std::int64_t> mFirstTime;    ///< when it was, in milliseconds of the monotonic clock
    std::atomic<std::int64_t> mLiveBlocks;   ///< of memory that the process holds
    std::atomic<std::uint32_t> mIsAttached;  ///< not 0: the agent has the interposed calls
};

static_assert(std::atomic<std::uint64_t>::is_always_lock_free && std::atomic<std::int64_t>::is_always_lock_free,
              "the fields are shared by processes");

#endif
