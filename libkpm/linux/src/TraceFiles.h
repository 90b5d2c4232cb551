/// Writing to tracefs: the directories of instances and the control files in them. Tests replace it with a double that
/// behaves as the kernel does.
#ifndef LIBKPM_LINUX_SRC_TRACEFILES_H
#define LIBKPM_LINUX_SRC_TRACEFILES_H

#include <string>
#include <string_view>

class ZTCTraceFiles {
public:
    virtual ~ZTCTraceFiles() = default;

    // Each returns 0, or the error number.

    /// On tracefs, this makes an instance with all its files, and removes one.
    virtual int make(const std::string& acrPath);
    virtual int remove(const std::string& acrPath);

    /// Writes all of a text in one call, as the kernel's control files want it. Allocates nothing.
    virtual int write(const std::string& acrPath, std::string_view aText);

    /// Appends a line to a file that many processes share. Never truncates it: on the kernel's list of dynamic events,
    /// truncating would remove everybody's.
    virtual int append(const std::string& acrPath, std::string_view aText);
};

#endif
