/// The settings of the sensor's programs, as read from one TOML file.
///
/// Every key is checked. All errors of a file are collected, so that a person mends them in one go. A file with an
/// error is not used at all.
#ifndef SENSOR_SETTINGS_INCLUDE_SETTINGS_H
#define SENSOR_SETTINGS_INCLUDE_SETTINGS_H

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

/// One [[warn]] table.
struct ZTSWarnRule {
    std::string mKind;  ///< name of an event kind, or deaf, gap, refused, agent-down, disk-full, path-lost
    std::uint64_t mCount = 1;
    std::chrono::milliseconds mWithin{60000};
    std::string mPer = "port";      ///< "port", "initiator" or "host"
    std::vector<std::string> mRun;  ///< program and arguments, not empty
    std::chrono::milliseconds mTimeout{30000};

    bool operator==(const ZTSWarnRule&) const = default;
};

/// The settings in force: the values of the file, and the defaults of the keys that it does not name. A new object is
/// blank: use defaultSettings() instead.
struct ZTSSettings {
    std::string mAgentProgram;  ///< a name or an absolute path
    std::string mAgentLibrary;  ///< empty: the agent's own default
    std::string mAgentLog;
    std::uint64_t mAgentLogLevel = 0;
    std::chrono::milliseconds mAgentHeartbeat{};  ///< whole seconds
    std::string mSensorDirectory;                 ///< absolute, without a slash at its end
    std::string mSensorState;                     ///< the same
    std::chrono::milliseconds mCollectPeriod{};
    std::uint64_t mCollectRecordLimit = 0;
    bool mTargetsSysfs = false;
    std::string mTargetsFile;  ///< empty: none
    /// World wide name as lower-case hex pairs with colons -> the administrator's name for it.
    std::map<std::string, std::string> mNames;
    std::uint64_t mHistoryDays = 0;
    std::uint64_t mHistorySize = 0;
    std::uint64_t mHistoryRecords = 0;
    std::chrono::milliseconds mEpisodeGap{};
    std::string mHttpListen;  ///< "ADDRESS:PORT", "unix:PATH", or empty: off
    bool mHttpPublic = false;
    std::vector<std::string> mHttpHosts;
    std::string mMetricsTextfile;  ///< empty: none
    std::uint64_t mMetricsRemotePorts = 0;
    std::string mNdjsonPath;  ///< empty: none; "-": standard output
    std::uint64_t mNdjsonSize = 0;
    std::uint64_t mNdjsonKeep = 0;
    bool mJournalEnabled = false;
    std::vector<ZTSWarnRule> mWarnings;

    bool operator==(const ZTSSettings&) const = default;

    /// ZT_QRV_SENSOR_DIR of the agent: FIFOs, pid files, lock, status pages.
    std::string agentDirectory() const { return mSensorDirectory + "/agent"; }
    std::string controlPath() const { return mSensorDirectory + "/control"; }
    std::string databasePath() const { return mSensorState + "/history.db"; }
    std::string spoolDirectory() const { return mSensorState + "/spool"; }
};

/// Something to say about one key.
struct ZTSSettingsProblem {
    std::string mFile;
    unsigned mLine = 0;  ///< 0: the file as a whole
    std::string mKey;    ///< "collect.period"; "file" where the file as a whole is meant, "syntax" where it is broken
    std::string mText;   ///< what is wrong, the value, the range

    /// "FILE:LINE: KEY: TEXT".
    std::string toText() const;
};

struct ZTSSettingsReading {
    ZTSSettings mSettings;
    std::vector<ZTSSettingsProblem> mErrors;  ///< by line; where there is one the settings must not be used
    std::string mFile;                        ///< the path that was read, or would have been
    std::string mContent;                     ///< the text that was read

    bool isGood() const { return mErrors.empty(); }
};

/// The file that is read where nothing else is named; the only one that may be missing.
inline constexpr const char* gcDefaultSettingsFile = "/etc/tavik/tavik.toml";
inline constexpr const char* gcSettingsFileVariable = "TAVIK_CONFIG";

/// Reads the file that the option --config names; where that is empty the one that $TAVIK_CONFIG names; where that is
/// unset or empty the default file. Does not throw for anything about the file: see mErrors.
ZTSSettingsReading readSettings(const std::string& acrOption);

/// Reads a text. `acrFile` is named in problems.
ZTSSettingsReading parseSettings(const std::string& acrText, const std::string& acrFile);

/// The settings without a file: every default.
ZTSSettings defaultSettings();

/// The keys whose values differ, as "agent.log", in the order of the table; "names" and "warn" as a whole.
std::vector<std::string> changedKeys(const ZTSSettings& acrOne, const ZTSSettings& acrOther);

/// The text of the file that is installed: every key with its meaning and its default, as comments.
std::string defaultSettingsFile();

#endif
