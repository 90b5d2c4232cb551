/// A topology as things, each with a key and its attributes in one range of bytes, as the database holds them.
///
/// Bytes: for each attribute that is known, in the order of the table in the source: its number and the size of its
/// value as varints, then the value as text. Lists have a line break between their members.
#ifndef SENSOR_STORE_SRC_THINGBODY_H
#define SENSOR_STORE_SRC_THINGBODY_H

#include <cstdint>
#include <map>
#include <span>
#include <string>
#include <vector>

#include "sensor/store/include/TopologyHistory.h"
#include "sensor/store/src/Varint.h"

struct ZTSThing {
    ZTETopologyThing mThing = ZTTT_Initiator;
    std::string mKey;
    ZTCStoreBytes mBody;
};

/// Values by attribute number.
using ZTCThingValues = std::map<std::uint64_t, std::string>;

/// Every thing of a topology, in no order.
std::vector<ZTSThing> toThings(const ZTSTopology& acrTopology);

/// Puts a stored thing into a topology. It skips attributes of a later version. Throws ZTCStoreDamagedEx for
/// bytes that end early.
void addThing(ZTSTopology& arTopology, ZTETopologyThing aThing, const std::string& acrKey,
              std::span<const std::uint8_t> aBody);

/// Takes a thing out; nothing where it is not there.
void removeThing(ZTSTopology& arTopology, ZTETopologyThing aThing, const std::string& acrKey);

/// As a scan sorts.
void sortTopology(ZTSTopology& arTopology);

ZTCThingValues readValues(std::span<const std::uint8_t> aBody);
ZTCStoreBytes writeValues(const ZTCThingValues& acrValues);

/// The name of an attribute, as changes show it; empty where there is no such number.
std::string getAttributeName(std::uint64_t aAttribute);

/// Whether the attribute's value is read from a file, which may block, and does not follow from a name in a directory.
bool isFromFile(std::uint64_t aAttribute);

#endif
