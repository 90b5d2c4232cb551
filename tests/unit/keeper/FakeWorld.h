/// A keeper's world without processes: it writes down what the keeper does, and a test moves its clock.
#ifndef TESTS_UNIT_KEEPER_FAKEWORLD_H
#define TESTS_UNIT_KEEPER_FAKEWORLD_H

#include <algorithm>
#include <string>
#include <vector>

#include "sensor/keeper/include/Keeper.h"

class ZTCFakeWorld : public ZTCKeeperWorld {
public:
    std::optional<ZTSLinkMessage> startAgent(std::uint64_t aStart) override {
        note("start agent " + std::to_string(aStart));
        if (!mCanStartAgent) {
            return {};
        }
        ZTSLinkMessage lStarted;
        lStarted.mType = ZTLM_AgentStarted;
        lStarted.mStart = aStart;
        lStarted.mPid = static_cast<pid_t>(1000 + aStart);
        lStarted.mText = "page." + std::to_string(aStart);
        return lStarted;
    }
    bool startCollector() override {
        note("start collector");
        return mCanStartCollector;
    }
    void sendSignal(ZTEWatched aProcess, int aSignal) override {
        static constexpr const char* scNames[] = {"agent", "collector", "stranger"};
        note("signal " + std::to_string(aSignal) + " to " + scNames[aProcess]);
    }
    ZTEStrangerLook lookForStranger() override { return mStranger; }
    ZTELinkResult send(const ZTSLinkMessage& acrMessage) override {
        static const char* const scNames[] = {"",          "AgentStarted", "AgentEnded", "KeeperState",
                                              "StopAgent", "Finish",       "Reload"};
        std::string lText = std::string("send ") + scNames[acrMessage.mType];
        if (acrMessage.mType == ZTLM_KeeperState) {
            mLastState = acrMessage.mState;
            mLastNextStart = acrMessage.mNextStart;
            lText += std::string(" ") + keeperStateName(acrMessage.mState);
        } else if (acrMessage.mStart != 0) {
            lText += " " + std::to_string(acrMessage.mStart);
        }
        note(lText);
        return mSendResult;
    }
    bool isEmpty(const ZTCFileDescriptor&) override { return mIsFifoEmpty; }
    std::optional<std::int64_t> getAgentTouch() override { return mTouch; }
    std::optional<std::uint32_t> countAdapters() override { return mAdapters; }
    std::set<std::string> getHostNames() override { return mHostNames; }
    void touchPidFile() override { ++mTouches; }
    std::int64_t getWallClock() override { return mWallClock; }
    void say(const std::string& acrText) override { mSaid.push_back(acrText); }
    void notify(const std::string& acrAssignment) override { mNotified.push_back(acrAssignment); }

    /// What was done since the last call.
    std::vector<std::string> take() {
        std::vector<std::string> lDone;
        lDone.swap(mDone);
        return lDone;
    }

    std::int64_t mWallClock = 1000000;
    bool mCanStartAgent = true;
    bool mCanStartCollector = true;
    ZTEStrangerLook mStranger = ZTSL_None;
    ZTELinkResult mSendResult = ZTLR_Done;
    bool mIsFifoEmpty = false;
    std::optional<std::int64_t> mTouch;
    std::optional<std::uint32_t> mAdapters;
    std::set<std::string> mHostNames;
    unsigned mTouches = 0;
    ZTEKeeperState mLastState = ZTKS_Starting;
    std::int64_t mLastNextStart = 0;
    std::vector<std::string> mSaid;
    std::vector<std::string> mNotified;

private:
    void note(const std::string& acrText) { mDone.push_back(acrText); }

    std::vector<std::string> mDone;
};

#endif
