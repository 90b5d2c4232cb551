#include "sensor/store/include/DamagedHistories.h"

#include <algorithm>
#include <filesystem>

#include "sensor/store/src/StoreFile.h"

namespace fs = std::filesystem;

std::optional<std::vector<std::string>> listDamagedHistories(const std::string& acrStateDirectory) {
    std::vector<std::string> lPaths;
    std::error_code lError;
    for (fs::directory_iterator lEntry(acrStateDirectory, lError); !lError && lEntry != fs::directory_iterator();
         lEntry.increment(lError)) {
        const std::string lName = lEntry->path().filename();
        if (lName.starts_with(gcDamagedPrefix) && lName.ends_with(gcHistorySuffix)) {
            lPaths.push_back(acrStateDirectory + "/" + lName);
        }
    }
    if (lError && lError != std::errc::no_such_file_or_directory) {
        return std::nullopt;
    }
    std::ranges::sort(lPaths);
    return lPaths;
}
