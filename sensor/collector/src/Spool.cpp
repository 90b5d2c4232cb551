#include "sensor/collector/include/Spool.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <tuple>

/// Room that is left to others where it can only be estimated.
static constexpr std::uint64_t scMargin = 1U << 20U;

static ZTCFileDescriptor sOpen(const std::string& acrPath, int aFlags) {
    ZTCFileDescriptor lFile = ZTCFileDescriptor::open(acrPath.c_str(), aFlags | O_NOFOLLOW | O_NOCTTY, 0600);
    if (!lFile.isOpen()) {
        throw ZTCSpoolTroubleEx("cannot open " + acrPath, errno);
    }
    return lFile;
}

static std::uint64_t sSizeOf(int aFile, const std::string& acrPath) {
    struct stat lStatus {};
    if (fstat(aFile, &lStatus) != 0) {
        throw ZTCSpoolTroubleEx("cannot look at " + acrPath, errno);
    }
    return static_cast<std::uint64_t>(lStatus.st_size);
}

static void sRename(const std::string& acrFrom, const std::string& acrTo) {
    if (rename(acrFrom.c_str(), acrTo.c_str()) != 0) {
        throw ZTCSpoolTroubleEx("cannot rename " + acrFrom, errno);
    }
}

static void sUnlink(const std::string& acrPath) {
    if (unlink(acrPath.c_str()) != 0 && errno != ENOENT) {
        throw ZTCSpoolTroubleEx("cannot remove " + acrPath, errno);
    }
}

void ZTCSpool::open() {
    if (mkdir(mFolder.c_str(), 0700) != 0 && errno != EEXIST) {
        throw ZTCSpoolTroubleEx("cannot make the spool folder " + mFolder, errno);
    }
}

std::vector<ZTSSpoolEntry> ZTCSpool::list() const {
    struct ZTSClose {
        void operator()(DIR* apFolder) const { closedir(apFolder); }
    };
    const std::unique_ptr<DIR, ZTSClose> lpFolder(opendir(mFolder.c_str()));
    if (lpFolder == nullptr) {
        throw ZTCSpoolTroubleEx("cannot open the spool folder " + mFolder, errno);
    }
    std::vector<ZTSSpoolEntry> lEntries;
    errno = 0;
    while (const dirent* lpEntry = readdir(lpFolder.get())) {
        struct stat lStatus {};
        const auto lName = parseSpoolName(lpEntry->d_name);
        if (lName && fstatat(dirfd(lpFolder.get()), lpEntry->d_name, &lStatus, AT_SYMLINK_NOFOLLOW) == 0 &&
            S_ISREG(lStatus.st_mode)) {
            lEntries.push_back({*lName, static_cast<std::uint64_t>(lStatus.st_size)});
        }
        errno = 0;
    }
    if (errno != 0) {
        throw ZTCSpoolTroubleEx("cannot read the spool folder " + mFolder, errno);
    }
    std::ranges::sort(lEntries, {}, [](const ZTSSpoolEntry& acrEntry) {
        return std::tie(acrEntry.mName.mNumber, acrEntry.mName.mGeneration, acrEntry.mName.mState);
    });
    return lEntries;
}

ZTSSpoolPart ZTCSpool::createPart(std::uint64_t aNumber, const std::string& acrGeneration, std::uint64_t aReserve) {
    ZTSSpoolPart lPart;
    lPart.mName = {.mNumber = aNumber, .mGeneration = acrGeneration, .mState = ZTSPS_Part};
    lPart.mFile = sOpen(pathOf(lPart.mName), O_RDWR | O_CREAT | O_EXCL);
    try {
        reserve(lPart, aReserve);
    } catch (const ZTCSpoolTroubleEx&) {
        // The request has not been sent: the empty file has no meaning yet. Some file systems keep a part of the room.
        unlink(pathOf(lPart.mName).c_str());
        throw;
    }
    return lPart;
}

