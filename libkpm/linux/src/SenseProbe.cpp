#include "libkpm/linux/src/SenseProbe.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <optional>
#include <utility>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/linux/src/ExitSwitch.h"
#include "libkpm/linux/src/InstanceName.h"
#include "libkpm/linux/src/Sysfs.h"

static constexpr std::size_t scMostTypes = std::size_t{64} * 1024 * 1024;

// How a probe names a function's first argument: the general form, and for older kernels the register's name.
static const char* const scFirstArguments[] = {"$arg1",
#if defined(__x86_64__)
                                               "%di"
#elif defined(__aarch64__)
                                               "%x0"
#elif defined(__s390x__)
                                               "%r2"
#elif defined(__powerpc64__)
                                               "%gpr3"
#else
                                               "$arg1"
#endif
};

/// A group's name may have letters, digits and underscores.
static std::string sGroupOf(std::string aInstanceName) {
    std::replace(aInstanceName.begin(), aInstanceName.end(), '-', '_');
    return aInstanceName;
}

/// Where the files of a group's event are in an instance.
static std::string sEventOf(const std::string& acrGroup) {
    return "events/" + acrGroup + "/" + gcSenseEvent;
}

static ZTSFeedProblem sProblem(const std::string& acrWhat, int aError) {
    ZTSFeedProblem lProblem{judgeFeedError(aError), acrWhat + ": " + std::strerror(aError)};
    if (lProblem.mHappening == ZTFH_NotGranted) {
        lProblem.mText += "; run the agent as root, or have root define the probe";
    } else if (aError == ENOENT) {
        lProblem.mText += "; this kernel has no kprobe events";
    }
    return lProblem;
}

static std::unique_ptr<ZTCTraceBuffers> sOpenBuffers(const std::string& acrOutcomes, ZTCTraceFiles& arFiles,
                                                     ZTSFeedProblem& arProblem) {
    const std::string lPrepared = acrOutcomes + "-sense";
    struct stat lStatus {};
    if (::stat(lPrepared.c_str(), &lStatus) == 0) {
        return ZTCTraceBuffers::open(lPrepared, ZTTO_Prepared, arFiles, arProblem);
    }
    const std::string lOwn = getParentDirectory(acrOutcomes) + "/" + makeSenseInstanceName();
    return ZTCTraceBuffers::open(lOwn, ZTTO_Library, arFiles, arProblem);
}

ZTCSenseProbe::ZTCSenseProbe(std::unique_ptr<ZTCTraceBuffers> apBuffers, const std::string& acrGroup,
                             ZTCTraceFiles& arFiles)
    : mpBuffers(std::move(apBuffers)),
      mGroup(acrGroup),
      mDefinitions(getParentDirectory(getParentDirectory(mpBuffers->getPath())) + "/kprobe_events"),
      mRemoval("-:" + acrGroup + "/" + gcSenseEvent + "\n"),
      mEventPath(mpBuffers->getPath() + "/" + sEventOf(acrGroup)),
      mEnablePath(mEventPath + "/enable"),
      mrFiles(arFiles) {}

std::unique_ptr<ZTCSenseProbe> ZTCSenseProbe::open(const std::string& acrOutcomes, const std::string& acrSysfsRoot,
                                                   ZTCTraceFiles& arFiles, ZTSFeedProblem& arProblem) {
    std::unique_ptr<ZTCTraceBuffers> lpBuffers = sOpenBuffers(acrOutcomes, arFiles, arProblem);
    if (lpBuffers == nullptr) {
        return nullptr;
    }
    const std::string lFormat = lpBuffers->getPath() + "/" + sEventOf(gcPreparedSenseGroup) + "/format";
    const bool lIsDefined = readSmallFile(lFormat, gcMostTraceDescription).has_value();
    const std::string lGroup = lIsDefined ? gcPreparedSenseGroup : sGroupOf(makeTraceInstanceName());
    std::unique_ptr<ZTCSenseProbe> lpProbe(new ZTCSenseProbe(std::move(lpBuffers), lGroup, arFiles));
    const bool lIsThere = lIsDefined || lpProbe->define(acrSysfsRoot, arProblem);
    return lIsThere && lpProbe->switchOn(arProblem) ? std::move(lpProbe) : nullptr;
}

ZTCSenseProbe::~ZTCSenseProbe() {
    switchOff();
    disarmLinuxExitSwitch(ZTXS_Sense);
    // The kernel keeps a probe that has open files in an instance.
    mpBuffers.reset();
    const int lError = mIsOwn ? mrFiles.append(mDefinitions, mRemoval) : 0;
    if (lError == 0) {
        return;
    }
    try {
        logLibraryLine(KPM_LOG_WARNING,
                       "the probe " + mGroup + "/" + gcSenseEvent + " stays: " + std::strerror(lError));
    } catch (const std::exception&) {
        return;  // no memory for a line; the next run removes the probe
    }
}

