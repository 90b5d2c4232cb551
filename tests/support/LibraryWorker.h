/// A thread that runs what it is given, in order. The scripted library delivers its events on such threads.
#ifndef TESTS_SUPPORT_LIBRARYWORKER_H
#define TESTS_SUPPORT_LIBRARYWORKER_H

#include <chrono>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>

class ZTCLibraryWorker {
public:
    ZTCLibraryWorker() : mThread([this] { run(); }) {}
    /// Runs what is left, and joins the thread.
    ~ZTCLibraryWorker();
    ZTCLibraryWorker(const ZTCLibraryWorker&) = delete;
    ZTCLibraryWorker& operator=(const ZTCLibraryWorker&) = delete;

    /// Runs the job on the thread. Returns whether it was done within `aPatience`.
    bool runJob(std::function<void()> aJob, std::chrono::seconds aPatience);

private:
    void run();

    std::mutex mLock;
    std::condition_variable mChange;
    std::deque<std::function<void()>> mJobs;
    bool mIsToEnd = false;
    std::thread mThread;
};

#endif
