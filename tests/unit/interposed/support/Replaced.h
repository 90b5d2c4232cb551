/// Functions that a test puts something else in place of. The linker leads every call to them here.
#ifndef TESTS_UNIT_INTERPOSED_SUPPORT_REPLACED_H
#define TESTS_UNIT_INTERPOSED_SUPPORT_REPLACED_H

#include <poll.h>

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <functional>
#include <string>
#include <utility>

#include "os/common/include/Os.h"

class ZTCTavikRecordList;
class ZTCEncodableOutStream;

/// What runs in place of a function, or beside it; empty: the function alone.
struct ZTSReplaced {
    std::function<void(int, char**)> mSystemMain;                          ///< in its place
    std::function<void(const char*, int)> mMkdir;                          ///< in place of ClibMkdir
    std::function<std::int64_t()> mMonotonicMilliseconds;                  ///< in its place
    std::function<std::timespec()> mRealTime;                              ///< what CLOCK_REALTIME shows
    std::function<void(int)> mSleep;                                       ///< in place of ClibSleep
    std::function<void(const char*)> mBeforeOpen;                          ///< before ClibOpen
    std::function<void(const struct pollfd*, unsigned, int)> mBeforePoll;  ///< before ClibPoll
    std::function<void(const char*)> mBeforeUnlink;                        ///< before ClibUnlink
    std::function<void(int)> mBeforeTryLock;                               ///< before ClibTryLock
    std::function<bool(std::int64_t)> mTimedWait;                  ///< in place of OsTimedWaitConditional; its deadline
    std::function<void(const ZTSOsMutex&)> mBeforeLock;            ///< before OsLockMutex
    std::function<void()> mBeforeTotalLimit;                       ///< before ZTCTavikSystem's test of the total
    std::function<void(const ZTCTavikRecordList&)> mBeforeEncode;  ///< before a record list is encoded
    std::function<void(const void*)> mBeforeFree;                  ///< before free, of what the linked code frees
};

/// One test at a time sets members of it.
extern ZTSReplaced gReplaced;

/// Sets a member for as long as it lives.
template <typename Function>
class ZTCReplacement {
public:
    template <typename With>
    ZTCReplacement(Function& arFunction, With aWith) : mrFunction(arFunction) {
        mrFunction = std::move(aWith);
    }
    ~ZTCReplacement() { mrFunction = nullptr; }
    ZTCReplacement(const ZTCReplacement&) = delete;
    ZTCReplacement& operator=(const ZTCReplacement&) = delete;

private:
    Function& mrFunction;
};

template <typename Function, typename With>
ZTCReplacement(Function&, With) -> ZTCReplacement<Function>;

#endif
