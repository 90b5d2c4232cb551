#include "libkpm/linux/src/Sysfs.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <memory>

#include "libkpm/common/include/Descriptor.h"

std::optional<std::string> readSmallFile(const std::string& acrPath, std::size_t aLimit) {
    const ZTCLibraryDescriptor lFile = openLibraryFile(acrPath.c_str(), O_RDONLY);
    if (!lFile.isOpen()) {
        return std::nullopt;
    }
    std::string lText;
    char lBlock[4096];
    while (true) {
        const ssize_t lRead = ::read(lFile.get(), lBlock, sizeof lBlock);
        if (lRead < 0 && errno == EINTR) {
            continue;
        }
        if (lRead < 0) {
            return std::nullopt;
        }
        if (lRead == 0) {
            return lText;
        }
        if (static_cast<std::size_t>(lRead) > aLimit - lText.size()) {
            errno = EFBIG;
            return std::nullopt;
        }
        lText.append(lBlock, static_cast<std::size_t>(lRead));
    }
}

std::optional<std::vector<std::string>> listDirectory(const std::string& acrPath) {
    struct Closer {
        void operator()(DIR* apDirectory) const { ::closedir(apDirectory); }
    };
    std::vector<std::string> lNames;
    const std::unique_ptr<DIR, Closer> lpDirectory(::opendir(acrPath.c_str()));
    if (lpDirectory == nullptr) {
        return errno == ENOENT ? std::optional(lNames) : std::nullopt;
    }
    while (true) {
        errno = 0;
        const dirent* lpEntry = ::readdir(lpDirectory.get());
        if (lpEntry == nullptr) {
            return errno == 0 ? std::optional(lNames) : std::nullopt;
        }
        if (lpEntry->d_name[0] != '.') {
            lNames.emplace_back(lpEntry->d_name);
        }
    }
}

std::string getParentDirectory(const std::string& acrPath) {
    std::filesystem::path lPath(acrPath);
    if (!lPath.has_filename()) {
        lPath = lPath.parent_path();
    }
    return lPath.parent_path().string();
}

static std::string sHostDirectory(std::uint32_t aHost) {
    return "fc_host/host" + std::to_string(aHost);
}

std::optional<std::string> ZTCSysfs::readAttribute(const std::string& acrName) const {
    static constexpr std::size_t scPage = 4096;  // an attribute is never longer
    return readSmallFile(mRoot + "/class/" + acrName, scPage);
}

std::optional<std::vector<std::string>> ZTCSysfs::listClass(const std::string& acrName) const {
    return listDirectory(mRoot + "/class/" + acrName);
}

std::optional<std::vector<ZTSLinuxHost>> ZTCSysfs::readHosts() const {
    const std::optional<std::vector<std::string>> lNames = listClass("fc_host");
    if (!lNames) {
        return std::nullopt;
    }
    std::vector<ZTSLinuxHost> lHosts;
    for (const std::string& lrName : *lNames) {
        const std::optional<std::uint32_t> lNumber = parseSysfsHostName(lrName);
        if (!lNumber) {
            continue;
        }
        const auto lReadName = [&](const char* apAttribute) {
            const std::optional<std::string> lText = readAttribute("fc_host/" + lrName + "/" + apAttribute);
            return (lText ? parseSysfsWwn(*lText) : std::nullopt).value_or(HBA_wwn{});
        };
        const ZTSLinuxHost lHost{*lNumber, lReadName("node_name"), lReadName("port_name")};
        // A host may vanish while its names are read: then it was not there, rather than there without names.
        const bool lHasName = !isZeroName(lHost.mPortName) || !isZeroName(lHost.mNodeName);
        struct stat lStatus {};
        if (lHasName || ::stat((mRoot + "/class/fc_host/" + lrName).c_str(), &lStatus) == 0) {
            lHosts.push_back(lHost);
        }
    }
    std::sort(lHosts.begin(), lHosts.end(), [](const ZTSLinuxHost& acrOne, const ZTSLinuxHost& acrOther) {
        return acrOne.mNumber < acrOther.mNumber;
    });
    // "host1" and "host01" would be one number twice.
    const auto lEnd = std::unique(
        lHosts.begin(), lHosts.end(),
        [](const ZTSLinuxHost& acrOne, const ZTSLinuxHost& acrOther) { return acrOne.mNumber == acrOther.mNumber; });
    lHosts.erase(lEnd, lHosts.end());
    return lHosts;
}

ZTELinuxLink ZTCSysfs::readPortState(std::uint32_t aHost) const {
    const std::optional<std::string> lText = readAttribute(sHostDirectory(aHost) + "/port_state");
    return lText ? parseSysfsPortState(*lText) : ZTLK_Unknown;
}

std::uint32_t ZTCSysfs::readPortId(std::uint32_t aHost) const {
    const std::optional<std::string> lText = readAttribute(sHostDirectory(aHost) + "/port_id");
    return (lText ? parseSysfsFcId(*lText) : std::nullopt).value_or(0);
}

HBA_wwn ZTCLinuxRemotePorts::find(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget) {
    const Key lKey(aHost, aChannel, aTarget);
    const auto lKnown = mNames.find(lKey);
    if (lKnown != mNames.end()) {
        return lKnown->second;
    }
    const HBA_wwn lName = read(lKey);
    mNames.emplace(lKey, lName);
    return lName;
}

void ZTCLinuxRemotePorts::forget() {
    mNames.clear();
    mIndex.clear();
    mHasIndex = false;
}

HBA_wwn ZTCLinuxRemotePorts::read(const Key& acrKey) {
    const auto [lHost, lChannel, lTarget] = acrKey;
    const auto lParse = [](const std::optional<std::string>& acrText) {
        return acrText ? parseSysfsWwn(*acrText) : std::nullopt;
    };
    const std::string lAddress = std::to_string(lHost) + ":" + std::to_string(lChannel) + ":" + std::to_string(lTarget);
    if (const auto lName = lParse(mrSysfs.readAttribute("fc_transport/target" + lAddress + "/port_name"))) {
        return *lName;
    }
    // The target's own directory may be gone when its last command ends: its remote port stays longer.
    if (!mHasIndex) {
        mHasIndex = true;
        const std::vector<std::string> lNames =
            mrSysfs.listClass("fc_remote_ports").value_or(std::vector<std::string>());
        for (const std::string& lrName : lNames) {
            const std::optional<ZTSLinuxRportName> lRport = parseSysfsRportName(lrName);
            const std::optional<std::string> lId =
                lRport ? mrSysfs.readAttribute("fc_remote_ports/" + lrName + "/scsi_target_id") : std::nullopt;
            const std::optional<std::int64_t> lNumber = lId ? parseSysfsNumber(*lId) : std::nullopt;
            if (lNumber && *lNumber >= 0 && *lNumber <= 0xFFFFFFFF) {
                mIndex.emplace(Key(lRport->mHost, lRport->mChannel, static_cast<std::uint32_t>(*lNumber)), lrName);
            }
        }
    }
    const auto lRport = mIndex.find(acrKey);
    if (lRport == mIndex.end()) {
        return HBA_wwn{};
    }
    return lParse(mrSysfs.readAttribute("fc_remote_ports/" + lRport->second + "/port_name")).value_or(HBA_wwn{});
}
