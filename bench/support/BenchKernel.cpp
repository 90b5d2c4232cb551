#include "bench/support/BenchKernel.h"

#include <fcntl.h>
#include <sys/eventfd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <utility>
#include <variant>

static constexpr std::size_t scPageBytes = 4096;
static constexpr int scPipeBytes = 1024 * 1024;
static constexpr std::size_t scNumberOffset = 44;  // of an FC message's number

static std::string sCapture(const std::string& acrKernel, const std::string& acrName) {
    return std::string(TAVIK_CAPTURES "/").append(acrKernel).append("/").append(acrName);
}

ZTCBenchBytes readCapture(const std::string& acrKernel, const std::string& acrName) {
    std::ifstream lFile(sCapture(acrKernel, acrName), std::ios::binary);
    ZTCBenchBytes lBytes((std::istreambuf_iterator<char>(lFile)), std::istreambuf_iterator<char>());
    if (lBytes.empty()) {
        throw std::runtime_error("cannot read " + sCapture(acrKernel, acrName));
    }
    return lBytes;
}

/// The second page of an overrun: full, and without the mark of a loss.
ZTCBenchBytes readCapturedPage(const std::string& acrKernel) {
    const ZTCBenchBytes lPages = readCapture(acrKernel, "tracing/pages/overrun.bin");
    if (lPages.size() < 2 * scPageBytes) {
        throw std::runtime_error("the captured overrun has no second page");
    }
    return {lPages.begin() + scPageBytes, lPages.begin() + 2 * scPageBytes};
}

ZTSBenchLayouts readCapturedLayouts(const std::string& acrKernel) {
    const auto lRead = [&acrKernel](const std::string& acrName) {
        const ZTCBenchBytes lBytes = readCapture(acrKernel, "tracing/events/" + acrName);
        return parseTraceFormat({reinterpret_cast<const char*>(lBytes.data()), lBytes.size()});
    };
    return {std::get<ZTSTracePageLayout>(makeTracePageLayout(lRead("header_page"))),
            std::get<ZTSScsiDoneLayout>(makeScsiDoneLayout(lRead("scsi/scsi_dispatch_cmd_done/format")))};
}

/// The captured messages in place of the socket's.
class ZTCBenchFcSource : public ZTCFcEventSource {
public:
    explicit ZTCBenchFcSource(ZTCBenchKernel& arKernel) : mrKernel(arKernel) {}

    int getDescriptor() const override { return mrKernel.mWake.get(); }
    ZTSLinuxReceived receive(std::span<std::uint8_t> aBuffer) override { return mrKernel.receive(aBuffer); }

private:
    ZTCBenchKernel& mrKernel;
};

ZTCBenchKernel::ZTCBenchKernel(std::string aKernel)
    : mKernel(std::move(aKernel)), mPage(readCapturedPage(mKernel)), mWake(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    char lName[] = "/tmp/tavik-bench-XXXXXX";
    if (::mkdtemp(lName) == nullptr || !mWake.isOpen()) {
        throw std::runtime_error("no directory for the benchmark's trees");
    }
    mDirectory = lName;
    std::filesystem::create_directories(mDirectory + "/instances");
}

ZTCBenchKernel::~ZTCBenchKernel() {
    std::filesystem::remove_all(mDirectory);
}

ZTSLinuxOptions ZTCBenchKernel::options() const {
    // No look at sysfs comes between, and no outcome waits for sense data.
    return {sCapture(mKernel, "sysfs-online"), {{mDirectory}, {}, {}, ZTPU_Never}, std::chrono::hours(1)};
}

std::unique_ptr<ZTCFcEventSource> ZTCBenchKernel::openFcEvents(ZTSFeedProblem& /*arProblem*/) {
    return std::make_unique<ZTCBenchFcSource>(*this);
}

/// What the kernel does when an instance is made.
int ZTCBenchKernel::make(const std::string& acrPath) {
    const std::string lEvent = acrPath + "/events/scsi/scsi_dispatch_cmd_done";
    const std::string lProcessor = acrPath + "/per_cpu/cpu0";
    std::filesystem::create_directories(lEvent);
    std::filesystem::create_directories(lProcessor);
    std::filesystem::copy_file(sCapture(mKernel, "tracing/events/header_page"), acrPath + "/events/header_page");
    std::filesystem::copy_file(sCapture(mKernel, "tracing/events/scsi/scsi_dispatch_cmd_done/format"),
                               lEvent + "/format");
    for (const std::string& lrName : {lEvent + "/filter", lEvent + "/enable", acrPath + "/buffer_size_kb",
                                      acrPath + "/buffer_percent", lProcessor + "/stats"}) {
        std::ofstream(lrName) << "";
    }
    const std::string lPipe = lProcessor + "/trace_pipe_raw";
    if (::mkfifo(lPipe.c_str(), 0600) != 0) {
        return errno;
    }
    mPipe = ZTCLibraryDescriptor(::open(lPipe.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
    // Without the right to more, the pipe holds fewer pages.
    static_cast<void>(::fcntl(mPipe.get(), F_SETPIPE_SZ, scPipeBytes));
    return 0;
}

int ZTCBenchKernel::remove(const std::string& acrPath) {
    std::filesystem::remove_all(acrPath);
    return 0;
}

void ZTCBenchKernel::hold() {
    std::unique_lock<std::mutex> lGuard(mLock);
    mIsToHold = true;
    const std::uint64_t lOne = 1;
    static_cast<void>(::write(mWake.get(), &lOne, sizeof lOne) == sizeof lOne);
    mChanged.wait(lGuard, [this] { return mIsHeld; });
}

void ZTCBenchKernel::release() {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mIsToHold = false;
    mChanged.notify_all();
}

std::size_t ZTCBenchKernel::fillTrace() {
    std::size_t lPages = 0;
    while (::write(mPipe.get(), mPage.data(), mPage.size()) == static_cast<ssize_t>(mPage.size())) {
        ++lPages;
    }
    return lPages;
}

void ZTCBenchKernel::addMessages(ZTCBenchBytes aMessage, std::size_t aCount) {
    const std::lock_guard<std::mutex> lGuard(mLock);
    mMessage = std::move(aMessage);
    mMessagesLeft = aCount;
}

ZTSLinuxReceived ZTCBenchKernel::receive(std::span<std::uint8_t> aBuffer) {
    std::unique_lock<std::mutex> lGuard(mLock);
    if (mIsToHold) {
        mIsHeld = true;
        mChanged.notify_all();
        mChanged.wait(lGuard, [this] { return !mIsToHold; });
        mIsHeld = false;
        // Something, and nothing of interest: a source that was said to be readable and has nothing is left alone.
        return {ZTLR_Datagram, 0};
    }
    if (mMessagesLeft == 0) {
        std::uint64_t lCount = 0;
        static_cast<void>(::read(mWake.get(), &lCount, sizeof lCount) == sizeof lCount);
        return {ZTLR_Empty, 0};
    }
    --mMessagesLeft;
    ++mLastNumber;
    std::memcpy(aBuffer.data(), mMessage.data(), mMessage.size());
    std::memcpy(aBuffer.data() + scNumberOffset, &mLastNumber, sizeof mLastNumber);
    return {ZTLR_Datagram, mMessage.size()};
}
