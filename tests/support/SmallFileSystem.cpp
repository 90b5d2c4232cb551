#include "tests/support/SmallFileSystem.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <iostream>
#include <stdexcept>

/// A mount namespace of this process's own, once: what is mounted there goes with it, however it ends.
static bool sEnterOwnNamespace() {
    static const bool sIsIn = [] {
        if (unshare(CLONE_NEWNS) != 0) {
            const std::string lUser = "0 " + std::to_string(geteuid()) + " 1";
            const std::string lGroup = "0 " + std::to_string(getegid()) + " 1";
            if (unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) {
                return false;
            }
            std::ofstream("/proc/self/setgroups") << "deny";
            std::ofstream("/proc/self/uid_map") << lUser;
            std::ofstream("/proc/self/gid_map") << lGroup;
        }
        return mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
    }();
    return sIsIn;
}

ZTCSmallFileSystem::ZTCSmallFileSystem(std::string aPath, std::size_t aKilobytes) : mPath(std::move(aPath)) {
    const std::string lOptions = "size=" + std::to_string(aKilobytes) + "k";
    mIsMounted = sEnterOwnNamespace() && mount("tmpfs", mPath.c_str(), "tmpfs", 0, lOptions.c_str()) == 0;
    if (!mIsMounted) {
        std::cout << "no file system can be mounted here (" << std::strerror(errno) << "): the other way is taken\n";
    }
}

ZTCSmallFileSystem::~ZTCSmallFileSystem() {
    if (mIsMounted) {
        makeWritable();
        umount2(mPath.c_str(), MNT_DETACH);
    }
}

// The file system cannot become read-only itself while files are open for writing; a read-only view over it can.
void ZTCSmallFileSystem::makeReadOnly() {
    const char* const lpPath = mPath.c_str();
    if (mount(lpPath, lpPath, nullptr, MS_BIND, nullptr) != 0 ||
        mount(nullptr, lpPath, nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) != 0) {
        throw std::runtime_error("making " + mPath + " read-only: " + std::strerror(errno));
    }
    mIsCovered = true;
}

void ZTCSmallFileSystem::makeWritable() {
    if (mIsCovered) {
        umount2(mPath.c_str(), MNT_DETACH);
        mIsCovered = false;
    }
}

void ZTCSmallFileSystem::fill() {
    const int lFile = open(fillerPath().c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    const char lBytes[4096] = {};
    ssize_t lCount = 0;
    while ((lCount = write(lFile, lBytes, sizeof(lBytes))) > 0) {
    }
    const int lError = errno;
    close(lFile);
    if (lFile < 0 || lError != ENOSPC) {
        throw std::runtime_error("filling " + mPath + ": " + std::strerror(lError));
    }
}

void ZTCSmallFileSystem::empty() {
    unlink(fillerPath().c_str());
}
