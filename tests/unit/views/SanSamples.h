/// Topologies of made-up hosts that the tests of the views look at.
#ifndef TESTS_UNIT_VIEWS_SANSAMPLES_H
#define TESTS_UNIT_VIEWS_SANSAMPLES_H

#include "sensor/topology/include/Topology.h"

struct ZTSSanShape {
    unsigned mHosts = 2;
    unsigned mPortsOfAHost = 4;
    unsigned mLuns = 4;
    unsigned mFirstHost = 7;
    bool mIsOneFabric = false;  ///< every initiator sees the same remote ports
};

/// A healthy host: each unit has a path through each remote port of each initiator, a multipath device and a mount.
/// The initiators are "host7", "host8" and so on, the remote ports "rport-7:0-0" and so on, the units "naa.000" ...
ZTSTopology makeSan(const ZTSSanShape& acrShape);

/// The port has just gone: it is blocked, and so are the devices behind it.
void losePort(ZTSTopology& arTopology, const std::string& acrName);

/// The port has been away for longer than dev_loss_tmo: the kernel has removed what was behind it.
void removePort(ZTSTopology& arTopology, const std::string& acrName);

#endif
