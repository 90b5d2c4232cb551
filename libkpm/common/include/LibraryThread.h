/// Threads of an adapters' library. They take no signals, whatever the process they live in does with its own.
#ifndef LIBKPM_COMMON_INCLUDE_LIBRARYTHREAD_H
#define LIBKPM_COMMON_INCLUDE_LIBRARYTHREAD_H

#include <functional>
#include <thread>

/// Starts a thread with all signals blocked. The caller's own signals are as before when it returns. Throws
/// std::system_error where there can be no thread.
std::thread startLibraryThread(std::function<void()> aBody);

#endif
