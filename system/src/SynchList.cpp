#include "system/include/SynchList.h"

#include <new>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Clib.h"

namespace {

void sRequireItem(bool aIsEmpty) {
    if (aIsEmpty) {
        throw ZTCNotFoundEx("The list is empty");
    }
}

}  // namespace

ZTCSynchList::ZTCSynchList() {
    OsInitConditional(mNotEmpty);
}

ZTCSynchList::~ZTCSynchList() {
    try {
        OsDestroyConditional(mNotEmpty);
    } catch (const ZTCException& acrException) {
        ZT_TRACE_MSG("Ignoring '%s'", acrException.what());
    }
}

void ZTCSynchList::pushBack(const ZTItem& acrItem) {
    ZTCMutexLock lLock(mMutex);
    try {
        mItems.push_back(acrItem);
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx();
    }
    OsBroadcastConditional(mNotEmpty);
}

void ZTCSynchList::pushFront(const ZTItem& acrItem) {
    ZTCMutexLock lLock(mMutex);
    try {
        mItems.push_front(acrItem);
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx();
    }
    OsBroadcastConditional(mNotEmpty);
}

ZTCSynchList::ZTItem ZTCSynchList::popFront() {
    ZTCMutexLock lLock(mMutex);
    sRequireItem(mItems.empty());
    const ZTItem lItem(mItems.front());
    mItems.pop_front();
    return lItem;
}

ZTCSynchList::ZTItem ZTCSynchList::popBack() {
    ZTCMutexLock lLock(mMutex);
    sRequireItem(mItems.empty());
    const ZTItem lItem(mItems.back());
    mItems.pop_back();
    return lItem;
}

ZTCSynchList::ZTItem ZTCSynchList::front() {
    ZTCMutexLock lLock(mMutex);
    sRequireItem(mItems.empty());
    return mItems.front();
}

unsigned ZTCSynchList::size() {
    ZTCMutexLock lLock(mMutex);
    return static_cast<unsigned>(mItems.size());
}

bool ZTCSynchList::isEmpty() {
    ZTCMutexLock lLock(mMutex);
    return mItems.empty();
}

void ZTCSynchList::clear() {
    std::list<ZTItem> lItems;
    {
        ZTCMutexLock lLock(mMutex);
        lItems.swap(mItems);
    }
    // The items go here, without the lock: their destructors are anybody's.
}

void ZTCSynchList::waitWhileEmpty(unsigned aSeconds) {
    const std::int64_t lDeadline = ClibMonotonicMilliseconds() + std::int64_t{aSeconds} * 1000;
    ZTCMutexLock lLock(mMutex);
    bool lIsInTime = true;
    while (mItems.empty() && !mIsInterrupted) {
        if (!lIsInTime) {
            throw ZTCTimeOutEx();
        }
        lIsInTime = OsTimedWaitConditional(mNotEmpty, mMutex.getOsMutex(), lDeadline);
    }
}

void ZTCSynchList::interrupt() {
    ZTCMutexLock lLock(mMutex);
    mIsInterrupted = true;
    OsBroadcastConditional(mNotEmpty);
}

ZTCSynchList::ZTIterator ZTCSynchList::begin() {
    ZTCMutexLock lLock(mMutex);
    return mItems.begin();
}

ZTCSynchList::ZTIterator ZTCSynchList::end() {
    ZTCMutexLock lLock(mMutex);
    return mItems.end();
}

ZTCSynchList::ZTConstIterator ZTCSynchList::begin() const {
    ZTCMutexLock lLock(mMutex);
    return mItems.begin();
}

ZTCSynchList::ZTConstIterator ZTCSynchList::end() const {
    ZTCMutexLock lLock(mMutex);
    return mItems.end();
}

void ZTCSynchList::erase(ZTIterator& arIterator) {
    ZTCMutexLock lLock(mMutex);
    arIterator = mItems.erase(arIterator);
}
