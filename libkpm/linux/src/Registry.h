/// The registrations that an agent has made, one at most for each kind of each board: the newest.
#ifndef LIBKPM_LINUX_SRC_REGISTRY_H
#define LIBKPM_LINUX_SRC_REGISTRY_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <optional>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/KindSources.h"

struct ZTSLinuxRegistration {
    std::uint32_t mHandle = 0;
    void* mpContext = nullptr;
    KPM_ScopeCallback mpScopeCallback = nullptr;  ///< for kinds that are registered per port
    KPM_EventCallback mpEventCallback = nullptr;  ///< for the others
};

/// All operations may be called from any thread, and none of them calls out.
class ZTCLinuxRegistry {
public:
    /// Replaces what is registered for that kind of that board, and returns the new handle.
    std::uint32_t put(std::uint32_t aBoard, std::size_t aKind, ZTSLinuxRegistration aRegistration);

    /// Ends the registration of this handle, if it is one of a kind that is registered per port, or per board, as
    /// `aIsPerPort` says. False where there is none.
    bool remove(std::uint32_t aBoard, std::uint32_t aHandle, bool aIsPerPort);

    std::optional<ZTSLinuxRegistration> find(std::uint32_t aBoard, std::size_t aKind) const;

private:
    mutable std::mutex mLock;

    // Guarded by mLock.
    std::uint32_t mLastHandle = 0;
    std::vector<std::array<std::optional<ZTSLinuxRegistration>, gcLinuxKindCount>> mBoards;
};

#endif
