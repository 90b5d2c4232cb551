#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <system_error>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/settings/include/Settings.h"

static constexpr std::size_t scMaxFileSize = 1048576;

/// Returns what is wrong; empty where the content was read.
static std::string sReadContent(const ZTCFileDescriptor& acrFile, std::string& arContent) {
    struct stat lStatus {};
    if (fstat(acrFile.get(), &lStatus) != 0) {
        return "cannot be read: " + std::generic_category().message(errno) + ", must be readable";
    }
    if (!S_ISREG(lStatus.st_mode)) {
        return "is not a file: something else, must be a regular file";
    }
    char lChunk[8192];
    while (true) {
        const ssize_t lRead = read(acrFile.get(), lChunk, sizeof(lChunk));
        if (lRead == 0) {
            return "";
        }
        if (lRead < 0 && errno != EINTR) {
            return "cannot be read: " + std::generic_category().message(errno) + ", must be readable";
        }
        arContent.append(lChunk, static_cast<std::size_t>(lRead > 0 ? lRead : 0));
        if (arContent.size() > scMaxFileSize) {
            return "is too long: more than 1048576 bytes, must be of at most 1048576 bytes";
        }
    }
}

ZTSSettingsReading readSettings(const std::string& acrOption) {
    const char* const lpVariable = std::getenv(gcSettingsFileVariable);
    const std::string lNamed = !acrOption.empty() ? acrOption : lpVariable != nullptr ? lpVariable : "";
    const bool lIsNamed = !lNamed.empty();
    const std::string lPath = lIsNamed ? lNamed : gcDefaultSettingsFile;

    // Without waiting: a FIFO in the file's place must not stop a reload.
    const ZTCFileDescriptor lFile = ZTCFileDescriptor::open(lPath.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY);
    std::string lContent;
    std::string lProblem;
    if (lFile.isOpen()) {
        lProblem = sReadContent(lFile, lContent);
    } else if (lIsNamed || errno != ENOENT) {
        lProblem = "cannot be opened: " + std::generic_category().message(errno) + ", must be readable";
    }
    if (lProblem.empty()) {
        return parseSettings(lContent, lPath);
    }
    ZTSSettingsReading lReading;
    lReading.mFile = lPath;
    lReading.mErrors.push_back({lPath, 0, "file", lProblem});
    return lReading;
}

std::string ZTSSettingsProblem::toText() const {
    return mFile + ":" + std::to_string(mLine) + ": " + mKey + ": " + mText;
}
