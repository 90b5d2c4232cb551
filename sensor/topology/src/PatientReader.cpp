#include "sensor/topology/include/PatientReader.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <condition_variable>
#include <mutex>
#include <set>
#include <thread>

/// The files that have not answered. Shared with the threads that wait for them, which may outlive the reader.
struct ZTCPatientReader::ZTSBlocked {
    mutable std::mutex mMutex;
    std::set<std::string> mPaths;  // under mMutex
};

/// One call of readAll(), shared between the caller and the threads that read.
struct ZTSReading {
    std::mutex mMutex;
    std::condition_variable mChanged;
    std::vector<std::string> mPaths;                 ///< constant
    std::vector<std::optional<std::string>> mTexts;  ///< under mMutex
    std::size_t mNext = 0;                           ///< under mMutex: the file that is being read
    std::chrono::steady_clock::time_point mSince;    ///< under mMutex: when its reading began
    unsigned mReader = 0;                            ///< under mMutex: the thread that may write, counted from 0
};

static std::optional<std::string> sReadFile(const std::string& acrPath) {
    int lFile;
    do {
        lFile = open(acrPath.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY);
    } while (lFile < 0 && errno == EINTR);
    if (lFile < 0) {
        return std::nullopt;
    }
    std::array<char, gcMostAttributeBytes> lText;
    ssize_t lCount;
    do {
        lCount = read(lFile, lText.data(), lText.size());
    } while (lCount < 0 && errno == EINTR);
    close(lFile);
    if (lCount < 0) {
        return std::nullopt;
    }
    std::string lResult(lText.data(), static_cast<std::size_t>(lCount));
    lResult.erase(lResult.find_last_not_of(" \t\n\r") + 1);
    return lResult;
}

ZTCPatientReader::ZTCPatientReader(std::chrono::milliseconds aPatience)
    : mPatience(aPatience), mpBlocked(std::make_shared<ZTSBlocked>()) {}

ZTCPatientReader::~ZTCPatientReader() = default;

std::vector<std::string> ZTCPatientReader::getBlockedPaths() const {
    const std::lock_guard lLock(mpBlocked->mMutex);
    return {mpBlocked->mPaths.begin(), mpBlocked->mPaths.end()};
}

std::vector<std::optional<std::string>> ZTCPatientReader::readAll(std::vector<std::string> aPaths) {
    const auto lpReading = std::make_shared<ZTSReading>();
    mFiles += aPaths.size();
    lpReading->mTexts.resize(aPaths.size());
    lpReading->mPaths = std::move(aPaths);
    const std::size_t lCount = lpReading->mPaths.size();

    // Reads until the end, or until another thread has taken its place.
    const auto lRead = [lpReading, lpBlocked = mpBlocked, lCount](unsigned aReader) {
        std::unique_lock lLock(lpReading->mMutex);
        while (lpReading->mReader == aReader && lpReading->mNext < lCount) {
            const std::size_t lIndex = lpReading->mNext;
            const std::string& lrPath = lpReading->mPaths[lIndex];
            lpReading->mSince = std::chrono::steady_clock::now();
            lLock.unlock();
            bool lIsBlocked;
            {
                const std::lock_guard lBlockedLock(lpBlocked->mMutex);
                lIsBlocked = lpBlocked->mPaths.contains(lrPath);
            }
            std::optional<std::string> lText = lIsBlocked ? std::nullopt : sReadFile(lrPath);
            lLock.lock();
            if (lpReading->mReader != aReader) {
                const std::lock_guard lBlockedLock(lpBlocked->mMutex);
                lpBlocked->mPaths.erase(lrPath);
                return;
            }
            lpReading->mTexts[lIndex] = std::move(lText);
            ++lpReading->mNext;
        }
        lpReading->mChanged.notify_all();
    };

    std::unique_lock lLock(lpReading->mMutex);
    lpReading->mSince = std::chrono::steady_clock::now();
    std::thread(lRead, 0U).detach();
    while (lpReading->mNext < lCount) {
        lpReading->mChanged.wait_until(lLock, lpReading->mSince + mPatience);
        if (lpReading->mNext >= lCount || std::chrono::steady_clock::now() < lpReading->mSince + mPatience) {
            continue;
        }
        std::size_t lBlockedCount;
        {
            const std::lock_guard lBlockedLock(mpBlocked->mMutex);
            mpBlocked->mPaths.insert(lpReading->mPaths[lpReading->mNext]);
            lBlockedCount = mpBlocked->mPaths.size();
        }
        const unsigned lReader = ++lpReading->mReader;
        ++lpReading->mNext;
        lpReading->mSince = std::chrono::steady_clock::now();
        if (lBlockedCount >= gcMostBlockedFiles) {
            break;
        }
        std::thread(lRead, lReader).detach();
    }
    // A thread that is left behind writes no more: its number is not the reader's.
    ++lpReading->mReader;
    return std::move(lpReading->mTexts);
}
