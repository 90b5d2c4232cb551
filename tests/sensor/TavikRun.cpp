#include "tests/sensor/TavikRun.h"

ZTSTavikRun runTavik(const ZTCSensorProcess& acrSensor, const std::vector<std::string>& acrArguments) {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = TAVIK_PROGRAM;
    lSetup.mArguments = {"--config", acrSensor.configPath()};
    lSetup.mArguments.insert(lSetup.mArguments.end(), acrArguments.begin(), acrArguments.end());
    lSetup.mEnvironment = {{"PATH", "/usr/bin:/bin"}};
    lSetup.mWorkingDirectory = acrSensor.path(".");
    lSetup.mOutputPrefix = acrSensor.path("tavik");
    ZTCChildProcess lProcess(lSetup);
    ZTSTavikRun lRun;
    lRun.mExit = lProcess.waitForExit(ZTCDeadline(6 * gcTestPatience));
    lRun.mOutput = lProcess.standardOutput();
    lRun.mError = lProcess.standardError();
    return lRun;
}
