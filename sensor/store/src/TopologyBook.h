/// Writes the intervals of the topology: only what a scan saw otherwise than the one before.
#ifndef SENSOR_STORE_SRC_TOPOLOGYBOOK_H
#define SENSOR_STORE_SRC_TOPOLOGYBOOK_H

#include <cstdint>
#include <map>
#include <string>
#include <utility>

#include "sensor/store/src/Database.h"
#include "sensor/store/src/ThingBody.h"

class ZTCTopologyBook {
public:
    explicit ZTCTopologyBook(ZTCDatabase& arDatabase) : mrDatabase(arDatabase) {}

    /// Forgets everything; the open intervals are read again when they are needed.
    void clear();

    /// Returns false where `aMostRows` did not suffice: the same call again, in a later transaction, goes on.
    bool note(std::int64_t aTime, const ZTSTopology& acrTopology, std::uint32_t aMostRows);

private:
    using Key = std::pair<ZTETopologyThing, std::string>;
    struct Interval {
        std::int64_t mId = 0;
        ZTCStoreBytes mBody;
        std::uint64_t mSeenIn = 0;  ///< the last call of note() that met it
    };

    void load();
    void noteScan(std::int64_t aTime, const ZTSTopology& acrTopology, bool aHasChanged);
    void keepUnread(ZTSThing& arThing, const ZTSTopology& acrTopology);
    std::int64_t insert(std::int64_t aTime, const ZTSThing& acrThing);

    ZTCDatabase& mrDatabase;
    bool mIsLoaded = false;
    std::uint64_t mCalls = 0;
    std::map<Key, Interval> mOpen;
};

#endif
