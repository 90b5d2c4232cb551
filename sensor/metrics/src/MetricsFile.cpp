#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/FileDescriptor.h"
#include "sensor/metrics/include/Metrics.h"

/// Writes all of it, or throws.
static void sWrite(int aDescriptor, const std::string& acrText, const std::string& acrPath) {
    std::size_t lWritten = 0;
    while (lWritten < acrText.size()) {
        const ssize_t lCount = write(aDescriptor, acrText.data() + lWritten, acrText.size() - lWritten);
        if (lCount < 0 && errno != EINTR) {
            throw ZTCSystemCallEx("cannot write " + acrPath + ": " + std::to_string(lWritten) + " of " +
                                      std::to_string(acrText.size()) + " bytes written",
                                  errno);
        }
        lWritten += lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    }
}

void writeMetricsFile(const std::string& acrPath, const std::string& acrText) {
    // node_exporter reads files that end in ".prom": the part that is being written must not.
    const std::string lNew = acrPath + ".new";
    ZTCFileDescriptor lFile = ZTCFileDescriptor::open(lNew.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW, 0644);
    if (!lFile.isOpen()) {
        throw ZTCSystemCallEx("cannot make " + lNew, errno);
    }
    try {
        if (fchmod(lFile.get(), 0644) != 0) {
            throw ZTCSystemCallEx("cannot set the mode of " + lNew, errno);
        }
        sWrite(lFile.get(), acrText, lNew);
        lFile.reset();
        if (rename(lNew.c_str(), acrPath.c_str()) != 0) {
            throw ZTCSystemCallEx("cannot rename " + lNew + " to " + acrPath, errno);
        }
    } catch (...) {
        unlink(lNew.c_str());
        throw;
    }
}
