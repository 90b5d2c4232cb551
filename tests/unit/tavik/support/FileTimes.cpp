#include "tests/unit/tavik/support/FileTimes.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

void setFileTime(const std::string& acrPath, std::time_t aSeconds) {
    const timespec lTimes[2] = {{aSeconds, 0}, {aSeconds, 0}};
    if (utimensat(AT_FDCWD, acrPath.c_str(), lTimes, 0) != 0) {
        throw std::runtime_error("utimensat of " + acrPath);
    }
}

std::time_t fileTime(const std::string& acrPath) {
    struct stat lStatus {};
    if (stat(acrPath.c_str(), &lStatus) != 0) {
        throw std::runtime_error("stat of " + acrPath);
    }
    return lStatus.st_mtime;
}

ZTCZombie::ZTCZombie() : mPid(fork()) {
    if (mPid == 0) {
        _exit(0);
    }
    siginfo_t lInfo{};
    if (mPid < 0 || waitid(P_PID, static_cast<id_t>(mPid), &lInfo, WEXITED | WNOWAIT) != 0) {
        throw std::runtime_error("no zombie");
    }
}

ZTCZombie::~ZTCZombie() {
    waitpid(mPid, nullptr, 0);
}

int idOfAGoneProcess() {
    return ZTCZombie().getPid();
}
