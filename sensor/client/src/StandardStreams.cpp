#include "sensor/client/include/StandardStreams.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "sensor/client/include/ClientErrors.h"

bool reserveStandardStreams() {
    const bool lHasOutput = fcntl(STDOUT_FILENO, F_GETFD) >= 0;
    int lDescriptor;
    do {
        lDescriptor = open("/dev/null", O_RDWR);  // children get it too, as they would get the stream
    } while (lDescriptor >= 0 && lDescriptor <= STDERR_FILENO);
    if (lDescriptor >= 0) {
        close(lDescriptor);
    }
    return lHasOutput;
}

void requireStandardOutput() {
    if (!reserveStandardStreams()) {
        throw ZTCSystemCallEx("cannot write standard output", EBADF);
    }
}

std::size_t writeSomeOutput(const std::string& acrText, std::size_t aWritten, std::size_t aMost) {
    const ssize_t lCount = write(STDOUT_FILENO, acrText.data() + aWritten, std::min(acrText.size() - aWritten, aMost));
    if (lCount < 0 && (errno == EINTR || errno == EAGAIN)) {
        return 0;
    }
    if (lCount <= 0) {
        throw ZTCSystemCallEx("cannot write standard output: " + std::to_string(aWritten) + " of " +
                                  std::to_string(acrText.size()) + " bytes written",
                              lCount < 0 ? errno : ENOSPC);
    }
    return static_cast<std::size_t>(lCount);
}

void writeOutput(const std::string& acrText) {
    for (std::size_t lWritten = 0; lWritten < acrText.size();) {
        const std::size_t lCount = writeSomeOutput(acrText, lWritten, acrText.size());
        lWritten += lCount;
        if (lCount == 0) {
            pollfd lOutput{.fd = STDOUT_FILENO, .events = POLLOUT, .revents = 0};
            poll(&lOutput, 1, -1);
        }
    }
}
