#include "sensor/store/src/CounterBook.h"

#include "sensor/store/src/CountBook.h"

std::int64_t ZTCCounterBook::findOrAddName(const std::string& acrName) {
    const auto lKnown = mIds.find(acrName);
    if (lKnown != mIds.end()) {
        return lKnown->second;
    }
    ZTCStatement(mrDatabase, "INSERT OR IGNORE INTO counterName(name) VALUES (?)").run(acrName);
    ZTCStatement lFind(mrDatabase, "SELECT id FROM counterName WHERE name = ?");
    lFind.query(acrName).step();
    return mIds[acrName] = lFind.number(0);
}

void ZTCCounterBook::note(std::span<const ZTSCounterSample> aSamples) {
    ZTCStatement lAdd(mrDatabase,
                      "INSERT INTO portCounter(slot, initiator, port, counter, difference) VALUES (?, ?, ?, ?, ?) "
                      "ON CONFLICT DO UPDATE SET difference = difference + excluded.difference");
    for (const ZTSCounterSample& lrSample : aSamples) {
        if (lrSample.mDifference == 0) {
            continue;
        }
        const std::uint32_t lInitiator =
            mrNames.findOrAddInitiator({.mWwpn = lrSample.mInitiator, .mWwnn = std::nullopt, .mHost = {}});
        const std::uint32_t lPort = lrSample.mRemotePort ? mrNames.findOrAddPort(*lrSample.mRemotePort) : 0;
        lAdd.run(getSlot(lrSample.mMinute, gcMinuteMicroseconds), lInitiator, lPort, findOrAddName(lrSample.mCounter),
                 lrSample.mDifference);
    }
}
