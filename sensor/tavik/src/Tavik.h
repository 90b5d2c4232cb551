/// What the commands of `tavik` share: options, exit statuses, output.
#ifndef SENSOR_TAVIK_SRC_TAVIK_H
#define SENSOR_TAVIK_SRC_TAVIK_H

#include <nlohmann/json_fwd.hpp>
#include <stdexcept>
#include <string>

#include "sensor/client/include/StandardStreams.h"
#include "sensor/views/include/FilterText.h"

/// Exit statuses that do not come from the table of states.
enum ZTETavikExit : int {
    ZTTX_Done = 0,
    ZTTX_HookFailed = 1,    ///< of warn --test
    ZTTX_WrongUse = 2,      ///< the command line or the configuration
    ZTTX_NewerHistory = 2,  ///< the history was written by a newer version: another try changes nothing
    ZTTX_NotKnown = 3,      ///< no sensor or no history to ask
    ZTTX_LocalFailure = 4   ///< standard output cannot be written, or the like
};

/// The command line or the configuration is wrong. One line for people.
class ZTCWrongUseEx : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// What was asked for cannot be learned now. One line for people.
class ZTCNotKnownEx : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// What the command line holds.
struct ZTSTavikOptions {
    std::string mConfig;  ///< of --config
    bool mIsJson = false;
    bool mIsWatch = false;
    bool mIsRecords = false;
    bool mIsFollow = false;
    bool mIsTest = false;  ///< of warn
    bool mIsAll = false;   ///< of explain
    std::string mSubject;  ///< of explain
    std::string mMark;
    std::string mMarkTime;  ///< empty: now
    std::string mFrom;      ///< of diff, as the next
    std::string mTo;
    std::string mOutput;  ///< of report
    std::string mAt;      ///< of paths
    bool mIsTroubleOnly = false;
    bool mIsEachPath = false;
    ZTSFilterTexts mFilter;
};

/// One line on standard error, with the program's name in front.
void complain(const std::string& acrText);

/// A document, indented, with a line break at its end.
void writeDocument(const nlohmann::ordered_json& acrDocument);

// The commands. Each returns the exit status.
int runStatus(const ZTSTavikOptions& acrOptions);
int runEvents(const ZTSTavikOptions& acrOptions);
int runPorts(const ZTSTavikOptions& acrOptions);
int runDiff(const ZTSTavikOptions& acrOptions);
int runReport(const ZTSTavikOptions& acrOptions);
int runPaths(const ZTSTavikOptions& acrOptions);
int runExplain(const ZTSTavikOptions& acrOptions);
int runCheck(const ZTSTavikOptions& acrOptions);
int runMark(const ZTSTavikOptions& acrOptions);
int runWarn(const ZTSTavikOptions& acrOptions);

#endif
