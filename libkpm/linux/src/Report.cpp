#include "libkpm/linux/src/Report.h"

#include <atomic>

static std::atomic<KPM_LogFunction> spLog{nullptr};

void setLinuxLog(KPM_LogFunction apLog) noexcept {
    // Release, with the acquire below: who logs through the function sees what its owner made before.
    spLog.store(apLog, std::memory_order_release);
}

void logLinuxLine(std::uint32_t aLevel, const std::string& acrText) noexcept {
    if (const KPM_LogFunction lpLog = spLog.load(std::memory_order_acquire); lpLog != nullptr) {
        lpLog(aLevel, acrText.c_str());
    }
}
