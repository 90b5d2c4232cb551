#include "sensor/store/src/StoreFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/store/include/StoreErrors.h"

[[noreturn]] static void sFail(const std::string& acrPath, const std::string& acrWhat, int aErrno) {
    throw ZTCStoreNoRoomEx(acrPath + ": " + acrWhat + ": " + std::strerror(aErrno));
}

std::string getHistoryPath(const std::string& acrStateDirectory) {
    return acrStateDirectory + "/history.db";
}

void createHistoryFile(const std::string& acrPath) {
    if (getFileBytes(acrPath) != 0) {
        return;
    }
    const ZTCFileDescriptor lFile = ZTCFileDescriptor::open(acrPath.c_str(), O_RDWR | O_CREAT, 0640);
    if (!lFile.isOpen()) {
        sFail(acrPath, "it cannot be created", errno);
    }
    if (fchmod(lFile.get(), 0640) != 0) {
        sFail(acrPath, "its mode cannot be set", errno);
    }
}

static void sSyncDirectoryOf(const std::string& acrPath) {
    const std::string lDirectory = acrPath.substr(0, acrPath.rfind('/'));
    const ZTCFileDescriptor lFile = ZTCFileDescriptor::open(lDirectory.c_str(), O_RDONLY | O_DIRECTORY);
    if (!lFile.isOpen() || fsync(lFile.get()) != 0) {
        sFail(lDirectory, "it cannot be synced", errno);
    }
}

std::string setDamagedFileAside(const std::string& acrPath) {
    const std::time_t lNow = std::time(nullptr);
    std::tm lTime{};
    gmtime_r(&lNow, &lTime);
    char lDate[32];
    std::strftime(lDate, sizeof lDate, "%Y%m%d-%H%M%S", &lTime);
    const std::string lStart = acrPath.substr(0, acrPath.rfind('/') + 1) + gcDamagedPrefix + lDate;
    std::string lTarget = lStart + gcHistorySuffix;
    for (int i = 2; access(lTarget.c_str(), F_OK) == 0; ++i) {
        lTarget = lStart + "-" + std::to_string(i) + gcHistorySuffix;
    }
    if (rename(acrPath.c_str(), lTarget.c_str()) != 0) {
        sFail(acrPath, "it is damaged and cannot be renamed to " + lTarget, errno);
    }
    // A journal belongs to its database alone: the next database must not find it.
    if (rename((acrPath + "-wal").c_str(), (lTarget + "-wal").c_str()) != 0 && errno != ENOENT) {
        sFail(acrPath + "-wal", "it cannot be renamed", errno);
    }
    if (unlink((acrPath + "-shm").c_str()) != 0 && errno != ENOENT) {
        sFail(acrPath + "-shm", "it cannot be removed", errno);
    }
    sSyncDirectoryOf(acrPath);
    return lTarget;
}

std::uint64_t getFileBytes(const std::string& acrPath) {
    struct stat lState {};
    return stat(acrPath.c_str(), &lState) == 0 ? static_cast<std::uint64_t>(lState.st_size) : 0;
}
