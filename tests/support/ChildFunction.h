/// Runs a function in a child process, where it may change what the test's own process has to keep.
#ifndef TESTS_SUPPORT_CHILDFUNCTION_H
#define TESTS_SUPPORT_CHILDFUNCTION_H

#include <sys/wait.h>
#include <unistd.h>

#include <functional>

/// The exit status of a child process that runs the function, or -1.
inline int statusOfChild(const std::function<int()>& acrFunction) {
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(acrFunction());
    }
    int lStatus = -1;
    return lChild > 0 && waitpid(lChild, &lStatus, 0) == lChild && WIFEXITED(lStatus) ? WEXITSTATUS(lStatus) : -1;
}

#endif
