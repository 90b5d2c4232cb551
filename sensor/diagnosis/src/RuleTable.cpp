#include <array>

#include "sensor/diagnosis/src/Rules.h"

/// In the order of docs/troubleshooting.md, which tells the story of each.
static constexpr std::array scRules{
    ZTSRule{.mpId = "port-overload",
            .mSeverity = ZTSV_Problem,
            .mpTitle = "TARGET PORT OVERLOADED",
            .mpWanted = "QUEUE FULL on four or more LUNs of one remote port within a minute.",
            .mpAgainst = "Another port of this host uses the target port and gets no QUEUE FULL; all these LUNs lie "
                         "on one slow pool of the array.",
            .mpMeans = "The target port has one queue for all its LUNs, and it is full. The hosts together send more "
                       "commands than the port can hold. I/O is delayed, and drivers lower their queue depths.",
            .mpNext = "Look at the load of {port} on the array, and at how many hosts share it.\n"
                      "Lower the queue depth of its LUNs, or spread them over more ports:\n"
                      "tavik paths\n"
                      "tavik events --port {wwpn} --since 24h",
            .mpKinds = "queue-full queue-depth port-busy",
            .mpLook = lookForPortOverload},
    ZTSRule{
        .mpId = "lun-overload",
        .mSeverity = ZTSV_Problem,
        .mpTitle = "LUN OVERLOADED",
        .mpWanted = "QUEUE FULL on one to three LUNs of a remote port, and on no other of its LUNs within a minute.",
        .mpAgainst = "Other LUNs of the port are full too: then the port is overloaded.",
        .mpMeans = "The LUN's own queue is full while other LUNs of the port have room. Its back end is slower "
                   "than its load: a few disks, a busy pool, a copy or rebuild.",
        .mpNext = "Look at the latency of the LUN and of its pool on the array.\n"
                  "Look for the load: a backup, a batch run, another host on the same LUN.\n"
                  "tavik events --port {wwpn} --since 24h",
        .mpKinds = "queue-full queue-depth",
        .mpLook = lookForLunOverload},
    ZTSRule{.mpId = "target-side",
            .mSeverity = ZTSV_Problem,
            .mpTitle = "TROUBLE AT THE TARGET",
            .mpWanted = "Busy answers, resets, or damaged data of one remote port at two or more ports of this host "
                        "within a minute.",
            .mpAgainst = "Both ports of this host share a switch or an inter-switch link on the way.",
            .mpMeans = "Paths that share nothing but the target have the same trouble. So the cause is the target "
                       "port, its cable to the switch, or its controller, and not a port of this host.",
            .mpNext = "Look at {port} on the array: state, load, events of that time.\n"
                      "Look at the error counters of its switch port.\n"
                      "tavik events --port {wwpn} --since 24h",
            .mpKinds = "port-busy fcp-read-check device-busy check-condition lun-reset target-reset",
            .mpLook = lookForTargetSide},
    ZTSRule{.mpId = "one-path",
            .mSeverity = ZTSV_Problem,
            .mpTitle = "TROUBLE ON ONE PATH",
            .mpWanted = "Busy answers, resets, or damaged data of one remote port at one port of this host, while "
                        "another port of this host is logged in to the same remote port and has none of these.",
            .mpAgainst = "The other port of this host is idle: it would see no errors.",
            .mpMeans = "The target serves the other path well. So the cause is on this path alone: its way through the "
                       "fabric, or this host's cable, transceiver or adapter.",
            .mpNext = "Compare the error counters along the path: adapter, switch ports, inter-switch links.\n"
                      "grep . /sys/class/fc_host/{host}/statistics/*crc*\n"
                      "tavik events --initiator {initiator} --since 24h",
            .mpKinds = "port-busy fcp-read-check device-busy check-condition lun-reset target-reset",
            .mpLook = lookForOnePath},
    ZTSRule{.mpId = "transport-error",
            .mSeverity = ZTSV_Warning,
            .mpTitle = "DATA DAMAGED ON THE WAY",
            .mpWanted = "Aborted commands (sense key 0B) with a code of parity, CRC, data phase, protection or "
                        "communication (08, 10, 47, 48, 49, 4B), or FCP read check errors.",
            .mpAgainst = "Every target of the fabric has these errors at once: then the cause is this host's own port.",
            .mpMeans = "Frames between this host and the target were damaged or lost. The commands were repeated, so "
                       "no data are wrong. But each repetition costs time, and the cause seldom goes away by itself.",
            .mpNext = "Look at CRC and encoding errors of every port on the way; clean or replace the cable and the "
                      "transceiver of the port where they rise.\n"
                      "grep . /sys/class/fc_host/{host}/statistics/*crc*\n"
                      "tavik events --port {wwpn} --since 24h",
            .mpKinds = "check-condition fcp-read-check",
            .mpLook = lookForTransportErrors},
    ZTSRule{
        .mpId = "device-error",
        .mSeverity = ZTSV_Problem,
        .mpTitle = "DEVICE REPORTS A DEFECT",
        .mpWanted = "Check conditions with sense key 03 (medium error) or 04 (hardware error).",
        .mpAgainst = "The device's own log shows no such error.",
        .mpMeans =
            "The device could not read or write its medium, or its hardware has a fault. The path is not the cause.",
        .mpNext = "Look at the array's or drive's own event log; give the codes to its support.\n"
                  "Make sure that the data of these LUNs are in a backup.\n"
                  "tavik events --port {wwpn} --kind check-condition",
        .mpKinds = "check-condition",
        .mpLook = lookForDeviceErrors},
    ZTSRule{.mpId = "target-restarted",
            .mSeverity = ZTSV_Warning,
            .mpTitle = "TARGET RESTARTED",
            .mpWanted = "Unit attentions (sense key 06) with code 29.",
            .mpAgainst = "This host itself reset the LUN or the target just before.",
            .mpMeans = "The target was switched on, restarted or reset, or the session with it was lost. The commands "
                       "that it held were lost and then repeated.",
            .mpNext = "Look for a restart or a failover in the array's log at that time.\n"
                      "If nobody did maintenance, ask the array's support.\n"
                      "tavik events --port {wwpn} --since 24h",
            .mpKinds = "check-condition lun-reset target-reset bus-reset",
            .mpLook = lookForRestarts},
    ZTSRule{.mpId = "luns-changed",
            .mSeverity = ZTSV_Note,
            .mpTitle = "LUNS OR THEIR DATA CHANGED",
            .mpWanted = "Unit attentions (sense key 06) with code 3F.",
            .mpAgainst = "Nobody changed the array: then its firmware changed it, by an update or a failover.",
            .mpMeans = "The target has other LUNs, other inquiry data or other firmware than before. The host uses "
                       "what it knew before until the devices are scanned again.",
            .mpNext = "Compare with the changes made on the array at that time.\n"
                      "If LUNs were added or removed, scan for them:\n"
                      "echo '- - -' | sudo tee /sys/class/scsi_host/{host}/scan",
            .mpKinds = "check-condition",
            .mpLook = lookForChangedLuns},
    ZTSRule{.mpId = "parameters-changed",
            .mSeverity = ZTSV_Note,
            .mpTitle = "PARAMETERS OF LUNS CHANGED",
            .mpWanted = "Unit attentions (sense key 06) with code 2A.",
            .mpAgainst = "It comes again and again: then two hosts or two controllers fight over the LUN.",
            .mpMeans = "A parameter of the LUN changed: its size, its reservations, or which controller it prefers. "
                       "This is normal after a change on the array or in a cluster.",
            .mpNext = "2A/06: the preferred paths moved. See which are active now:\n"
                      "multipath -ll\n"
                      "2A/09: the size changed. Scan the devices again, then grow the file system.\n"
                      "2A/03 to 2A/05: look at the cluster that uses the LUN.\n"
                      "tavik events --port {wwpn} --kind check-condition",
            .mpKinds = "check-condition",
            .mpLook = lookForChangedParameters},
    ZTSRule{.mpId = "link-unstable",
            .mSeverity = ZTSV_Warning,
            .mpTitle = "LINK UNSTABLE",
            .mpWanted = "Link changes of a port of this host, unless all its ports on that fabric had one within 30 s.",
            .mpAgainst = "Its error counters did not rise; another port of this host lost its link at the same moment.",
            .mpMeans = "The link between this port and its switch went down or up. Other ports stayed up, so the cause "
                       "is on this link alone: its cable, a transceiver, or the switch port.",
            .mpNext = "Clean and reseat the cable; compare the receive power at both ends; replace the weaker "
                      "transceiver.\n"
                      "Check whether somebody disabled the switch port.\n"
                      "grep . /sys/class/fc_host/{host}/statistics/{loss,invalid,link}*\n"
                      "tavik events --initiator {initiator} --since 24h",
            .mpKinds = "link",
            .mpLook = lookForUnstableLinks},
    ZTSRule{
        .mpId = "switch-trouble",
        .mSeverity = ZTSV_Problem,
        .mpTitle = "SWITCH TROUBLE",
        .mpWanted =
            "Link changes of all ports of this host on one fabric within 30 s. There must be at least two such ports.",
        .mpAgainst = "Ports on other fabrics lost their links too: then the cause is this host or its power.",
        .mpMeans = "Cables do not all fail at once. The switch that these ports are on restarted, lost power, or was "
                   "worked on.",
        .mpNext = "Look at the switch's log and uptime.\n"
                  "Ask whether other hosts on it lost their links.\n"
                  "Check that every LUN has paths again:\n"
                  "tavik paths",
        .mpKinds = "link rscn",
        .mpLook = lookForSwitchTrouble},
    ZTSRule{
        .mpId = "zoning-changed",
        .mSeverity = ZTSV_Warning,
        .mpTitle = "ZONING CHANGED",
        .mpWanted = "An RSCN, and within a minute LOGO and PLOGI of two or more remote ports, without a link event of "
                    "this host's port. The remote ports are of different nodes, or are not all ports of one node.",
        .mpAgainst = "Nobody changed the zoning; the ports belong to one controller.",
        .mpMeans = "The fabric reported a change, and several ports logged out and in again. This happens when a zone "
                   "set is activated.",
        .mpNext = "Compare the time with the change calendar and with the switch's log.\n"
                  "Check that no port is missing:\n"
                  "tavik ports;  tavik paths\n"
                  "tavik events --initiator {initiator} --since 24h",
        .mpKinds = "rscn logo plogi link",
        .mpLook = lookForZoning},
    ZTSRule{.mpId = "controller-failover",
            .mSeverity = ZTSV_Warning,
            .mpTitle = "CONTROLLER FAILED OVER",
            .mpWanted = "An RSCN, and within a minute LOGO and PLOGI of all known ports of one node and of no other "
                        "node, without a link event of this host's port. The node must have at least two known ports.",
            .mpAgainst = "The node has only ports on this fabric, and its zone was changed.",
            .mpMeans =
                "All ports of one storage controller disappeared and came back together: it restarted or failed over.",
            .mpNext = "Look at the array's event log: firmware update, or a fault?\n"
                      "Check that the paths are all back and which are active:\n"
                      "multipath -ll\n"
                      "tavik events --initiator {initiator} --since 24h",
            .mpKinds = "rscn logo plogi link check-condition",
            .mpLook = lookForFailover},
    ZTSRule{.mpId = "login-limit",
            .mSeverity = ZTSV_Problem,
            .mpTitle = "LOGIN LIMIT REACHED",
            .mpWanted = "LS_RJT of a PLOGI with explanation 29, insufficient resources for a login.",
            .mpAgainst = "The port is just starting, and accepts the login a little later.",
            .mpMeans = "The remote port already has as many logins as it can hold, and refuses this host's login. This "
                       "host cannot reach the LUNs behind it this way.",
            .mpNext = "Count the initiators that are zoned to {port}; its limit is in the array's manual.\n"
                      "Take hosts that do not need the port out of its zones, and remove stale logins on the array.\n"
                      "tavik events --port {wwpn} --kind lsrjt --since 24h",
            .mpKinds = "lsrjt plogi",
            .mpLook = lookForLoginLimit},
    ZTSRule{.mpId = "login-unsupported",
            .mSeverity = ZTSV_Note,
            .mpTitle = "LOGIN NOT SUPPORTED",
            .mpWanted = "LS_RJT of a PLOGI or PRLI with reason 0B or explanation 2C, not supported.",
            .mpAgainst = "The port is a storage port that other hosts use.",
            .mpMeans = "The remote port does not serve this kind of login: it is another initiator, or a target that "
                       "speaks another protocol. Usually a zone is wider than it should be.",
            .mpNext = "Find out what {port} is, and take it out of this host's zone if it is not storage.\n"
                      "tavik events --port {wwpn} --kind lsrjt --since 24h",
            .mpKinds = "lsrjt plogi",
            .mpLook = lookForUnsupportedLogin},
    ZTSRule{
        .mpId = "host-timeouts",
        .mSeverity = ZTSV_Warning,
        .mpTitle = "THIS HOST TIMES OUT",
        .mpWanted =
            "LUN resets by this host, and BUSY answers of the same remote port that begin within a minute after them.",
        .mpAgainst = "The target was busy or full before the first reset.",
        .mpMeans = "This host gave up waiting for commands and reset the LUN; the target was busy because it had "
                   "to clean up. So the resets are the cause of the busy answers and not their consequence.",
        .mpNext = "Find out what was slow before the first reset:\n"
                  "sudo journalctl -k --grep 'timing out|abort'\n"
                  "Look at the command time-out:\n"
                  "grep . /sys/block/sd*/device/timeout\n"
                  "tavik events --port {wwpn} --since 24h",
        .mpKinds = "lun-reset device-busy queue-full",
        .mpLook = lookForHostTimeouts},
    ZTSRule{.mpId = "scan-noise",
            .mSeverity = ZTSV_Noise,
            .mpTitle = "ANSWERS TO A DEVICE SCAN",
            .mpWanted =
                "Check conditions with sense key 05 and code 20/00, 24/00 or 25/00, and only in answer to commands "
                "that ask what a device is or can do (INQUIRY, REPORT LUNS, TEST UNIT READY, MODE SENSE ...).",
            .mpAgainst = "A read or a write got the same answer.",
            .mpMeans = "A device was asked for something that it does not have, and said so. Every scan of devices "
                       "does that. It is harmless.",
            .mpNext = "Nothing.",
            .mpKinds = "check-condition",
            .mpLook = lookForScans},
};

std::span<const ZTSRule> getRules() {
    return scRules;
}
