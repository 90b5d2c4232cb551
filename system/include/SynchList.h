/// A list that threads share, and wait on while it is empty.

#ifndef SYSTEM_INCLUDE_SYNCHLIST_H
#define SYSTEM_INCLUDE_SYNCHLIST_H

#include <list>

#include "common/include/Pointer.h"
#include "common/include/ThreadAnnotations.h"
#include "os/common/include/Conditional.h"
#include "os/common/include/Mutex.h"
#include "system/include/Queueable.h"

/// Every operation may be called from any thread. But while one walks it with begin(), end() and erase(), no other
/// touches the list. Taking from an empty list throws ZTCNotFoundEx, a failed allocation ZTCNoMemoryEx.
class ZTCSynchList {
public:
    using ZTItem = ZTCPointer<ZTCQueueable>;
    using ZTIterator = std::list<ZTItem>::iterator;
    using ZTConstIterator = std::list<ZTItem>::const_iterator;

    ZTCSynchList();
    virtual ~ZTCSynchList();

    ZTCSynchList(const ZTCSynchList&) = delete;
    ZTCSynchList& operator=(const ZTCSynchList&) = delete;

    void pushBack(const ZTItem& acrItem);
    void pushFront(const ZTItem& acrItem);
    ZTItem popFront();
    ZTItem popBack();

    /// The first item, which stays in the list.
    ZTItem front();

    unsigned size();
    bool isEmpty();
    void clear();

    /// Returns when there is an item, or after interrupt(); throws ZTCTimeOutEx when the time passes first.
    void waitWhileEmpty(unsigned aSeconds);

    /// Makes this wait and every later one return at once. For good.
    void interrupt();

    ZTIterator begin();
    ZTIterator end();
    ZTConstIterator begin() const;
    ZTConstIterator end() const;

    /// Removes the item and moves the iterator to the next one.
    void erase(ZTIterator& arIterator);

private:
    mutable ZTCMutex mMutex;
    ZTSOsConditional mNotEmpty;  // waited on with mMutex held
    std::list<ZTItem> mItems ZT_GUARDED_BY(mMutex);
    bool mIsInterrupted ZT_GUARDED_BY(mMutex) = false;
};

/// A queue is the list filled at its back and emptied at its front.
using ZTCSynchQueue = ZTCSynchList;

#endif
