#include "tavik/include/SensorDirectory.h"

#include <sys/stat.h>
#include <unistd.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Clib.h"
#include "tavik/include/TavikSystem.h"

void warnOfSharedDirectory(const ZTCString& acrPath) {
    ZT_ENTRY();
    // Names are appended to the directory as it stands, so that an empty one is the root.
    const char* lpPath = *acrPath.get() != '\0' ? acrPath.get() : "/";
    struct stat lStatus {};
    try {
        ClibStat(lpPath, &lStatus);
    } catch (const ZTCClibStatFailedEx&) {  // what comes to use the directory says what is wrong with it
        ZT_EXIT();
        return;
    }
    const bool lIsShared = (lStatus.st_mode & (S_IWGRP | S_IWOTH)) != 0;
    const bool lIsForeign = lStatus.st_uid != 0 && lStatus.st_uid != ::geteuid();
    if (lIsShared || lIsForeign) {
        char lWho[64];
        char lRemedy[MAX_FILE_PATH];
        if (lIsShared) {
            ClibStrcpy(lWho, (lStatus.st_mode & S_IWOTH) != 0 ? "everybody" : "its group");
            ClibSprintf(lRemedy, sizeof lRemedy, "chmod go-w '%s'", lpPath);
        } else {
            ClibSprintf(lWho, sizeof lWho, "user %u", lStatus.st_uid);
            ClibSprintf(lRemedy, sizeof lRemedy, "run the agent as that user, or chown %u '%s'", ::geteuid(), lpPath);
        }
        ZT_LOG_WARN(
            "The sensor directory '%s' can be written by %s, who can so command this agent and replace its files; to "
            "make it private: %s",
            lpPath, lWho, lRemedy);
    }
    ZT_EXIT();
}
