// The kernel's library, fed with what two kernels gave (tests/vm/captures): from the bytes to its callbacks.
//
// | benchmark              | workload                                                                                |
// |------------------------|-----------------------------------------------------------------------------------------|
// | PageParsed/<kernel>    | a captured page full of failed commands: walked, each record taken apart by the layout  |
// |                        | that the kernel's own description gives; nanoseconds an outcome                         |
// | PageOverlay/<kernel>   | floor: the same page walked by a loop that has the layout built in: each record through |
// |                        | a structure                                                                             |
// | PageCopied             | floor: the page copied, by the outcomes in it                                           |
// | PageDelivered/<kernel> | a pipe full of such pages, read by the library's thread: page, outcome, board, name of  |
// |                        | the remote port, callback; from the first callback to the last, nanoseconds an outcome  |
// | PipeOverlay/<kernel>   | peer: the same pipe read by a loop as in PageOverlay, with a call for each outcome      |
// | MessageParsed          | a captured message with an RSCN: taken apart and made an RSCN as on the wire            |
// | MessageDelivered       | such messages through the library's thread, without a socket: event, count of numbers,  |
// |                        | board, callback; nanoseconds a message                                                  |
// | DatagramReceived       | peer: a message of that size received from a socket of this machine, and no more        |

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstring>
#include <stdexcept>

#include "bench/support/BenchKernel.h"
#include "libkpm/linux/src/FcMessage.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "libkpm/linux/src/TracePage.h"

namespace {

constexpr const char* scKernels[] = {"6.1", "6.12"};
constexpr std::size_t scMessages = 16384;
constexpr std::uint32_t scScsiCategory = 4;
constexpr std::uint32_t gcCheckCondition = 4;

// ---- A page and a message as those know them who have the layout built in ----

struct ZTSDoneRecord {
    std::uint16_t mType;
    std::uint16_t mFlags;
    std::uint32_t mPid;
    std::uint32_t mHost;
    std::uint32_t mChannel;
    std::uint32_t mTarget;
    std::uint32_t mLun;
    std::uint32_t mResult;
    std::uint32_t mOpcode;
    std::uint32_t mOthers[7];
    std::uint8_t mSenseKey;
    std::uint8_t mAsc;
    std::uint8_t mAscq;
};

/// Calls with each outcome of a page: LUN, operation code, sense data. Records with a length word there are none.
template <class Call>
std::size_t sWalkOverlay(const std::uint8_t* apPage, bool aHasSense, Call aCall) {
    std::uint64_t lCommit = 0;
    std::memcpy(&lCommit, apPage + 8, sizeof lCommit);
    std::size_t lCount = 0;
    const std::uint8_t* lpEnd = apPage + 16 + (lCommit & 0x7FFFFFF);
    for (const std::uint8_t* lpPlace = apPage + 16; lpPlace < lpEnd;) {
        std::uint32_t lHeader = 0;
        std::memcpy(&lHeader, lpPlace, sizeof lHeader);
        lpPlace += sizeof lHeader;
        const std::uint32_t lWords = lHeader & 31;
        if (lWords >= 29) {
            lpPlace += sizeof lHeader;
            continue;
        }
        ZTSDoneRecord lRecord;
        std::memcpy(&lRecord, lpPlace, sizeof lRecord);
        lpPlace += lWords * 4;
        zt_scsi_checkcondition_v0 lData{};
        lData.zt_checkcondition_lun = lRecord.mLun;
        lData.zt_checkcondition_cmdcode = lRecord.mOpcode;
        lData.zt_checkcondition_senskey = aHasSense ? lRecord.mSenseKey : gcUnknownSense;
        lData.zt_checkcondition_asc = aHasSense ? lRecord.mAsc : gcUnknownSense;
        lData.zt_checkcondition_ascq = aHasSense ? lRecord.mAscq : gcUnknownSense;
        aCall(lRecord.mHost, lData);
        ++lCount;
    }
    return lCount;
}

std::size_t sCountOutcomes(const std::string& acrKernel) {
    return sWalkOverlay(readCapturedPage(acrKernel).data(), true, [](auto&&...) {});
}

void sRequire(bool aCondition, const char* apWhat) {
    if (!aCondition) {
        throw std::runtime_error(apWhat);
    }
}

void sSetTime(benchmark::State& arState, double aSeconds, std::size_t aEvents) {
    arState.counters["ns_per_event"] = aSeconds * 1e9 / static_cast<double>(aEvents);
}

/// Counts what a loop of iterations took by the processor's clock of this thread.
class ZTCThreadClock {
public:
    double seconds() const { return sNow() - mBegin; }

private:
    static double sNow() {
        timespec lNow{};
        clock_gettime(CLOCK_THREAD_CPUTIME_ID, &lNow);
        return static_cast<double>(lNow.tv_sec) + static_cast<double>(lNow.tv_nsec) * 1e-9;
    }

