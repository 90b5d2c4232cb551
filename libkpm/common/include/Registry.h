/// The registrations that an agent has made: for each kind of each board, the newest alone.
#ifndef LIBKPM_COMMON_INCLUDE_REGISTRY_H
#define LIBKPM_COMMON_INCLUDE_REGISTRY_H

#include <cstddef>
#include <cstdint>
#include <mutex>
#include <optional>
#include <vector>

#include "libkpm/include/libkpm.h"

struct ZTSLibraryRegistration {
    std::uint32_t mHandle = 0;
    bool mHasSource = true;  ///< false: nothing is ever delivered for it
    void* mpContext = nullptr;
    KPM_ScopeCallback mpScopeCallback = nullptr;  ///< for kinds that are registered per port
    KPM_EventCallback mpEventCallback = nullptr;  ///< for kinds that are registered per board

    bool isPerPort() const { return mpScopeCallback != nullptr; }
};

/// All operations may be called from any thread, and none of them calls out.
class ZTCLibraryRegistry {
public:
    /// Kinds are numbered from 0 to `aKinds` - 1.
    explicit ZTCLibraryRegistry(std::size_t aKinds) : mKinds(aKinds) {}

    /// Replaces the registration for that kind of that board. Returns its handle: `aHandle` where one is given, else a
    /// new one, which is never 0.
    std::uint32_t put(std::uint32_t aBoard, std::size_t aKind, ZTSLibraryRegistration aRegistration,
                      std::optional<std::uint32_t> aHandle = std::nullopt);

    /// The kind that this handle of the board is registered for.
    std::optional<std::size_t> findKind(std::uint32_t aBoard, std::uint32_t aHandle) const;

    std::optional<ZTSLibraryRegistration> find(std::uint32_t aBoard, std::size_t aKind) const;

    /// Ends the registration of that kind, unless it has another handle by now. Returns whether there was one.
    bool remove(std::uint32_t aBoard, std::size_t aKind, std::uint32_t aHandle);

    /// The number of registrations.
    std::size_t size() const;

private:
    using Entry = std::optional<ZTSLibraryRegistration>;

    const Entry* findEntry(std::uint32_t aBoard, std::size_t aKind) const;

    const std::size_t mKinds;

    mutable std::mutex mLock;

    // Guarded by mLock.
    std::uint32_t mLastHandle = 0;
    std::vector<std::vector<Entry>> mBoards;
};

#endif
