#include "libkpm/sim/src/SimThread.h"

#include <pthread.h>
#include <signal.h>

#include <utility>

/// Blocks all signals of the calling thread for as long as it lives: a new thread inherits the mask.
class ZTCSimSignalBlock {
public:
    ZTCSimSignalBlock() {
        sigset_t lAll;
        sigfillset(&lAll);
        pthread_sigmask(SIG_SETMASK, &lAll, &mBefore);
    }
    ~ZTCSimSignalBlock() { pthread_sigmask(SIG_SETMASK, &mBefore, nullptr); }
    ZTCSimSignalBlock(const ZTCSimSignalBlock&) = delete;
    ZTCSimSignalBlock& operator=(const ZTCSimSignalBlock&) = delete;

private:
    sigset_t mBefore;
};

std::thread startSimThread(std::function<void()> aBody) {
    const ZTCSimSignalBlock lBlock;
    return std::thread(std::move(aBody));
}
