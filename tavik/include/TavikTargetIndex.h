/// The names of the registered targets by port name, in one flat table: an event's look-up reads one place of memory,
/// however many targets there are.
#ifndef TAVIK_INCLUDE_TAVIKTARGETINDEX_H
#define TAVIK_INCLUDE_TAVIKTARGETINDEX_H

#include <cstddef>
#include <vector>

#include "common/include/Log.h"
#include "sensor/agentcommon/include/WorldWideName.h"

/// A remote port's names.
struct ZTSRemotePortNames {
    ZTCWorldWideName mWwpn;
    ZTCWorldWideName mWwnn;
};

/// Not locked: its owner guards it. Names are added and never removed.
class ZTCTavikTargetIndex {
public:
    /// Makes room for one port more. Throws ZTCNoMemoryEx and changes nothing then.
    void reserveOne();

    /// Adds a port whose name is not there yet; room was made for it.
    void insert(const ZTSRemotePortNames& acrNames) noexcept;

    /// The names of the port with this key (ZTCWorldWideName::getKey), or null. Valid until reserveOne.
    const ZTSRemotePortNames* find(unsigned long aKey) const noexcept;

private:
    /// Where the search for a key begins.
    std::size_t getFirstSlot(unsigned long aKey) const noexcept {
        ZT_ENTRY();
        const auto lSlot = static_cast<std::size_t>(aKey * gcHashFactor >> mShift);
        ZT_EXIT();
        return lSlot;
    }

    static constexpr unsigned long gcHashFactor = 0x9e3779b97f4a7c15;

    /// A slot with the zero port name is free. So a port that has this name is kept in mNoPort. The number of slots is
    /// a power of 2, and at most two thirds of them are taken.
    std::vector<ZTSRemotePortNames> mSlots;
    ZTSRemotePortNames mNoPort;
    bool mHasNoPort = false;
    std::size_t mTaken = 0;
    unsigned mShift = 0;  ///< the hash's highest bits are the slot
};

#endif
