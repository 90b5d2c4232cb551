#include "common/include/DateTime.h"

#include <cstring>
#include <type_traits>

#include "common/include/EncodableStream.h"
#include "common/include/NetworkOrder.h"

namespace {

/// The local fields of one second. Asking the time zone costs more than all the rest of a time stamp, and when events
/// come in numbers many of them fall into one second.
struct ZTSLocalSecond {
    bool mIsKnown = false;
    unsigned char mFields[7] = {};
    std::uint64_t mSecond = 0;
};

constinit thread_local ZTSLocalSecond sLatest;

std::timespec sNow() noexcept {
    std::timespec lNow{};
    clock_gettime(CLOCK_REALTIME, &lNow);
    return lNow;
}

}  // namespace

ZTCDateTime::ZTCDateTime(const char* apSeparator) noexcept : ZTCDateTime(sNow(), apSeparator, nullptr) {
    static_assert(offsetof(ZTCDateTime, mSeparator) == gcLocalSize && std::is_trivially_copyable_v<ZTCDateTime>);
    static_assert(sizeof sLatest.mFields == gcLocalSize);
    if (sLatest.mIsKnown && sLatest.mSecond == mSecondsSinceEpoch) [[likely]] {
        std::memcpy(static_cast<void*>(this), sLatest.mFields, gcLocalSize);
        return;
    }
    const auto lSecond = static_cast<std::time_t>(mSecondsSinceEpoch);
    std::tm lLocal{};
    sLatest.mIsKnown = localtime_r(&lSecond, &lLocal) != nullptr;
    if (sLatest.mIsKnown) {
        setLocalFields(lLocal);
        std::memcpy(sLatest.mFields, this, gcLocalSize);
        sLatest.mSecond = mSecondsSinceEpoch;
    }
}

ZTCDateTime::ZTCDateTime(const std::timespec& acrTime, const char* apSeparator) noexcept
    : ZTCDateTime(acrTime, apSeparator, nullptr) {
    std::tm lLocal{};
    if (localtime_r(&acrTime.tv_sec, &lLocal) != nullptr) {
        setLocalFields(lLocal);
    }
}

void ZTCDateTime::setLocalFields(const std::tm& acrLocal) noexcept {
    mYear = static_cast<std::uint16_t>(acrLocal.tm_year + 1900);
    mMonth = static_cast<std::uint8_t>(acrLocal.tm_mon + 1);
    mDay = static_cast<std::uint8_t>(acrLocal.tm_mday);
    mHour = static_cast<std::uint8_t>(acrLocal.tm_hour);
    mMinute = static_cast<std::uint8_t>(acrLocal.tm_min);
    mSecond = static_cast<std::uint8_t>(acrLocal.tm_sec);
}

void ZTCDateTime::encode(ZTCEncodableOutStream& arStream) const {
    store(arStream.extend(gcEncodedSize));
}

unsigned char* ZTCDateTime::store(unsigned char* apBytes) const noexcept {
    // From the month to the separator the fields lie as they do on the wire.
    std::memcpy(apBytes, this, gcLocalSize + 1);
    storeInNetworkOrder(apBytes, mYear);
    apBytes = storeInNetworkOrder(apBytes + gcLocalSize + 1, mMilliSeconds);
    apBytes = storeInNetworkOrder(apBytes, mMicroSeconds);
    return storeInNetworkOrder(apBytes, mSecondsSinceEpoch);
}
