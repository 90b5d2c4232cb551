/// A trace instance that no other user of tracing shares: one event, finished SCSI commands, with a filter and small
/// buffers. The library makes it and removes it, or uses one that was prepared for it.
#ifndef LIBKPM_LINUX_SRC_TRACEINSTANCE_H
#define LIBKPM_LINUX_SRC_TRACEINSTANCE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/TraceFiles.h"
#include "libkpm/linux/src/TraceFormat.h"

enum ZTETraceRead : std::uint8_t { ZTTR_Page, ZTTR_Empty, ZTTR_Failed };

/// What a read of a buffer that gave nothing means: what it returned, and the error number where that is negative.
ZTETraceRead judgeEmptyTraceRead(std::int64_t aRead, int aError);

/// When sense data come by the probe.
enum ZTEProbeUse : std::uint8_t {
    ZTPU_Needed,  ///< where the trace has none
    ZTPU_Always,  ///< also where the trace has them
    ZTPU_Never
};

/// Where tracefs is, and what is used of it.
struct ZTSTracePlace {
    /// The first is used that has instances.
    std::vector<std::string> mRoots{"/sys/kernel/tracing", "/sys/kernel/debug/tracing"};
    /// The directory of an instance that was prepared for the library; empty: it makes its own.
    std::string mPrepared{};
    /// Where /sys is: the kernel describes its types there.
    std::string mSysfsRoot = "/sys";
    ZTEProbeUse mProbeUse = ZTPU_Needed;
};

enum ZTETraceFilter : std::uint8_t {
    ZTTF_Set,   ///< the event is on for these hosts, or off where there are none
    ZTTF_Kept,  ///< the kernel refused: the filter before is still in use
    ZTTF_Off    ///< the kernel refused: the event is off
};

/// Descriptors that the library leaves to the rest of the process.
inline constexpr std::size_t gcTraceDescriptorReserve = 64;

/// One thread at a time.
class ZTCTraceInstance {
public:
    /// Removes what killed runs have left, makes the instance or takes the prepared one, and opens its buffers; nothing
    /// is recorded yet. Null, with the reason in `arProblem`, where that cannot be done. `arFiles` outlives the
    /// instance.
    static std::unique_ptr<ZTCTraceInstance> open(const ZTSTracePlace& acrPlace, ZTCTraceFiles& arFiles,
                                                  ZTSFeedProblem& arProblem);

    /// Switches the event off, closes the buffers, and removes the instance if the library has made it.
    ~ZTCTraceInstance();
    ZTCTraceInstance(const ZTCTraceInstance&) = delete;
    ZTCTraceInstance& operator=(const ZTCTraceInstance&) = delete;

    /// Records finished commands of these hosts, which are in ascending order. Where that is not Set, `arProblem` has
    /// the reason.
    ZTETraceFilter watchHosts(const std::vector<std::uint32_t>& acrHosts, ZTSFeedProblem& arProblem);

    /// Records nothing from now on. What was recorded can still be read. Allocates nothing.
    void switchOff();

    const ZTSScsiDoneLayout& getRecordLayout() const { return mRecordLayout; }
    const ZTSTracePageLayout& getPageLayout() const { return mPageLayout; }

    /// Whether the buffers' descriptors are readable as soon as one record is there. Otherwise they are readable when
    /// the buffers are filled to some part.
    bool wakesAtOnce() const { return mWakesAtOnce; }

    std::size_t getBufferCount() const { return mBuffers.size(); }
    int getDescriptor(std::size_t aBuffer) const { return mBuffers.at(aBuffer).mPipe.get(); }

    /// Takes a page off a buffer, never waiting. `aPage` has room for a page.
    ZTETraceRead read(std::size_t aBuffer, std::span<std::uint8_t> aPage, std::size_t& arSize);

    /// Records that the buffer has lost since the last call; nothing where the kernel does not tell.
    std::optional<std::uint64_t> takeLosses(std::size_t aBuffer);

    const std::string& getPath() const { return mPath; }

private:
    struct Buffer {
        ZTCLibraryDescriptor mPipe;
        std::string mStatsPath;
        std::uint64_t mLosses = 0;
    };

    ZTCTraceInstance(std::string aPath, ZTCTraceFiles& arFiles);

    bool readLayouts(ZTSFeedProblem& arProblem);
    bool openBuffers(ZTSFeedProblem& arProblem);
    void setBufferSizes();

    const std::string mPath;
    const std::string mFilterPath;
    const std::string mEnablePath;
    bool mIsOwn = false;  // made by the library, and removed by it
    ZTCTraceFiles& mrFiles;
    ZTSScsiDoneLayout mRecordLayout;
    ZTSTracePageLayout mPageLayout;
    bool mWakesAtOnce = false;
    std::string mFilter;  // in use; empty: the event is off
    std::vector<Buffer> mBuffers;
};

#endif
