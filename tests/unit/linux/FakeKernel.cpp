#include "tests/unit/linux/FakeKernel.h"

#include <fcntl.h>
#include <sys/eventfd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <stdexcept>
#include <utility>

#include "tests/unit/linux/BtfBytes.h"

std::string portNameText(std::uint32_t aName) {
    char lText[32];
    std::snprintf(lText, sizeof lText, "0x10000000000000%02x", aName);
    return lText;
}

HBA_wwn portName(std::uint32_t aName) {
    return HBA_wwn{{0x10, 0, 0, 0, 0, 0, 0, static_cast<std::uint8_t>(aName)}};
}

HBA_wwn nodeName(std::uint32_t aName) {
    return HBA_wwn{{0x20, 0, 0, 0, 0, 0, 0, static_cast<std::uint8_t>(aName)}};
}

ZTCFakeKernel::ZTCFakeKernel() : mFcWake(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    for (const char* lpClass : {"fc_host", "fc_remote_ports", "fc_transport"}) {
        std::filesystem::create_directories(sysfs() + "/class/" + lpClass);
    }
    std::filesystem::create_directories(tracefs() + "/instances");
    std::filesystem::create_directories(tracefs() + "/events");
    writeFile(tracefs() + "/kprobe_events", "");
}

ZTCFakeKernel::~ZTCFakeKernel() = default;

ZTSLinuxOptions ZTCFakeKernel::options() const {
    return {sysfs(), {{tracefs()}, {}, sysfs()}, std::chrono::milliseconds(20)};
}

// ---- sysfs ----

void ZTCFakeKernel::setAttribute(const std::string& acrName, const std::string& acrText) {
    const std::filesystem::path lPath = sysfs() + "/class/" + acrName;
    std::filesystem::create_directories(lPath.parent_path());
    const std::string lNew = mDirectory.path("new");
    writeFile(lNew, acrText);
    std::filesystem::rename(lNew, lPath);
}

void ZTCFakeKernel::setHost(std::uint32_t aHost, const std::string& acrAttribute, const std::string& acrText) {
    setAttribute("fc_host/host" + std::to_string(aHost) + "/" + acrAttribute, acrText);
}

void ZTCFakeKernel::addHost(std::uint32_t aHost, std::uint32_t aName) {
    const std::uint32_t lName = aName == 0 ? aHost + 1 : aName;
    // Made aside and moved in: the library never sees a half of it.
    const std::string lHost = "fc_host/host" + std::to_string(aHost);
    const std::string lAside = "aside";
    char lText[32];
    std::snprintf(lText, sizeof lText, "0x20000000000000%02x\n", lName);
    setAttribute(lAside + "/node_name", lText);
    setAttribute(lAside + "/port_name", portNameText(lName) + "\n");
    setAttribute(lAside + "/port_state", "Online\n");
    std::snprintf(lText, sizeof lText, "0x0100%02x\n", lName);
    setAttribute(lAside + "/port_id", lText);
    std::filesystem::rename(sysfs() + "/class/" + lAside, sysfs() + "/class/" + lHost);
}

void ZTCFakeKernel::removeClass(const std::string& acrName) {
    const std::string lAside = mDirectory.path("gone");
    std::filesystem::rename(sysfs() + "/class/" + acrName, lAside);
    std::filesystem::remove_all(lAside);
}

void ZTCFakeKernel::removeHost(std::uint32_t aHost) {
    removeClass("fc_host/host" + std::to_string(aHost));
}

void ZTCFakeKernel::addTarget(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget,
                              const std::string& acrName) {
    setAttribute("fc_transport/target" + std::to_string(aHost) + ":" + std::to_string(aChannel) + ":" +
                     std::to_string(aTarget) + "/port_name",
                 acrName + "\n");
}

void ZTCFakeKernel::addRport(std::uint32_t aHost, std::uint32_t aNumber, std::int64_t aTarget,
                             const std::string& acrName) {
    const std::string lRport = "fc_remote_ports/rport-" + std::to_string(aHost) + ":0-" + std::to_string(aNumber);
    const std::string lPath = sysfs() + "/class/" + lRport;
    std::filesystem::create_directory(lPath);
    writeFile(lPath + "/scsi_target_id", std::to_string(aTarget) + "\n");
    writeFile(lPath + "/port_name", acrName + "\n");
}

// ---- FC events ----

class ZTCFakeFcSource : public ZTCFcEventSource {
public:
    explicit ZTCFakeFcSource(ZTCFakeKernel& arKernel) : mrKernel(arKernel) {}

    int getDescriptor() const override { return mrKernel.mFcWake.get(); }

