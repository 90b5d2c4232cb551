#include "sensor/collector/include/Leftovers.h"

#include <unistd.h>

#include <algorithm>
#include <filesystem>

#include "sensor/client/include/AgentState.h"
#include "sensor/collector/include/EndedAgent.h"
#include "sensor/collector/include/SpoolRecovery.h"

/// How an agent of another keeper ended, read from its page. Where its keeper vanished, the next one
/// ended it without a last retrieval: that is a gap, also where the agent happened to hold nothing.
static ZTSEndedAgent sDescribe(const ZTCPagePointer& acrPage, const std::string& acrPath) {
    ZTSEndedAgent lAgent = describeEndedAgent(acrPage, acrPath);
    const bool lIsForced = acrPage->mEndReason == ZTSE_Signal || acrPage->mEndReason == ZTSE_SensorGone;
    if (lIsForced && (acrPage->mIsCollecting || acrPage->mRetrievals != 0)) {
        lAgent.mIsVanished = true;
        lAgent.mReason = "the sensor that had started the agent ended without an orderly stop";
    }
    return lAgent;
}

std::vector<std::string> ZTCLeftovers::listPages(std::error_code& arError) const {
    std::vector<std::string> lPaths;
    for (std::filesystem::directory_iterator lEntry(mAgentDirectory, arError), lEnd; !arError && lEntry != lEnd;
         lEntry.increment(arError)) {
        if (lEntry->path().filename().string().starts_with("page.")) {
            lPaths.push_back(lEntry->path());
        }
    }
    std::ranges::sort(lPaths);
    return lPaths;
}

ZTCPagePointer ZTCLeftovers::findPage(const std::string& acrGeneration) const {
    std::error_code lError;
    for (const std::string& lrPath : listPages(lError)) {
        ZTCStatusPageReader lReader;
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        if (lReader.open(lrPath) && lReader.read(*lpPage) && lpPage->mStartId == acrGeneration) {
            return lpPage;
        }
    }
    return nullptr;
}

void ZTCLeftovers::takeInWaiting(std::uint64_t aLastNumber) {
    mrSpool.open();
    const std::vector<ZTSSpoolEntry> lEntries = mrSpool.list();
    const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, "");
    mrSpool.raiseNumber(lPlan.mNextNumber);
    mrSpool.raiseNumber(aLastNumber + 1);
    for (const ZTSSpoolEntry& lrEntry : lPlan.mWaiting) {
        mrHistory.takeIn(lrEntry, findPage(lrEntry.mName.mGeneration));
    }
}

void ZTCLeftovers::tearParts() {
    const std::vector<ZTSSpoolEntry> lEntries = mrSpool.list();
    for (const ZTSSpoolEntry& lrEntry : planSpoolRecovery(lEntries, "").mTear) {
        ZTSSpoolPart lPart = mrSpool.openPart(lrEntry.mName);
        const ZTSSpoolName lName = mrSpool.tear(lPart);
        if (lName.mState == ZTSPS_Torn) {
            mrHistory.takeIn({lName, lrEntry.mSize}, findPage(lName.mGeneration));
        }
    }
}

bool ZTCLeftovers::endPages(const std::string& acrCurrent) {
    std::error_code lError;
    const std::vector<std::string> lPaths = listPages(lError);
    bool lIsComplete = !isShortage(lError.value());
    if (!lIsComplete) {
        mReport("cannot look for status pages in " + mAgentDirectory + ": " + lError.message() + ": tried again");
    }
    for (const std::string& lrPath : lPaths) {
        if (lrPath == acrCurrent) {
            continue;
        }
        ZTCStatusPageReader lReader;
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        const bool lIsRead = lReader.open(lrPath) && lReader.read(*lpPage);
        if (!lIsRead && !lReader.hasLooked()) {
            mReport(lReader.getReason() + ": tried again");
            lIsComplete = false;
            continue;
        }
        if (!lIsRead) {
            mReport(lReader.getReason() + ": removed");
            unlink(lrPath.c_str());
            continue;
        }
        // An agent that another keeper has started may still run. A process number alone does not show it: another
        // program may have it by now.
        const ZTSAgentState lAgent = lookAtAgent(mAgentDirectory);
        if (lAgent.mPresence == ZTAP_None || lAgent.mPid != static_cast<long>(lpPage->mPid)) {
            mrHistory.endAgent(sDescribe(lpPage, lrPath));
        } else {
            lIsComplete = false;
        }
    }
    return lIsComplete;
}
