/// The entries of libkpm.h for adapters and for registrations, as both libraries answer them. They check the arguments
/// in the same order, return the same status for the same mistake, and keep the registrations. A library derives its
/// engine from this class and overrides which boards and kinds it has.
///
/// All operations may be called from any thread.
#ifndef LIBKPM_COMMON_INCLUDE_REGISTRATIONDESK_H
#define LIBKPM_COMMON_INCLUDE_REGISTRATIONDESK_H

#include <cstddef>
#include <cstdint>
#include <optional>

#include "libkpm/common/include/LibraryStatus.h"
#include "libkpm/common/include/Registry.h"
#include "libkpm/include/libkpm.h"

/// How a library answers a registration whose arguments are right.
struct ZTSRegistrationAnswer {
    std::uint32_t mStatus = KPM_STATUS_SUCCESS;
    std::optional<std::uint32_t> mHandle;  ///< none: the registry gives one
    bool mHasSource = true;                ///< false: nothing is ever delivered
};

struct ZTSBoardNames {
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
};

/// Whether the agent counts a registration with this status as made.
constexpr bool isAcceptedStatus(std::uint32_t aStatus) {
    return aStatus == KPM_STATUS_SUCCESS || aStatus == KPM_STATUS_INFO_5 || aStatus == KPM_STATUS_NO_SOURCE ||
           aStatus == KPM_STATUS_NO_RIGHTS;
}

class ZTCRegistrationDesk {
public:
    /// Kinds are numbered from 0 to `aKinds` - 1.
    explicit ZTCRegistrationDesk(std::size_t aKinds) : mRegistry(aKinds) {}
    virtual ~ZTCRegistrationDesk() = default;
    ZTCRegistrationDesk(const ZTCRegistrationDesk&) = delete;
    ZTCRegistrationDesk& operator=(const ZTCRegistrationDesk&) = delete;

    /// The number of boards now. Never waits for a callback.
    virtual std::uint32_t getNumberOfAdapters() const = 0;

    std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName);
    std::uint32_t registerForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                                  std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                  KPM_ScopeCallback apCallback);
    std::uint32_t unregisterForPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aHandle);

    /// The handle, 0 on failure.
    std::uint32_t registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                   KPM_EventCallback apCallback);
    std::uint32_t unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle);

protected:
    const ZTCLibraryRegistry& getRegistry() const { return mRegistry; }

    // Answered by the library. They are called only with boards and kinds that there are.

    /// The number of boards, with those that have gone: their registrations can still be ended.
    virtual std::uint32_t getNumberOfBoardsEver() const { return getNumberOfAdapters(); }

    /// Writes the names. Where the library refuses, returns another status than success.
    virtual std::uint32_t answerAdapterInfo(std::uint32_t aBoard, ZTSBoardNames& arNames) = 0;

    virtual bool isPortOf(std::uint32_t aBoard, const HBA_wwn& acrPort) const = 0;

    /// The kind that is registered under this pair; category 0 for those that are registered per board.
    virtual std::optional<std::size_t> findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const = 0;

    virtual ZTSRegistrationAnswer answerRegistration(std::uint32_t aBoard, std::size_t aKind) = 0;

    /// Called after a registration was made.
    virtual void noteRegistration(std::uint32_t /*aBoard*/, std::size_t /*aKind*/) {}

    /// Where the library refuses, returns another status than success.
    virtual std::uint32_t answerUnregistration(std::uint32_t /*aBoard*/, std::size_t /*aKind*/) {
        return ZTLST_Success;
    }

private:
    std::uint32_t unregister(std::uint32_t aBoard, std::uint32_t aHandle, bool aIsPerPort);

    ZTCLibraryRegistry mRegistry;
};

#endif
