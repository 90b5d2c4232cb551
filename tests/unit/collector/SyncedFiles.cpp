#include "tests/unit/collector/SyncedFiles.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <mutex>
#include <set>

namespace {

struct ZTSState {
    std::mutex mMutex;
    // ---- under mMutex ----
    std::function<bool()> mHasPower;
    std::set<std::string> mContents;  ///< of these files
    std::set<std::string> mNames;     ///< of those, the ones whose folder was synced behind them
};

ZTSState& state() {
    static ZTSState sState;
    return sState;
}

}  // namespace

// Of the same name in the object file, so that it need not agree with the header's declaration in every attribute.
extern "C" int sSync(int aFile) __asm__("fsync");
int sSync(int aFile) {
    ZTSState& lrState = state();
    const std::lock_guard lLock(lrState.mMutex);
    if (lrState.mHasPower && !lrState.mHasPower()) {
        errno = EIO;
        return -1;
    }
    const int lResult = static_cast<int>(syscall(SYS_fsync, aFile));
    std::error_code lError;
    const std::filesystem::path lPath = std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(aFile), lError);
    if (lResult != 0 || lError) {
        return lResult;
    }
    struct stat lStatus {};
    if (fstat(aFile, &lStatus) == 0 && S_ISREG(lStatus.st_mode)) {
        lrState.mContents.insert(lPath);
    } else {
        for (const std::string& lrFile : lrState.mContents) {
            if (std::filesystem::path(lrFile).parent_path() == lPath) {
                lrState.mNames.insert(lrFile);
            }
        }
    }
    return lResult;
}

ZTCSyncedFiles::ZTCSyncedFiles(std::function<bool()> aHasPower) {
    const std::lock_guard lLock(state().mMutex);
    state().mHasPower = std::move(aHasPower);
}

ZTCSyncedFiles::~ZTCSyncedFiles() {
    const std::lock_guard lLock(state().mMutex);
    state().mHasPower = nullptr;
    state().mContents.clear();
    state().mNames.clear();
}

bool ZTCSyncedFiles::isOnDisk(const std::string& acrPath) const {
    const std::lock_guard lLock(state().mMutex);
    return state().mNames.contains(acrPath);
}
