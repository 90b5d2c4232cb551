#include "libkpm/sim/src/Control.h"

#include <array>
#include <exception>
#include <variant>

#include "libkpm/sim/src/Engine.h"

static std::string sStatusText(const ZTSSimStatus& acrStatus) {
    static constexpr std::array<const char*, 3> scSchedules{"waiting", "running", "done"};
    return "ok delivered=" + std::to_string(acrStatus.mDelivered) + " dropped=" + std::to_string(acrStatus.mDropped) +
           " pages=" + std::to_string(acrStatus.mPages) + " registered=" + std::to_string(acrStatus.mRegistered) +
           " adapters=" + std::to_string(acrStatus.mAdapters) + " schedule=" + scSchedules.at(acrStatus.mSchedule);
}

static std::string sCountsText(const ZTSSimStatus& acrStatus) {
    std::string lText = "ok";
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        lText += std::string(" ") + getSimKind(lKind).mpName + "=" + std::to_string(acrStatus.mDeliveredByKind[lKind]);
    }
    return lText;
}

std::string answerSimLine(ZTCSimEngine& arEngine, std::string_view aLine) {
    if (aLine == "status") {
        return sStatusText(arEngine.getStatus());
    }
    if (aLine == "counts") {
        return sCountsText(arEngine.getStatus());
    }
    try {
        const ZTSSimEventLine lLine = parseSimEventLine(aLine, arEngine.getScenario());
        if (std::visit([](const auto& acrLine) { return acrLine.mIsTimed; }, lLine)) {
            return "error: at=, every= and over= are for scenarios: an injected line is delivered at once";
        }
        return "ok " + std::to_string(arEngine.inject(lLine));
    } catch (const std::exception& lrException) {
        return std::string("error: ") + lrException.what();
    }
}
