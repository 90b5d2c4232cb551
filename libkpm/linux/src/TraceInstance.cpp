#include "libkpm/linux/src/TraceInstance.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <variant>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/ExitSwitch.h"
#include "libkpm/linux/src/InstanceName.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/SenseProbe.h"
#include "libkpm/linux/src/Sysfs.h"

static const char* const scDoneEvent = "events/scsi/scsi_dispatch_cmd_done";
static const char* const scBufferKilobytes = "256";  // for each processor: some thousand records
static constexpr std::size_t scMostDescription = 65536;

static ZTSFeedProblem sProblem(const std::string& acrWhat, int aError) {
    ZTSFeedProblem lProblem{judgeFeedError(aError), acrWhat + ": " + std::strerror(aError)};
    if (lProblem.mHappening == ZTFH_NotGranted && aError != EROFS) {
        lProblem.mText += "; run the agent as root, or with CAP_DAC_OVERRIDE, or prepare tracefs for its user";
    }
    return lProblem;
}

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
            arProblem = sProblem(
                (lError == ENOENT ? "there is no tracefs at " : "no tracefs can be reached at ") + lrRoot, lError);
        }
        if (lError != ENOENT) {
            return std::nullopt;
        }
    }
    arProblem.mText += "; mount it with: mount -t tracefs nodev /sys/kernel/tracing";
    return std::nullopt;
}

ZTCTraceInstance::ZTCTraceInstance(std::string aPath, ZTCTraceFiles& arFiles)
    : mPath(std::move(aPath)),
      mFilterPath(mPath + "/" + scDoneEvent + "/filter"),
      mEnablePath(mPath + "/" + scDoneEvent + "/enable"),
      mrFiles(arFiles) {}

std::unique_ptr<ZTCTraceInstance> ZTCTraceInstance::open(const ZTSTracePlace& acrPlace, ZTCTraceFiles& arFiles,
                                                         ZTSFeedProblem& arProblem) {
    std::string lPath = acrPlace.mPrepared;
    const bool lIsOwn = lPath.empty();
    if (lIsOwn) {
        const std::optional<std::string> lInstances = sFindInstances(acrPlace.mRoots, arProblem);
        if (!lInstances) {
            return nullptr;
        }
        sRemoveLeftOvers(*lInstances, arFiles);
        removeLeftOverProbes(*lInstances + "/..", arFiles);
        lPath = *lInstances + "/" + makeTraceInstanceName();
    }
    // Before the directory is made: from then on, its owner removes it.
    std::unique_ptr<ZTCTraceInstance> lpInstance(new ZTCTraceInstance(lPath, arFiles));
    if (lIsOwn) {
        int lError = arFiles.make(lPath);
        if (lError == EEXIST) {
            arFiles.remove(lPath);
            lError = arFiles.make(lPath);
        }
        if (lError != 0) {
            arProblem = sProblem("the trace instance " + lPath + " cannot be made", lError);
            return nullptr;
        }
        lpInstance->mIsOwn = true;
    }
    if (!lpInstance->readLayouts(arProblem)) {
        return nullptr;
    }
    lpInstance->setBufferSizes();
    return lpInstance->openBuffers(arProblem) ? std::move(lpInstance) : nullptr;
}

ZTCTraceInstance::~ZTCTraceInstance() {
    switchOff();
    disarmLinuxExitSwitch();
    // The kernel keeps an instance that has open files.
    mBuffers.clear();
    const int lError = mIsOwn ? mrFiles.remove(mPath) : 0;
    if (lError == 0) {
        return;
    }
    try {
        logLibraryLine(KPM_LOG_WARNING, "the trace instance " + mPath + " stays: " + std::strerror(lError));
    } catch (const std::exception&) {
        return;  // no memory for a line; the next run removes the instance
    }
}

bool ZTCTraceInstance::readLayouts(ZTSFeedProblem& arProblem) {
    std::optional<std::string> lHeader = readSmallFile(mPath + "/events/header_page", scMostDescription);
    if (!lHeader) {
        // Older kernels have it at the root alone.
        lHeader = readSmallFile(mPath + "/../../events/header_page", scMostDescription);
    }
    const std::string lFormatName = std::string(scDoneEvent) + "/format";
    const std::optional<std::string> lFormat = readSmallFile(mPath + "/" + lFormatName, scMostDescription);
    if (!lHeader || !lFormat) {
        const int lError = errno;
        arProblem = {judgeFeedError(lError),
                     std::string(lFormat ? "events/header_page" : lFormatName) + " cannot be read below " + mPath};
        return false;
    }
    const auto lPageLayout = makeTracePageLayout(parseTraceFormat(*lHeader));
    const auto lRecordLayout = makeScsiDoneLayout(parseTraceFormat(*lFormat));
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lPageLayout)) {
        arProblem = {ZTFH_Broken, "trace pages cannot be read: " + lpProblem->mText};
        return false;
    }
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lRecordLayout)) {
        arProblem = {ZTFH_Broken, "the trace event scsi_dispatch_cmd_done cannot be used: " + lpProblem->mText};
        return false;
    }
    mPageLayout = std::get<ZTSTracePageLayout>(lPageLayout);
    mRecordLayout = std::get<ZTSScsiDoneLayout>(lRecordLayout);
    return true;
}

void ZTCTraceInstance::setBufferSizes() {
    if (const int lError = mrFiles.write(mPath + "/buffer_size_kb", scBufferKilobytes); lError != 0) {
        logLibraryLine(KPM_LOG_WARNING,
                       "the size of the trace buffers stays as it is: " + std::string(std::strerror(lError)));
    }
    // Records of one command may be in the buffers of two processors: their times must be of one clock.
    mrFiles.write(mPath + "/trace_clock", "mono");
    // Some kernels store a written 0 as 1, which would leave a single record unread: see what is there.
    const std::string lPercent = mPath + "/buffer_percent";
    mWakesAtOnce = mrFiles.write(lPercent, "0") == 0 &&
                   parseSysfsNumber(readSmallFile(lPercent, scMostDescription).value_or(std::string())) == 0;
}

