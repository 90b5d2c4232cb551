#include "libkpm/linux/src/TraceInstance.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <optional>
#include <string_view>
#include <utility>
#include <variant>

#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/ExitSwitch.h"
#include "libkpm/linux/src/Report.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/Sysfs.h"

static const char* const scNamePrefix = "libkpm-linux-";
static const char* const scDoneEvent = "events/scsi/scsi_dispatch_cmd_done";
static const char* const scBufferKilobytes = "256";  // for each processor: some thousand records
static constexpr std::size_t scMostDescription = 65536;

int ZTCTraceDirectories::make(const std::string& acrPath) {
    return ::mkdir(acrPath.c_str(), 0700) == 0 ? 0 : errno;
}

int ZTCTraceDirectories::remove(const std::string& acrPath) {
    return ::rmdir(acrPath.c_str()) == 0 ? 0 : errno;
}

/// When a process was started, in the kernel's ticks since boot: field 22 of its stat file.
static std::optional<std::string> sStartTime(const std::string& acrProcess) {
    const std::optional<std::string> lText = readSmallFile("/proc/" + acrProcess + "/stat", 4096);
    if (!lText) {
        return std::nullopt;
    }
    // The second field, the name in brackets, may hold anything.
    std::size_t lPlace = lText->rfind(')');
    for (int lField = 2; lField < 22 && lPlace != std::string::npos; ++lField) {
        lPlace = lText->find(' ', lPlace + 1);
    }
    if (lPlace == std::string::npos) {
        return std::nullopt;
    }
    return lText->substr(lPlace + 1, lText->find(' ', lPlace + 1) - lPlace - 1);
}

std::string makeTraceInstanceName() {
    return scNamePrefix + std::to_string(::getpid()) + "-" + sStartTime("self").value_or("0");
}

bool isTraceInstanceLeftOver(const std::string& acrName) {
    if (!acrName.starts_with(scNamePrefix)) {
        return false;
    }
    const std::string lRest = acrName.substr(std::strlen(scNamePrefix));
    const std::size_t lDash = lRest.find('-');
    const auto lIsNumber = [](std::string_view aText) {
        return !aText.empty() &&
               std::all_of(aText.begin(), aText.end(), [](char aChar) { return '0' <= aChar && aChar <= '9'; });
    };
    if (lDash == std::string::npos || !lIsNumber(lRest.substr(0, lDash)) || !lIsNumber(lRest.substr(lDash + 1))) {
        return false;
    }
    return sStartTime(lRest.substr(0, lDash)) != lRest.substr(lDash + 1);
}

static std::string sExplain(const std::string& acrWhat, int aError) {
    std::string lText = acrWhat + ": " + std::strerror(aError);
    if (aError == EACCES || aError == EPERM) {
        lText += "; run the agent as root, or with CAP_DAC_OVERRIDE";
    }
    return lText;
}

/// Instances of killed runs; one that is in use after all (a process of another namespace) the kernel keeps.
static void sRemoveLeftOvers(const std::string& acrInstances, ZTCTraceDirectories& arDirectories) {
    const std::vector<std::string> lNames = listDirectory(acrInstances).value_or(std::vector<std::string>());
    for (const std::string& lrName : lNames) {
        if (!isTraceInstanceLeftOver(lrName)) {
            continue;
        }
        const int lError = arDirectories.remove(std::string(acrInstances).append("/").append(lrName));
        if (lError == 0) {
            logLinuxLine(
                KPM_LOG_NOTICE,
                std::string("removed the trace instance ").append(lrName).append(", which a killed run has left"));
        } else if (lError != EBUSY && lError != ENOENT) {
            logLinuxLine(KPM_LOG_WARNING, "the trace instance " + lrName +
                                              ", which a killed run has left, stays: " + std::strerror(lError));
        }
    }
}

std::unique_ptr<ZTCTraceInstance> ZTCTraceInstance::open(const std::string& acrRoot, ZTCTraceDirectories& arDirectories,
                                                         std::string& arProblem) {
    const std::string lInstances = acrRoot + "/instances";
    if (::access(lInstances.c_str(), F_OK) != 0) {
        const bool lIsMissing = errno == ENOENT;
        arProblem = sExplain("there is no tracefs at " + acrRoot, errno);
        arProblem += lIsMissing ? "; mount it with: mount -t tracefs nodev /sys/kernel/tracing" : "";
        return nullptr;
    }
    sRemoveLeftOvers(lInstances, arDirectories);
    const std::string lPath = lInstances + "/" + makeTraceInstanceName();
    int lError = arDirectories.make(lPath);
    if (lError == EEXIST) {
        arDirectories.remove(lPath);
        lError = arDirectories.make(lPath);
    }
    if (lError != 0) {
        arProblem = sExplain("the trace instance " + lPath + " cannot be made", lError);
        return nullptr;
    }
    std::unique_ptr<ZTCTraceInstance> lpInstance(new ZTCTraceInstance(lPath, arDirectories));
    if (!lpInstance->readLayouts(acrRoot, arProblem) || !lpInstance->openBuffers(arProblem)) {
        return nullptr;
    }
    return lpInstance;
}

