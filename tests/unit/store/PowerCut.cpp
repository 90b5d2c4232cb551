#include "tests/unit/store/PowerCut.h"

#include <sqlite3.h>

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstring>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/support/TemporaryDirectory.h"

namespace {

using Bytes = std::string;

/// One change of a file that has not been synced. No bytes: a truncation to the offset.
struct ZTSUnsynced {
    std::uint64_t mOffset;
    Bytes mBytes;
};

struct ZTSFileState {
    Bytes mSynced;
    std::vector<ZTSUnsynced> mUnsynced;
};

struct ZTSDisk {
    std::map<std::string, ZTSFileState> mFiles;
    std::atomic<std::uint64_t> mOperations = 0;
    std::atomic<std::uint64_t> mFailFrom = 0;
    std::atomic<bool> mHasFailed = false;
};

ZTSDisk* gpDisk = nullptr;
sqlite3_vfs* gpReal = nullptr;
sqlite3_vfs gLayer;
sqlite3_io_methods gMethods;

/// An open file; that of the real layer stands behind it.
struct ZTSFile {
    sqlite3_file mBase;
    ZTSFileState* mpState;
};

sqlite3_file* real(sqlite3_file* apFile) {
    return reinterpret_cast<sqlite3_file*>(reinterpret_cast<ZTSFile*>(apFile) + 1);
}
ZTSFileState* state(sqlite3_file* apFile) {
    return reinterpret_cast<ZTSFile*>(apFile)->mpState;
}

bool hasPower() {
    ++gpDisk->mOperations;
    if (gpDisk->mFailFrom != 0 && gpDisk->mOperations >= gpDisk->mFailFrom) {
        gpDisk->mHasFailed = true;
        return false;
    }
    return true;
}

void applyChange(Bytes& arImage, const ZTSUnsynced& acrChange) {
    if (acrChange.mBytes.empty()) {
        arImage.resize(acrChange.mOffset);
        return;
    }
    arImage.resize(std::max(arImage.size(), acrChange.mOffset + acrChange.mBytes.size()));
    arImage.replace(acrChange.mOffset, acrChange.mBytes.size(), acrChange.mBytes);
}

int layerWrite(sqlite3_file* apFile, const void* apBytes, int aCount, sqlite3_int64 aOffset) {
    if (state(apFile) != nullptr) {
        if (!hasPower()) {
            return SQLITE_IOERR_WRITE;
        }
        state(apFile)->mUnsynced.push_back(
            {static_cast<std::uint64_t>(aOffset),
             Bytes(static_cast<const char*>(apBytes), static_cast<std::size_t>(aCount))});
    }
    return real(apFile)->pMethods->xWrite(real(apFile), apBytes, aCount, aOffset);
}

int layerTruncate(sqlite3_file* apFile, sqlite3_int64 aSize) {
    if (state(apFile) != nullptr) {
        if (!hasPower()) {
            return SQLITE_IOERR_TRUNCATE;
        }
        state(apFile)->mUnsynced.push_back({static_cast<std::uint64_t>(aSize), {}});
    }
    return real(apFile)->pMethods->xTruncate(real(apFile), aSize);
}

int layerSync(sqlite3_file* apFile, int aFlags) {
    if (state(apFile) == nullptr) {
        return real(apFile)->pMethods->xSync(real(apFile), aFlags);
    }
    if (!hasPower()) {
        return SQLITE_IOERR_FSYNC;
    }
    for (const ZTSUnsynced& lrChange : state(apFile)->mUnsynced) {
        applyChange(state(apFile)->mSynced, lrChange);
    }
    state(apFile)->mUnsynced.clear();
    return SQLITE_OK;
}

int layerClose(sqlite3_file* apFile) {
    const int lResult = real(apFile)->pMethods->xClose(real(apFile));
    apFile->pMethods = nullptr;
    return lResult;
}
int layerRead(sqlite3_file* apFile, void* apBytes, int aCount, sqlite3_int64 aOffset) {
    return real(apFile)->pMethods->xRead(real(apFile), apBytes, aCount, aOffset);
}
int layerFileSize(sqlite3_file* apFile, sqlite3_int64* apSize) {
    return real(apFile)->pMethods->xFileSize(real(apFile), apSize);
}
int layerLock(sqlite3_file* apFile, int aLevel) {
    return real(apFile)->pMethods->xLock(real(apFile), aLevel);
}
int layerUnlock(sqlite3_file* apFile, int aLevel) {
    return real(apFile)->pMethods->xUnlock(real(apFile), aLevel);
}
int layerCheckReservedLock(sqlite3_file* apFile, int* apResult) {
    return real(apFile)->pMethods->xCheckReservedLock(real(apFile), apResult);
}
int layerFileControl(sqlite3_file* apFile, int aOperation, void* apArgument) {
    return real(apFile)->pMethods->xFileControl(real(apFile), aOperation, apArgument);
}
int layerSectorSize(sqlite3_file* apFile) {
    return real(apFile)->pMethods->xSectorSize(real(apFile));
}
int layerDeviceCharacteristics(sqlite3_file*) {
    return 0;
}
int layerShmMap(sqlite3_file* apFile, int aPage, int aSize, int aExtend, void volatile** appPage) {
    return real(apFile)->pMethods->xShmMap(real(apFile), aPage, aSize, aExtend, appPage);
}
int layerShmLock(sqlite3_file* apFile, int aOffset, int aCount, int aFlags) {
    return real(apFile)->pMethods->xShmLock(real(apFile), aOffset, aCount, aFlags);
}
void layerShmBarrier(sqlite3_file* apFile) {
    real(apFile)->pMethods->xShmBarrier(real(apFile));
}
int layerShmUnmap(sqlite3_file* apFile, int aDelete) {
    return real(apFile)->pMethods->xShmUnmap(real(apFile), aDelete);
}

int layerOpen(sqlite3_vfs*, const char* apName, sqlite3_file* apFile, int aFlags, int* apOutFlags) {
    auto* const lpFile = reinterpret_cast<ZTSFile*>(apFile);
    lpFile->mBase.pMethods = nullptr;
    lpFile->mpState = nullptr;
    const int lResult = gpReal->xOpen(gpReal, apName, real(apFile), aFlags, apOutFlags);
    if (lResult != SQLITE_OK) {
        return lResult;
    }
    lpFile->mBase.pMethods = &gMethods;
    if (apName != nullptr && (aFlags & (SQLITE_OPEN_MAIN_DB | SQLITE_OPEN_WAL)) != 0) {
        const auto [lPlace, lIsNew] = gpDisk->mFiles.try_emplace(apName);
        if (lIsNew) {
            lPlace->second.mSynced = readFile(apName);
        }
        lpFile->mpState = &lPlace->second;
    }
    return SQLITE_OK;
}

}  // namespace

