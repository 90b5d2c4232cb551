/// Names of what the library makes in tracefs: a common begin, the process's number, and when the process was started,
/// so that another process of the same number is not taken for it.
#ifndef LIBKPM_LINUX_SRC_INSTANCENAME_H
#define LIBKPM_LINUX_SRC_INSTANCENAME_H

#include <string>

/// The name of this process's instance.
std::string makeTraceInstanceName();

/// Whether an instance of this name is one of the library's, and its process is gone.
bool isTraceInstanceLeftOver(const std::string& acrName);

#endif
