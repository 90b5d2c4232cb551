#include "sensor/tavik/src/HistoryWatch.h"

#include <poll.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>

static constexpr int scIdleMilliseconds = 1000;
static constexpr int scQuickMilliseconds = 5;
static constexpr int scQuickLooks = 40;

ZTCHistoryWatch::ZTCHistoryWatch(const std::string& acrStateDirectory)
    : mDirectory(acrStateDirectory),
      mDatabase(acrStateDirectory + "/history.db"),
      mNotifications(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    watchDirectory();
}

void ZTCHistoryWatch::watchDirectory() {
    if (!mIsWatching && mNotifications.isOpen()) {
        mIsWatching = inotify_add_watch(mNotifications.get(), mDirectory.c_str(),
                                        IN_MODIFY | IN_CREATE | IN_MOVED_TO | IN_ONLYDIR) >= 0;
    }
}

void ZTCHistoryWatch::wait() {
    watchDirectory();
    pollfd lSource{.fd = mIsWatching ? mNotifications.get() : -1, .events = POLLIN, .revents = 0};
    // While quick looks are due a notification only renews their number: each look costs one query at most.
    const int lMilliseconds = mQuickLooks > 0 ? scQuickMilliseconds : scIdleMilliseconds;
    mQuickLooks -= mQuickLooks > 0 ? 1 : 0;
    if (mQuickLooks > 0) {
        poll(nullptr, 0, lMilliseconds);
        lSource.revents = 0;
        poll(&lSource, 1, 0);
    } else {
        poll(&lSource, 1, lMilliseconds);
    }
    std::array<char, 4096> lEvents;
    if ((lSource.revents & POLLIN) != 0) {
        while (read(mNotifications.get(), lEvents.data(), lEvents.size()) > 0) {
        }
        mQuickLooks = scQuickLooks;
    }
}

bool ZTCHistoryWatch::isReplaced() {
    struct stat lStatus {};
    if (stat(mDatabase.c_str(), &lStatus) != 0) {
        return false;  // between two databases: the one that is open stays until there is another
    }
    const bool lIsOther = lStatus.st_dev != mDevice || lStatus.st_ino != mInode;
    mDevice = lStatus.st_dev;
    mInode = lStatus.st_ino;
    return lIsOther;
}
