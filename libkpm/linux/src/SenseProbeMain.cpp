// kpm-sense-probe: prints the line that defines the probe for sense data on this kernel, for root to append to
// kprobe_events, so that an agent of an ordinary user can use the probe. Prints nothing where the kernel's trace has
// sense data of its own. With "remove", prints the line that removes the probe.
//
// Status 0: printed, or not needed. 1: this kernel lacks what the probe needs; standard error says what. 2: usage.
#include <cstdio>
#include <cstring>
#include <string>
#include <variant>

#include "libkpm/linux/src/SenseProbe.h"
#include "libkpm/linux/src/Sysfs.h"

int main(int aArgc, char** appArgv) {
    const bool lIsRemoval = aArgc == 2 && std::strcmp(appArgv[1], "remove") == 0;
    if (aArgc > 1 && !lIsRemoval) {
        std::fprintf(stderr, "usage: kpm-sense-probe [remove]\n");
        return 2;
    }
    if (lIsRemoval) {
        std::printf("-:%s/%s\n", gcPreparedSenseGroup, gcSenseEvent);
        return 0;
    }
    const std::string lFormat =
        readSmallFile("/sys/kernel/tracing/events/scsi/scsi_dispatch_cmd_done/format", gcMostTraceDescription)
            .value_or("");
    const auto lDone = makeScsiDoneLayout(parseTraceFormat(lFormat));
    const auto* lpDone = std::get_if<ZTSScsiDoneLayout>(&lDone);
    if (lpDone != nullptr && lpDone->hasSense()) {
        return 0;
    }
    const std::variant<std::string, ZTSTraceProblem> lLine = readSenseProbe("/sys", gcPreparedSenseGroup, "$arg1");
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lLine)) {
        std::fprintf(stderr, "kpm-sense-probe: %s\n", lpProblem->mText.c_str());
        return 1;
    }
    std::printf("%s\n", std::get<std::string>(lLine).c_str());
    return 0;
}
