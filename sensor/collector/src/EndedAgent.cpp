#include "sensor/collector/include/EndedAgent.h"

#include "sensor/agentcommon/include/StatusPage.h"

ZTSEndedAgent describeEndedAgent(const ZTCPagePointer& acrPage, const std::string& acrPagePath) {
    ZTSEndedAgent lAgent;
    lAgent.mGeneration = acrPage->mStartId;
    lAgent.mPagePath = acrPagePath;
    lAgent.mpPage = acrPage;
    lAgent.mFrom = fromMicroseconds(acrPage->mLastRetrieval != 0 ? acrPage->mLastRetrieval : acrPage->mStartTime);
    lAgent.mTo = acrPage->mEndTime != 0 ? fromMicroseconds(acrPage->mEndTime) : getHistoryTime();
    lAgent.mIsVanished = acrPage->mEndReason == ZTSE_Running;
    lAgent.mReason = lAgent.mIsVanished ? "the agent vanished"
                                        : std::string("the agent ended: ") + gcStatusEndNames.at(acrPage->mEndReason);
    return lAgent;
}
