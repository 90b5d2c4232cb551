/// Where the library says what is wrong: the agent's log, through the function that the agent hands over.
#ifndef LIBKPM_LINUX_SRC_REPORT_H
#define LIBKPM_LINUX_SRC_REPORT_H

#include <cstdint>
#include <string>

#include "libkpm/include/libkpm.h"

/// Null: lines are dropped, as before the first call.
void setLinuxLog(KPM_LogFunction apLog) noexcept;

/// Writes one line, at a level of libkpm.h. From any thread.
void logLinuxLine(std::uint32_t aLevel, const std::string& acrText) noexcept;

#endif
