#include "libkpm/common/include/LibraryThread.h"

#include <pthread.h>
#include <signal.h>

#include <utility>

/// Blocks all signals of the calling thread for as long as it lives: a new thread inherits the mask.
class ZTCLibrarySignalBlock {
public:
    ZTCLibrarySignalBlock() {
        sigset_t lAll;
        sigfillset(&lAll);
        pthread_sigmask(SIG_SETMASK, &lAll, &mBefore);
    }
    ~ZTCLibrarySignalBlock() { pthread_sigmask(SIG_SETMASK, &mBefore, nullptr); }
    ZTCLibrarySignalBlock(const ZTCLibrarySignalBlock&) = delete;
    ZTCLibrarySignalBlock& operator=(const ZTCLibrarySignalBlock&) = delete;

private:
    sigset_t mBefore;
};

std::thread startLibraryThread(std::function<void()> aBody) {
    const ZTCLibrarySignalBlock lBlock;
    return std::thread(std::move(aBody));
}
