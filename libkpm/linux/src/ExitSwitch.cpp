#include "libkpm/linux/src/ExitSwitch.h"

#include <unistd.h>

#include <atomic>

// The thread that takes the descriptor out owns it: exit and Close may run at once.
static std::atomic<int> sFiles[ZTXS_Sense + 1] = {-1, -1};
static std::atomic<bool> sIsPulled{false};

void armLinuxExitSwitch(ZTEExitSwitch aEvent, ZTCLibraryDescriptor aFile) noexcept {
    const ZTCLibraryDescriptor lBefore(sFiles[aEvent].exchange(aFile.release()));
}

void disarmLinuxExitSwitch(ZTEExitSwitch aEvent) noexcept {
    const ZTCLibraryDescriptor lFile(sFiles[aEvent].exchange(-1));
}

void pullLinuxExitSwitch() noexcept {
    // Before the files are used: a thread that switches an event on and then looks here switches it off again.
    sIsPulled.store(true);
    for (std::atomic<int>& lrFile : sFiles) {
        const int lFile = lrFile.exchange(-1);
        if (lFile >= 0) {
            // Not closed: the process ends, and other threads may be opening files.
            const ssize_t lWritten = ::write(lFile, "0", 1);
            static_cast<void>(lWritten);
        }
    }
}

bool isLinuxExitSwitchPulled() noexcept {
    return sIsPulled.load();
}