    ZTSLinuxReceived receive(std::span<std::uint8_t> aBuffer) override {
        const ZTCTestsOwn lOwn;
        const std::lock_guard<std::mutex> lGuard(mrKernel.mLock);
        std::uint64_t lCount = 0;
        if (mrKernel.mOutcomes.empty() || mrKernel.mIsHeld) {
            static_cast<void>(::read(mrKernel.mFcWake.get(), &lCount, sizeof lCount) < 0);
            return {ZTLR_Empty, 0};
        }
        const auto [lOutcome, lBytes] = mrKernel.mOutcomes.front();
        mrKernel.mOutcomes.pop_front();
        std::copy(lBytes.begin(), lBytes.end(), aBuffer.begin());
        return {lOutcome, lBytes.size()};
    }

private:
    ZTCFakeKernel& mrKernel;
};

std::unique_ptr<ZTCFcEventSource> ZTCFakeKernel::openFcEvents(ZTSFeedProblem& arProblem) {
    const ZTCTestsOwn lOwn;
    if (mRefusesFcEvents) {
        arProblem = {ZTFH_NotGranted, "FC events cannot be subscribed to: Operation not permitted"};
        return nullptr;
    }
    return std::make_unique<ZTCFakeFcSource>(*this);
}

void ZTCFakeKernel::sendFc(ZTELinuxReceived aOutcome, const ZTCBytes& acrBytes) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mOutcomes.emplace_back(aOutcome, acrBytes);
    const std::uint64_t lOne = 1;
    if (!mIsHeld && ::write(mFcWake.get(), &lOne, sizeof lOne) < 0) {
        throw std::runtime_error("the event source cannot be woken");
    }
}

void ZTCFakeKernel::holdFc() {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mIsHeld = true;
}

void ZTCFakeKernel::releaseFc() {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mIsHeld = false;
    const std::uint64_t lOne = 1;
    if (::write(mFcWake.get(), &lOne, sizeof lOne) < 0) {
        throw std::runtime_error("the event source cannot be woken");
    }
}

bool ZTCFakeKernel::isFcDrained() const {
    const std::lock_guard<std::mutex> lGuard(mLock);
    return mOutcomes.empty();
}

// ---- tracefs ----

int ZTCFakeKernel::make(const std::string& acrPath) {
    const ZTCTestsOwn lOwn;
    if (mMakeError != 0) {
        return mMakeError;
    }
    if (!std::filesystem::create_directory(acrPath)) {
        return EEXIST;
    }
    fillInstance(acrPath);
    return 0;
}

void ZTCFakeKernel::fillInstance(const std::string& acrPath) {
    const bool lIsOfSense = std::filesystem::path(acrPath).filename().string().find("sense") != std::string::npos;
    (lIsOfSense ? mSense : mInstance) = acrPath;
    const std::string lEvent = acrPath + "/events/scsi/scsi_dispatch_cmd_done";
    std::filesystem::create_directories(lEvent);
    if (!mFormat.empty()) {
        writeFile(lEvent + "/format", mFormat);
    }
    writeFile(lEvent + "/enable", "0");
    if (mHasFilter) {
        writeFile(lEvent + "/filter", "none");
    } else {
        std::filesystem::create_directory(lEvent + "/filter");
    }
    if (!mHeaderPage.empty()) {
        writeFile(acrPath + "/events/header_page", mHeaderPage);
    }
    writeFile(acrPath + "/buffer_size_kb", "1408");
    writeFile(acrPath + "/trace_clock", "local");
    if (mHasBufferPercent) {
        writeFile(acrPath + "/buffer_percent", "50");
    } else {
        std::filesystem::create_directory(acrPath + "/buffer_percent");
    }
    for (unsigned lProcessor = 0; lProcessor < mProcessors; ++lProcessor) {
        const std::string lBuffer = acrPath + "/per_cpu/cpu" + std::to_string(lProcessor);
        std::filesystem::create_directories(lBuffer);
        writeFile(lBuffer + "/stats", "entries: 0\noverrun: 0\ncommit overrun: 0\ndropped events: 0\n");
        if (::mkfifo((lBuffer + "/trace_pipe_raw").c_str(), 0600) != 0) {
            throw std::runtime_error("a FIFO cannot be made");
        }
        // Open for both, so that the reader never sees an end.
        mPipes[{acrPath, lProcessor}] =
            ZTCLibraryDescriptor(::open((lBuffer + "/trace_pipe_raw").c_str(), O_RDWR | O_CLOEXEC));
    }
    for (const std::string& lrGroup : probes()) {
        addProbeTo(acrPath, lrGroup);
    }
}

int ZTCFakeKernel::remove(const std::string& acrPath) {
    const ZTCTestsOwn lOwn;
    if (isOpenElsewhere(acrPath)) {
        return EBUSY;
    }
    std::error_code lError;
    return std::filesystem::remove_all(acrPath, lError) == 0 || lError ? ENOENT : 0;
}

