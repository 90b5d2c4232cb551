#include "libkpm/linux/src/TraceInstance.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <utility>
#include <variant>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/ExitSwitch.h"
#include "libkpm/linux/src/InstanceName.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SenseProbe.h"
#include "libkpm/linux/src/Sysfs.h"

static const char* const scDoneEvent = "events/scsi/scsi_dispatch_cmd_done";

// ---- Opening ----

/// Instances of killed runs. The kernel keeps one that is in use after all, by a process of another name space.
static void sRemoveLeftOvers(const std::string& acrInstances, ZTCTraceFiles& arFiles) {
    const std::vector<std::string> lNames = listDirectory(acrInstances).value_or(std::vector<std::string>());
    for (const std::string& lrName : lNames) {
        if (!isTraceInstanceLeftOver(lrName)) {
            continue;
        }
        const std::string lPath = acrInstances + "/" + lrName;
        arFiles.write(lPath + "/" + scDoneEvent + "/enable", "0");
        const int lError = arFiles.remove(lPath);
        if (lError == 0) {
            logLibraryLine(KPM_LOG_NOTICE, "removed the trace instance " + lrName + ", which a killed run has left");
        } else if (lError != EBUSY && lError != ENOENT) {
            logLibraryLine(KPM_LOG_WARNING, "the trace instance " + lrName +
                                                ", which a killed run has left, stays: " + std::strerror(lError));
        }
    }
}

/// The directory of instances: the first that is there, or cannot be seen for want of rights. By trying, with the
/// rights that count for opening files; access(2) asks for those of the real user.
static std::optional<std::string> sFindInstances(const std::vector<std::string>& acrRoots, ZTSFeedProblem& arProblem) {
    for (const std::string& lrRoot : acrRoots) {
        struct stat lStatus {};
        if (::stat((lrRoot + "/instances").c_str(), &lStatus) == 0) {
            return lrRoot + "/instances";
        }
        const int lError = errno;
        const bool lIsFirst = &lrRoot == &acrRoots.front();
        if (lIsFirst || lError != ENOENT) {
            arProblem = makeTraceProblem(
                (lError == ENOENT ? "there is no tracefs at " : "no tracefs can be reached at ") + lrRoot, lError);
        }
        if (lError != ENOENT) {
            return std::nullopt;
        }
    }
    arProblem.mText += "; mount it with: mount -t tracefs nodev /sys/kernel/tracing";
    return std::nullopt;
}

ZTCTraceInstance::ZTCTraceInstance(std::unique_ptr<ZTCTraceBuffers> apBuffers, ZTCTraceFiles& arFiles)
    : mpBuffers(std::move(apBuffers)),
      mFilterPath(mpBuffers->getPath() + "/" + scDoneEvent + "/filter"),
      mEnablePath(mpBuffers->getPath() + "/" + scDoneEvent + "/enable"),
      mrFiles(arFiles) {}

std::unique_ptr<ZTCTraceInstance> ZTCTraceInstance::open(const ZTSTracePlace& acrPlace, ZTCTraceFiles& arFiles,
                                                         ZTSFeedProblem& arProblem) {
    const bool lIsPrepared = !acrPlace.mPrepared.empty();
    const std::optional<std::string> lInstances =
        lIsPrepared ? getParentDirectory(acrPlace.mPrepared) : sFindInstances(acrPlace.mRoots, arProblem);
    if (!lInstances) {
        return nullptr;
    }
    sRemoveLeftOvers(*lInstances, arFiles);
    removeLeftOverProbes(*lInstances, arFiles);
    const std::string lPath = lIsPrepared ? acrPlace.mPrepared : *lInstances + "/" + makeTraceInstanceName();
    std::unique_ptr<ZTCTraceBuffers> lpBuffers =
        ZTCTraceBuffers::open(lPath, lIsPrepared ? ZTTO_Prepared : ZTTO_Library, arFiles, arProblem);
    if (lpBuffers == nullptr) {
        return nullptr;
    }
    std::unique_ptr<ZTCTraceInstance> lpInstance(new ZTCTraceInstance(std::move(lpBuffers), arFiles));
    return lpInstance->readRecordLayout(arProblem) ? std::move(lpInstance) : nullptr;
}

ZTCTraceInstance::~ZTCTraceInstance() {
    switchOff();
    disarmLinuxExitSwitch(ZTXS_Outcomes);
}

bool ZTCTraceInstance::readRecordLayout(ZTSFeedProblem& arProblem) {
    const std::string& lrPath = mpBuffers->getPath();
    const std::string lFormatName = std::string(scDoneEvent) + "/format";
    const std::optional<std::string> lFormat = readSmallFile(lrPath + "/" + lFormatName, gcMostTraceDescription);
    if (!lFormat) {
        const int lError = errno;
        arProblem = {judgeFeedError(lError), lFormatName + " cannot be read below " + lrPath};
        return false;
    }
    const auto lLayout = makeScsiDoneLayout(parseTraceFormat(*lFormat));
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLayout)) {
        arProblem = {ZTFH_Broken, "the trace event scsi_dispatch_cmd_done cannot be used: " + lpProblem->mText};
        return false;
    }
    mRecordLayout = std::get<ZTSScsiDoneLayout>(lLayout);
    return true;
}

// ---- On and off ----

void ZTCTraceInstance::switchOff() {
    mrFiles.write(mEnablePath, "0");
    mFilter.clear();
}

ZTETraceFilter ZTCTraceInstance::watchHosts(const std::vector<std::uint32_t>& acrHosts, ZTSFeedProblem& arProblem) {
    if (acrHosts.empty()) {
        switchOff();
        return ZTTF_Set;
    }
    std::string lFilter = makeScsiFilter(acrHosts);
    int lError = mrFiles.write(mFilterPath, lFilter);
    if (lError != 0 && !mFilter.empty()) {
        arProblem = makeTraceProblem("the filter of the trace event scsi_dispatch_cmd_done cannot be set", lError);
        // After a refusal some kernels leave the event without any filter.
        if (mrFiles.write(mFilterPath, mFilter) == 0) {
            return ZTTF_Kept;
        }
        switchOff();
        return ZTTF_Off;
    }
    if (lError == 0) {
        armLinuxExitSwitch(ZTXS_Outcomes, openLibraryFile(mEnablePath.c_str(), O_WRONLY));
        lError = mrFiles.write(mEnablePath, "1");
        if (isLinuxExitSwitchPulled()) {
            mrFiles.write(mEnablePath, "0");
        }
    }
    if (lError != 0) {
        switchOff();
        arProblem = makeTraceProblem("the trace event scsi_dispatch_cmd_done cannot be switched on", lError);
        return ZTTF_Off;
    }
    mFilter.swap(lFilter);
    return ZTTF_Set;
}
