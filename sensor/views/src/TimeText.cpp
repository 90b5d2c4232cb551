#include "sensor/views/include/TimeText.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>

using std::chrono::microseconds;
using std::chrono::seconds;

/// Whole seconds of the time, rounded down, and the microseconds above them.
static std::pair<std::time_t, long> sSplit(ZTCHistoryTime aTime) {
    const auto lSeconds = std::chrono::floor<seconds>(aTime);
    return {static_cast<std::time_t>(lSeconds.time_since_epoch().count()),
            static_cast<long>((aTime - lSeconds).count())};
}

static std::tm sLocal(ZTCHistoryTime aTime) {
    const std::time_t lSeconds = sSplit(aTime).first;
    std::tm lLocal{};
    localtime_r(&lSeconds, &lLocal);
    return lLocal;
}

static std::string sFormat(const std::tm& acrLocal, const char* apFormat) {
    std::array<char, 64> lText{};
    return {lText.data(), std::strftime(lText.data(), lText.size(), apFormat, &acrLocal)};
}

std::string toRfc3339(ZTCHistoryTime aTime) {
    const std::tm lLocal = sLocal(aTime);
    const long lMinutes = lLocal.tm_gmtoff / 60;
    std::array<char, 32> lRest{};
    std::snprintf(lRest.data(), lRest.size(), ".%06ld%c%02ld:%02ld", sSplit(aTime).second, lMinutes < 0 ? '-' : '+',
                  std::labs(lMinutes) / 60, std::labs(lMinutes) % 60);
    return sFormat(lLocal, "%Y-%m-%dT%H:%M:%S") + lRest.data();
}

/// Takes a text apart from its front; once something is missing, all that follows is too.
class ZTCTimeScanner {
public:
    explicit ZTCTimeScanner(std::string_view aText) : mRest(aText) {}

    bool isGood() const { return mIsGood; }
    bool isAtEnd() const { return mRest.empty(); }
    char peek() const { return mRest.empty() ? '\0' : mRest.front(); }

    /// Exactly so many digits, as a number from `aLeast` to `aMost`.
    int number(std::size_t aDigits, int aLeast, int aMost) {
        int lNumber = 0;
        for (std::size_t i = 0; i < aDigits; ++i) {
            if (mRest.empty() || mRest.front() < '0' || mRest.front() > '9') {
                mIsGood = false;
                return 0;
            }
            lNumber = 10 * lNumber + (mRest.front() - '0');
            mRest.remove_prefix(1);
        }
        mIsGood = mIsGood && lNumber >= aLeast && lNumber <= aMost;
        return lNumber;
    }
    /// One of these characters.
    void sign(std::string_view aSigns) {
        mIsGood = mIsGood && !mRest.empty() && aSigns.find(mRest.front()) != std::string_view::npos;
        if (mIsGood) {
            mRest.remove_prefix(1);
        }
    }
    /// ".", then one to nine digits.
    microseconds fraction() {
        sign(".");
        long lMicroseconds = 0;
        int lDigits = 0;
        for (; peek() >= '0' && peek() <= '9'; ++lDigits) {
            lMicroseconds = lDigits < 6 ? 10 * lMicroseconds + (peek() - '0') : lMicroseconds;
            mRest.remove_prefix(1);
        }
        mIsGood = mIsGood && lDigits >= 1 && lDigits <= 9;
        for (int i = lDigits; i < 6; ++i) {
            lMicroseconds *= 10;
        }
        return microseconds(lMicroseconds);
    }
    void date(std::tm& arTime) {
        arTime.tm_year = number(4, 1970, 9999) - 1900;
        sign("-");
        arTime.tm_mon = number(2, 1, 12) - 1;
        sign("-");
        arTime.tm_mday = number(2, 1, 31);
    }
    /// "10:04" or "10:04:12".
    void clock(std::tm& arTime, bool aNeedsSeconds) {
        arTime.tm_hour = number(2, 0, 23);
        sign(":");
        arTime.tm_min = number(2, 0, 59);
        if (aNeedsSeconds || peek() == ':') {
            sign(":");
            arTime.tm_sec = number(2, 0, 60);
        }
    }

private:
    std::string_view mRest;
    bool mIsGood = true;
};

