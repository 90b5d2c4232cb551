#include "common/include/DateTime.h"

#include "common/include/EncodableStream.h"

static std::timespec sNow() noexcept {
    std::timespec lNow{};
    clock_gettime(CLOCK_REALTIME, &lNow);
    return lNow;
}

ZTCDateTime::ZTCDateTime(const char* apSeparator) noexcept : ZTCDateTime(sNow(), apSeparator) {}

ZTCDateTime::ZTCDateTime(const std::timespec& acrTime, const char* apSeparator) noexcept
    : mMilliSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000000)),
      mMicroSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000 % 1000)),
      mSecondsSinceEpoch(static_cast<std::uint64_t>(acrTime.tv_sec)) {
    if (nullptr != apSeparator && '\0' != apSeparator[0]) {
        mSeparator = apSeparator[0];
    }
    std::tm lLocal{};
    if (nullptr != localtime_r(&acrTime.tv_sec, &lLocal)) {
        mYear = static_cast<std::uint16_t>(lLocal.tm_year + 1900);
        mMonth = static_cast<std::uint8_t>(lLocal.tm_mon + 1);
        mDay = static_cast<std::uint8_t>(lLocal.tm_mday);
        mHour = static_cast<std::uint8_t>(lLocal.tm_hour);
        mMinute = static_cast<std::uint8_t>(lLocal.tm_min);
        mSecond = static_cast<std::uint8_t>(lLocal.tm_sec);
    }
}

void ZTCDateTime::encode(ZTCEncodableOutStream& arStream) const {
    // One write, so that a failure leaves no part of the time behind.
    unsigned char lBytes[gcEncodedSize];
    Size lUsed = 0;
    const auto lAdd = [&lBytes, &lUsed](std::uint64_t aValue, Size aWidth) noexcept {
        for (Size i = 0; i < aWidth; ++i) {
            lBytes[lUsed++] = static_cast<unsigned char>(aValue >> (8 * (aWidth - 1 - i)));
        }
    };
    lAdd(mYear, 2);
    lAdd(mMonth, 1);
    lAdd(mDay, 1);
    lAdd(mHour, 1);
    lAdd(mMinute, 1);
    lAdd(mSecond, 1);
    lAdd(static_cast<unsigned char>(mSeparator), 1);
    lAdd(mMilliSeconds, 2);
    lAdd(mMicroSeconds, 2);
    lAdd(mSecondsSinceEpoch, 8);
    arStream.writeBytes(lBytes, lUsed);
}
