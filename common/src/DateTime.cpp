#include "common/include/DateTime.h"

#include "common/include/EncodableStream.h"
#include "common/include/NetworkOrder.h"

namespace {

/// The local fields of one second. Asking the time zone costs more than all the rest of a time stamp, and when events
/// come in numbers many of them fall into one second.
struct ZTSLocalSecond {
    bool mIsKnown = false;
    std::time_t mSecond = 0;
    std::tm mFields{};
};

constinit thread_local ZTSLocalSecond sLatest;

std::timespec sNow() noexcept {
    std::timespec lNow{};
    clock_gettime(CLOCK_REALTIME, &lNow);
    return lNow;
}

}  // namespace

ZTCDateTime::ZTCDateTime(const char* apSeparator) noexcept : ZTCDateTime(sNow(), apSeparator, nullptr) {
    const auto lSecond = static_cast<std::time_t>(mSecondsSinceEpoch);
    if (!sLatest.mIsKnown || sLatest.mSecond != lSecond) [[unlikely]] {
        sLatest.mIsKnown = nullptr != localtime_r(&lSecond, &sLatest.mFields);
        sLatest.mSecond = lSecond;
    }
    if (sLatest.mIsKnown) {
        setLocalFields(sLatest.mFields);
    }
}

ZTCDateTime::ZTCDateTime(const std::timespec& acrTime, const char* apSeparator) noexcept
    : ZTCDateTime(acrTime, apSeparator, nullptr) {
    std::tm lLocal{};
    if (nullptr != localtime_r(&acrTime.tv_sec, &lLocal)) {
        setLocalFields(lLocal);
    }
}

ZTCDateTime::ZTCDateTime(const std::timespec& acrTime, const char* apSeparator, std::nullptr_t) noexcept
    : mMilliSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000000)),
      mMicroSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000 % 1000)),
      mSecondsSinceEpoch(static_cast<std::uint64_t>(acrTime.tv_sec)) {
    if (nullptr != apSeparator && '\0' != apSeparator[0]) {
        mSeparator = apSeparator[0];
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
    apBytes = storeInNetworkOrder(apBytes, mYear);
    *apBytes++ = mMonth;
    *apBytes++ = mDay;
    *apBytes++ = mHour;
    *apBytes++ = mMinute;
    *apBytes++ = mSecond;
    *apBytes++ = static_cast<unsigned char>(mSeparator);
    apBytes = storeInNetworkOrder(apBytes, mMilliSeconds);
    apBytes = storeInNetworkOrder(apBytes, mMicroSeconds);
    return storeInNetworkOrder(apBytes, mSecondsSinceEpoch);
}
