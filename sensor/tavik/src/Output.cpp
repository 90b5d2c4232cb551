#include <unistd.h>

#include <cerrno>
#include <system_error>

#include "sensor/client/include/RecordJson.h"
#include "sensor/tavik/src/Tavik.h"
#include "sensor/views/include/TextTable.h"

#include <nlohmann/json.hpp>

void complain(const std::string& acrText) {
    const std::string lLine = "tavik: " + escapeControls(acrText) + "\n";
    // Nothing can be said about a standard error that does not take the line.
    [[maybe_unused]] const ssize_t lWritten = write(STDERR_FILENO, lLine.data(), lLine.size());
}

void writeOutput(const std::string& acrText) {
    for (std::size_t lWritten = 0; lWritten < acrText.size();) {
        const ssize_t lCount = write(STDOUT_FILENO, acrText.data() + lWritten, acrText.size() - lWritten);
        if (lCount > 0) {
            lWritten += static_cast<std::size_t>(lCount);
        } else if (lCount == 0 || errno != EINTR) {
            throw std::system_error(lCount < 0 ? errno : ENOSPC, std::generic_category(),
                                    "cannot write standard output: " + std::to_string(lWritten) + " of " +
                                        std::to_string(acrText.size()) + " bytes written");
        }
    }
}

void writeDocument(const nlohmann::ordered_json& acrDocument) {
    writeOutput(dumpJson(acrDocument, 2) + "\n");
}