/// Whether a descriptor of this process, other than those of this object, is open below the path.
bool ZTCFakeKernel::isOpenElsewhere(const std::string& acrPath) const {
    const std::vector<std::string> lNames = listDirectory("/proc/self/fd").value_or(std::vector<std::string>());
    return std::any_of(lNames.begin(), lNames.end(), [&](const std::string& acrName) {
        std::error_code lError;
        const std::string lTarget = std::filesystem::read_symlink("/proc/self/fd/" + acrName, lError).string();
        const bool lIsOwn = std::any_of(mPipes.begin(), mPipes.end(), [&](const auto& acrPipe) {
            return std::to_string(acrPipe.second.get()) == acrName;
        });
        return lTarget.starts_with(acrPath + "/") && !lIsOwn;
    });
}

void ZTCFakeKernel::refuseWrites(const std::string& acrName, const std::string& acrText, int aError, unsigned aTimes) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mRefusals.push_back({"/" + acrName, acrText, aError, aTimes});
}

void ZTCFakeKernel::allowWrites() {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mRefusals.clear();
}

/// The error number of a refusal that is meant for this; 0 where there is none.
int ZTCFakeKernel::refuse(const std::string& acrPath, std::string_view aText) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    for (Refusal& lrRefusal : mRefusals) {
        const bool lIsMeant =
            acrPath.ends_with(lrRefusal.mName) && aText.find(lrRefusal.mText) != std::string_view::npos;
        if (lIsMeant && lrRefusal.mTimes != 0) {
            --lrRefusal.mTimes;
            return lrRefusal.mError;
        }
    }
    return 0;
}

int ZTCFakeKernel::write(const std::string& acrPath, std::string_view aText) {
    const ZTCTestsOwn lOwn;
    if (const int lError = refuse(acrPath, aText); lError != 0) {
        return lError;
    }
    const bool lIsPercent = !mStoredPercent.empty() && acrPath.ends_with("/buffer_percent");
    return ZTCTraceFiles::write(acrPath, lIsPercent ? mStoredPercent : aText);
}

// ---- Dynamic probes ----

void ZTCFakeKernel::addProbeTo(const std::string& acrRoot, const std::string& acrGroup) const {
    const std::string lEvent = acrRoot + "/events/" + acrGroup + "/check_sense";
    std::filesystem::create_directories(lEvent);
    writeFile(lEvent + "/format", mSenseFormat);
    writeFile(lEvent + "/enable", "0");
    writeFile(lEvent + "/filter", "none");
}

void ZTCFakeKernel::addProbe(const std::string& acrGroup) {
    for (const std::string& lrRoot : {tracefs(), mInstance, mSense}) {
        if (!lrRoot.empty() && std::filesystem::exists(lrRoot)) {
            addProbeTo(lrRoot, acrGroup);
        }
    }
}

int ZTCFakeKernel::append(const std::string& acrPath, std::string_view aText) {
    const ZTCTestsOwn lOwn;
    if (const int lError = refuse(acrPath, aText); lError != 0) {
        return lError;
    }
    if (const int lError = ZTCTraceFiles::append(acrPath, aText); lError != 0) {
        return lError;
    }
    const std::string lText(aText);
    const std::string lGroup = lText.substr(2, lText.find('/') - 2);
    const std::string lRoot = tracefs() + "/events/" + lGroup;
    if (lText.starts_with("p:")) {
        if (std::filesystem::exists(lRoot)) {
            return EEXIST;
        }
        addProbe(lGroup);
        return 0;
    }
    for (const std::string& lrName : instances()) {
        const std::string lEnable = tracefs() + "/instances/" + lrName + "/events/" + lGroup + "/check_sense/enable";
        if (std::filesystem::exists(lEnable) && readFile(lEnable) == "1") {
            return EBUSY;
        }
    }
    return std::filesystem::remove_all(lRoot) == 0 ? ENOENT : 0;
}

std::vector<std::string> ZTCFakeKernel::probes() const {
    return listDirectory(tracefs() + "/events").value();
}

void ZTCFakeKernel::addTypes() {
    const ZTSScsiBtf lBtf = scsiBtf();
    std::filesystem::create_directories(sysfs() + "/kernel/btf");
    writeFile(sysfs() + "/kernel/btf/vmlinux", std::string(lBtf.mKernel.begin(), lBtf.mKernel.end()));
    writeFile(sysfs() + "/kernel/btf/scsi_mod", std::string(lBtf.mModule.begin(), lBtf.mModule.end()));
}

void ZTCFakeKernel::sendTo(const std::string& acrInstance, const ZTCBytes& acrPage, unsigned aProcessor) {
    const int lPipe = mPipes.at({acrInstance, aProcessor}).get();
    if (::write(lPipe, acrPage.data(), acrPage.size()) != static_cast<ssize_t>(acrPage.size())) {
        throw std::runtime_error("a page cannot be written");
    }
}

std::vector<std::string> ZTCFakeKernel::instances() const {
    return listDirectory(tracefs() + "/instances").value();
}
