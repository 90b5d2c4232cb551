#include "sensor/client/include/SensorPidFile.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdio>
#include <fstream>
#include <limits>
#include <string_view>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/ClientErrors.h"

/// Tries to lock the file at the path. Between opening and lock, another file can take its place.
static constexpr int scMostTries = 100;

long readPid(int aDescriptor) {
    char lText[32];
    ssize_t lCount;
    do {
        lCount = pread(aDescriptor, lText, sizeof(lText), 0);
    } while (lCount < 0 && errno == EINTR);
    if (lCount <= 0) {
        return 0;
    }
    int lPid = 0;
    const auto [lpEnd, lError] = std::from_chars(lText, lText + lCount, lPid);
    const bool lIsWhole = lpEnd == lText + lCount || *lpEnd == '\n' || *lpEnd == ' ';
    return lError == std::errc() && lIsWhole && lPid > 0 ? lPid : 0;
}

bool isProcessAlive(long aPid) {
    if (aPid <= 0 || aPid > std::numeric_limits<pid_t>::max()) {
        return false;
    }
    if (kill(static_cast<pid_t>(aPid), 0) != 0 && errno != EPERM) {
        return false;
    }
    // "PID (NAME) STATE ...": the name may hold anything, also brackets.
    std::ifstream lFile("/proc/" + std::to_string(aPid) + "/stat");
    std::string lLine;
    std::getline(lFile, lLine);
    const std::size_t lEnd = lLine.rfind(") ");
    return lEnd == std::string::npos || (lLine.substr(lEnd + 2, 1) != "Z" && lLine.substr(lEnd + 2, 1) != "X");
}

ZTCSensorPidFile::ZTCSensorPidFile(const std::string& acrDirectory) : mPath(acrDirectory + gcSensorPidFileName) {
    take();
}

ZTCSensorPidFile::~ZTCSensorPidFile() {
    if (mFile.isAtPath(mPath.c_str()) && readPid(mFile.get()) == getpid()) {
        unlink(mPath.c_str());
    }
}

void ZTCSensorPidFile::take() {
    ZTCFileDescriptor lFile;
    for (int lTry = 1;; ++lTry) {
        lFile = ZTCFileDescriptor::open(mPath.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK, 0644);
        if (!lFile.isOpen()) {
            throw ZTCSystemCallEx("cannot open the sensor's pid file " + mPath, errno);
        }
        while (flock(lFile.get(), LOCK_EX | LOCK_NB) != 0) {
            if (errno == EWOULDBLOCK) {
                throw ZTCSensorBusyEx("another sensor, process " + std::to_string(readPid(lFile.get())) + ", holds " +
                                      mPath);
            }
            if (errno != EINTR) {
                throw ZTCSystemCallEx("cannot lock the sensor's pid file " + mPath, errno);
            }
        }
        errno = ESTALE;  // another file is there by now, unless a call says more
        if (lFile.isAtPath(mPath.c_str())) {
            break;
        }
        if (lTry == scMostTries) {
            throw ZTCSystemCallEx("cannot keep hold of the sensor's pid file " + mPath, errno);
        }
    }

    const long lPid = readPid(lFile.get());
    if (lPid != 0 && lPid != getpid() && isProcessAlive(lPid)) {
        throw ZTCSensorBusyEx(mPath + " names process " + std::to_string(lPid) +
                              ", which runs: remove the file if that process is not a sensor");
    }
    const std::string lText = std::to_string(getpid()) + "\n";
    if (ftruncate(lFile.get(), 0) != 0 ||
        pwrite(lFile.get(), lText.data(), lText.size(), 0) != static_cast<ssize_t>(lText.size())) {
        throw ZTCSystemCallEx("cannot write the sensor's pid file " + mPath, errno);
    }
    mFile = std::move(lFile);
}

void ZTCSensorPidFile::touch() {
    if (!mFile.isAtPath(mPath.c_str())) {
        mFile.reset();
        take();
    }
    if (futimens(mFile.get(), nullptr) != 0) {
        throw ZTCSystemCallEx("cannot touch the sensor's pid file " + mPath, errno);
    }
}
