#include "sensor/keeper/src/KeeperTexts.h"

#include <sys/wait.h>

#include <cstring>

using std::chrono::seconds;

std::string endText(int aWaitStatus) {
    if (WIFSIGNALED(aWaitStatus)) {
        return "killed by signal " + std::to_string(WTERMSIG(aWaitStatus)) + " (" + strsignal(WTERMSIG(aWaitStatus)) +
               ")";
    }
    return "status " + std::to_string(WEXITSTATUS(aWaitStatus));
}

std::string pauseText(seconds aPause) {
    return aPause == seconds(0) ? "at once" : "in " + std::to_string(aPause.count()) + " s";
}