ZTSSpoolPart ZTCSpool::openPart(const ZTSSpoolName& acrName) {
    ZTSSpoolPart lPart;
    lPart.mName = acrName;
    lPart.mFile = sOpen(pathOf(acrName), O_RDWR);
    lPart.mSize = sSizeOf(lPart.mFile.get(), pathOf(acrName));
    return lPart;
}

void ZTCSpool::reserve(ZTSSpoolPart& arPart, std::uint64_t aBytes) {
    if (aBytes <= arPart.mReserved) {
        return;
    }
    int lResult;
    do {
        lResult = fallocate(arPart.mFile.get(), FALLOC_FL_KEEP_SIZE, 0, static_cast<off_t>(aBytes));
    } while (lResult != 0 && errno == EINTR);
    if (lResult != 0 && errno != EOPNOTSUPP) {
        throw ZTCSpoolTroubleEx("no room for " + std::to_string(aBytes) + " bytes in " + mFolder, errno);
    }
    if (lResult != 0) {  // this file system reserves nothing: see at least that there is room now
        struct statvfs lRoom {};
        if (fstatvfs(arPart.mFile.get(), &lRoom) != 0) {
            throw ZTCSpoolTroubleEx("cannot look at the file system of " + mFolder, errno);
        }
        if (static_cast<std::uint64_t>(lRoom.f_bavail) * lRoom.f_frsize + arPart.mSize < aBytes + scMargin) {
            throw ZTCSpoolTroubleEx("no room for " + std::to_string(aBytes) + " bytes in " + mFolder, ENOSPC);
        }
    }
    arPart.mReserved = aBytes;
}

ZTSSpoolName ZTCSpool::settle(ZTSSpoolPart& arPart, ZTESpoolState aState) {
    // Truncating to the size that it has gives the room behind it back. Where that fails, the room is given back when
    // the file is removed.
    [[maybe_unused]] const int lResult = ftruncate(arPart.mFile.get(), static_cast<off_t>(arPart.mSize));
    ZTSSpoolName lName = arPart.mName.withState(aState);
    sRename(pathOf(arPart.mName), pathOf(lName));
    arPart.mFile.reset();
    return lName;
}

ZTSSpoolName ZTCSpool::finish(ZTSSpoolPart& arPart) {
    return settle(arPart, ZTSPS_Frame);
}

ZTSSpoolName ZTCSpool::tear(ZTSSpoolPart& arPart) {
    if (arPart.mSize != 0) {
        return settle(arPart, ZTSPS_Torn);
    }
    discard(arPart);
    return arPart.mName;
}

void ZTCSpool::discard(ZTSSpoolPart& arPart) {
    sUnlink(pathOf(arPart.mName));
    arPart.mFile.reset();
}

std::vector<std::uint8_t> ZTCSpool::read(const ZTSSpoolName& acrName) const {
    const std::string lPath = pathOf(acrName);
    const ZTCFileDescriptor lFile = sOpen(lPath, O_RDONLY);
    std::vector<std::uint8_t> lBytes(sSizeOf(lFile.get(), lPath));
    std::size_t lHad = 0;
    while (lHad < lBytes.size()) {
        const ssize_t lCount = ::read(lFile.get(), lBytes.data() + lHad, lBytes.size() - lHad);
        if (lCount > 0) {
            lHad += static_cast<std::size_t>(lCount);
        } else if (lCount == 0) {
            lBytes.resize(lHad);
        } else if (errno != EINTR) {
            throw ZTCSpoolTroubleEx("cannot read " + lPath, errno);
        }
    }
    return lBytes;
}

void ZTCSpool::remove(const ZTSSpoolName& acrName) const {
    sUnlink(pathOf(acrName));
}

void ZTCSpool::sync(const ZTSSpoolName& acrName) const {
    const std::string lPath = pathOf(acrName);
    const ZTCFileDescriptor lFile = sOpen(lPath, O_RDONLY);
    const ZTCFileDescriptor lFolder = sOpen(mFolder, O_RDONLY | O_DIRECTORY);
    if (fsync(lFile.get()) != 0 || fsync(lFolder.get()) != 0) {
        throw ZTCSpoolTroubleEx("cannot write " + lPath + " to the disk", errno);
    }
}
