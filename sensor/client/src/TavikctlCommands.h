/// The commands of tavikctl that ask once and end. TavikctlWatch has the one that goes on.
#ifndef SENSOR_CLIENT_SRC_TAVIKCTLCOMMANDS_H
#define SENSOR_CLIENT_SRC_TAVIKCTLCOMMANDS_H

#include <string>

#include "sensor/client/src/Tavikctl.h"

// Each returns what the answer means for the exit status, and throws what a conversation throws (ClientErrors.h).
// Without mIsWaiting they answer at once where no process holds the agent's pid file.

/// A command whose answer is success or failure. @param acrCommand  its name in messages
ZTEExitStatus runCommand(const ZTSToolOptions& acrOptions, const std::string& acrCommand,
                         const ZTCWireBytes& acrRequest);

/// Takes all records and prints them. @param acrRawPath  the answer's bytes are saved there too; empty: nowhere
ZTEExitStatus runGet(const ZTSToolOptions& acrOptions, const std::string& acrRawPath);

/// Prints an answer that was saved; asks no agent.
ZTEExitStatus runDecode(const ZTSToolOptions& acrOptions, const std::string& acrPath);

/// Prints whether an agent runs and answers.
ZTEExitStatus runStatus(const ZTSToolOptions& acrOptions);

#endif
