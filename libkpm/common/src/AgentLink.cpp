#include "libkpm/common/include/AgentLink.h"

#include <atomic>

// Stored with release and loaded with acquire: a thread that calls the function sees what its owner made before.
static std::atomic<KPM_LogFunction> spLog{nullptr};
static std::atomic<void*> spContext{nullptr};
static std::atomic<KPM_StateFunction> spState{nullptr};
static std::atomic<KPM_LossFunction> spLoss{nullptr};

void setLibraryLog(KPM_LogFunction apLog) noexcept {
    spLog.store(apLog, std::memory_order_release);
}

void logLibraryLine(std::uint32_t aLevel, const std::string& acrText) noexcept {
    if (const KPM_LogFunction lpLog = spLog.load(std::memory_order_acquire); lpLog != nullptr) {
        lpLog(aLevel, acrText.c_str());
    }
}

void setLibraryReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) noexcept {
    spContext.store(apContext, std::memory_order_relaxed);
    spState.store(apState, std::memory_order_release);
    spLoss.store(apLoss, std::memory_order_release);
}

void reportLibraryState(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory, std::uint32_t aState,
                        const std::string& acrReason) noexcept {
    if (const KPM_StateFunction lpState = spState.load(std::memory_order_acquire); lpState != nullptr) {
        lpState(spContext.load(std::memory_order_relaxed), aBoard, aCategory, aSubcategory, aState, acrReason.c_str());
    }
}

void reportLibraryLoss(const char* apName, std::uint64_t aTotal) noexcept {
    if (const KPM_LossFunction lpLoss = spLoss.load(std::memory_order_acquire); lpLoss != nullptr) {
        lpLoss(spContext.load(std::memory_order_relaxed), apName, aTotal);
    }
}
