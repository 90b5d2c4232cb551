/// The registrations that an agent has made, one at most for each kind of each board: the newest.
#ifndef LIBKPM_SIM_SRC_REGISTRY_H
#define LIBKPM_SIM_SRC_REGISTRY_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <optional>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/KindTable.h"

struct ZTSSimRegistration {
    std::uint32_t mHandle = 0;
    bool mHasSource = true;  ///< false: nothing is ever delivered for it
    void* mpContext = nullptr;
    KPM_ScopeCallback mpScopeCallback = nullptr;  ///< for kinds that are registered per port
    KPM_EventCallback mpEventCallback = nullptr;  ///< for the others
};

/// All operations may be called from any thread, and none of them calls out.
class ZTCSimRegistry {
public:
    explicit ZTCSimRegistry(std::size_t aBoards);

    /// Replaces what is registered for that kind of that board. Fills in a handle of its own, unless aHandle names one,
    /// and returns it.
    std::uint32_t put(std::uint32_t aBoard, std::size_t aKind, ZTSSimRegistration aRegistration,
                      std::optional<std::uint32_t> aHandle);

    /// The kind that this handle of the board stands for now.
    std::optional<std::size_t> findKind(std::uint32_t aBoard, std::uint32_t aHandle) const;

    /// Ends a registration, if the handle is still its own.
    void remove(std::uint32_t aBoard, std::size_t aKind, std::uint32_t aHandle);

    std::optional<ZTSSimRegistration> find(std::uint32_t aBoard, std::size_t aKind) const;

    std::size_t size() const;

private:
    mutable std::mutex mLock;

    // Guarded by mLock.
    std::uint32_t mLastHandle = 0;
    std::vector<std::array<std::optional<ZTSSimRegistration>, gcSimKindCount>> mBoards;
};

#endif
