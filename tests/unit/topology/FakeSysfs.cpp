#include "tests/unit/topology/FakeSysfs.h"

#include <array>
#include <cstdio>
#include <filesystem>

static std::string sHex(std::uint64_t aValue) {
    std::array<char, 19> lText{};
    std::snprintf(lText.data(), lText.size(), "0x%016llx", static_cast<unsigned long long>(aValue));
    return lText.data();
}

static std::string sHostPath(unsigned aHost) {
    return "devices/pci0/host" + std::to_string(aHost);
}

static std::string sRemotePortOf(unsigned aHost, unsigned aTarget) {
    return "rport-" + std::to_string(aHost) + ":0-" + std::to_string(aTarget);
}

std::string ZTCFakeSysfs::initiatorName(unsigned aHost) {
    return sHex(0x1000000000000000 + aHost);
}

std::string ZTCFakeSysfs::remotePortName(unsigned aPort) {
    return sHex(0x5006016000000000 + aPort);
}

ZTSTopologyRoots ZTCFakeSysfs::roots() const {
    writeFile(mDirectory.path("mountinfo"), mMountInfo);
    writeFile(mDirectory.path("swaps"), mSwaps);
    return {.mSysfs = mDirectory.path("sys"), .mProcfs = mDirectory.path(), .mSwaps = mDirectory.path("swaps")};
}

void ZTCFakeSysfs::makeFolder(const std::string& acrPath) const {
    std::filesystem::create_directories(path(acrPath));
}

void ZTCFakeSysfs::write(const std::string& acrPath, const std::string& acrText) const {
    makeFolder(acrPath.substr(0, acrPath.rfind('/')));
    writeFile(path(acrPath), acrText + "\n");
}

void ZTCFakeSysfs::link(const std::string& acrPath, const std::string& acrTarget) const {
    makeFolder(acrPath.substr(0, acrPath.rfind('/')));
    std::filesystem::create_symlink(acrTarget, path(acrPath));
}

void ZTCFakeSysfs::addHost(unsigned aHost) const {
    const std::string lFolder = sHostPath(aHost) + "/fc_host/host" + std::to_string(aHost);
    write(lFolder + "/port_name", initiatorName(aHost));
    write(lFolder + "/node_name", sHex(0x2000000000000000 + aHost));
    write(lFolder + "/fabric_name", sHex(gcFabric));
    write(lFolder + "/port_state", "Online");
    write(lFolder + "/speed", "16 Gbit");
    write(lFolder + "/symbolic_name", "port " + std::to_string(aHost));
    write(lFolder + "/port_id", "0x01" + std::string(aHost < 16 ? "000" : "00") + "0");
    link("class/fc_host/host" + std::to_string(aHost), "../../" + lFolder);
}

void ZTCFakeSysfs::addRemotePort(unsigned aHost, unsigned aTarget, unsigned aPort) const {
    const std::string lName = sRemotePortOf(aHost, aTarget);
    const std::string lFolder = sHostPath(aHost) + "/" + lName + "/fc_remote_ports/" + lName;
    write(lFolder + "/port_name", remotePortName(aPort));
    write(lFolder + "/node_name", sHex(0x50060160F0000000 + aPort / 4));
    write(lFolder + "/port_state", "Online");
    write(lFolder + "/roles", "FCP Target");
    write(lFolder + "/port_id", sHex(0x020000 + aPort));
    write(lFolder + "/dev_loss_tmo", "60");
    link("class/fc_remote_ports/" + lName, "../../" + lFolder);
}

void ZTCFakeSysfs::addBlockDevice(const std::string& acrDevice) {
    const std::string lNumber = "8:" + std::to_string(mNumbers.size());
    mNumbers[acrDevice] = lNumber;
    makeFolder("class/block/" + acrDevice + "/holders");
    write("class/block/" + acrDevice + "/dev", lNumber);
}

void ZTCFakeSysfs::addPath(unsigned aHost, unsigned aTarget, unsigned aLun, const std::string& acrWwid,
                           const std::string& acrDisk) {
    const std::string lTarget = std::to_string(aHost) + ":0:" + std::to_string(aTarget);
    const std::string lAddress = lTarget + ":" + std::to_string(aLun);
    const std::string lDevice =
        sHostPath(aHost) + "/" + sRemotePortOf(aHost, aTarget) + "/target" + lTarget + "/" + lAddress;
    write(lDevice + "/vendor", "ACME    ");
    write(lDevice + "/model", "Array           ");
    write(lDevice + "/wwid", acrWwid);
    write(lDevice + "/state", "running");
    write(lDevice + "/queue_depth", "32");
    makeFolder(lDevice + "/scsi_device/" + lAddress);
    link(lDevice + "/scsi_device/" + lAddress + "/device", "../../../" + lAddress);
    link("class/scsi_device/" + lAddress, "../../" + lDevice + "/scsi_device/" + lAddress);
    if (!acrDisk.empty()) {
        makeFolder(lDevice + "/block/" + acrDisk);
        addBlockDevice(acrDisk);
    }
}

void ZTCFakeSysfs::addMapping(unsigned aNumber, const std::string& acrName, const std::string& acrUuid,
                              const std::vector<std::string>& acrDisks) {
    const std::string lDevice = "dm-" + std::to_string(aNumber);
    addBlockDevice(lDevice);
    write("class/block/" + lDevice + "/dm/name", acrName);
    write("class/block/" + lDevice + "/dm/uuid", acrUuid);
    for (const std::string& lrDisk : acrDisks) {
        makeFolder("class/block/" + lrDisk + "/holders/" + lDevice);
        makeFolder("class/block/" + lDevice + "/slaves/" + lrDisk);
    }
}

void ZTCFakeSysfs::mount(const std::string& acrDevice, const std::string& acrMountPoint) {
    mMountInfo += "36 1 " + mNumbers.at(acrDevice) + " / " + acrMountPoint + " rw,relatime shared:1 - ext4 /dev/x rw\n";
}

void ZTCFakeSysfs::addLargeHost(unsigned aLuns) {
    for (unsigned lHost = 0; lHost < gcLargeHosts; ++lHost) {
        addHost(lHost);
        for (unsigned lTarget = 0; lTarget < gcLargePortsOfAHost; ++lTarget) {
            addRemotePort(lHost, lTarget, lHost * gcLargePortsOfAHost + lTarget);
        }
    }
    for (unsigned lLun = 0; lLun < aLuns; ++lLun) {
        const std::string lNumber = std::to_string(lLun);
        std::vector<std::string> lDisks;
        for (unsigned lHost = 0; lHost < gcLargeHosts; ++lHost) {
            lDisks.push_back("sd" + lNumber + "x" + std::to_string(lHost));
            addPath(lHost, lLun % gcLargePortsOfAHost, lLun, "naa." + lNumber, lDisks.back());
        }
        addMapping(lLun, "mpath" + lNumber, "mpath-" + lNumber, lDisks);
        mount("dm-" + lNumber, "/data/" + lNumber);
    }
}

void ZTCFakeSysfs::swapOn(const std::string& acrDevice) {
    mSwaps += "/dev/" + acrDevice + "\tpartition\t1048572\t0\t-2\n";
}