    double mBegin = sNow();
};

// ---- Parsing alone ----

void sPageParsed(benchmark::State& arState, const char* apKernel) {
    const ZTCBenchBytes lBytes = readCapturedPage(apKernel);
    const ZTSBenchLayouts lLayouts = readCapturedLayouts(apKernel);
    std::size_t lEvents = 0;
    const ZTCThreadClock lClock;
    for (auto lUnused : arState) {
        ZTCTracePage lPage(lBytes, lLayouts.mPage);
        while (const auto lRecord = lPage.next()) {
            if (getTraceRecordId(*lRecord, lLayouts.mDone) == lLayouts.mDone.mId) {
                const auto lOutcome = parseScsiOutcome(*lRecord, lLayouts.mDone);
                benchmark::DoNotOptimize(lOutcome);
                ++lEvents;
            }
        }
    }
    sSetTime(arState, lClock.seconds(), lEvents);
}

void sPageOverlay(benchmark::State& arState, const char* apKernel) {
    const ZTCBenchBytes lBytes = readCapturedPage(apKernel);
    const bool lHasSense = readCapturedLayouts(apKernel).mDone.hasSense();
    std::size_t lEvents = 0;
    const ZTCThreadClock lClock;
    for (auto lUnused : arState) {
        lEvents += sWalkOverlay(lBytes.data(), lHasSense, [](std::uint32_t aHost, const auto& acrData) {
            benchmark::DoNotOptimize(aHost);
            benchmark::DoNotOptimize(acrData);
        });
    }
    sSetTime(arState, lClock.seconds(), lEvents);
}

void sPageCopied(benchmark::State& arState) {
    const ZTCBenchBytes lBytes = readCapturedPage("6.12");
    const std::size_t lInPage = sCountOutcomes("6.12");
    ZTCBenchBytes lCopy(lBytes.size());
    std::size_t lEvents = 0;
    const ZTCThreadClock lClock;
    for (auto lUnused : arState) {
        std::memcpy(lCopy.data(), lBytes.data(), lBytes.size());
        benchmark::ClobberMemory();
        lEvents += lInPage;
    }
    sSetTime(arState, lClock.seconds(), lEvents);
}

void sMessageParsed(benchmark::State& arState) {
    const ZTCBenchBytes lBytes = readCapture("6.12", "netlink/post-rscn-port.bin");
    std::size_t lEvents = 0;
    const ZTCThreadClock lClock;
    for (auto lUnused : arState) {
        ZTCLinuxFcMessages lMessages(lBytes);
        while (const auto lEvent = lMessages.next()) {
            const auto lPayload = makeLinuxRscn(lEvent->mData);
            benchmark::DoNotOptimize(lPayload);
            ++lEvents;
        }
    }
    sSetTime(arState, lClock.seconds(), lEvents);
}

/// Received from a socket pair, as many at a time as it holds.
void sDatagramReceived(benchmark::State& arState) {
    const ZTCBenchBytes lBytes = readCapture("6.12", "netlink/post-rscn-port.bin");
    std::array<int, 2> lEnds{};
    sRequire(::socketpair(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0, lEnds.data()) == 0, "no sockets");
    ZTCBenchBytes lBuffer(gcMostFcMessageBytes);
    double lSeconds = 0;
    std::size_t lEvents = 0;
    for (auto lUnused : arState) {
        while (::send(lEnds[1], lBytes.data(), lBytes.size(), 0) > 0) {
        }
        const ZTCThreadClock lClock;
        while (::recv(lEnds[0], lBuffer.data(), lBuffer.size(), 0) > 0) {
            ++lEvents;
        }
        const double lTime = lClock.seconds();
        arState.SetIterationTime(lTime);
        lSeconds += lTime;
    }
    ::close(lEnds[0]);
    ::close(lEnds[1]);
    sSetTime(arState, lSeconds, lEvents);
}

// ---- Through the library's thread ----

/// What the callbacks have seen; one iteration's expectation is set while the library's thread is held.
class ZTCDeliveries {
public:
    using Clock = std::chrono::steady_clock;

