/// Words of the keeper's messages.
#ifndef SENSOR_KEEPER_SRC_KEEPERTEXTS_H
#define SENSOR_KEEPER_SRC_KEEPERTEXTS_H

#include <chrono>
#include <string>

/// "status 3", or "killed by signal 9 (Killed)", of a status as of waitpid().
std::string endText(int aWaitStatus);

/// "at once", or "in 4 s".
std::string pauseText(std::chrono::seconds aPause);

#endif
