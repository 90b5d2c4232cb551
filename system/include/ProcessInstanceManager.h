/// Makes sure that only one process runs for each pid file, and looks up the processes that pid files name.
///
/// A lock on the pid file decides. The kernel drops it when the process ends, so that neither a pid file left behind
/// nor a pid used again misleads. The file is emptied as soon as it is locked, and holds the process id, in decimal
/// with a line break behind it, once the process is marked as running: an empty file under a lock means a process that
/// is starting.

#ifndef SYSTEM_INCLUDE_PROCESSINSTANCEMANAGER_H
#define SYSTEM_INCLUDE_PROCESSINSTANCEMANAGER_H

#include <sys/types.h>

#include <chrono>
#include <cstdint>

#include "common/include/String.h"

/// Belongs to the main thread, but for getProcStatus(), which any thread may call.
class ZTCProcessInstanceManager {
public:
    /// How long killRunningInstance() waits for the other process to end.
    static constexpr std::chrono::milliseconds gcKillTimeout{15000};

    explicit ZTCProcessInstanceManager(const ZTCString& acrPidFilePath,
                                       std::chrono::milliseconds aKillTimeout = gcKillTimeout);

    /// Drops the lock; the file stays.
    ~ZTCProcessInstanceManager();

    ZTCProcessInstanceManager(const ZTCProcessInstanceManager&) = delete;
    ZTCProcessInstanceManager& operator=(const ZTCProcessInstanceManager&) = delete;

    /// Takes the lock, which a fork keeps, and empties the file, or makes it with mode 0600: returns false. While
    /// another process holds the lock it changes nothing and returns true: getProcessId() is then what the file names,
    /// or -1. Throws ZTCInvalidEx where the path is not a regular file, ZTCClibEx for the rest.
    bool isAnInstanceRunning();

    /// Writes this process's id into the file, after taking the lock if isAnInstanceRunning() was not called. From here
    /// on this process may rotate the log. Throws ZTCExistsEx while another process holds the lock.
    void markAsRunning();

    /// Asks the process that holds the lock to stop (SIGTERM) and waits until it is gone; waits for one that is
    /// starting. A process that does not belong to the file's owner is left alone: the file may be forged. Prints
    /// the outcome on standard output, also that none is running. Throws ZTCClibKillFailedEx where it may not be
    /// asked.
    void killRunningInstance();

    /// Removes the file, if it still is the one that this process locked, and drops the lock. From here on this process
    /// does not rotate the log. Does nothing a second time.
    void exitInstanceManagement();

    /// Returns if the pid file holds the id, above 0 and in decimal, of a process that exists and is not a zombie;
    /// throws ZTCClibGetProcStatusFailedEx, which names the file and the reason, if not.
    void getProcStatus(const ZTCString& acrPidFilePath) const;

    /// This process's id once it is marked as running, another's that runs in its place, or -1.
    std::int32_t getProcessId() const { return mProcessId; }

private:
    const ZTCString mPidFilePath;
    std::int32_t mProcessId = -1;
    bool mIsLocked = false;

    int mDescriptor = -1;  // open while the lock is held
    const std::chrono::milliseconds mKillTimeout;
};

#endif
