#!/usr/bin/python3
"""Makes a folder that looks like the sysfs of a host with Fibre Channel ports: two local ports, twelve remote ports of
three arrays, twenty LUNs of each array with a disk for each path and a multipath device. One remote port is not there.

  make_sysfs.py FOLDER
"""
import os
import sys

INITIATORS = {7: 0x10000000C9000001, 8: 0x10000000C9000002}
ARRAYS = (
    ("EXAMPLE", "Array 7", (0x500601603BA01234, 0x500601613BA01234, 0x500601683BA01234, 0x500601693BA01234)),
    ("EXAMPLE", "Array 9", (0x50000973F0119900, 0x50000973F0119904, 0x50000973F0119908, 0x50000973F011990C)),
    ("SAMPLE", "Flash 2", (0x2101001B32A90001, 0x2101001B32A90002, 0x500104F000ABC001, 0x500104F000ABC002)),
)
LUNS = 20
LOST = 0x500601683BA01234


class Tree:
    def __init__(self, folder):
        self.folder = folder
        self.devices = 0

    def write(self, path, text):
        path = os.path.join(self.folder, path)
        os.makedirs(os.path.dirname(path), exist_ok=True)
        with open(path, "w", encoding="ascii") as file:
            file.write(f"{text}\n")

    def link(self, path, target):
        path = os.path.join(self.folder, path)
        os.makedirs(os.path.dirname(path), exist_ok=True)
        os.symlink(target, path)

    def make(self, path):
        os.makedirs(os.path.join(self.folder, path), exist_ok=True)

    def add_block_device(self, name):
        self.make(f"class/block/{name}/holders")
        self.write(f"class/block/{name}/dev", f"250:{self.devices}")
        self.devices += 1

    def add_host(self, host, wwpn):
        base = f"devices/pci0/host{host}/fc_host/host{host}"
        for name, text in (("port_name", f"0x{wwpn:016x}"), ("node_name", f"0x{wwpn | 1 << 60:016x}"), ("port_state", "Online"),
                           ("speed", "16 Gbit"), ("symbolic_name", f"example port {host}"), ("port_id", f"0x0{host}0000")):
            self.write(f"{base}/{name}", text)
        for counter in ("invalid_crc_count", "loss_of_sync_count", "link_failure_count"):
            self.write(f"{base}/statistics/{counter}", "0x0")
        self.link(f"class/fc_host/host{host}", f"../../{base}")

    def add_remote_port(self, host, target, wwpn):
        name = f"rport-{host}:0-{target}"
        base = f"devices/pci0/host{host}/{name}/fc_remote_ports/{name}"
        for key, text in (("port_name", f"0x{wwpn:016x}"), ("node_name", f"0x{wwpn & ~0xFF:016x}"), ("roles", "FCP Target"),
                          ("port_state", "Not Present" if wwpn == LOST else "Online"), ("port_id", f"0x0{host}02{target:02x}"),
                          ("dev_loss_tmo", "60")):
            self.write(f"{base}/{key}", text)
        self.link(f"class/fc_remote_ports/{name}", f"../../{base}")

    def add_path(self, host, target, lun, unit, array, state):
        address = f"{host}:0:{target}:{lun}"
        device = f"devices/pci0/host{host}/rport-{host}:0-{target}/target{host}:0:{target}/{address}"
        disk = disk_name(self.devices)
        for key, text in (("vendor", array[0]), ("model", array[1]), ("wwid", f"naa.{unit}"), ("state", state), ("queue_depth", 32)):
            self.write(f"{device}/{key}", text)
        self.make(f"{device}/scsi_device/{address}")
        self.link(f"{device}/scsi_device/{address}/device", f"../../../{address}")
        self.link(f"class/scsi_device/{address}", f"../../{device}/scsi_device/{address}")
        self.make(f"{device}/block/{disk}")
        self.add_block_device(disk)
        return disk

    def add_multipath(self, number, disks, unit):
        device = f"dm-{number}"
        self.add_block_device(device)
        self.write(f"class/block/{device}/dm/name", f"mpath{number}")
        self.write(f"class/block/{device}/dm/uuid", f"mpath-3{unit}")
        for disk in disks:
            self.make(f"class/block/{disk}/holders/{device}")
            self.make(f"class/block/{device}/slaves/{disk}")


def disk_name(number):
    """sda to sdz, sdaa and so on."""
    text = ""
    number += 1
    while number:
        number, digit = divmod(number - 1, 26)
        text = chr(ord("a") + digit) + text
    return f"sd{text}"


def main(folder):
    tree = Tree(folder)
    for host, wwpn in INITIATORS.items():
        tree.add_host(host, wwpn)
    hosts = list(INITIATORS)
    for array_number, array in enumerate(ARRAYS):
        ports = [(hosts[index % 2], array_number * 4 + index, wwpn) for index, wwpn in enumerate(array[2])]
        for port in ports:
            tree.add_remote_port(*port)
        for lun in range(LUNS):
            unit = f"600601{array_number:02x}{lun:024x}"
            disks = [tree.add_path(host, target, lun, unit, array, "transport-offline" if wwpn == LOST else "running")
                     for host, target, wwpn in ports]
            tree.add_multipath(array_number * LUNS + lun, disks, unit)


main(*sys.argv[1:])
