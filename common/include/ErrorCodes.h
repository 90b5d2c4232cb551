/// Error codes: what an exception carries beside its text.
///
/// The code space is cut into segments of equal length, one for each source of errors, so that the number shows where
/// an error comes from.

#ifndef COMMON_INCLUDE_ERRORCODES_H
#define COMMON_INCLUDE_ERRORCODES_H

#include <cstdint>

/// An error code.
using ZTError = std::uint32_t;

/// The number of codes in one segment.
#define ZT_ERRCODE_SPACE_LENGTH 0xA0u

/// The first code of a segment.
#define ZT_ERRCODE_SPACE_BASE(aSegment) (ZT_ERRCODE_SPACE_LENGTH * (aSegment))

/// The code as it is carried: the segment's base plus the code inside of the segment.
#define ZT_SEGMENTED_ERRCODE(aSegment, aCode) (ZT_ERRCODE_SPACE_BASE(aSegment) + (aCode))

/// The segment that a carried code belongs to.
#define ZT_ERRCODE_SEGMENT(aErrorCode) ((aErrorCode) / ZT_ERRCODE_SPACE_LENGTH)

/// The code inside of its segment.
#define ZT_UNSEGMENTED_ERRCODE(aErrorCode, aSegment) ((aErrorCode)-ZT_ERRCODE_SPACE_BASE(aSegment))

/// The segments.
enum ZTEErrorSegment : ZTError {
    ZTES_Generic = 0,    ///< the framework and the agent
    ZTES_Clib = 1,       ///< calls of the C library
    ZTES_Os = 2,         ///< threads, mutexes, conditionals, waits
    ZTES_Operations = 3  ///< the agent's running operations
};

inline constexpr ZTError gcErrGeneric = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 1);
inline constexpr ZTError gcErrNoMemory = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 2);
inline constexpr ZTError gcErrHalt = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 3);
inline constexpr ZTError gcErrInvalid = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 6);
inline constexpr ZTError gcErrNotFound = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 8);
inline constexpr ZTError gcErrExists = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 10);
inline constexpr ZTError gcErrNotImplemented = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 13);

/// The agent is to stop: shared on purpose by the exit condition and by the shut-down.
inline constexpr ZTError gcErrStop = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 19);
inline constexpr ZTError gcErrQuitThread = ZT_SEGMENTED_ERRCODE(ZTES_Generic, 20);

inline constexpr ZTError gcErrClib = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 0);
inline constexpr ZTError gcErrClibStat = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 1);
inline constexpr ZTError gcErrClibUtime = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 2);
inline constexpr ZTError gcErrClibGetProcStatus = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 3);
inline constexpr ZTError gcErrClibOpen = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 4);
inline constexpr ZTError gcErrClibClose = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 5);
inline constexpr ZTError gcErrClibRead = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 6);
inline constexpr ZTError gcErrClibWrite = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 7);
inline constexpr ZTError gcErrClibMkfifo = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 8);
inline constexpr ZTError gcErrClibMkdir = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 9);
inline constexpr ZTError gcErrClibUnlink = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 10);
inline constexpr ZTError gcErrClibLock = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 11);
inline constexpr ZTError gcErrClibFork = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 12);
inline constexpr ZTError gcErrClibPoll = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 13);
inline constexpr ZTError gcErrClibSignal = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 14);
inline constexpr ZTError gcErrClibKill = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 15);
inline constexpr ZTError gcErrClibEvent = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 16);
inline constexpr ZTError gcErrClibDup = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 17);
inline constexpr ZTError gcErrClibTruncate = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 18);
inline constexpr ZTError gcErrClibSession = ZT_SEGMENTED_ERRCODE(ZTES_Clib, 19);

inline constexpr ZTError gcErrOs = ZT_SEGMENTED_ERRCODE(ZTES_Os, 0);
inline constexpr ZTError gcErrOsTimeOut = ZT_SEGMENTED_ERRCODE(ZTES_Os, 1);
inline constexpr ZTError gcErrOsMutex = ZT_SEGMENTED_ERRCODE(ZTES_Os, 2);
inline constexpr ZTError gcErrOsConditional = ZT_SEGMENTED_ERRCODE(ZTES_Os, 3);
inline constexpr ZTError gcErrOsThread = ZT_SEGMENTED_ERRCODE(ZTES_Os, 4);

inline constexpr ZTError gcErrOps = ZT_SEGMENTED_ERRCODE(ZTES_Operations, 0);
inline constexpr ZTError gcErrHeartbeatFailed = ZT_SEGMENTED_ERRCODE(ZTES_Operations, 12);

#endif
