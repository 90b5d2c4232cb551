/// Runs the built `tavik` against a test's sensor.
#ifndef TESTS_SENSOR_TAVIKRUN_H
#define TESTS_SENSOR_TAVIKRUN_H

#include <string>
#include <vector>

#include "tests/sensor/SensorProcess.h"

struct ZTSTavikRun {
    int mExit = -1;
    std::string mOutput;
    std::string mError;
};

/// Returns when it has ended. @param acrArguments  behind those that name the sensor's configuration
ZTSTavikRun runTavik(const ZTCSensorProcess& acrSensor, const std::vector<std::string>& acrArguments);

#endif
