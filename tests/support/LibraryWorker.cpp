#include "tests/support/LibraryWorker.h"

#include <memory>
#include <utility>

ZTCLibraryWorker::~ZTCLibraryWorker() {
    {
        const std::lock_guard lGuard(mLock);
        mIsToEnd = true;
    }
    mChange.notify_all();
    mThread.join();
}

bool ZTCLibraryWorker::runJob(std::function<void()> aJob, std::chrono::seconds aPatience) {
    const auto lpDone = std::make_shared<bool>(false);
    std::unique_lock lGuard(mLock);
    mJobs.push_back([this, lJob = std::move(aJob), lpDone] {
        lJob();
        const std::lock_guard lInner(mLock);
        *lpDone = true;
        mChange.notify_all();
    });
    mChange.notify_all();
    return mChange.wait_for(lGuard, aPatience, [&] { return *lpDone; });
}

void ZTCLibraryWorker::run() {
    std::unique_lock lGuard(mLock);
    for (;;) {
        mChange.wait(lGuard, [this] { return mIsToEnd || !mJobs.empty(); });
        if (mJobs.empty()) {
            return;
        }
        const std::function<void()> lJob = std::move(mJobs.front());
        mJobs.pop_front();
        lGuard.unlock();
        lJob();
        lGuard.lock();
    }
}
