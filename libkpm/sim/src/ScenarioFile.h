/// Scenarios as files.
#ifndef LIBKPM_SIM_SRC_SCENARIOFILE_H
#define LIBKPM_SIM_SRC_SCENARIOFILE_H

#include <stdexcept>
#include <string>

#include "libkpm/sim/src/Scenario.h"

/// A file that cannot be read. The text names the file and the reason.
class ZTCSimUnreadable : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The text of a file, at most gcSimMaxTextSize bytes. Throws ZTCSimUnreadable.
std::string readSimFile(const std::string& acrPath);

/// FILE:LINE: reason, or FILE: reason where no line is to blame.
std::string describeSimRefusal(const std::string& acrPath, const ZTCSimRefusal& acrRefusal);

#endif
