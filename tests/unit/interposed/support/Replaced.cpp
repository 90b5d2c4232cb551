#include "tests/unit/interposed/support/Replaced.h"

#include "common/include/EncodableStream.h"
#include "tavik/include/TavikRecordList.h"
#include "tavik/include/TavikSystem.h"

ZTSReplaced gReplaced;

extern "C" {
void __real__Z10SystemMainiPPc(int, char**);
void __wrap__Z10SystemMainiPPc(int, char**);
void __real__Z9ClibMkdirPKci(const char*, int);
void __wrap__Z9ClibMkdirPKci(const char*, int);
std::int64_t __real__Z25ClibMonotonicMillisecondsv() noexcept;
std::int64_t __wrap__Z25ClibMonotonicMillisecondsv() noexcept;
void __real__Z9ClibSleepi(int) noexcept;
void __wrap__Z9ClibSleepi(int) noexcept;
void __real__Z11OsLockMutexR10ZTSOsMutex(ZTSOsMutex&);
void __wrap__Z11OsLockMutexR10ZTSOsMutex(ZTSOsMutex&);
bool __real__ZN14ZTCTavikSystem30isTotalLimitOnScopeDataReachedEv(ZTCTavikSystem*);
bool __wrap__ZN14ZTCTavikSystem30isTotalLimitOnScopeDataReachedEv(ZTCTavikSystem*);
void __real__ZNK18ZTCTavikRecordList6encodeER21ZTCEncodableOutStream(const ZTCTavikRecordList*, ZTCEncodableOutStream&);
void __wrap__ZNK18ZTCTavikRecordList6encodeER21ZTCEncodableOutStream(const ZTCTavikRecordList*, ZTCEncodableOutStream&);
int __real__Z8ClibOpenPKcij(const char*, int, ::mode_t);
int __wrap__Z8ClibOpenPKcij(const char*, int, ::mode_t);
int __real__Z8ClibPollP6pollfdji(struct pollfd*, unsigned, int);
int __wrap__Z8ClibPollP6pollfdji(struct pollfd*, unsigned, int);
bool __real__Z10ClibUnlinkPKc(const char*);
bool __wrap__Z10ClibUnlinkPKc(const char*);
bool __real__Z11ClibTryLocki(int);
bool __wrap__Z11ClibTryLocki(int);
bool __real__Z22OsTimedWaitConditionalR16ZTSOsConditionalR10ZTSOsMutexl(ZTSOsConditional&, ZTSOsMutex&, std::int64_t);
bool __wrap__Z22OsTimedWaitConditionalR16ZTSOsConditionalR10ZTSOsMutexl(ZTSOsConditional&, ZTSOsMutex&, std::int64_t);
int __real_clock_gettime(clockid_t, std::timespec*);
int __wrap_clock_gettime(clockid_t, std::timespec*);
void __real_free(void*);
void __wrap_free(void*);

void __wrap__Z10SystemMainiPPc(int aArgc, char** apArgv) {
    gReplaced.mSystemMain ? gReplaced.mSystemMain(aArgc, apArgv) : __real__Z10SystemMainiPPc(aArgc, apArgv);
}

void __wrap__Z9ClibMkdirPKci(const char* apPath, int aMode) {
    gReplaced.mMkdir ? gReplaced.mMkdir(apPath, aMode) : __real__Z9ClibMkdirPKci(apPath, aMode);
}

std::int64_t __wrap__Z25ClibMonotonicMillisecondsv() noexcept {
    return gReplaced.mMonotonicMilliseconds ? gReplaced.mMonotonicMilliseconds()
                                            : __real__Z25ClibMonotonicMillisecondsv();
}

void __wrap__Z9ClibSleepi(int aMilliseconds) noexcept {
    gReplaced.mSleep ? gReplaced.mSleep(aMilliseconds) : __real__Z9ClibSleepi(aMilliseconds);
}

void __wrap__Z11OsLockMutexR10ZTSOsMutex(ZTSOsMutex& arMutex) {
    if (gReplaced.mBeforeLock) {
        gReplaced.mBeforeLock(arMutex);
    }
    __real__Z11OsLockMutexR10ZTSOsMutex(arMutex);
}

bool __wrap__ZN14ZTCTavikSystem30isTotalLimitOnScopeDataReachedEv(ZTCTavikSystem* apSystem) {
    if (gReplaced.mBeforeTotalLimit) {
        gReplaced.mBeforeTotalLimit();
    }
    return __real__ZN14ZTCTavikSystem30isTotalLimitOnScopeDataReachedEv(apSystem);
}

void __wrap__ZNK18ZTCTavikRecordList6encodeER21ZTCEncodableOutStream(const ZTCTavikRecordList* apList,
                                                                     ZTCEncodableOutStream& arStream) {
    if (gReplaced.mBeforeEncode) {
        gReplaced.mBeforeEncode(*apList);
    }
    __real__ZNK18ZTCTavikRecordList6encodeER21ZTCEncodableOutStream(apList, arStream);
}

int __wrap__Z8ClibOpenPKcij(const char* apPath, int aFlags, ::mode_t aMode) {
    if (gReplaced.mBeforeOpen) {
        gReplaced.mBeforeOpen(apPath);
    }
    return __real__Z8ClibOpenPKcij(apPath, aFlags, aMode);
}

int __wrap__Z8ClibPollP6pollfdji(struct pollfd* apDescriptors, unsigned aCount, int aMilliseconds) {
    if (gReplaced.mBeforePoll) {
        gReplaced.mBeforePoll(apDescriptors, aCount, aMilliseconds);
    }
    return __real__Z8ClibPollP6pollfdji(apDescriptors, aCount, aMilliseconds);
}

bool __wrap__Z10ClibUnlinkPKc(const char* apPath) {
    if (gReplaced.mBeforeUnlink) {
        gReplaced.mBeforeUnlink(apPath);
    }
    return __real__Z10ClibUnlinkPKc(apPath);
}

bool __wrap__Z11ClibTryLocki(int aDescriptor) {
    if (gReplaced.mBeforeTryLock) {
        gReplaced.mBeforeTryLock(aDescriptor);
    }
    return __real__Z11ClibTryLocki(aDescriptor);
}

bool __wrap__Z22OsTimedWaitConditionalR16ZTSOsConditionalR10ZTSOsMutexl(ZTSOsConditional& arConditional,
                                                                        ZTSOsMutex& arMutex, std::int64_t aDeadline) {
    return gReplaced.mTimedWait
               ? gReplaced.mTimedWait(aDeadline)
               : __real__Z22OsTimedWaitConditionalR16ZTSOsConditionalR10ZTSOsMutexl(arConditional, arMutex, aDeadline);
}

int __wrap_clock_gettime(clockid_t aClock, std::timespec* apTime) {
    if (aClock == CLOCK_REALTIME && gReplaced.mRealTime) {
        *apTime = gReplaced.mRealTime();
        return 0;
    }
    return __real_clock_gettime(aClock, apTime);
}

void __wrap_free(void* apBlock) {
    if (gReplaced.mBeforeFree) {
        gReplaced.mBeforeFree(apBlock);
    }
    __real_free(apBlock);
}
}
