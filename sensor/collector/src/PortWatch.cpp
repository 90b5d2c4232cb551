#include "sensor/collector/include/PortWatch.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>

/// Between two looks at the ports in sysfs and in the targets' file.
static constexpr std::chrono::seconds scScanPeriod{10};

static std::string sSysfsRoot() {
    const char* const lpRoot = std::getenv(gcSysfsVariable);
    return lpRoot != nullptr && *lpRoot != '\0' ? lpRoot : "/sys";
}

ZTCPortWatch::ZTCPortWatch(ZTCHistoryWorker& arHistory, Report aReport)
    : mrHistory(arHistory),
      mReport(std::move(aReport)),
      mSysfsRoot(sSysfsRoot()),
      mpPorts(std::make_shared<ZTSTopology>()) {}

bool ZTCPortWatch::scan(const ZTSSettings& acrSettings, ZTCTime aNow) {
    if (aNow < mNextScan) {
        return false;
    }
    mNextScan = aNow + scScanPeriod;
    auto lpPorts = std::make_shared<ZTSTopology>(scanPorts(mSysfsRoot, mReader));
    if (*lpPorts != *mpPorts) {
        mpPorts = lpPorts;
        mrHistory.notePorts(lpPorts);
    }
    mTargets = acrSettings.mTargetsSysfs ? toTargets(*lpPorts) : std::vector<ZTSTargetPort>();
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
