/// The trace instance of finished SCSI commands: one event with a filter, in buffers that no other user of tracing
/// shares. The library makes the instance and removes it, or uses one that was prepared for it.
#ifndef LIBKPM_LINUX_SRC_TRACEINSTANCE_H
#define LIBKPM_LINUX_SRC_TRACEINSTANCE_H

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/TraceBuffers.h"
#include "libkpm/linux/src/TraceFiles.h"
#include "libkpm/linux/src/TraceFormat.h"

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

/// One thread at a time.
class ZTCTraceInstance {
public:
    /// Removes the instances and probes that killed runs have left, makes the instance or takes the prepared one, and
    /// opens its buffers. Nothing is recorded yet. Null, with the reason in `arProblem`, where that cannot be done.
    /// `arFiles` outlives the instance.
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
    /// Where the records come.
    ZTCTraceBuffers& getBuffers() { return *mpBuffers; }

private:
    ZTCTraceInstance(std::unique_ptr<ZTCTraceBuffers> apBuffers, ZTCTraceFiles& arFiles);

    bool readRecordLayout(ZTSFeedProblem& arProblem);

    const std::unique_ptr<ZTCTraceBuffers> mpBuffers;
    const std::string mFilterPath;
    const std::string mEnablePath;
    ZTCTraceFiles& mrFiles;
    ZTSScsiDoneLayout mRecordLayout;
    std::string mFilter;  // in use; empty: the event is off
};

#endif
