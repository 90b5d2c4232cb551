#include <gtest/gtest.h>
#include <pthread.h>

#include <algorithm>
#include <string>
#include <vector>

#include "common/include/Log.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class Locking : public ZTCTavikFixture {
protected:
    /// Whether the previous-data lock is held, by whomever.
    bool isHeld() {
        pthread_mutex_t* const lpMutex = &lock().mMutex;
        const bool lIsFree = pthread_mutex_trylock(lpMutex) == 0;
        if (lIsFree) {
            pthread_mutex_unlock(lpMutex);
        }
        return !lIsFree;
    }

    /// How often something takes the previous-data lock.
    template <typename Do>
    unsigned countHolds(Do aDo) {
        unsigned lHolds = 0;
        const ZTCReplacement lCounter(gReplaced.mBeforeLock,
                                      [&](const ZTSOsMutex& acrMutex) { lHolds += &acrMutex == &lock() ? 1 : 0; });
        aDo();
        return lHolds;
    }

    ZTSOsMutex& lock() { return const_cast<ZTCMutex&>(mSystem->getPrevDataLock()).getOsMutex(); }
};

}  // namespace

TEST_F(Locking, RecordListsAreEncodedOutsideOfTheLock) {
    collect(2);
    mSystem->makePendingRecord(0, 8);
    unsigned lEncoded = 0;
    const ZTCReplacement lEncode(gReplaced.mBeforeEncode, [&](const ZTCTavikRecordList&) {
        ++lEncoded;
        EXPECT_FALSE(isHeld());
    });
    retrieve();
    EXPECT_EQ(2u, lEncoded);
    const ZTCPrevDataHold lHold(*mSystem);
    EXPECT_TRUE(isHeld()) << "the test sees a lock that is held";
}

TEST_F(Locking, WhereverARetrievalLeavesTheLockToAnEventItsBoardHasAList) {
    collect(1);
    unsigned lDelivered = 0;
    bool lIsDelivering = false;
    const ZTCReplacement lEvent(gReplaced.mBeforeLock, [&](const ZTSOsMutex& acrMutex) {
        if (&acrMutex == &lock() && !lIsDelivering) {
            lIsDelivering = true;
            deliverTemperature(0);
            ++lDelivered;
            lIsDelivering = false;
        }
    });
    retrieve();
    EXPECT_LE(1u, lDelivered);
    EXPECT_EQ(std::vector<std::string>(), mLog.texts("-E-"));
}

TEST_F(Locking, EachPageOfAnRscnTakesTheLockAnew) {
    collect(1);
    const auto lHoldsOf = [&](const std::vector<std::uint32_t>& acrPages) {
        return countHolds([&] { deliverRscn(0, makeRscn(acrPages)); });
    };
    const unsigned lOfOne = lHoldsOf({1});
    EXPECT_LE(1u, lOfOne);
    EXPECT_EQ(lOfOne + 4, lHoldsOf({1, 2, 3, 4, 5}));
}

TEST_F(Locking, AnRscnEndsAtTheFirstPageWhoseBoardHasLostItsListAndThatIsSaidOnce) {
    collect(1);
    constexpr unsigned lcPages = 4;
    const ZTCBytes lPayload = makeRscn({1, 2, 3, 4});
    const unsigned lHoldsOfAll = countHolds([&] { deliverRscn(0, lPayload); });
    // The hold of a page is one of the last: one for each of them.
    for (unsigned lLeft = 1; lLeft <= lcPages; ++lLeft) {
        SCOPED_TRACE(std::to_string(lLeft) + " pages left");
        mSystem->exchangeRecordLists(1);
        mLog.forget();
        const unsigned lTaken = lHoldsOfAll - lLeft;
        unsigned lHolds = 0;
        const ZTCReplacement lLeave(gReplaced.mBeforeLock, [&](const ZTSOsMutex& acrMutex) {
            if (&acrMutex == &lock() && lHolds++ == lTaken) {
                mSystem->exchangeRecordLists(0);  // takes the lock once itself
            }
        });
        deliverRscn(0, lPayload);
        EXPECT_EQ(lTaken + 2, lHolds) << "no page behind the one that found no list";
        const std::vector<std::string> lErrors = mLog.texts("-E-");
        ASSERT_EQ(1u, lErrors.size());
        EXPECT_EQ(0u, lErrors[0].find("-E- Bad boardid 0 in event has been recieved. Event: wwn "));
    }
}

TEST_F(Locking, ATargetsNoticesComeAfterTheLockWasGivenBack) {
    bringUp();
    setLogCode(255);
    registerTargets({{makeWwn(1), makeWwn(2), 3}});
    std::vector<std::string> lSeen;
    for (const ZTSLogLine& lcrLine : mLog.lines()) {
        if (lcrLine.mFunction == "~ZTCPrevDataHold" && lcrLine.mText == "Left") {
            lSeen.emplace_back("given back");
        } else if (lcrLine.mMark == "-N-") {
            lSeen.push_back(lcrLine.mFunction);
        }
    }
    EXPECT_EQ((std::vector<std::string>{"given back", "addFcTarget", "given back", "addWwpnTarget"}), lSeen);
}

TEST_F(Locking, ATargetIsLookedUpAndInsertedInOneHold) {
    bringUp();
    EXPECT_EQ(2u, countHolds([&] { registerTargets({{makeWwn(1), makeWwn(2), 3}}); })) << "one for each map";
}
