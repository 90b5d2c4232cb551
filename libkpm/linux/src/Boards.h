/// Which FC host is which board. Boards are given in order of host number to the hosts of one look, and are never given
/// to another port again: a host that leaves leaves its board empty, and a port that comes back, known by its name,
/// gets its own. Pure.
#ifndef LIBKPM_LINUX_SRC_BOARDS_H
#define LIBKPM_LINUX_SRC_BOARDS_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "libkpm/include/libkpm.h"

/// A host as it was seen. A name that could not be read is zero.
struct ZTSLinuxHost {
    std::uint32_t mNumber = 0;
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
};

struct ZTSLinuxBoard {
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
    std::optional<std::uint32_t> mHost;  ///< none: its host is gone
};

class ZTCLinuxBoards {
public:
    struct Changes {
        std::vector<std::uint32_t> mArrived;
        std::vector<std::uint32_t> mLeft;

        bool isEmpty() const { return mArrived.empty() && mLeft.empty(); }
    };

    /// Takes in what one look saw: all hosts there are, each number once, in ascending order.
    Changes update(const std::vector<ZTSLinuxHost>& acrHosts);

    std::optional<std::uint32_t> findHost(std::uint32_t aNumber) const;
    const ZTSLinuxBoard& get(std::uint32_t aBoard) const { return mBoards.at(aBoard); }
    std::uint32_t size() const { return static_cast<std::uint32_t>(mBoards.size()); }

    /// The numbers of the hosts that are there, in ascending order.
    std::vector<std::uint32_t> getHosts() const;

private:
    std::uint32_t place(const ZTSLinuxHost& acrHost);

    std::vector<ZTSLinuxBoard> mBoards;
};

bool isSameName(const HBA_wwn& acrOne, const HBA_wwn& acrOther);
bool isZeroName(const HBA_wwn& acrName);

#endif
