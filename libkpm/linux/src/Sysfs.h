/// Reads the FC transport class below one root: /sys, or a tree made by a test. A value is absent from the result where
/// its file is missing, cannot be parsed, or vanishes while it is read. May be used from any thread.
#ifndef LIBKPM_LINUX_SRC_SYSFS_H
#define LIBKPM_LINUX_SRC_SYSFS_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "libkpm/linux/src/Boards.h"
#include "libkpm/linux/src/SysfsText.h"

/// The content of a small file; nothing, with the reason in errno, where it cannot be read at once or is longer than
/// `aLimit`.
std::optional<std::string> readSmallFile(const std::string& acrPath, std::size_t aLimit);

/// The names in a directory, without those that begin with a dot, in no order. Empty where there is no such directory.
/// Nothing where it cannot be read, for example for lack of descriptors.
std::optional<std::vector<std::string>> listDirectory(const std::string& acrPath);

/// The directory that a path's last name is in. By the text alone: the path need not be there.
std::string getParentDirectory(const std::string& acrPath);

class ZTCSysfs {
public:
    explicit ZTCSysfs(std::string aRoot) : mRoot(std::move(aRoot)) {}

    /// All FC hosts, in ascending order; empty where the directory cannot be read.
    std::optional<std::vector<ZTSLinuxHost>> readHosts() const;

    ZTELinuxLink readPortState(std::uint32_t aHost) const;

    /// The FC id of the host's port, 0 where it is not known.
    std::uint32_t readPortId(std::uint32_t aHost) const;

    /// An attribute of the class, such as "fc_host/host0/port_state".
    std::optional<std::string> readAttribute(const std::string& acrName) const;

    std::optional<std::vector<std::string>> listClass(const std::string& acrName) const;

private:
    const std::string mRoot;
};

/// The names of remote ports by SCSI address, read when they are first asked for and kept until told to forget. One
/// thread at a time.
class ZTCLinuxRemotePorts {
public:
    explicit ZTCLinuxRemotePorts(const ZTCSysfs& acrSysfs) : mrSysfs(acrSysfs) {}

    /// The port name of a target; the zero name where it is not known.
    HBA_wwn find(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget);

    void forget();

private:
    using Key = std::tuple<std::uint32_t, std::uint32_t, std::uint32_t>;

    HBA_wwn read(const Key& acrKey);

    const ZTCSysfs& mrSysfs;
    std::map<Key, HBA_wwn> mNames;
    bool mHasIndex = false;
    std::map<Key, std::string> mIndex;  // the remote ports' directories
};

#endif
