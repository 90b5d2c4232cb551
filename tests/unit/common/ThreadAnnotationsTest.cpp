#include "common/include/ThreadAnnotations.h"

#include <gtest/gtest.h>

namespace {

/// Uses every annotation, so that compiling this file shows that each is accepted, and that none changes the code.
class ZT_CAPABILITY("mutex") ZTCSampleLock {
public:
    void lock() ZT_ACQUIRE() { ++mDepth; }
    void unlock() ZT_RELEASE() { --mDepth; }
    bool tryLock() ZT_TRY_ACQUIRE(true) { return ++mDepth == 1; }
    int mDepth = 0;
};

class ZT_SCOPED_CAPABILITY ZTCSampleScope {
public:
    explicit ZTCSampleScope(ZTCSampleLock& arLock) ZT_ACQUIRE(arLock) : mrLock(arLock) { mrLock.lock(); }
    ~ZTCSampleScope() ZT_RELEASE() { mrLock.unlock(); }

private:
    ZTCSampleLock& mrLock;
};

class ZTCSampleOwner {
public:
    ZTCSampleLock& getLock() ZT_RETURN_CAPABILITY(mLock) { return mLock; }
    int countBoth() ZT_EXCLUDES(mLock) {
        ZTCSampleScope lScope(mLock);
        return countLocked();
    }
    int countUnchecked() ZT_NO_THREAD_SAFETY_ANALYSIS { return mValue; }

private:
    int countLocked() ZT_REQUIRES(mLock) { return ++mValue + ++*mpValue; }

    ZTCSampleLock mLock;
    int mValue ZT_GUARDED_BY(mLock) = 0;
    int* mpValue ZT_PT_GUARDED_BY(mLock) = &mOther;
    int mOther = 0;
};

}  // namespace

TEST(ThreadAnnotations, AreAcceptedAndChangeNothing) {
    ZTCSampleOwner lOwner;
    EXPECT_EQ(2, lOwner.countBoth());
    EXPECT_EQ(1, lOwner.countUnchecked());
    EXPECT_EQ(0, lOwner.getLock().mDepth);
    if (lOwner.getLock().tryLock()) {
        EXPECT_EQ(1, lOwner.getLock().mDepth);
        lOwner.getLock().unlock();
    } else {
        ADD_FAILURE() << "the lock was free";
    }
}