    void expect(std::size_t aCount) {
        mLeft = aCount;
        mIsFirst = true;
        mIsDone.store(false);
    }

    void note() {
        if (mIsFirst) {
            mIsFirst = false;
            mBegin = Clock::now();
        }
        if (--mLeft == 0) {
            mEnd = Clock::now();
            mIsDone.store(true);
            mIsDone.notify_one();
        }
    }

    /// Seconds from the first to the last.
    double wait() {
        mIsDone.wait(false);
        return std::chrono::duration<double>(mEnd - mBegin).count();
    }

private:
    std::size_t mLeft = 0;
    bool mIsFirst = true;
    Clock::time_point mBegin;
    Clock::time_point mEnd;
    std::atomic<bool> mIsDone{false};
};

ZTCDeliveries gDeliveries;

void sScopeCallback(unsigned /*aBoard*/, HBA_wwn /*aPort*/, unsigned /*aCategory*/, unsigned /*aSubcategory*/,
                    void* /*apContext*/, ZT_event* apEvent) {
    benchmark::DoNotOptimize(apEvent);
    gDeliveries.note();
}

void sRscnCallback(unsigned /*aBoard*/, void* apPayload, unsigned /*aLength*/) {
    benchmark::DoNotOptimize(apPayload);
    gDeliveries.note();
}

/// Has the engine deliver what aFill puts into its sources while they are held, again and again. aFill returns how many
/// events that makes.
template <typename Fill>
void sMeasureDeliveries(benchmark::State& arState, ZTCBenchKernel& arKernel, Fill aFill) {
    double lSeconds = 0;
    std::size_t lEvents = 0;
    for (auto lUnused : arState) {
        arKernel.hold();
        const std::size_t lCount = aFill();
        gDeliveries.expect(lCount);
        arKernel.release();
        const double lTime = gDeliveries.wait();
        arState.SetIterationTime(lTime);
        lSeconds += lTime;
        lEvents += lCount;
    }
    sSetTime(arState, lSeconds, lEvents);
}

void sPageDelivered(benchmark::State& arState, const char* apKernel) {
    ZTCBenchKernel lKernel(apKernel);
    ZTCLinuxEngine lEngine(lKernel.options(), lKernel);
    lEngine.start();
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    std::uint32_t lHandle = 0;
    sRequire(lEngine.getAdapterInfo(0, &lNode, &lPort) == ZTLST_Success, "the captured hosts are no boards");
    sRequire(lEngine.registerForPort(0, lPort, scScsiCategory, gcCheckCondition, nullptr, &lHandle, sScopeCallback) ==
                 ZTLST_Success,
             "check conditions have no source");
    const std::size_t lInPage = sCountOutcomes(apKernel);
    sMeasureDeliveries(arState, lKernel, [&] { return lKernel.fillTrace() * lInPage; });
    lEngine.stop();
}

void sPipeOverlay(benchmark::State& arState, const char* apKernel) {
    const ZTCBenchBytes lPage = readCapturedPage(apKernel);
    const bool lHasSense = readCapturedLayouts(apKernel).mDone.hasSense();
    const HBA_wwn lPort{};
    std::array<int, 2> lEnds{};
    sRequire(::pipe2(lEnds.data(), O_NONBLOCK | O_CLOEXEC) == 0, "no pipe");
    static_cast<void>(::fcntl(lEnds[0], F_SETPIPE_SZ, 1024 * 1024));
    const std::size_t lInPage = sCountOutcomes(apKernel);
    ZTCBenchBytes lBuffer(lPage.size());
    double lSeconds = 0;
    std::size_t lEvents = 0;
    for (auto lUnused : arState) {
        std::size_t lPages = 0;
        while (::write(lEnds[1], lPage.data(), lPage.size()) == static_cast<ssize_t>(lPage.size())) {
            ++lPages;
        }
        gDeliveries.expect(lPages * lInPage);
        while (::read(lEnds[0], lBuffer.data(), lBuffer.size()) > 0) {
            sWalkOverlay(lBuffer.data(), lHasSense, [&](std::uint32_t aHost, zt_scsi_checkcondition_v0& arData) {
                ZT_event_payload lPayload{0, &arData};
                ZT_event lEvent{ZT_EVENT_VERSION, ZT_EVENT_HEADER_SIZE + sizeof arData, &lPayload};
                KPM_ScopeCallback lpCallback = sScopeCallback;
                benchmark::DoNotOptimize(lpCallback);
                lpCallback(aHost, lPort, scScsiCategory, gcCheckCondition, nullptr, &lEvent);
            });
        }
        const double lTime = gDeliveries.wait();
        arState.SetIterationTime(lTime);
        lSeconds += lTime;
        lEvents += lPages * lInPage;
    }
    ::close(lEnds[0]);
    ::close(lEnds[1]);
    sSetTime(arState, lSeconds, lEvents);
}

void sMessageDelivered(benchmark::State& arState) {
    ZTCBenchKernel lKernel("6.12");
    ZTCLinuxEngine lEngine(lKernel.options(), lKernel);
    lEngine.start();
    const auto lpGeneric = reinterpret_cast<KPM_EventCallback>(reinterpret_cast<void (*)()>(sRscnCallback));
    sRequire(lEngine.registerForBoard(0, FC_REG_RSCN_EVENT, nullptr, lpGeneric) != 0, "RSCNs have no source");
    const ZTCBenchBytes lMessage = readCapture("6.12", "netlink/post-rscn-port.bin");
    sMeasureDeliveries(arState, lKernel, [&] {
        lKernel.addMessages(lMessage, scMessages);
        return std::size_t{scMessages};
    });
    lEngine.stop();
}

}  // namespace

int main(int aArgc, char** appArgv) {
    for (const char* lpKernel : scKernels) {
        const auto lName = [lpKernel](const char* apBenchmark) { return std::string(apBenchmark) + "/" + lpKernel; };
        benchmark::RegisterBenchmark(lName("PageParsed").c_str(), sPageParsed, lpKernel);
        benchmark::RegisterBenchmark(lName("PageOverlay").c_str(), sPageOverlay, lpKernel);
        benchmark::RegisterBenchmark(lName("PageDelivered").c_str(), sPageDelivered, lpKernel)->UseManualTime();
        benchmark::RegisterBenchmark(lName("PipeOverlay").c_str(), sPipeOverlay, lpKernel)->UseManualTime();
    }
    benchmark::RegisterBenchmark("PageCopied", sPageCopied);
    benchmark::RegisterBenchmark("MessageParsed", sMessageParsed);
    benchmark::RegisterBenchmark("DatagramReceived", sDatagramReceived)->UseManualTime();
    benchmark::RegisterBenchmark("MessageDelivered", sMessageDelivered)->UseManualTime();
    benchmark::Initialize(&aArgc, appArgv);
    if (benchmark::ReportUnrecognizedArguments(aArgc, appArgv)) {
        return 1;
    }
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
