/// What tavikctl reads from its arguments and from files. Everything throws ZTCBadInputEx, naming the text and what it
/// should be.
#ifndef SENSOR_CLIENT_SRC_TAVIKCTLINPUT_H
#define SENSOR_CLIENT_SRC_TAVIKCTLINPUT_H

#include <chrono>
#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

#include "sensor/client/include/CommandEncoder.h"

/// A number of seconds from 0.001 to 86400, decimal fractions included. @param acrWhat  names it in the error
std::chrono::milliseconds parseSeconds(const std::string& acrText, const std::string& acrWhat);

/// A number from 0 to 4294967295, decimal or 0x-hexadecimal.
std::uint32_t parseUnsigned(const std::string& acrText, const std::string& acrWhat);

/// Opens a file for reading; "-" is standard input.
std::ifstream openInput(const std::string& acrPath);

/// The targets that the arguments name: each is a target, a file of targets, or "-".
std::vector<ZTSTargetPort> collectTargets(const std::vector<std::string>& acrArguments);

#endif
