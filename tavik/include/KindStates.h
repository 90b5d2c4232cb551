/// What is known of each kind on each board: registered or not, and what the adapters' library reports. Shows it on the
/// status page.
#ifndef TAVIK_INCLUDE_KINDSTATES_H
#define TAVIK_INCLUDE_KINDSTATES_H

#include <array>
#include <cstdint>
#include <vector>

#include "common/include/Log.h"
#include "common/include/Map.h"
#include "common/include/Pointer.h"
#include "common/include/ThreadAnnotations.h"
#include "os/common/include/Mutex.h"
#include "sensor/agentcommon/include/LibkpmAbs.h"
#include "sensor/agentcommon/include/ScopeEvent.h"
#include "sensor/agentcommon/include/StatusPage.h"
#include "tavik/include/StatusPageWriter.h"
#include "tavik/include/TavikInitiator.h"

/// Does nothing while there is no page. Its lock is taken with no other lock of the agent held, and none is taken while
/// it is held; the library may hold its own.
///
/// A kind is off before it is registered, and while collection is off. A registration that answers with a status gives
/// its state: a report counts only if it came while the registration ran, or comes later. For one that answers with a
/// handle alone the last report counts, whenever it came.
class ZTCKindStates : public ZTCLibkpmReports {
public:
    /// The page is not owned and outlives this.
    explicit ZTCKindStates(ZTCStatusPageWriter& arPage) : mrPage(arPage) {
        ZT_ENTRY();
        ZT_EXIT();
    }

    // ---- Main thread ----

    /// Adds the boards to the page. Throws ZTCClibEx as the page does.
    void addBoards(const ZTCMap<unsigned int, ZTCPointer<ZTCTavikInitiator>>& acrInitiators);

    // ---- Command thread ----

    void setCollecting(bool aIsCollecting);

    /// To be called before a registration; its result goes to the call below that follows the registration.
    std::uint64_t countReports();

    /// A registration that answers with a status of libkpm.h has answered. acrEvent is the kind as registered.
    void noteStatus(unsigned aBoardId, const ZTCScopeEvent& acrEvent, unsigned aStatus, std::uint64_t aReports);

    /// A registration that answers with a handle has answered. aIsOptional: the agent does without it.
    void noteHandle(unsigned aBoardId, const ZTCScopeEvent& acrEvent, unsigned aHandle, bool aIsOptional);

    /// Nothing is registered any more.
    void clearRegistrations();

    // ---- Any thread ----

    void reportState(std::uint32_t aBoardId, std::uint32_t aCategory, std::uint32_t aSubcategory, std::uint32_t aState,
                     const char* apReason) noexcept override;
    void reportLoss(const char* apName, std::uint64_t aTotal) noexcept override;

private:
    struct ZTSKindState {
        bool mIsRegistered = false;
        ZTEStatusState mState = ZTSS_Off;     ///< once it is registered
        ZTEStatusState mReported = ZTSS_Off;  ///< the last report; off: none yet
        std::uint64_t mReportNumber = 0;      ///< the number of that report among all
        char mReason[8 * 14] = "";            ///< of that report
    };
    using ZTCBoardStates = std::array<ZTSKindState, gcStatusKinds>;

    ZTSKindState* findKind(unsigned aBoardId, unsigned aKind) ZT_REQUIRES(mLock);
    void show(unsigned aBoardId, unsigned aKind) noexcept ZT_REQUIRES(mLock);
    void showAll() noexcept ZT_REQUIRES(mLock);

    ZTCStatusPageWriter& mrPage;
    ZTCMutex mLock;
    std::vector<ZTCBoardStates> mBoards ZT_GUARDED_BY(mLock);
    std::uint64_t mReports ZT_GUARDED_BY(mLock) = 0;
    bool mIsCollecting ZT_GUARDED_BY(mLock) = false;
};

#endif