ZTCPowerCut::ZTCPowerCut() {
    if (gpDisk != nullptr) {
        throw std::logic_error("one power cut at a time");
    }
    gpDisk = new ZTSDisk;
    gpReal = sqlite3_vfs_find(nullptr);
    gLayer = *gpReal;
    gLayer.zName = "power-cut";
    gLayer.szOsFile = gpReal->szOsFile + static_cast<int>(sizeof(ZTSFile));
    gLayer.xOpen = layerOpen;
    gMethods = {.iVersion = 2,
                .xClose = layerClose,
                .xRead = layerRead,
                .xWrite = layerWrite,
                .xTruncate = layerTruncate,
                .xSync = layerSync,
                .xFileSize = layerFileSize,
                .xLock = layerLock,
                .xUnlock = layerUnlock,
                .xCheckReservedLock = layerCheckReservedLock,
                .xFileControl = layerFileControl,
                .xSectorSize = layerSectorSize,
                .xDeviceCharacteristics = layerDeviceCharacteristics,
                .xShmMap = layerShmMap,
                .xShmLock = layerShmLock,
                .xShmBarrier = layerShmBarrier,
                .xShmUnmap = layerShmUnmap,
                .xFetch = nullptr,
                .xUnfetch = nullptr};
    sqlite3_vfs_register(&gLayer, 1);
}

ZTCPowerCut::~ZTCPowerCut() {
    sqlite3_vfs_unregister(&gLayer);
    sqlite3_vfs_register(gpReal, 1);
    delete gpDisk;
    gpDisk = nullptr;
}

void ZTCPowerCut::failFrom(std::uint64_t aNth) {
    gpDisk->mHasFailed = false;
    gpDisk->mFailFrom = aNth == 0 ? 0 : gpDisk->mOperations + aNth;
}

bool ZTCPowerCut::hasFailed() const {
    return gpDisk->mHasFailed;
}

void ZTCPowerCut::cut(bool aKeepsAll, const std::function<unsigned(unsigned)>& acrDraw) {
    static constexpr unsigned scSector = 512;
    for (auto& [lrName, lrState] : gpDisk->mFiles) {
        for (ZTSUnsynced lChange : lrState.mUnsynced) {
            const unsigned lFate = aKeepsAll ? 0 : acrDraw(3);
            if (lFate == 1 && !lChange.mBytes.empty()) {
                lChange.mBytes.resize(std::min<std::size_t>(lChange.mBytes.size(), scSector * (1 + acrDraw(7))));
            }
            if (lFate != 2) {
                applyChange(lrState.mSynced, lChange);
            }
        }
        writeFile(lrName, lrState.mSynced);
        std::remove((lrName + "-shm").c_str());
    }
    gpDisk->mFiles.clear();
    gpDisk->mFailFrom = 0;
    gpDisk->mHasFailed = false;
}
