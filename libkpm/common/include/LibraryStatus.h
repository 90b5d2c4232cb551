/// What the adapters' libraries that are built here return from the entries of libkpm.h.

#ifndef LIBKPM_COMMON_INCLUDE_LIBRARYSTATUS_H
#define LIBKPM_COMMON_INCLUDE_LIBRARYSTATUS_H

#include <cstdint>

/// Statuses of their own, beside those of KPM_STATUS_... An agent takes only 0 for success. 1 to 3 are those of the
/// simulated library.
enum ZTELibraryStatus : std::uint32_t {
    ZTLST_Success = 0,
    ZTLST_NoScenario = 1,    ///< Init: the scenario's file cannot be read
    ZTLST_BadScenario = 2,   ///< Init: the scenario does not parse
    ZTLST_NoSocket = 3,      ///< Init: the socket cannot be made
    ZTLST_AlreadyOpen = 4,   ///< Init: the library is open
    ZTLST_NoResources = 8,   ///< out of memory, descriptors or threads
    ZTLST_NotOpen = 9,       ///< the library is not open
    ZTLST_NoSuchBoard = 10,  ///< no board of that number
    ZTLST_NotItsPort = 11,   ///< the port is not the board's
    ZTLST_NoSuchKind = 12,   ///< no event kind of that category and subcategory
    ZTLST_NullPointer = 13,  ///< a pointer is missing
    ZTLST_NoSuchHandle = 14  ///< no registration of that handle
};

#endif
