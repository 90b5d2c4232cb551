/// Where the simulated library says what is wrong: standard error, and, for a process without one, the file that the
/// environment variable KPM_SIM_LOG names.
#ifndef LIBKPM_SIM_SRC_REPORT_H
#define LIBKPM_SIM_SRC_REPORT_H

#include <string>

/// Writes one line to both. Never throws; what cannot be written is lost.
void reportSimProblem(const std::string& acrText) noexcept;

/// Writes one line to the file of KPM_SIM_LOG alone.
void noteSimLine(const std::string& acrText) noexcept;

#endif
