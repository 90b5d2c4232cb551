#include "libkpm/sim/src/ScenarioFile.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstddef>
#include <system_error>

#include "libkpm/common/include/Descriptor.h"

[[noreturn]] static void sRefuse(const std::string& acrPath, const std::string& acrReason) {
    throw ZTCSimUnreadable(acrPath + ": " + acrReason);
}

std::string readSimFile(const std::string& acrPath) {
    const ZTCLibraryDescriptor lFile(::open(acrPath.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    if (!lFile.isOpen()) {
        sRefuse(acrPath, std::system_category().message(errno));
    }
    struct stat lStatus {};
    if (::fstat(lFile.get(), &lStatus) != 0) {
        sRefuse(acrPath, std::system_category().message(errno));
    }
    if (!S_ISREG(lStatus.st_mode)) {
        sRefuse(acrPath, "is not a regular file");
    }
    std::string lText;
    char lBytes[65536];
    while (true) {
        const ssize_t lCount = ::read(lFile.get(), lBytes, sizeof lBytes);
        if (lCount < 0 && errno == EINTR) {
            continue;
        }
        if (lCount < 0) {
            sRefuse(acrPath, std::system_category().message(errno));
        }
        if (lCount == 0) {
            return lText;
        }
        lText.append(lBytes, static_cast<std::size_t>(lCount));
        if (lText.size() > gcSimMaxTextSize) {
            sRefuse(acrPath, "has more than " + std::to_string(gcSimMaxTextSize) + " bytes");
        }
    }
}

std::string describeSimRefusal(const std::string& acrPath, const ZTCSimRefusal& acrRefusal) {
    const std::string lLine = acrRefusal.getLine() == 0 ? "" : ":" + std::to_string(acrRefusal.getLine());
    return acrPath + lLine + ": " + acrRefusal.what();
}
