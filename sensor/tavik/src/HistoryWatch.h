/// Waits until the history may have changed. The kernel reports writes to its journal (inotify). Without such a report
/// the wait ends after a second.
#ifndef SENSOR_TAVIK_SRC_HISTORYWATCH_H
#define SENSOR_TAVIK_SRC_HISTORYWATCH_H

#include <sys/types.h>

#include <string>

#include "sensor/client/include/FileDescriptor.h"

class ZTCHistoryWatch {
public:
    /// @param acrStateDirectory  holds the database; it need not exist yet
    explicit ZTCHistoryWatch(const std::string& acrStateDirectory);

    /// Returns soon after a write, else after a second at most. What is written becomes visible to readers only a
    /// moment after the kernel has reported it: so the next calls return quickly for a while.
    void wait();

    /// Whether the path leads to another database than at the last call; true at the first.
    bool isReplaced();

private:
    void watchDirectory();

    const std::string mDirectory;
    const std::string mDatabase;
    ZTCFileDescriptor mNotifications;
    bool mIsWatching = false;
    int mQuickLooks = 0;
    dev_t mDevice = 0;
    ino_t mInode = 0;
};

#endif
