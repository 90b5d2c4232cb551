/// The driver of the process, the one system object and the heartbeat timeout.

#ifndef SYSTEM_INCLUDE_SYSTEMGLOBALS_H
#define SYSTEM_INCLUDE_SYSTEMGLOBALS_H

class ZTCSystem;

/// The system object that SystemMain() drives; null until it is set. It is borrowed, and never deleted. Main thread.
void setSystemObject(ZTCSystem* apSystem);
ZTCSystem* getSystemObject();

/// The heartbeat period in seconds until another one is set.
inline constexpr unsigned gcDefaultHbTimeout = 240;

/// The heartbeat period in seconds. Any thread.
void setHbTimeout(unsigned aSeconds);
void getHbTimeout(unsigned& arSeconds);

/// Runs the life of the process. Signals are blocked first; then the system's operations are called in this order:
///
///     preInit
///     setCmdLineArgDescs, processCommandLine, processCommandLineArguments
///     isAnInstanceRunning      another one: a line on standard error and in the log, ZTCExitConditionEx (19)
///     systemDaemonize          where the command line says so, which is the default
///     markAsRunning            then the signal waiter starts
///     init
///     createThreads, startThreads, postThreadsInit
///     waitForThreads
///     destroy
///     exitInstanceManagement
///     postDestroy              the signal waiter has stopped by then
///
/// Some options end the process with status 0 in processCommandLineArguments. An exception of any of them leaves the
/// function after the threads that run have been made to exit and were joined, the signal waiter has stopped and the
/// instance record has been given up. Throws ZTCNoMemoryEx where there is no system object.
void SystemMain(int aArgc, char** apArgv);

#endif
