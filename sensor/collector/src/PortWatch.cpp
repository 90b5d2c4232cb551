#include "sensor/collector/include/PortWatch.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"

/// Between two looks at the targets' file.
static constexpr std::chrono::seconds scScanPeriod{10};
/// How long the first agent waits for the ports: it keeps the first target that it was given for an FC id.
static constexpr std::chrono::seconds scPortsPatience{1};

/// Kinds that say that ports, paths or queue depths are no longer what they were.
static constexpr std::array<std::string_view, 7> scTellingKinds = {"rscn", "link",  "queue-depth",    "logo",
                                                                   "prlo", "plogi", "adapter-arrival"};

ZTCPortWatch::ZTCPortWatch(ZTCTopologyWatch& arTopology, Report aReport)
    : mrTopology(arTopology), mReport(std::move(aReport)), mpPorts(std::make_shared<ZTSTopology>()) {}

bool ZTCPortWatch::scan(const ZTSSettings& acrSettings, ZTCTime aNow) {
    const std::shared_ptr<const ZTSTopology> lpPorts = mrTopology.getPorts();
    const bool lIsNew = lpPorts != nullptr && lpPorts != mpPorts;
    mReadyBy = mReadyBy.value_or(aNow + scPortsPatience);
    if (!mIsReady && lpPorts == nullptr && aNow < *mReadyBy) {
        mNextScan = *mReadyBy;
        return false;
    }
    if (mIsReady && !lIsNew && aNow < mNextScan) {
        return false;
    }
    mIsReady = true;
    mNextScan = aNow + scScanPeriod;
    mpPorts = lpPorts != nullptr ? lpPorts : mpPorts;
    mTargets = acrSettings.mTargetsSysfs ? toTargets(*mpPorts) : std::vector<ZTSTargetPort>();
    try {
        std::ranges::copy(readTargetFile(acrSettings.mTargetsFile), std::back_inserter(mTargets));
        mTargetFileProblem.clear();
    } catch (const ZTCBadInputEx& lrEx) {
        if (mTargetFileProblem != lrEx.what()) {
            mTargetFileProblem = lrEx.what();
            mReport(mTargetFileProblem + ": its targets are not registered");
        }
    }
    return true;
}

void ZTCPortWatch::noteEvents(const std::shared_ptr<const ZTSStatusSnapshot>& acrPage) {
    if (acrPage == nullptr || acrPage == mpPage) {
        return;
    }
    mpPage = acrPage;
    std::int64_t lLast = 0;
    for (const ZTSStatusBoardCopy& lrBoard : acrPage->mBoards) {
        for (std::size_t i = 0; i < lrBoard.mRows.size(); ++i) {
            if (std::ranges::find(scTellingKinds, getStatusRowName(i)) != scTellingKinds.end()) {
                lLast = std::max(lLast, lrBoard.mRows[i].mLastEvent);
            }
        }
    }
    if (lLast != mLastEvent) {
        mLastEvent = lLast;
        mrTopology.hurry();
    }
}
