#include "sensor/topology/src/SysfsFiles.h"

#include <dirent.h>

#include <algorithm>

std::vector<std::string> listDirectory(const std::string& acrPath) {
    std::vector<std::string> lNames;
    DIR* lpDirectory = opendir(acrPath.c_str());
    if (lpDirectory == nullptr) {
        return lNames;
    }
    while (const dirent* lpEntry = readdir(lpDirectory)) {
        if (lpEntry->d_name[0] != '.') {
            lNames.emplace_back(lpEntry->d_name);
        }
    }
    closedir(lpDirectory);
    std::ranges::sort(lNames);
    return lNames;
}
