#include "tavik/include/Bell.h"

#include <charconv>
#include <cstring>

#include "common/include/Log.h"
#include "os/common/include/Clib.h"
#include "sensor/agentcommon/include/StatusPage.h"

namespace {

constexpr int scHighestStandardDescriptor = 2;

/// The text as a decimal number; -1 where it is not one, or more than one.
int sReadDescriptor(const char* apText) {
    ZT_ENTRY();
    int lDescriptor = -1;
    const char* lpEnd = apText + std::strlen(apText);
    const auto [lpRead, lError] = std::from_chars(apText, lpEnd, lDescriptor);
    ZT_EXIT();
    return lError == std::errc() && lpRead == lpEnd ? lDescriptor : -1;
}

}  // namespace

void ZTCBell::open(const char* apText) {
    ZT_ENTRY();
    const int lDescriptor = sReadDescriptor(apText);
    const char* lpWrong =
        lDescriptor <= scHighestStandardDescriptor ? "it is no number above 2" : ClibAdoptEventFd(lDescriptor);
    if (lpWrong != nullptr) {
        ZT_LOG_WARN("The sensor is not rung for: %s='%s' cannot be used, %s", gcBellVariable, apText, lpWrong);
    } else {
        mDescriptor = lDescriptor;
    }
    ZT_EXIT();
}

void ZTCBell::ringForRefusal(std::uint64_t aRetrievals) noexcept {
    ZT_ENTRY();
    std::uint64_t lRung = mRefusalRung.load(std::memory_order_relaxed);
    if (mDescriptor >= 0 && lRung <= aRetrievals &&
        mRefusalRung.compare_exchange_strong(lRung, aRetrievals + 1, std::memory_order_relaxed)) {
        ClibRaiseEvent(mDescriptor);
    }
    ZT_EXIT();
}

void ZTCBell::ringDue() noexcept {
    ZT_ENTRY();
    if (mIsDue.exchange(false, std::memory_order_relaxed)) {
        ClibRaiseEvent(mDescriptor);
    }
    ZT_EXIT();
}
