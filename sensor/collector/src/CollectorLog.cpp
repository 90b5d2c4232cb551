#include "sensor/collector/include/CollectorLog.h"

#include <unistd.h>

#include <cerrno>

void logLine(const std::string& acrText) {
    std::string lLine = "tavik-collector: ";
    for (const char lCharacter : acrText) {
        lLine += static_cast<unsigned char>(lCharacter) < 0x20 ? ' ' : lCharacter;
    }
    lLine += '\n';
    // One write a line, so that lines of several threads and processes do not mix. One that fails has nowhere to go.
    while (write(STDERR_FILENO, lLine.data(), lLine.size()) < 0 && errno == EINTR) {
    }
}
