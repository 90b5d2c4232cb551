/// Events as an adapters' library hands them to the agent's callbacks, made once and delivered many times.
#ifndef BENCH_SUPPORT_BENCHEVENTS_H
#define BENCH_SUPPORT_BENCHEVENTS_H

#include <array>
#include <cstdint>
#include <vector>

#include "libkpm/include/libkpm.h"

/// Remote ports by number: each port name differs from its neighbours in its last bytes, as those of one maker do.
inline constexpr std::uint64_t gcBenchPortBase = 0x500601603ba00000;

/// A world wide name as it stands on the wire.
HBA_wwn makeBenchName(std::uint64_t aValue);

/// One event of the generic callback. Belongs to one thread; neither copied nor moved, since it points into itself.
class ZTCBenchEvent {
public:
    /// Version 0, the remote port, and these numbers behind it.
    ZTCBenchEvent(unsigned aCategory, unsigned aSubcategory, std::uint64_t aPort,
                  const std::vector<std::uint32_t>& acrNumbers);
    ZTCBenchEvent(const ZTCBenchEvent&) = delete;
    ZTCBenchEvent& operator=(const ZTCBenchEvent&) = delete;

    void setPort(std::uint64_t aPort);
    void deliver(unsigned aBoard = 0);

private:
    unsigned mCategory;
    unsigned mSubcategory;
    alignas(8) std::array<unsigned char, 64> mData{};
    ZT_event_payload mPayload{};
    ZT_event mEvent{};
};

/// QUEUE FULL of LUN 5.
class ZTCBenchQFull : public ZTCBenchEvent {
public:
    explicit ZTCBenchQFull(std::uint64_t aPort = gcBenchPortBase) : ZTCBenchEvent(4, 0x01, aPort, {5}) {}
};

/// An RSCN with one page, the address of one port.
void deliverBenchRscn(unsigned aBoard = 0);

#endif
