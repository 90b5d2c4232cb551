#include "system/include/SynchList.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>
#include <vector>

#include "common/include/Exception.h"
#include "common/include/Memory.h"
#include "tests/support/FailingAllocation.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"

class ZTCNumber : public ZTCQueueable {
public:
    explicit ZTCNumber(int aNumber) : mNumber(aNumber) {}
    const int mNumber;
};

static ZTCPointer<ZTCQueueable> sItem(int aNumber) {
    return ZTCPointer<ZTCQueueable>(NEW ZTCNumber(aNumber));
}

static int sNumber(const ZTCPointer<ZTCQueueable>& acrItem) {
    return dynamic_cast<const ZTCNumber&>(*acrItem).mNumber;
}

TEST(SynchList, ItemsComeOffBothEnds) {
    ZTCSynchList lList;
    EXPECT_TRUE(lList.isEmpty());
    lList.pushBack(sItem(2));
    lList.pushBack(sItem(3));
    lList.pushFront(sItem(1));
    EXPECT_EQ(lList.size(), 3u);
    EXPECT_EQ(sNumber(lList.front()), 1);
    EXPECT_EQ(sNumber(lList.popBack()), 3);
    EXPECT_EQ(sNumber(lList.popFront()), 1);
    EXPECT_EQ(lList.size(), 1u);
    lList.clear();
    EXPECT_TRUE(lList.isEmpty());
}

TEST(SynchList, TakingFromAnEmptyListIsNotFound) {
    ZTCSynchList lList;
    EXPECT_THROW(lList.popFront(), ZTCNotFoundEx);
    EXPECT_THROW(lList.popBack(), ZTCNotFoundEx);
    EXPECT_THROW(lList.front(), ZTCNotFoundEx);
}

TEST(SynchList, AnItemThatFindsNoMemoryIsNotInTheList) {
    ZTCSynchList lList;
    lList.pushBack(sItem(1));
    const ZTCPointer<ZTCQueueable> lItem = sItem(2);
    EXPECT_TRUE(failAllocation(1, [&] { EXPECT_THROW(lList.pushBack(lItem), ZTCNoMemoryEx); }));
    EXPECT_TRUE(failAllocation(1, [&] { EXPECT_THROW(lList.pushFront(lItem), ZTCNoMemoryEx); }));
    EXPECT_EQ(lList.size(), 1u);
    EXPECT_EQ(sNumber(lList.popFront()), 1);
}

TEST(SynchList, ItCanBeWalkedAndItemsErased) {
    ZTCSynchList lList;
    for (int lNumber = 1; lNumber <= 4; ++lNumber) {
        lList.pushBack(sItem(lNumber));
    }
    for (ZTCSynchList::ZTIterator lPlace = lList.begin(); lPlace != lList.end();) {
        if (sNumber(*lPlace) % 2 == 0) {
            lList.erase(lPlace);
        } else {
            ++lPlace;
        }
    }
    std::vector<int> lNumbers;
    const ZTCSynchList& lcrList = lList;
    for (ZTCSynchList::ZTConstIterator lPlace = lcrList.begin(); lPlace != lcrList.end(); ++lPlace) {
        lNumbers.push_back(sNumber(*lPlace));
    }
    EXPECT_EQ(lNumbers, (std::vector<int>{1, 3}));
}

TEST(SynchList, WaitingEndsWithAnItemATimeOutOrAnInterruption) {
    ZTCSynchList lList;
    EXPECT_THROW(lList.waitWhileEmpty(0), ZTCTimeOutEx);
    ZTCTestThread lThread([&] {
        lList.waitWhileEmpty(60);
        EXPECT_EQ(sNumber(lList.popFront()), 7);
    });
    lList.pushBack(sItem(7));
    lThread.join();

    ZTCTestThread lOther([&] { lList.waitWhileEmpty(60); });
    lList.interrupt();
    lOther.join();
    EXPECT_NO_THROW(lList.waitWhileEmpty(60));
}

TEST(SynchList, AnItemAtTheFrontEndsTheWaitToo) {
    ZTCSynchList lList;
    constexpr int lcRounds = 300;
    const ZTCTestThread lThread([&lList] {
        for (int lRound = 0; lRound < lcRounds; ++lRound) {
            lList.waitWhileEmpty(3600);
            if (lList.isEmpty()) {
                return;  // interrupted
            }
            EXPECT_EQ(sNumber(lList.popFront()), lRound);
        }
    });
    for (int lRound = 0; lRound < lcRounds; ++lRound) {
        lList.pushFront(sItem(lRound));
        const ZTCDeadline lDeadline;
        while (!lList.isEmpty() && !lDeadline.isOver()) {
            std::this_thread::yield();
        }
        if (!lList.isEmpty()) {
            ADD_FAILURE() << "item " << lRound << " woke nobody";
            break;
        }
        // Some of the items come while the thread waits already.
        std::this_thread::sleep_for(std::chrono::microseconds(lRound));
    }
    lList.interrupt();
}

TEST(SynchList, EveryItemReachesExactlyOneThread) {
    ZTCSynchList lList;
    std::vector<int> lTaken[2];
    ZTCTestThreads lThreads;
    lThreads.start(2, [&lList, &lTaken](unsigned aThread) {
        for (;;) {
            lList.waitWhileEmpty(60);
            int lNumber;
            try {
                lNumber = sNumber(lList.popFront());
            } catch (const ZTCNotFoundEx&) {
                continue;  // the other one was faster
            }
            if (lNumber < 0) {
                return;
            }
            lTaken[aThread].push_back(lNumber);
        }
    });
    for (int lNumber = 0; lNumber < 1000; ++lNumber) {
        lList.pushBack(sItem(lNumber));
    }
    lList.pushBack(sItem(-1));
    lList.pushBack(sItem(-1));
    lThreads.join();
    std::vector<bool> lSeen(1000, false);
    for (const std::vector<int>& lcrTaken : lTaken) {
        for (const int lNumber : lcrTaken) {
            EXPECT_FALSE(lSeen[static_cast<std::size_t>(lNumber)]);
            lSeen[static_cast<std::size_t>(lNumber)] = true;
        }
    }
    EXPECT_EQ(lTaken[0].size() + lTaken[1].size(), 1000u);
}
