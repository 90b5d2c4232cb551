/// The probe for sense data: defined by the library and removed by it, or used as an administrator has defined it.
/// Nobody else's probes are touched.
///
/// Its records come in a trace instance of their own. In the instance of finished commands, a lost record could be of
/// either kind, and nobody could say how many commands were lost.
#ifndef LIBKPM_LINUX_SRC_SENSEPROBE_H
#define LIBKPM_LINUX_SRC_SENSEPROBE_H

#include <cstdint>
#include <memory>
#include <string>
#include <variant>
#include <vector>

#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/SenseData.h"
#include "libkpm/linux/src/TraceBuffers.h"
#include "libkpm/linux/src/TraceFiles.h"

/// The group in which an administrator defines the probe for the library.
inline constexpr const char* gcPreparedSenseGroup = "libkpm_linux";

/// makeSenseProbe for the kernel that is described below this sysfs.
std::variant<std::string, ZTSTraceProblem> readSenseProbe(const std::string& acrSysfsRoot, const std::string& acrGroup,
                                                          const std::string& acrArgument);

/// One thread at a time.
class ZTCSenseProbe {
public:
    /// Makes the instance, finds or defines the probe, and switches its event on. `acrOutcomes` is the instance of
    /// finished commands: the new one is beside it. Where that name with "-sense" behind it is there, it was prepared
    /// for this, and is used and stays. Null, with the reason in `arProblem`, where that cannot be done. `arFiles`
    /// outlives the probe.
    static std::unique_ptr<ZTCSenseProbe> open(const std::string& acrOutcomes, const std::string& acrSysfsRoot,
                                               ZTCTraceFiles& arFiles, ZTSFeedProblem& arProblem);

    /// Removes the instance and the definition, if the library has made them.
    ~ZTCSenseProbe();
    ZTCSenseProbe(const ZTCSenseProbe&) = delete;
    ZTCSenseProbe& operator=(const ZTCSenseProbe&) = delete;

    /// Passes commands of these hosts alone. Where the kernel refuses, all pass, and those of other hosts match
    /// nothing.
    void watchHosts(const std::vector<std::uint32_t>& acrHosts);

    /// Records nothing from now on. Allocates nothing.
    void switchOff() { mrFiles.write(mEnablePath, "0"); }

    const ZTSSenseLayout& getLayout() const { return mLayout; }

    /// Where the records come.
    ZTCTraceBuffers& getBuffers() { return *mpBuffers; }

private:
    ZTCSenseProbe(std::unique_ptr<ZTCTraceBuffers> apBuffers, const std::string& acrGroup, ZTCTraceFiles& arFiles);

    bool define(const std::string& acrSysfsRoot, ZTSFeedProblem& arProblem);
    bool switchOn(ZTSFeedProblem& arProblem);

    std::unique_ptr<ZTCTraceBuffers> mpBuffers;
    const std::string mGroup;
    const std::string mDefinitions;  // the kernel's file of everybody's probes
    const std::string mRemoval;      // the line that removes this one
    const std::string mEventPath;
    const std::string mEnablePath;
    ZTCTraceFiles& mrFiles;
    bool mIsOwn = false;  // defined by the library, and removed by it
    ZTSSenseLayout mLayout;
};

/// Removes the probes that killed runs have left in the tracefs that this directory of instances is of.
void removeLeftOverProbes(const std::string& acrInstances, ZTCTraceFiles& arFiles);

#endif
