/// A tree that looks like sysfs with Fibre Channel hosts, for tests: written file by file.
#ifndef TESTS_UNIT_TOPOLOGY_FAKESYSFS_H
#define TESTS_UNIT_TOPOLOGY_FAKESYSFS_H

#include <cstdint>
#include <string>

#include "sensor/topology/include/TopologyScan.h"
#include "tests/support/TemporaryDirectory.h"

/// The fabric of every host that is added.
inline constexpr std::uint64_t gcFabric = 0x100000051e000001;

class ZTCFakeSysfs {
public:
    ZTSTopologyRoots roots() const;
    /// A path in the tree.
    std::string path(const std::string& acrPath) const { return mDirectory.path("sys") + "/" + acrPath; }
    /// Writes an attribute, and makes the folders that lead to it.
    void write(const std::string& acrPath, const std::string& acrText) const;
    /// The folders that lead to it, and it.
    void makeFolder(const std::string& acrPath) const;
    void link(const std::string& acrPath, const std::string& acrTarget) const;

    /// An initiator with names that follow from its number, Online.
    void addHost(unsigned aHost) const;
    /// A remote port "rport-HOST:0-TARGET" of a host, Online. Its name follows from `aPort`, so that several hosts can
    /// see one port.
    void addRemotePort(unsigned aHost, unsigned aTarget, unsigned aPort) const;
    /// A path: SCSI device HOST:0:TARGET:LUN behind that remote port, with a disk where one is named.
    void addPath(unsigned aHost, unsigned aTarget, unsigned aLun, const std::string& acrWwid,
                 const std::string& acrDisk = {});
    /// A device-mapper device over disks.
    void addMapping(unsigned aNumber, const std::string& acrName, const std::string& acrUuid,
                    const std::vector<std::string>& acrDisks);
    void mount(const std::string& acrDevice, const std::string& acrMountPoint);
    void swapOn(const std::string& acrDevice);

    /// A host of 8 initiators with 8 remote ports each, and so many units: each has a path through every initiator, and
    /// a multipath device that is mounted.
    void addLargeHost(unsigned aLuns);
    static constexpr unsigned gcLargeHosts = 8;
    static constexpr unsigned gcLargePortsOfAHost = 8;

    static std::string initiatorName(unsigned aHost);
    static std::string remotePortName(unsigned aPort);

private:
    void addBlockDevice(const std::string& acrDevice);

    ZTCTemporaryDirectory mDirectory;
    std::map<std::string, std::string> mNumbers;  // of block devices
    std::string mMountInfo;
    std::string mSwaps = "Filename\t\tType\t\tSize\t\tUsed\t\tPriority\n";
};

#endif
