/// Threads that a test starts. An exception in one of them fails the test. The end of the scope waits for them, so
/// declare them after everything that they use.
#ifndef TESTS_SUPPORT_TESTTHREADS_H
#define TESTS_SUPPORT_TESTTHREADS_H

#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <atomic>
#include <exception>
#include <list>
#include <memory>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>

/// One thread. Used by the thread that made it.
class ZTCTestThread {
public:
    /// Starts a thread that calls aDo(), or aDo(token) if it takes a std::stop_token: a loop ends when the token says
    /// that a stop was requested. The text of a failure has the name.
    template <class Do>
    explicit ZTCTestThread(Do aDo, std::string aName = "a thread of the test")
        : mThread([this, lDo = std::move(aDo), lName = std::move(aName)](const std::stop_token& acrStop) mutable {
              try {
                  if constexpr (std::is_invocable_v<Do&, const std::stop_token&>) {
                      lDo(acrStop);
                  } else {
                      lDo();
                  }
              } catch (const std::exception& lcrError) {
                  ADD_FAILURE() << lName << " ended with: " << lcrError.what();
              } catch (...) {
                  ADD_FAILURE() << lName << " ended with an exception of an unknown class";
              }
              mIsRunning = false;
          }) {}
    /// As stop() does.
    ~ZTCTestThread() = default;
    ZTCTestThread(const ZTCTestThread&) = delete;
    ZTCTestThread& operator=(const ZTCTestThread&) = delete;

    /// Whether its function has not returned yet.
    bool isRunning() const { return mIsRunning; }

    /// Waits until it has ended.
    void join() {
        if (mThread.joinable()) {
            mThread.join();
        }
    }

    /// Requests a stop, and waits until it has ended.
    void stop() {
        mThread.request_stop();
        join();
    }

    /// Not behind join() or stop().
    void sendSignal(int aSignal) { EXPECT_EQ(pthread_kill(mThread.native_handle(), aSignal), 0); }

private:
    std::atomic<bool> mIsRunning{true};
    std::jthread mThread;
};

/// Threads that begin together.
class ZTCTestThreads {
public:
    /// Starts threads that call aDo(0) to aDo(aCount - 1), each as soon as all of them have started.
    template <class Do>
    void start(unsigned aCount, Do aDo) {
        const ZTCGate lGate;
        for (unsigned lThread = 0; lThread < aCount; ++lThread) {
            mThreads.emplace_back(
                [aDo, lThread, lpIsOpen = lGate.mpIsOpen]() mutable {
                    lpIsOpen->wait(false);
                    aDo(lThread);
                },
                "thread " + std::to_string(lThread));
        }
    }

    /// Waits until all of them have ended.
    void join() { mThreads.clear(); }

    /// Whether one of them is still at work.
    bool isRunning() const { return std::ranges::any_of(mThreads, &ZTCTestThread::isRunning); }

private:
    /// Opens when it goes away, also where a thread cannot be started.
    struct ZTCGate {
        ~ZTCGate() {
            *mpIsOpen = true;
            mpIsOpen->notify_all();
        }
        std::shared_ptr<std::atomic<bool>> mpIsOpen = std::make_shared<std::atomic<bool>>(false);
    };

    std::list<ZTCTestThread> mThreads;
};

/// Runs aDo(0) to aDo(aCount - 1) on threads of their own, and returns when all of them have ended.
template <class Do>
void runOnThreads(unsigned aCount, Do aDo) {
    ZTCTestThreads lThreads;
    lThreads.start(aCount, aDo);
    lThreads.join();
}

#endif
