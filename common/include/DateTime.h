/// A point in time, as records carry it.

#ifndef COMMON_INCLUDE_DATETIME_H
#define COMMON_INCLUDE_DATETIME_H

#include <cstddef>
#include <cstdint>
#include <ctime>

#include "common/include/Types.h"

class ZTCEncodableOutStream;

/// A local time of day to the microsecond, with the seconds since the epoch. A plain value: copying it and asking it
/// never allocates.
class ZTCDateTime {
public:
    /// The bytes that encode writes.
    static constexpr Size gcEncodedSize = 20;

    /// The current time. The separator is the first character of the text, "." where there is none.
    explicit ZTCDateTime(const char* apSeparator = ".") noexcept;

    /// A given time since the epoch.
    ZTCDateTime(const std::timespec& acrTime, const char* apSeparator) noexcept;

    std::uint16_t getYear() const noexcept { return mYear; }
    std::uint8_t getMonth() const noexcept { return mMonth; }    ///< 1 to 12
    std::uint8_t getDay() const noexcept { return mDay; }        ///< 1 to 31
    std::uint8_t getHour() const noexcept { return mHour; }      ///< 0 to 23
    std::uint8_t getMinute() const noexcept { return mMinute; }  ///< 0 to 59
    std::uint8_t getSecond() const noexcept { return mSecond; }  ///< 0 to 60
    char getSeparator() const noexcept { return mSeparator; }
    std::uint16_t getMilliSeconds() const noexcept { return mMilliSeconds; }  ///< 0 to 999
    std::uint16_t getMicroSeconds() const noexcept { return mMicroSeconds; }  ///< 0 to 999, below the millisecond
    std::uint64_t getSecondsSinceEpoch() const noexcept { return mSecondsSinceEpoch; }

    /// Writes the fields in the order of their declarations, 20 bytes. Failures are the stream's.
    void encode(ZTCEncodableOutStream& arStream) const;

    /// Stores the same 20 bytes; returns the address behind them.
    unsigned char* store(unsigned char* apBytes) const noexcept;

private:
    /// Everything but the local fields.
    ZTCDateTime(const std::timespec& acrTime, const char* apSeparator, std::nullptr_t) noexcept
        : mMilliSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000000)),
          mMicroSeconds(static_cast<std::uint16_t>(acrTime.tv_nsec / 1000 % 1000)),
          mSecondsSinceEpoch(static_cast<std::uint64_t>(acrTime.tv_sec)) {
        if (apSeparator != nullptr && apSeparator[0] != '\0') {
            mSeparator = apSeparator[0];
        }
    }
    void setLocalFields(const std::tm& acrLocal) noexcept;

    /// Bytes of the local fields, which come first and without gaps.
    static constexpr std::size_t gcLocalSize = 7;

    std::uint16_t mYear = 0;
    std::uint8_t mMonth = 0;
    std::uint8_t mDay = 0;
    std::uint8_t mHour = 0;
    std::uint8_t mMinute = 0;
    std::uint8_t mSecond = 0;
    char mSeparator = '.';
    std::uint16_t mMilliSeconds = 0;
    std::uint16_t mMicroSeconds = 0;
    std::uint64_t mSecondsSinceEpoch = 0;
};

#endif
