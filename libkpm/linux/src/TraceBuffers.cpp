#include "libkpm/linux/src/TraceBuffers.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <utility>
#include <variant>

#include "libkpm/common/include/AgentLink.h"
#include "libkpm/linux/src/Sysfs.h"

static const char* const scBufferKilobytes = "256";  // for each processor: some thousand records

ZTSFeedProblem makeTraceProblem(const std::string& acrWhat, int aError) {
    ZTSFeedProblem lProblem{judgeFeedError(aError), acrWhat + ": " + std::strerror(aError)};
    if (lProblem.mHappening == ZTFH_NotGranted && aError != EROFS) {
        lProblem.mText += "; run the agent as root, or with CAP_DAC_OVERRIDE, or prepare tracefs for its user";
    }
    return lProblem;
}

// ---- Opening ----

std::unique_ptr<ZTCTraceBuffers> ZTCTraceBuffers::open(const std::string& acrPath, ZTETraceOwner aOwner,
                                                       ZTCTraceFiles& arFiles, ZTSFeedProblem& arProblem) {
    // Before the directory is made: from then on, its owner removes it.
    std::unique_ptr<ZTCTraceBuffers> lpBuffers(new ZTCTraceBuffers(acrPath, arFiles));
    if (aOwner == ZTTO_Library && !lpBuffers->make(arProblem)) {
        return nullptr;
    }
    if (!lpBuffers->readPageLayout(arProblem)) {
        return nullptr;
    }
    lpBuffers->setSizes();
    return lpBuffers->openAll(arProblem) ? std::move(lpBuffers) : nullptr;
}

ZTCTraceBuffers::~ZTCTraceBuffers() {
    // The kernel keeps an instance that has open files.
    mBuffers.clear();
    const int lError = mIsMade ? mrFiles.remove(mPath) : 0;
    if (lError == 0) {
        return;
    }
    try {
        logLibraryLine(KPM_LOG_WARNING, "the trace instance " + mPath + " stays: " + std::strerror(lError));
    } catch (const std::exception&) {
        return;  // no memory for a line; the next run removes the instance
    }
}

bool ZTCTraceBuffers::make(ZTSFeedProblem& arProblem) {
    int lError = mrFiles.make(mPath);
    if (lError == EEXIST) {
        // Left by an opening of this process that was not closed in order.
        mrFiles.remove(mPath);
        lError = mrFiles.make(mPath);
    }
    if (lError != 0) {
        arProblem = makeTraceProblem("the trace instance " + mPath + " cannot be made", lError);
        return false;
    }
    mIsMade = true;
    return true;
}

bool ZTCTraceBuffers::readPageLayout(ZTSFeedProblem& arProblem) {
    std::optional<std::string> lHeader = readSmallFile(mPath + "/events/header_page", gcMostTraceDescription);
    if (!lHeader) {
        // Older kernels have it at the root alone.
        lHeader = readSmallFile(mPath + "/../../events/header_page", gcMostTraceDescription);
    }
    if (!lHeader) {
        const int lError = errno;
        arProblem = {judgeFeedError(lError), "events/header_page cannot be read below " + mPath};
        return false;
    }
    const auto lLayout = makeTracePageLayout(parseTraceFormat(*lHeader));
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLayout)) {
        arProblem = {ZTFH_Broken, "trace pages cannot be read: " + lpProblem->mText};
        return false;
    }
    mPageLayout = std::get<ZTSTracePageLayout>(lLayout);
    return true;
}

void ZTCTraceBuffers::setSizes() {
    if (const int lError = mrFiles.write(mPath + "/buffer_size_kb", scBufferKilobytes); lError != 0) {
        logLibraryLine(KPM_LOG_WARNING,
                       "the size of the trace buffers stays as it is: " + std::string(std::strerror(lError)));
    }
    // Records of one command may be in several buffers: their times must be of one clock.
    mrFiles.write(mPath + "/trace_clock", "mono");
    // Some kernels store a written 0 as 1, which would leave a single record unread: see what is there.
    const std::string lPercent = mPath + "/buffer_percent";
    mWakesAtOnce = mrFiles.write(lPercent, "0") == 0 &&
                   parseSysfsNumber(readSmallFile(lPercent, gcMostTraceDescription).value_or(std::string())) == 0;
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

bool ZTCTraceBuffers::openAll(ZTSFeedProblem& arProblem) {
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
        lNew.mPipe = openLibraryFile((lBuffer + "/trace_pipe_raw").c_str(), O_RDONLY);
        if (!lNew.mPipe.isOpen()) {
            lError = errno;
            ++lMissing;
            continue;
        }
        mBuffers.push_back(std::move(lNew));
    }
    if (mBuffers.empty()) {
        const std::string lWhat = "no trace buffer below " + mPath + "/per_cpu can be opened";
        arProblem = lMissing == 0 ? ZTSFeedProblem{ZTFH_Broken, lWhat} : makeTraceProblem(lWhat, lError);
        return false;
    }
    if (lMissing != 0) {
        logLibraryLine(KPM_LOG_WARNING, "the trace buffers of " + std::to_string(lMissing) + " of " +
                                            std::to_string(lMissing + mBuffers.size()) +
                                            " processors cannot be opened below " + mPath +
                                            ", so that their records are lost: " + std::strerror(lError));
    }
    return true;
}

// ---- Reading ----

ZTETraceRead ZTCTraceBuffers::read(std::size_t aBuffer, std::span<std::uint8_t> aPage, std::size_t& arSize) {
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

std::optional<std::uint64_t> ZTCTraceBuffers::takeLosses(std::size_t aBuffer) {
    Buffer& lrBuffer = mBuffers.at(aBuffer);
    const std::optional<std::string> lText = readSmallFile(lrBuffer.mStatsPath, gcMostTraceDescription);
    const std::optional<std::uint64_t> lLosses = lText ? parseTraceLosses(*lText) : std::nullopt;
    if (!lLosses) {
        return std::nullopt;
    }
    // A count that has gone back was reset by someone: it begins anew.
    const std::uint64_t lNew = *lLosses >= lrBuffer.mLosses ? *lLosses - lrBuffer.mLosses : 0;
    lrBuffer.mLosses = *lLosses;
    return lNew;
}
