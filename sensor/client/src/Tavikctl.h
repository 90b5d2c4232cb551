/// What the parts of the tool tavikctl share: its options, exit statuses and output.
#ifndef SENSOR_CLIENT_SRC_TAVIKCTL_H
#define SENSOR_CLIENT_SRC_TAVIKCTL_H

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "sensor/client/include/SensorClient.h"
#include "sensor/client/include/StandardStreams.h"

enum ZTEExitStatus : int {
    ZTXS_Done = 0,
    ZTXS_Refused = 1,      ///< the agent answered with a failed response
    ZTXS_WrongUse = 2,     ///< command line, input file, directory, or another sensor at work
    ZTXS_NoAnswer = 3,     ///< no agent, no answer in time, or bytes that are no answer
    ZTXS_LocalFailure = 4  ///< a file or standard output cannot be written, or the like
};

struct ZTSToolOptions {
    std::string mDirectory;
    std::chrono::milliseconds mTimeout{0};
    bool mIsJson = false;
    bool mIsWaiting = false;  ///< wait for an agent that has not been started yet
};

struct ZTSWatchOptions {
    std::chrono::milliseconds mInterval{0};
    std::uint32_t mCount = 0;  ///< retrievals after which it ends; 0 = none
    std::uint32_t mMaxRecordBytes = 0;
    std::vector<ZTSTargetPort> mTargets;
};

/// One line on standard error, with the tool's name in front.
void complain(const std::string& acrText);

/// writeOutput() for a process that has to go on while its reader does not read. Calls acrPause at least once a second.
/// Where it returns false and the reader still does not read, some of the text stays unwritten and the result is false.
bool writeOutputPatiently(const std::string& acrText, const std::function<bool()>& acrPause);

/// Says on standard error what is remarkable about an answer. Returns what it means for the exit status.
ZTEExitStatus reportAnswer(const ZTSToolOptions& acrOptions, const std::string& acrCommand, const ZTSAnswer& acrAnswer);

/// Plays the sensor until a signal or the last retrieval. Prints every retrieval.
ZTEExitStatus runWatch(const ZTSToolOptions& acrOptions, const ZTSWatchOptions& acrWatch);

#endif