/// Whether so many more descriptors leave the rest of the process enough.
static bool sHasDescriptorsFor(std::size_t aNumber, const std::string& acrPath, ZTSFeedProblem& arProblem) {
    rlimit lLimit{};
    const std::optional<std::vector<std::string>> lOpen = listDirectory("/proc/self/fd");
    if (::getrlimit(RLIMIT_NOFILE, &lLimit) != 0 || lLimit.rlim_cur == RLIM_INFINITY || !lOpen) {
        return true;
    }
    const std::size_t lNeeded = lOpen->size() + aNumber + gcTraceDescriptorReserve;
    if (lNeeded <= lLimit.rlim_cur) {
        return true;
    }
    arProblem = {ZTFH_Broken, "the trace buffers of " + std::to_string(aNumber) +
                                  " possible processors need a descriptor each, below " + acrPath + "/per_cpu: of " +
                                  std::to_string(lLimit.rlim_cur) + " that are allowed, " +
                                  std::to_string(lOpen->size()) + " are in use and " +
                                  std::to_string(gcTraceDescriptorReserve) +
                                  " are kept for the agent; raise the limit (LimitNOFILE= of the service) to " +
                                  std::to_string(lNeeded) + " or more"};
    return false;
}

bool ZTCTraceInstance::openBuffers(ZTSFeedProblem& arProblem) {
    const std::vector<std::string> lNames = listDirectory(mPath + "/per_cpu").value_or(std::vector<std::string>());
    if (!sHasDescriptorsFor(lNames.size(), mPath, arProblem)) {
        return false;
    }
    int lError = 0;
    std::size_t lMissing = 0;
    mBuffers.reserve(lNames.size());
    for (const std::string& lrName : lNames) {
        const std::string lBuffer = mPath + "/per_cpu/" + lrName;
        Buffer lNew;
        lNew.mStatsPath = lBuffer + "/stats";
        lNew.mPipe = ZTCLibraryDescriptor(
            ::open((lBuffer + "/trace_pipe_raw").c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC | O_NOCTTY));
        if (!lNew.mPipe.isOpen()) {
            lError = errno;
            ++lMissing;
            continue;
        }
        mBuffers.push_back(std::move(lNew));
    }
    if (mBuffers.empty()) {
        const std::string lWhat = "no trace buffer below " + mPath + "/per_cpu can be opened";
        arProblem = lMissing == 0 ? ZTSFeedProblem{ZTFH_Broken, lWhat} : sProblem(lWhat, lError);
        return false;
    }
    if (lMissing != 0) {
        logLibraryLine(
            KPM_LOG_WARNING,
            "the trace buffers of " + std::to_string(lMissing) + " of " + std::to_string(lMissing + mBuffers.size()) +
                " processors cannot be opened, so that their SCSI outcomes are lost: " + std::strerror(lError));
    }
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
        arProblem = sProblem("the filter of the trace event scsi_dispatch_cmd_done cannot be set", lError);
        // After a refusal some kernels leave the event without any filter.
        if (mrFiles.write(mFilterPath, mFilter) == 0) {
            return ZTTF_Kept;
        }
        switchOff();
        return ZTTF_Off;
    }
    if (lError == 0) {
        armLinuxExitSwitch(
            ZTCLibraryDescriptor(::open(mEnablePath.c_str(), O_WRONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY)));
        lError = mrFiles.write(mEnablePath, "1");
        if (isLinuxExitSwitchPulled()) {
            mrFiles.write(mEnablePath, "0");
        }
    }
    if (lError != 0) {
        switchOff();
        arProblem = sProblem("the trace event scsi_dispatch_cmd_done cannot be switched on", lError);
        return ZTTF_Off;
    }
    mFilter.swap(lFilter);
    return ZTTF_Set;
}

// ---- Reading ----

ZTETraceRead ZTCTraceInstance::read(std::size_t aBuffer, std::span<std::uint8_t> aPage, std::size_t& arSize) {
    ssize_t lRead = -1;
    do {
        lRead = ::read(mBuffers.at(aBuffer).mPipe.get(), aPage.data(), aPage.size());
    } while (lRead < 0 && errno == EINTR);
    if (lRead > 0) {
        arSize = static_cast<std::size_t>(lRead);
        return ZTTR_Page;
    }
    return judgeEmptyTraceRead(lRead, errno);
}

ZTETraceRead judgeEmptyTraceRead(std::int64_t aRead, int aError) {
    // No such device: the buffer of a processor that is not up, which may come up later.
    return aRead == 0 || aError == EAGAIN || aError == ENODEV ? ZTTR_Empty : ZTTR_Failed;
}

std::optional<std::uint64_t> ZTCTraceInstance::takeLosses(std::size_t aBuffer) {
    Buffer& lrBuffer = mBuffers.at(aBuffer);
    const std::optional<std::string> lText = readSmallFile(lrBuffer.mStatsPath, scMostDescription);
    const std::optional<std::uint64_t> lLosses = lText ? parseTraceLosses(*lText) : std::nullopt;
    if (!lLosses) {
        return std::nullopt;
    }
    // A count that has gone back was reset by someone: it begins anew.
    const std::uint64_t lNew = *lLosses >= lrBuffer.mLosses ? *lLosses - lrBuffer.mLosses : 0;
    lrBuffer.mLosses = *lLosses;
    return lNew;
}
