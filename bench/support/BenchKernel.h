/// What two kernels said (tests/vm/captures), as the kernel's library finds it: a tree for sysfs, a tracefs whose
/// buffer is a pipe with captured pages, and captured FC messages in place of the socket's.
#ifndef BENCH_SUPPORT_BENCHKERNEL_H
#define BENCH_SUPPORT_BENCHKERNEL_H

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "libkpm/linux/src/Engine.h"
#include "libkpm/linux/src/TraceFormat.h"

using ZTCBenchBytes = std::vector<std::uint8_t>;

/// A file below the captures of a kernel ("6.1", "6.12"). Throws std::runtime_error where there is none.
ZTCBenchBytes readCapture(const std::string& acrKernel, const std::string& acrName);

/// A page that is full of failed commands, one after the other.
ZTCBenchBytes readCapturedPage(const std::string& acrKernel);

struct ZTSBenchLayouts {
    ZTSTracePageLayout mPage;
    ZTSScsiDoneLayout mDone;
};
ZTSBenchLayouts readCapturedLayouts(const std::string& acrKernel);

class ZTCBenchKernel : public ZTCLinuxSources {
public:
    explicit ZTCBenchKernel(std::string aKernel);
    ~ZTCBenchKernel() override;
    ZTCBenchKernel(const ZTCBenchKernel&) = delete;
    ZTCBenchKernel& operator=(const ZTCBenchKernel&) = delete;

    ZTSLinuxOptions options() const;

    /// Has the library's thread wait until release().
    void hold();
    void release();

    /// While the thread is held: fills the trace buffer with the captured page; how many times.
    std::size_t fillTrace();

    /// While the thread is held: so many messages of this bytes come, with numbers of their own, once it is released.
    void addMessages(ZTCBenchBytes aMessage, std::size_t aCount);

    std::unique_ptr<ZTCFcEventSource> openFcEvents(ZTSFeedProblem& arProblem) override;
    int make(const std::string& acrPath) override;
    int remove(const std::string& acrPath) override;

private:
    friend class ZTCBenchFcSource;

    ZTSLinuxReceived receive(std::span<std::uint8_t> aBuffer);

    const std::string mKernel;
    const ZTCBenchBytes mPage;
    std::string mDirectory;
    ZTCLibraryDescriptor mPipe;
    ZTCLibraryDescriptor mWake;

    std::mutex mLock;
    std::condition_variable mChanged;
    bool mIsToHold = false;
    bool mIsHeld = false;
    ZTCBenchBytes mMessage;
    std::size_t mMessagesLeft = 0;
    std::uint32_t mLastNumber = 0;
};

#endif
