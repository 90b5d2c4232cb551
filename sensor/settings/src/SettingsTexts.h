/// What the texts among the settings may be.
#ifndef SENSOR_SETTINGS_SRC_SETTINGSTEXTS_H
#define SENSOR_SETTINGS_SRC_SETTINGSTEXTS_H

#include <string>
#include <string_view>

/// One kind of text.
struct ZTSTextRule {
    bool (*mpIsGood)(std::string_view aText);
    const char* mpRange;        ///< follows "must be"
    bool mIsDirectory = false;  ///< slashes at its end do not count
};

extern const ZTSTextRule gcAnyRule;              ///< printable, or empty
extern const ZTSTextRule gcProgramRule;          ///< a name, or an absolute path
extern const ZTSTextRule gcPathRule;             ///< an absolute path
extern const ZTSTextRule gcOptionalPathRule;     ///< an absolute path, or empty
extern const ZTSTextRule gcStreamRule;           ///< an absolute path, "-", or empty
extern const ZTSTextRule gcDirectoryRule;        ///< an absolute path, not /
extern const ZTSTextRule gcSocketDirectoryRule;  ///< the same, and short enough for a socket in it
extern const ZTSTextRule gcListenRule;           ///< ADDRESS:PORT, unix:PATH, or empty
extern const ZTSTextRule gcHostRule;             ///< a name as in a Host header, without a port
extern const ZTSTextRule gcNameRule;             ///< an administrator's name
extern const ZTSTextRule gcWarnKindRule;         ///< what a [[warn]] table can watch
extern const ZTSTextRule gcWarnPerRule;          ///< what it counts by

/// Whether others than this host's users can connect to a good http.listen.
bool isPublicListen(std::string_view aListen);

/// The text on one line: bytes that do not print as \xNN.
std::string escaped(std::string_view aText);

/// The text in quotes, escaped, and cut where it is long.
std::string quoted(std::string_view aText);

#endif
