/// Threads of the simulated library. They take no signals, whatever the process they live in does with its own.
#ifndef LIBKPM_SIM_SRC_SIMTHREAD_H
#define LIBKPM_SIM_SRC_SIMTHREAD_H

#include <functional>
#include <thread>

/// Starts a thread with all signals blocked. Throws std::system_error where there can be none.
std::thread startSimThread(std::function<void()> aBody);

#endif
