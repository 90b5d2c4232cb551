/// The probe for sense data in the library's trace instance: defined by the library and removed by it, or used as an
/// administrator has defined it. Nobody else's probes are touched.
#ifndef LIBKPM_LINUX_SRC_SENSEPROBE_H
#define LIBKPM_LINUX_SRC_SENSEPROBE_H

#include <cstdint>
#include <memory>
#include <string>
#include <variant>
#include <vector>

#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/SenseData.h"
#include "libkpm/linux/src/TraceFiles.h"

/// The group in which an administrator defines the probe for the library.
inline constexpr const char* gcPreparedSenseGroup = "libkpm_linux";

/// makeSenseProbe for the kernel that is described below this sysfs.
std::variant<std::string, ZTSTraceProblem> readSenseProbe(const std::string& acrSysfsRoot, const std::string& acrGroup,
                                                          const std::string& acrArgument);

/// One thread at a time.
class ZTCSenseProbe {
public:
    /// Finds or defines the probe and switches its event on in the instance. Null, with the reason in `arProblem`,
    /// where that cannot be done. `arFiles` outlives the probe, and the instance is removed before it.
    static std::unique_ptr<ZTCSenseProbe> open(const std::string& acrInstance, const std::string& acrSysfsRoot,
                                               ZTCTraceFiles& arFiles, ZTSFeedProblem& arProblem);

    /// Removes the definition, if the library has made it.
    ~ZTCSenseProbe();
    ZTCSenseProbe(const ZTCSenseProbe&) = delete;
    ZTCSenseProbe& operator=(const ZTCSenseProbe&) = delete;

    /// Passes commands of these hosts alone. Where the kernel refuses, all pass, and those of other hosts match
    /// nothing.
    void watchHosts(const std::vector<std::uint32_t>& acrHosts);

    /// Records nothing from now on. Allocates nothing.
    void switchOff() { mrFiles.write(mEnablePath, "0"); }

    const ZTSSenseLayout& getLayout() const { return mLayout; }

private:
    ZTCSenseProbe(const std::string& acrInstance, const std::string& acrGroup, ZTCTraceFiles& arFiles);

    bool define(const std::string& acrSysfsRoot, ZTSFeedProblem& arProblem);
    bool switchOn(ZTSFeedProblem& arProblem);

    const std::string mGroup;
    const std::string mDefinitions;  // the kernel's file of everybody's probes
    const std::string mRemoval;      // the line that removes this one
    const std::string mEventPath;
    const std::string mEnablePath;
    ZTCTraceFiles& mrFiles;
    bool mIsOwn = false;  // defined by the library, and removed by it
    ZTSSenseLayout mLayout;
};

/// Removes the probes that killed runs have left below this root of tracefs. Their instances are gone before.
void removeLeftOverProbes(const std::string& acrTracefsRoot, ZTCTraceFiles& arFiles);

#endif
