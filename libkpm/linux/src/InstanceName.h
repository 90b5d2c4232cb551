/// Names of what the library makes in tracefs: a common beginning, the process's number, and when the process was
/// started, so that another process of the same number is not taken for it.
#ifndef LIBKPM_LINUX_SRC_INSTANCENAME_H
#define LIBKPM_LINUX_SRC_INSTANCENAME_H

#include <string>

/// The name of this process's instance of finished commands, and of its probe's group with other punctuation.
std::string makeTraceInstanceName();

/// The name of this process's instance of sense data.
std::string makeSenseInstanceName();

/// Whether an instance of this name is one of the library's two, and its process is gone.
bool isTraceInstanceLeftOver(const std::string& acrName);

#endif
