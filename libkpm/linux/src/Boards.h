/// Maps FC hosts to boards. New hosts get boards in the order of their numbers. A board belongs to one port for ever:
/// it stays empty while the port's host is gone, and the port gets it again when it comes back. Ports are known by
/// their names, so a host whose name cannot be read yet has to wait for its board. Pure.
#ifndef LIBKPM_LINUX_SRC_BOARDS_H
#define LIBKPM_LINUX_SRC_BOARDS_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "libkpm/common/include/PortName.h"
#include "libkpm/include/libkpm.h"

/// A host as it was seen. A name that it does not have, or that could not be read, is zero.
struct ZTSLinuxHost {
    std::uint32_t mNumber = 0;
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
};

struct ZTSLinuxBoard {
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
    std::optional<std::uint32_t> mHost;   ///< none: its host is gone
    std::vector<HBA_wwn> mFormerNames{};  ///< port names that it had before

    /// Whether this is its port name, or was.
    bool hasName(const HBA_wwn& acrPort) const;
};

class ZTCLinuxBoards {
public:
    struct Changes {
        std::vector<std::uint32_t> mArrived;   ///< boards whose host has come
        std::vector<std::uint32_t> mLeft;      ///< boards whose host is gone
        std::vector<std::uint32_t> mRenamed;   ///< boards that have another port name now
        std::vector<std::uint32_t> mHeldBack;  ///< hosts without a name that were not held back before
    };

    /// Takes in what one look saw: all hosts there are, each number once, in ascending order.
    Changes update(const std::vector<ZTSLinuxHost>& acrHosts);

    std::optional<std::uint32_t> findHost(std::uint32_t aNumber) const;
    const ZTSLinuxBoard& get(std::uint32_t aBoard) const { return mBoards.at(aBoard); }
    std::uint32_t size() const { return static_cast<std::uint32_t>(mBoards.size()); }

    /// The numbers of the boards' hosts that are there, in ascending order.
    std::vector<std::uint32_t> getHosts() const;

private:
    bool isAnotherBoards(const HBA_wwn& acrName, std::uint32_t aBoard) const;
    bool follow(std::uint32_t aBoard, const std::vector<ZTSLinuxHost>& acrHosts, Changes& arChanges);
    std::uint32_t place(const ZTSLinuxHost& acrHost);

    std::vector<ZTSLinuxBoard> mBoards;
    std::vector<std::uint32_t> mHeldBack;  // numbers of hosts, in ascending order
};

#endif