ZTCTraceInstance::~ZTCTraceInstance() {
    write(std::string(scDoneEvent) + "/enable", "0");
    disarmLinuxExitSwitch();
    // The kernel keeps an instance that has open files.
    mBuffers.clear();
    if (const int lError = mrDirectories.remove(mPath); lError != 0) {
        logLinuxLine(KPM_LOG_WARNING, "the trace instance " + mPath + " stays: " + std::strerror(lError));
    }
}

bool ZTCTraceInstance::readLayouts(const std::string& acrRoot, std::string& arProblem) {
    std::optional<std::string> lHeader = readSmallFile(mPath + "/events/header_page", scMostDescription);
    if (!lHeader) {
        lHeader = readSmallFile(acrRoot + "/events/header_page", scMostDescription);
    }
    const std::string lFormatName = std::string(scDoneEvent) + "/format";
    const std::optional<std::string> lFormat = readSmallFile(mPath + "/" + lFormatName, scMostDescription);
    if (!lHeader || !lFormat) {
        arProblem = std::string(lFormat ? "events/header_page" : lFormatName) + " cannot be read below " + mPath;
        return false;
    }
    const auto lPageLayout = makeTracePageLayout(parseTraceFormat(*lHeader));
    const auto lRecordLayout = makeScsiDoneLayout(parseTraceFormat(*lFormat));
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lPageLayout)) {
        arProblem = "trace pages cannot be read: " + lpProblem->mText;
        return false;
    }
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lRecordLayout)) {
        arProblem = "the trace event scsi_dispatch_cmd_done cannot be used: " + lpProblem->mText;
        return false;
    }
    mPageLayout = std::get<ZTSTracePageLayout>(lPageLayout);
    mRecordLayout = std::get<ZTSScsiDoneLayout>(lRecordLayout);
    return true;
}

bool ZTCTraceInstance::openBuffers(std::string& arProblem) {
    if (const int lError = write("buffer_size_kb", scBufferKilobytes); lError != 0) {
        logLinuxLine(KPM_LOG_WARNING,
                     "the size of the trace buffers stays as it is: " + std::string(std::strerror(lError)));
    }
    mWakesAtOnce = write("buffer_percent", "0") == 0;
    int lError = 0;
    std::size_t lMissing = 0;
    const std::vector<std::string> lNames = listDirectory(mPath + "/per_cpu").value_or(std::vector<std::string>());
    for (const std::string& lrName : lNames) {
        const std::string lBuffer = mPath + "/per_cpu/" + lrName;
        Buffer lNew;
        lNew.mPipe = ZTCLibraryDescriptor(
            ::open((lBuffer + "/trace_pipe_raw").c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC | O_NOCTTY));
        if (!lNew.mPipe.isOpen()) {
            lError = errno;
            ++lMissing;
            continue;
        }
        lNew.mStatsPath = lBuffer + "/stats";
        mBuffers.push_back(std::move(lNew));
    }
    if (mBuffers.empty()) {
        arProblem = "no trace buffer below " + mPath + "/per_cpu can be opened" +
                    (lMissing == 0 ? std::string() : std::string(": ") + std::strerror(lError));
        return false;
    }
    if (lMissing != 0) {
        logLinuxLine(
            KPM_LOG_WARNING,
            "the trace buffers of " + std::to_string(lMissing) + " of " + std::to_string(lMissing + mBuffers.size()) +
                " processors cannot be opened, so that their SCSI outcomes are lost: " + std::strerror(lError));
    }
    return true;
}

/// Writes all of a text at once, as the kernel's control files want it. 0, or the error number.
int ZTCTraceInstance::write(const std::string& acrName, const std::string& acrText) const {
    const ZTCLibraryDescriptor lFile(
        ::open((mPath + "/" + acrName).c_str(), O_WRONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY | O_TRUNC));
    if (!lFile.isOpen()) {
        return errno;
    }
    ssize_t lWritten = -1;
    do {
        lWritten = ::write(lFile.get(), acrText.data(), acrText.size());
    } while (lWritten < 0 && errno == EINTR);
    if (lWritten < 0) {
        return errno;
    }
    return static_cast<std::size_t>(lWritten) == acrText.size() ? 0 : EIO;
}

bool ZTCTraceInstance::watchHosts(const std::vector<std::uint32_t>& acrHosts, std::string& arProblem) {
    const std::string lEnable = std::string(scDoneEvent) + "/enable";
    if (acrHosts.empty()) {
        write(lEnable, "0");
        return true;
    }
    int lError = write(std::string(scDoneEvent) + "/filter", makeScsiFilter(acrHosts));
    if (lError == 0) {
        armLinuxExitSwitch(ZTCLibraryDescriptor(
            ::open((mPath + "/" + lEnable).c_str(), O_WRONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY)));
        lError = write(lEnable, "1");
        if (isLinuxExitSwitchPulled()) {
            write(lEnable, "0");
        }
    }
    if (lError == 0) {
        return true;
    }
    write(lEnable, "0");
    arProblem = sExplain("the trace event scsi_dispatch_cmd_done cannot be switched on", lError);
    return false;
}

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
