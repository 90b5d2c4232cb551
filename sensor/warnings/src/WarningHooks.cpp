// The programs that warnings run: started, watched, judged, and tested on request. Warnings.cpp has the thread, and
// decides what is warned of.
#include "sensor/warnings/include/Warnings.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/RecordJson.h"

using std::chrono::steady_clock;
using ZTCJson = nlohmann::ordered_json;

void ZTCWarnings::beginTest() {
    std::vector<std::uint64_t> lTickets;
    {
        const std::lock_guard lLock(mMutex);
        lTickets.swap(mNewTests);
    }
    for (const std::uint64_t lTicket : lTickets) {
        if (mTest) {
            const std::lock_guard lLock(mMutex);
            mDoneTests.push_back({lTicket, dumpJson({{"error", "the hooks are being tested already"}}, -1)});
            mBell.ring();
            continue;
        }
        mTest = ZTSTest{lTicket, std::vector<std::optional<std::string>>(mSettings.mWarnings.size())};
        const ZTCNameBook lNames = makeNames();
        for (std::size_t i = 0; i < mSettings.mWarnings.size(); ++i) {
            ZTSWarnDocument lDocument;
            lDocument.mTrouble.mRule = i;
            lDocument.mTrouble.mText = "a test: nothing has happened";
            lDocument.mTrouble.mFirst = lDocument.mTrouble.mLast = getHistoryTime();
            ZTSWarnDocument lFilled = makeDocument(lDocument.mTrouble);
            lFilled.mIsTest = true;
            lFilled.mEpisode.reset();
            mHooks.push_back({.mRule = i,
                              .mSettings = mSettings.mWarnings[i],
                              .mTicket = lTicket,
                              .mpProcess = nullptr,
                              .mInput = makeInput(lFilled),
                              .mEnvironment = toHookEnvironment(lFilled, lNames)});
        }
        if (mSettings.mWarnings.empty()) {
            endTest();
        }
    }
}

void ZTCWarnings::startHooks() {
    std::size_t lRunning = 0;
    for (auto lPlace = mHooks.begin(); lPlace != mHooks.end();) {
        if (lPlace->mpProcess == nullptr && lRunning < gcMostHooks) {
            const ZTSHookCall lCall{.mRun = lPlace->mSettings.mRun,
                                    .mEnvironment = std::move(lPlace->mEnvironment),
                                    .mInput = std::move(lPlace->mInput),
                                    .mTimeout = lPlace->mSettings.mTimeout};
            try {
                lPlace->mpProcess = std::make_unique<ZTCHookProcess>(lCall, steady_clock::now());
            } catch (const ZTCSystemCallEx& lrEx) {
                noteEnd(*lPlace, lrEx.what());
                lPlace = mHooks.erase(lPlace);
                continue;
            }
        }
        lRunning += lPlace->mpProcess != nullptr ? 1 : 0;
        ++lPlace;
    }
}

void ZTCWarnings::stepHooks() {
    for (auto lPlace = mHooks.begin(); lPlace != mHooks.end();) {
        const std::optional<std::string> lEnd =
            lPlace->mpProcess != nullptr ? lPlace->mpProcess->step(steady_clock::now()) : std::nullopt;
        if (lEnd) {
            noteEnd(*lPlace, *lEnd);
            lPlace = mHooks.erase(lPlace);
        } else {
            ++lPlace;
        }
    }
}

void ZTCWarnings::noteEnd(const ZTSHook& acrHook, const std::string& acrProblem) {
    if (!acrProblem.empty()) {
        ++mFailures;
        if (mIsLoaded) {
            mSetup.mSetValue(mSetup.mFailuresValue, std::to_string(mFailures));
        }
        mSetup.mReport("the hook " + acrHook.mSettings.mRun.front() + " for " + acrHook.mSettings.mKind +
                       " failed: " + acrProblem + "; it is run again with the next warning");
    }
    const bool lIsCurrent =
        acrHook.mRule < mSettings.mWarnings.size() && mSettings.mWarnings[acrHook.mRule] == acrHook.mSettings;
    if (lIsCurrent) {
        mProblems[acrHook.mRule] = acrProblem;
    }
    if (lIsCurrent && mTest && acrHook.mTicket == mTest->mTicket) {
        mTest->mResults[acrHook.mRule] = acrProblem;
        if (std::ranges::all_of(mTest->mResults, [](const auto& acrResult) { return acrResult.has_value(); })) {
            endTest();
        }
    }
}

void ZTCWarnings::endTest() {
    ZTCJson lHooks = ZTCJson::array();
    for (std::size_t i = 0; i < mSettings.mWarnings.size(); ++i) {
        const std::string lProblem = mTest->mResults[i].value_or("");
        lHooks.push_back({{"kind", mSettings.mWarnings[i].mKind},
                          {"run", mSettings.mWarnings[i].mRun},
                          {"problem", lProblem.empty() ? ZTCJson(nullptr) : ZTCJson(lProblem)}});
    }
    {
        const std::lock_guard lLock(mMutex);
        mDoneTests.push_back({mTest->mTicket, dumpJson(ZTCJson{{"hooks", std::move(lHooks)}}, -1)});
    }
    mTest.reset();
    mBell.ring();
}

ZTSWarnDocument ZTCWarnings::makeDocument(const ZTSTrouble& acrTrouble) {
    ZTSWarnDocument lDocument;
    lDocument.mHost = mSetup.mHost;
    lDocument.mRule = mpBook->getRule(acrTrouble.mRule);
    lDocument.mTrouble = acrTrouble;
    const std::optional<ZTCKindKey> lKind = findKind(lDocument.mRule.mKind);
    try {
        if (mpHistory == nullptr) {
            return lDocument;
        }
        lDocument.mStoreId = mpHistory->getStoreId();
        ZTSHistoryFilter lFilter;
        lFilter.mLimit = 1;
        lFilter.mKinds = {lKind.value_or(0)};
        if (lDocument.mRule.mPer == "port" && acrTrouble.mRemotePort) {
            lFilter.mPorts = {acrTrouble.mRemotePort->mWwpn};
        } else if (lDocument.mRule.mPer != "host" && acrTrouble.mInitiator.mWwpn) {
            lFilter.mInitiators = {*acrTrouble.mInitiator.mWwpn};
        }
        if (lKind) {
            const std::vector<ZTSEpisode> lNewest = mpHistory->readEpisodes(lFilter);
            lDocument.mEpisode = lNewest.empty() ? std::nullopt : std::optional(lNewest.back());
        }
    } catch (const ZTCStoreEx&) {
        mpHistory.reset();
    }
    return lDocument;
}
