/// Filters as people and programs write them: texts of the command line, or parameters of a request.
#ifndef SENSOR_VIEWS_INCLUDE_FILTERTEXT_H
#define SENSOR_VIEWS_INCLUDE_FILTERTEXT_H

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"

/// A text that cannot be a filter: wrong use. One line that names the option or parameter, the value and what is
/// wanted.
class ZTCBadFilterEx : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct ZTSFilterTexts {
    std::string mSince{};  ///< empty: not given
    std::string mUntil{};
    std::vector<std::string> mKinds{};
    std::vector<std::string> mPorts{};
    std::vector<std::string> mInitiators{};
    std::vector<std::string> mLuns{};
    std::string mLimit{};
    bool mIsOpenOnly = false;
    std::string mNamePrefix = "--";  ///< before a name in errors: that of options; parameters of a request have none
};

/// The point in time that a text stands for: a time, a duration back from now ("90s", "10m", "24h", "30d"), or the name
/// of a mark. @param acrOption  named in the error as it is. Throws ZTCBadFilterEx.
ZTCHistoryTime readPoint(const std::string& acrText, const std::string& acrOption, const std::vector<ZTSMark>& acrMarks,
                         ZTCHistoryTime aNow);

/// Checks that a stretch of time ends after it begins. @param apEarlier,apLater  named in the error. Throws
/// ZTCBadFilterEx with both times.
void checkOrder(const char* apEarlier, ZTCHistoryTime aEarlier, const char* apLater, ZTCHistoryTime aLater);

/// Whether a text is read as a time or a duration, so that no mark can have it as its name.
bool isTimeOrDuration(const std::string& acrText);

/// Checks the kinds, LUNs and the limit, which need no history: wrong use is reported also where there is none.
/// Throws ZTCBadFilterEx.
void checkFilter(const ZTSFilterTexts& acrTexts);

/// @param aDefaultLimit  where none is given; 0: all. Throws ZTCBadFilterEx, also where the time ends before it begins.
ZTSHistoryFilter readFilter(const ZTSFilterTexts& acrTexts, const ZTCNameBook& acrNames,
                            const std::vector<ZTSMark>& acrMarks, ZTCHistoryTime aNow, std::uint64_t aDefaultLimit);

/// "plogi, prlo, ...": for messages.
std::string listKinds();

#endif