std::variant<std::string, ZTSTraceProblem> readSenseProbe(const std::string& acrSysfsRoot, const std::string& acrGroup,
                                                          const std::string& acrArgument) {
    const std::optional<std::string> lKernel = readSmallFile(acrSysfsRoot + "/kernel/btf/vmlinux", scMostTypes);
    // Not there where the SCSI layer is part of the kernel itself.
    const std::string lModule =
        readSmallFile(acrSysfsRoot + "/kernel/btf/scsi_mod", scMostTypes).value_or(std::string());
    if (!lKernel) {
        return ZTSTraceProblem{"this kernel does not describe its types (no /sys/kernel/btf/vmlinux)"};
    }
    const auto lBytes = [](const std::string& acrText) {
        return ZTCByteSpan(reinterpret_cast<const std::uint8_t*>(acrText.data()), acrText.size());
    };
    return makeSenseProbe(ZTCBtf(lBytes(*lKernel), lBytes(lModule)), acrGroup, acrArgument);
}

bool ZTCSenseProbe::define(const std::string& acrSysfsRoot, ZTSFeedProblem& arProblem) {
    int lError = 0;
    for (const char* const lpArgument : scFirstArguments) {
        const std::variant<std::string, ZTSTraceProblem> lLine = readSenseProbe(acrSysfsRoot, mGroup, lpArgument);
        if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLine)) {
            arProblem = {ZTFH_Broken, lpProblem->mText};
            return false;
        }
        lError = mrFiles.append(mDefinitions, std::get<std::string>(lLine) + "\n");
        if (lError == EEXIST) {
            // Left by an opening of this process that was not closed in order.
            mrFiles.append(mDefinitions, mRemoval);
            lError = mrFiles.append(mDefinitions, std::get<std::string>(lLine) + "\n");
        }
        if (lError != EINVAL) {
            break;
        }
    }
    if (lError != 0) {
        arProblem = sProblem("the probe for them cannot be defined in kprobe_events", lError);
        return false;
    }
    mIsOwn = true;
    return true;
}

bool ZTCSenseProbe::switchOn(ZTSFeedProblem& arProblem) {
    const std::optional<std::string> lFormat = readSmallFile(mEventPath + "/format", gcMostTraceDescription);
    if (!lFormat) {
        arProblem = {ZTFH_Broken, "the format of the probe's event cannot be read"};
        return false;
    }
    const std::variant<ZTSSenseLayout, ZTSTraceProblem> lLayout = makeSenseLayout(parseTraceFormat(*lFormat));
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLayout)) {
        arProblem = {ZTFH_Broken, "the probe's event cannot be used: " + lpProblem->mText};
        return false;
    }
    mLayout = std::get<ZTSSenseLayout>(lLayout);
    armLinuxExitSwitch(ZTXS_Sense, openLibraryFile(mEnablePath.c_str(), O_WRONLY));
    if (const int lError = mrFiles.write(mEnablePath, "1"); lError != 0) {
        arProblem = sProblem("the probe for them cannot be switched on", lError);
        return false;
    }
    if (isLinuxExitSwitchPulled()) {
        switchOff();
    }
    return true;
}

void ZTCSenseProbe::watchHosts(const std::vector<std::uint32_t>& acrHosts) {
    mrFiles.write(mEventPath + "/filter", acrHosts.empty() ? std::string("0") : makeSenseFilter(acrHosts));
}

void removeLeftOverProbes(const std::string& acrInstances, ZTCTraceFiles& arFiles) {
    const std::string lPrefix = std::string(gcPreparedSenseGroup) + "_";
    const std::string lRoot = getParentDirectory(acrInstances);
    const std::vector<std::string> lNames = listDirectory(lRoot + "/events").value_or(std::vector<std::string>());
    for (const std::string& lrName : lNames) {
        std::string lInstance = lrName;
        std::replace(lInstance.begin(), lInstance.end(), '_', '-');
        if (!lrName.starts_with(lPrefix) || !isTraceInstanceLeftOver(lInstance)) {
            continue;
        }
        // The killed run's own instance is gone before, and in a prepared one the probe may still be on.
        for (const std::string& lrOther : listDirectory(acrInstances).value_or(std::vector<std::string>())) {
            arFiles.write(acrInstances + "/" + lrOther + "/" + sEventOf(lrName) + "/enable", "0");
        }
        const int lError = arFiles.append(lRoot + "/kprobe_events", "-:" + lrName + "/" + gcSenseEvent + "\n");
        logLibraryLine(lError == 0 ? KPM_LOG_NOTICE : KPM_LOG_WARNING,
                       lError == 0
                           ? "removed the probe " + lrName + ", which a killed run has left"
                           : "the probe " + lrName + ", which a killed run has left, stays: " + std::strerror(lError));
    }
}
