#include <unistd.h>

#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordJson.h"
#include "sensor/tavik/src/Tavik.h"
#include "sensor/views/include/TextTable.h"

void complain(const std::string& acrText) {
    const std::string lLine = "tavik: " + escapeControls(acrText) + "\n";
    // Nothing can be said about a standard error that does not take the line.
    [[maybe_unused]] const ssize_t lWritten = write(STDERR_FILENO, lLine.data(), lLine.size());
}

void writeDocument(const nlohmann::ordered_json& acrDocument) {
    writeOutput(dumpJson(acrDocument, 2) + "\n");
}
