/// A keeper with a heartbeat of 60 s in a fake world, and a clock that the test moves.
#ifndef TESTS_UNIT_KEEPER_KEEPERFIXTURE_H
#define TESTS_UNIT_KEEPER_KEEPERFIXTURE_H

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/unit/keeper/FakeWorld.h"

inline constexpr int gcKilled = 9;  ///< wait statuses
inline constexpr int gcStatus0 = 0;
inline constexpr int gcStatus2 = 2 << 8;
inline constexpr int gcStatus3 = 3 << 8;

class Keeper : public testing::Test {
protected:
    Keeper() : mKeeper(mWorld, std::chrono::seconds(60)), mNow(std::chrono::seconds(5000)) {}

    /// Starts; what that does is taken from the world.
    void start() {
        mKeeper.start(mNow);
        mWorld.take();
    }
    /// Starts, and lets agent and collector work.
    void startWorking() {
        start();
        look();
        answer(1);
        mWorld.take();
    }
    void tell(ZTELinkMessageType aType, std::uint64_t aStart = 0) {
        ZTSLinkMessage lMessage;
        lMessage.mType = aType;
        lMessage.mStart = aStart;
        mKeeper.handleMessage(mNow, lMessage);
    }
    void look() { tell(ZTLM_Look); }
    void answer(std::uint64_t aStart) { tell(ZTLM_StartAnswered, aStart); }
    void agentEnds(int aWaitStatus = gcKilled, ZTEStatusEnd aReason = ZTSE_Running) {
        mKeeper.handleAgentEnd(mNow, aWaitStatus, aReason);
    }
    void collectorEnds(int aWaitStatus = gcKilled) { mKeeper.handleCollectorEnd(mNow, aWaitStatus); }

    /// Lets time pass as the loop does: at each time that the keeper asks for, it is called. The agent's heart and the
    /// collector's looks go on where the test has not stopped them.
    void pass(std::chrono::milliseconds aTime) {
        const auto lEnd = mNow + aTime;
        while (mKeeper.getNextTime() <= lEnd) {
            ASSERT_LT(++mCalls, 100000U) << "the keeper spins";
            step(std::max(mKeeper.getNextTime(), mNow));
            mKeeper.handleTime(mNow);
        }
        step(lEnd);
    }
    /// The time until the world is told to do this.
    std::chrono::seconds waitFor(const std::string& acrWhat) {
        const auto lBegin = mNow;
        while (mNow - lBegin < std::chrono::hours(1)) {
            for (const std::string& lcrDone : mWorld.take()) {
                if (lcrDone == acrWhat) {
                    return std::chrono::duration_cast<std::chrono::seconds>(mNow - lBegin);
                }
            }
            step(std::max(mKeeper.getNextTime(), mNow));
            mKeeper.handleTime(mNow);
        }
        ADD_FAILURE() << "in vain: " << acrWhat;
        return {};
    }
    void step(ZTCKeeper::ZTCTime aTime) {
        mNow = aTime;
        if (mHasHeart) {
            mWorld.mTouch = mNow.time_since_epoch().count();
        }
        if (mDoesLook) {
            look();
        }
    }

    ZTCFakeWorld mWorld;
    ZTCKeeper mKeeper;
    ZTCKeeper::ZTCTime mNow;
    bool mHasHeart = true;
    bool mDoesLook = true;
    unsigned mCalls = 0;
};

#endif
