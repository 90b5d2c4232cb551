/// A copy of the test's process that runs a function of the test. It never returns into the test program.
#ifndef TESTS_UNIT_SYSTEM_FORKEDPROCESS_H
#define TESTS_UNIT_SYSTEM_FORKEDPROCESS_H

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <functional>
#include <iostream>
#include <stdexcept>
#include <string>

#include "tests/support/Waiting.h"

class ZTCForkedProcess {
public:
    using Function = std::function<int(ZTCForkedProcess&)>;

    /// The child's exit status is what the function returns, 99 where an exception left it. Its standard streams go to
    /// the files with this prefix, where one is given.
    explicit ZTCForkedProcess(const Function& acrFunction, const std::string& acrOutputPrefix = "") {
        std::cout.flush();
        std::cerr.flush();
        if (pipe2(mToParent, O_CLOEXEC) != 0 || pipe2(mToChild, O_CLOEXEC) != 0) {
            throw std::runtime_error("no pipes");
        }
        mPid = fork();
        if (mPid < 0) {
            throw std::runtime_error("no process");
        }
        if (mPid == 0) {
            runChild(acrFunction, acrOutputPrefix);
        }
        close(mToParent[1]);
        close(mToChild[0]);
    }
    ~ZTCForkedProcess() {
        if (mPid > 0 && !mIsReaped) {
            ::kill(mPid, SIGKILL);
            waitpid(mPid, nullptr, 0);
        }
        close(mToParent[0]);
        close(mToChild[1]);
    }
    ZTCForkedProcess(const ZTCForkedProcess&) = delete;
    ZTCForkedProcess& operator=(const ZTCForkedProcess&) = delete;

    // In the child.
    void tellParent() { [[maybe_unused]] const ssize_t lCount = write(mToParent[1], "x", 1); }
    void waitForParent() {
        char lByte;
        if (read(mToChild[0], &lByte, 1) != 1) {
            _exit(98);
        }
    }

    // In the parent.
    pid_t getPid() const { return mPid; }
    void waitForChild() {
        struct pollfd lPipe = {mToParent[0], POLLIN, 0};
        char lByte;
        if (poll(&lPipe, 1, ZTCDeadline().remainingMilliseconds()) != 1 || read(mToParent[0], &lByte, 1) != 1) {
            throw std::runtime_error("the child said nothing");
        }
    }
    void tellChild() { [[maybe_unused]] const ssize_t lCount = write(mToChild[1], "x", 1); }
    void sendSignal(int aSignal) const { ::kill(mPid, aSignal); }

    /// The exit status, or 1000 plus the signal that ended it.
    int waitForExit() {
        int lStatus = 0;
        waitUntil([&] { return waitpid(mPid, &lStatus, WNOHANG) == mPid; }, "the child's end");
        mIsReaped = true;
        return WIFEXITED(lStatus) ? WEXITSTATUS(lStatus) : 1000 + WTERMSIG(lStatus);
    }

private:
    [[noreturn]] void runChild(const Function& acrFunction, const std::string& acrOutputPrefix) {
        close(mToParent[0]);
        close(mToChild[1]);
        if (!acrOutputPrefix.empty()) {
            for (const int lStream : {STDOUT_FILENO, STDERR_FILENO}) {
                const std::string lPath = acrOutputPrefix + (lStream == STDOUT_FILENO ? ".out" : ".err");
                const int lFile = open(lPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC, 0600);
                dup2(lFile, lStream);
                close(lFile);
            }
        }
        int lStatus = 99;
        try {
            lStatus = acrFunction(*this);
        } catch (...) {
            std::cerr << "an exception left the child's function" << std::endl;
        }
        std::cout.flush();
        std::cerr.flush();
        _exit(lStatus);
    }

    pid_t mPid = -1;
    int mToParent[2] = {-1, -1};
    int mToChild[2] = {-1, -1};
    bool mIsReaped = false;
};

#endif
