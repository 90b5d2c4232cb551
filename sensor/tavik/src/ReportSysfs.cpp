#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>

#include "sensor/tavik/src/Report.h"
#include "sensor/topology/include/PatientReader.h"

namespace fs = std::filesystem;

/// Files that are read at most, all together.
static constexpr std::size_t scMostFiles = 20000;

/// Of each entry of a class: the folder with the attributes, and whether the folder below it is wanted too.
struct ZTSSysfsClass {
    const char* mpClass;
    const char* mpBelow;  ///< "" : the entry itself
};

static constexpr std::array scClasses{
    ZTSSysfsClass{"fc_host", ""},         ZTSSysfsClass{"fc_host", "statistics"},
    ZTSSysfsClass{"fc_remote_ports", ""}, ZTSSysfsClass{"fc_remote_ports", "statistics"},
    ZTSSysfsClass{"fc_transport", ""},    ZTSSysfsClass{"scsi_device", "device"}};

/// The readable plain files in a folder, sorted. What commands the kernel, such as `issue_lip`, can only be written.
static void sAddFiles(const std::string& acrFolder, std::vector<std::string>& arPaths) {
    std::error_code lError;
    std::vector<std::string> lNames;
    for (fs::directory_iterator lEntry(acrFolder, lError); !lError && lEntry != fs::directory_iterator();
         lEntry.increment(lError)) {
        struct stat lStatus {};
        const std::string lPath = lEntry->path();
        if (lstat(lPath.c_str(), &lStatus) == 0 && S_ISREG(lStatus.st_mode) && (lStatus.st_mode & S_IRUSR) != 0) {
            lNames.push_back(lPath);
        }
    }
    std::ranges::sort(lNames);
    arPaths.insert(arPaths.end(), lNames.begin(), lNames.end());
}

std::vector<ZTSReportFile> gatherSysfs(std::vector<std::string>& arMissing) {
    const char* const lpRoot = std::getenv("TAVIK_SYSFS_ROOT");
    const std::string lRoot = lpRoot != nullptr && *lpRoot != '\0' ? lpRoot : "/sys";
    std::vector<std::string> lPaths;
    for (const ZTSSysfsClass& lrClass : scClasses) {
        const std::string lClass = lRoot + "/class/" + lrClass.mpClass;
        std::error_code lError;
        std::vector<std::string> lEntries;
        for (fs::directory_iterator lEntry(lClass, lError); !lError && lEntry != fs::directory_iterator();
             lEntry.increment(lError)) {
            lEntries.push_back(lEntry->path());
        }
        std::ranges::sort(lEntries);
        for (const std::string& lrEntry : lEntries) {
            sAddFiles(*lrClass.mpBelow == '\0' ? lrEntry : lrEntry + "/" + lrClass.mpBelow, lPaths);
        }
    }
    if (lPaths.size() > scMostFiles) {
        arMissing.push_back("sysfs: " + std::to_string(lPaths.size() - scMostFiles) + " files beyond the first " +
                            std::to_string(scMostFiles));
        lPaths.resize(scMostFiles);
    }
    ZTCPatientReader lReader;
    const std::vector<std::optional<std::string>> lTexts = lReader.readAll(lPaths);
    for (const std::string& lrBlocked : lReader.getBlockedPaths()) {
        arMissing.push_back(lrBlocked + ": did not answer");
    }
    std::vector<ZTSReportFile> lFiles;
    for (std::size_t i = 0; i < lPaths.size(); ++i) {
        if (lTexts[i]) {
            lFiles.push_back({.mPath = "sysfs" + lPaths[i].substr(lRoot.size()), .mText = *lTexts[i] + "\n"});
        }
    }
    return lFiles;
}
