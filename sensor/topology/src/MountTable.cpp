#include "sensor/topology/src/MountTable.h"

#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <fstream>
#include <set>
#include <sstream>

/// Undoes the kernel's escapes: blanks, tabs, line breaks and backslashes stand as three octal digits.
static std::string sUnescape(const std::string& acrText) {
    std::string lResult;
    for (std::size_t i = 0; i < acrText.size(); ++i) {
        const auto lIsOctal = [&](std::size_t aAt) { return acrText[aAt] >= '0' && acrText[aAt] <= '7'; };
        if (acrText[i] == '\\' && i + 3 < acrText.size() && lIsOctal(i + 1) && lIsOctal(i + 2) && lIsOctal(i + 3)) {
            lResult +=
                static_cast<char>((acrText[i + 1] - '0') * 64 + (acrText[i + 2] - '0') * 8 + acrText[i + 3] - '0');
            i += 3;
        } else {
            lResult += acrText[i];
        }
    }
    return lResult;
}

/// The name of a device in /dev as the kernel knows it, by its number: "/dev/mapper/swap" is a link to a dm device.
static std::string sNumberOf(const std::string& acrPath) {
    struct stat lStatus {};
    if (stat(acrPath.c_str(), &lStatus) != 0 || !S_ISBLK(lStatus.st_mode)) {
        return {};
    }
    return std::to_string(major(lStatus.st_rdev)) + ":" + std::to_string(minor(lStatus.st_rdev));
}

std::map<std::string, std::vector<std::string>> readMounts(
    const std::string& acrMountInfo, const std::string& acrSwaps,
    const std::map<std::string, std::string>& acrDeviceOfNumber) {
    std::map<std::string, std::set<std::string>> lFound;
    std::ifstream lMountInfo(acrMountInfo);
    for (std::string lLine; std::getline(lMountInfo, lLine);) {
        // "ID PARENT MAJOR:MINOR ROOT MOUNTPOINT ..."
        std::istringstream lFields(lLine);
        std::string lId, lParent, lNumber, lRoot, lMountPoint;
        if (lFields >> lId >> lParent >> lNumber >> lRoot >> lMountPoint) {
            const auto lDevice = acrDeviceOfNumber.find(lNumber);
            if (lDevice != acrDeviceOfNumber.end()) {
                lFound[lDevice->second].insert(sUnescape(lMountPoint));
            }
        }
    }
    std::ifstream lSwaps(acrSwaps);
    for (std::string lLine; std::getline(lSwaps, lLine);) {
        const std::string lPath = sUnescape(lLine.substr(0, lLine.find_first_of(" \t")));
        const std::string lName = lPath.substr(lPath.rfind('/') + 1);
        const auto lByNumber = acrDeviceOfNumber.find(sNumberOf(lPath));
        for (const auto& [lNumber, lDevice] : acrDeviceOfNumber) {
            if (lByNumber != acrDeviceOfNumber.end() ? lDevice == lByNumber->second : lDevice == lName) {
                lFound[lDevice].insert("[swap]");
            }
        }
    }
    std::map<std::string, std::vector<std::string>> lMounts;
    for (auto& [lDevice, lPoints] : lFound) {
        lMounts[lDevice] = {lPoints.begin(), lPoints.end()};
    }
    return lMounts;
}