static bool sIsDate(const std::tm& acrTime) {
    const std::chrono::year_month_day lDate{std::chrono::year(acrTime.tm_year + 1900),
                                            std::chrono::month(static_cast<unsigned>(acrTime.tm_mon + 1)),
                                            std::chrono::day(static_cast<unsigned>(acrTime.tm_mday))};
    return lDate.ok();
}

static ZTCHistoryTime sFromSeconds(std::time_t aSeconds) {
    return ZTCHistoryTime(seconds(aSeconds));
}

std::optional<ZTCHistoryTime> fromRfc3339(std::string_view aText) {
    ZTCTimeScanner lScanner(aText);
    std::tm lTime{};
    lScanner.date(lTime);
    lScanner.sign("Tt ");
    lScanner.clock(lTime, true);
    const microseconds lFraction = lScanner.peek() == '.' ? lScanner.fraction() : microseconds(0);
    int lOffset = 0;
    if (lScanner.peek() == 'Z' || lScanner.peek() == 'z') {
        lScanner.sign("Zz");
    } else {
        const int lSign = lScanner.peek() == '-' ? -1 : 1;
        lScanner.sign("+-");
        lOffset = 60 * lScanner.number(2, 0, 23);
        lScanner.sign(":");
        lOffset = lSign * (lOffset + lScanner.number(2, 0, 59));
    }
    if (!lScanner.isGood() || !lScanner.isAtEnd() || !sIsDate(lTime)) {
        return std::nullopt;
    }
    return sFromSeconds(timegm(&lTime)) + lFraction - std::chrono::minutes(lOffset);
}

/// mktime() of fields whose daylight saving time is not known.
static ZTCHistoryTime sFromLocal(std::tm aTime) {
    aTime.tm_isdst = -1;
    return sFromSeconds(std::mktime(&aTime));
}

std::optional<ZTCHistoryTime> parseLocalTime(std::string_view aText, ZTCHistoryTime aNow) {
    if (const auto lTime = fromRfc3339(aText)) {
        return lTime;
    }
    ZTCTimeScanner lClock(aText);
    std::tm lTime = sLocal(aNow);
    lTime.tm_sec = 0;
    lClock.clock(lTime, false);
    if (lClock.isGood() && lClock.isAtEnd()) {
        if (sFromLocal(lTime) > aNow) {
            --lTime.tm_mday;
        }
        return sFromLocal(lTime);
    }
    ZTCTimeScanner lDate(aText);
    lTime = std::tm{};
    lDate.date(lTime);
    if (!lDate.isAtEnd()) {
        lDate.sign("T ");
        lDate.clock(lTime, false);
    }
    if (!lDate.isGood() || !lDate.isAtEnd() || !sIsDate(lTime)) {
        return std::nullopt;
    }
    return sFromLocal(lTime);
}

std::string formatDateTime(ZTCHistoryTime aTime) {
    return sFormat(sLocal(aTime), "%Y-%m-%d %H:%M:%S");
}

std::string formatShortTime(ZTCHistoryTime aTime, ZTCHistoryTime aNow) {
    static constexpr std::array<const char*, 12> scMonths{"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                          "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const std::tm lLocal = sLocal(aTime);
    const std::tm lNow = sLocal(aNow);
    if (lLocal.tm_year == lNow.tm_year && lLocal.tm_yday == lNow.tm_yday) {
        return sFormat(lLocal, "%H:%M:%S");
    }
    const auto lDistance = aTime > aNow ? aTime - aNow : aNow - aTime;
    if (lDistance < std::chrono::days(360)) {
        return std::to_string(lLocal.tm_mday) + " " + scMonths.at(static_cast<std::size_t>(lLocal.tm_mon)) +
               sFormat(lLocal, " %H:%M");
    }
    return sFormat(lLocal, "%Y-%m-%d %H:%M");
}

std::string formatSpan(microseconds aSpan) {
    const auto lSeconds = std::max<std::int64_t>(std::chrono::floor<seconds>(aSpan).count(), 0);
    if (lSeconds < 60) {
        return std::to_string(lSeconds) + " s";
    }
    if (lSeconds < 3600) {
        return std::to_string(lSeconds / 60) + " min";
    }
    if (lSeconds < 86400) {
        return std::to_string(lSeconds / 3600) + " h";
    }
    const std::int64_t lDays = lSeconds / 86400;
    return std::to_string(lDays) + (lDays == 1 ? " day" : " days");
}
