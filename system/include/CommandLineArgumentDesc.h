/// The description of one command-line option.

#ifndef SYSTEM_INCLUDE_COMMANDLINEARGUMENTDESC_H
#define SYSTEM_INCLUDE_COMMANDLINEARGUMENTDESC_H

/// The size of an identifier, its terminator included.
#define MAX_CMD_ARG_LEN 128

/// The number of options that a system has room for.
#define MAX_CMD_ARGUMENTS 10

enum ZTECommandLineArgumentType : unsigned char {
    ZTCLAT_None = 0,
    ZTCLAT_OptionOnly = 1,   ///< has no value
    ZTCLAT_OptionValue = 2,  ///< the next argument is its value
    ZTCLAT_Max = 3
};

struct ZTSCommandLineArgumentDesc {
    ZTECommandLineArgumentType type;
    char identifier[MAX_CMD_ARG_LEN];  ///< the option's text, such as "-h", zero-filled behind it
};

#endif
