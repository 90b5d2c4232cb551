/// Reads a command line by the table of its options.
///
/// The whole line is read and checked before anything of it is used. One table in the source says which value each
/// option takes: a number and its limits, or true or false.

#ifndef SYSTEM_INCLUDE_COMMANDLINEPARSER_H
#define SYSTEM_INCLUDE_COMMANDLINEPARSER_H

#include "common/include/String.h"
#include "common/include/Vector.h"
#include "system/include/CommandLineArgumentDesc.h"

enum ZTEParsingState : unsigned char {
    ZTPS_None = 0,
    ZTPS_NotStarted = 1,
    ZTPS_Running = 2,  ///< also after an error
    ZTPS_Done = 3,
    ZTPS_Max = 4
};

/// The options of a command line. A value is valid where its flag is set. Of an option given twice, the last counts.
struct ZTSCommandLineOptions {
    bool mShowHelp = false;       ///< -h
    bool mShowVersion = false;    ///< -v
    bool mShutDownOther = false;  ///< -s
    bool mSniffer = false;        ///< -S
    bool mRunAsDaemon = true;     ///< -D
    bool mHasLogFile = false;     ///< -l
    bool mHasLogCode = false;     ///< -d
    bool mHasConfigFile = false;  ///< -c
    bool mHasHbTimeout = false;   ///< -b
    unsigned mLogCode = 0;        ///< 0 to 255
    unsigned mHbTimeout = 0;      ///< seconds, at least 1
    ZTCString mLogFile{""};
    ZTCString mConfigFile{""};
};

/// Belongs to the main thread.
class ZTCCommandLineParser {
public:
    ZTCCommandLineParser() = default;

    /// Reads the arguments from the second on; the first is the program's name. An argument is an identifier of the
    /// table, letter for letter, or the value of the one before it. An argument that names an option is never taken for
    /// a value. Throws ZTCInvalidEx, whose text is one line that names the option, its value and the limits, for an
    /// option that is not in the table, a value that is missing, and one that is out of its limits.
    void parse(const ZTCVector<ZTSCommandLineArgumentDesc>& acrDescs, int aArgc, const char* const* apArgv);

    ZTEParsingState getState() const { return mState; }

    /// All at their defaults until the state is ZTPS_Done.
    const ZTSCommandLineOptions& getOptions() const { return mOptions; }

private:
    ZTEParsingState mState = ZTPS_NotStarted;
    ZTSCommandLineOptions mOptions;
};

#endif
