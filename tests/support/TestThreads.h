/// Threads that a test runs beside each other. They begin together, and what one of them throws fails the test.
#ifndef TESTS_SUPPORT_TESTTHREADS_H
#define TESTS_SUPPORT_TESTTHREADS_H

#include <gtest/gtest.h>

#include <atomic>
#include <exception>
#include <memory>
#include <thread>
#include <vector>

class ZTCTestThreads {
public:
    ZTCTestThreads() = default;
    ~ZTCTestThreads() { join(); }
    ZTCTestThreads(const ZTCTestThreads&) = delete;
    ZTCTestThreads& operator=(const ZTCTestThreads&) = delete;

    /// Starts threads that call aDo(0) to aDo(aCount - 1), each as soon as all of them have started.
    template <class Do>
    void start(unsigned aCount, Do aDo) {
        const ZTCGate lGate;
        for (unsigned lThread = 0; lThread < aCount; ++lThread) {
            ++mRunning;
            mThreads.emplace_back([this, aDo, lThread, lpIsOpen = lGate.mpIsOpen]() mutable {
                lpIsOpen->wait(false);
                try {
                    aDo(lThread);
                } catch (const std::exception& lcrError) {
                    ADD_FAILURE() << "thread " << lThread << " ended with: " << lcrError.what();
                }
                --mRunning;
            });
        }
    }

    /// Waits until all of them have ended.
    void join() {
        for (std::thread& lrThread : mThreads) {
            lrThread.join();
        }
        mThreads.clear();
    }

    /// Whether one of them is still at work.
    bool isRunning() const { return mRunning != 0; }

private:
    /// Opens when it goes away, also where a thread cannot be started.
    struct ZTCGate {
        ~ZTCGate() {
            *mpIsOpen = true;
            mpIsOpen->notify_all();
        }
        std::shared_ptr<std::atomic<bool>> mpIsOpen = std::make_shared<std::atomic<bool>>(false);
    };

    std::atomic<unsigned> mRunning{0};
    std::vector<std::thread> mThreads;
};

/// Runs aDo(0) to aDo(aCount - 1) on threads of their own, and returns when all of them have ended.
template <class Do>
void runOnThreads(unsigned aCount, Do aDo) {
    ZTCTestThreads lThreads;
    lThreads.start(aCount, aDo);
    lThreads.join();
}

#endif
