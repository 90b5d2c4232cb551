#include "libkpm/sim/src/Report.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string_view>

/// Writes as much as the descriptor takes without waiting for ever.
static void sWrite(int aDescriptor, std::string_view aText) noexcept {
    while (!aText.empty()) {
        const ssize_t lWritten = ::write(aDescriptor, aText.data(), aText.size());
        if (lWritten < 0 && errno == EINTR) {
            continue;
        }
        if (lWritten <= 0) {
            return;
        }
        aText.remove_prefix(static_cast<std::size_t>(lWritten));
    }
}

void noteSimLine(const std::string& acrText) noexcept {
    const char* lpPath = std::getenv("KPM_SIM_LOG");
    if (lpPath == nullptr || *lpPath == '\0') {
        return;
    }
    const int lFile =
        ::open(lpPath, O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY, 0600);
    if (lFile < 0) {
        return;
    }
    sWrite(lFile, acrText);
    sWrite(lFile, "\n");
    ::close(lFile);
}

void reportSimProblem(const std::string& acrText) noexcept {
    sWrite(STDERR_FILENO, acrText);
    sWrite(STDERR_FILENO, "\n");
    noteSimLine(acrText);
}
