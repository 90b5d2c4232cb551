#include "tavik/include/TavikProtocolHandler.h"

#include <algorithm>
#include <cstdint>
#include <iterator>

#include "common/include/Assert.h"
#include "common/include/EncodableStream.h"
#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Memory.h"
#include "libkpm/include/libkpm.h"
#include "tavik/include/ScopeEventSubType.h"
#include "tavik/include/TavikCore.h"
#include "tavik/include/TavikSystem.h"

ZTCTavikSystem* gpTavikSystem = nullptr;
std::atomic<bool> mDoScopeCollection(false);

namespace {

constexpr Size scResponseCapacity = 1024;
/// More bytes than the key of a board takes in a response.
constexpr Size scInitiatorKeySize = 128;

using ZTPCommandHandler = void (ZTCTavikProtocolHandler::*)(const ZTCPointer<ZTCBuffer>&, ZTCPointer<ZTCBuffer>&);

/// By command code.
constexpr ZTPCommandHandler scCommandHandlers[] = {
    &ZTCTavikProtocolHandler::handleStartScopeCommand, &ZTCTavikProtocolHandler::handleGetScopeDataCommand,
    &ZTCTavikProtocolHandler::handleStopCommand,       &ZTCTavikProtocolHandler::handleRegisterTargetsCommand,
    &ZTCTavikProtocolHandler::handleShutDownCommand,   &ZTCTavikProtocolHandler::handleSetCollectionPeriodCommand,
};

/// How the kinds are registered that the library reports per board.
struct ZTSBoardRegistration {
    unsigned char mSubcategory;
    unsigned int mEventType;
    unsigned int mSize;
    KPM_EventCallback mpCallback;
    const char* mpFailedText;
    const char* mpRegisteredText;
    bool mIsRequired;  ///< a failure fails the whole command
};

const ZTSBoardRegistration scBoardRegistrations[] = {
    {FC_REG_RSCN_EVENT, FC_REG_RSCN_EVENT, 1024, reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmRscn),
     "Failed to register RSCN for Initiator <%s, %s> - Error %u", "Registered RSCN for Initiator <%s, %s>", true},
    {FC_REG_TEMPERATURE_EVENT, FC_REG_TEMPERATURE_EVENT, 0, reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmTemp),
     "Failed to register TEMPERATURE for Initiator <%s, %s> - Error %u",
     "Registered Temperature Event for Initiator <%s, %s>", false},
    {FC_REG_LINK_EVENT, FC_REG_LINK_EVENT, sizeof(LINKINFO), reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmLink),
     "Failed to register LINK for Initiator <%s, %s> - Error %u", "Registered LINK for Initiator <%s, %s>", true},
};

/// The library hands the context of a board registration back unread.
void* const scpBoardContext = reinterpret_cast<void*>(std::uintptr_t{0xFFFF});

enum ZTERegistrationOutcome : unsigned char {
    ZTRG_Registered,
    ZTRG_Ignored,  ///< a kind that nothing registers
    ZTRG_Missing,  ///< the library refused a kind that the agent can do without
    ZTRG_Refused   ///< the library refused a kind that the agent needs
};

/// What came of registering one kind for one initiator.
struct ZTSRegistration {
    ZTERegistrationOutcome mOutcome;
    unsigned int mStatus;                 ///< a board registration yields none: 0
    unsigned int mHandle;                 ///< where it is registered
    const ZTSBoardRegistration* mpBoard;  ///< null for a kind that the library reports per port
};

const ZTSBoardRegistration* sFindBoardRegistration(unsigned char aSubcategory) {
    ZT_ENTRY();
    const auto* lpFound = std::find_if(std::begin(scBoardRegistrations), std::end(scBoardRegistrations),
                                       [&](const auto& acrRow) { return acrRow.mSubcategory == aSubcategory; });
    ZT_EXIT();
    return lpFound == std::end(scBoardRegistrations) ? nullptr : lpFound;
}

bool sIsAccepted(unsigned int aStatus) {
    ZT_ENTRY();
    const bool lIsAccepted = aStatus == KPM_STATUS_SUCCESS || aStatus == KPM_STATUS_INFO_5 ||
                             aStatus == KPM_STATUS_NO_SOURCE || aStatus == KPM_STATUS_NO_RIGHTS;
    ZT_EXIT();
    return lIsAccepted;
}

/// Registers a kind that the library reports per port.
ZTSRegistration sRegisterForPort(ZTCTavikSystem* apSystem, const ZTCTavikInitiator& acrInitiator,
                                 const ZTCPointer<ZTCScopeEvent>& acrEvent) {
    ZT_ENTRY();
    unsigned int lHandle = 0;
    const std::uint64_t lReports = apSystem->getKindStates().countReports();
    const unsigned int lStatus = apSystem->getLibkpmAbs()->LIBKPM_ZtapiRegEvent(
        acrInitiator.getBoardId(), acrInitiator.getWwpn(), acrEvent, apSystem, &lHandle, &ScopeCb_Generic);
    apSystem->getKindStates().noteStatus(acrInitiator.getBoardId(), *acrEvent, lStatus, lReports);
    const ZTERegistrationOutcome lOutcome = sIsAccepted(lStatus) ? ZTRG_Registered : ZTRG_Refused;
    ZT_EXIT();
    return {lOutcome, lStatus, lHandle, nullptr};
}

/// Registers a kind that the library reports per board.
ZTSRegistration sRegisterForBoard(ZTCTavikSystem* apSystem, const ZTCTavikInitiator& acrInitiator,
                                  const ZTCPointer<ZTCScopeEvent>& acrEvent) {
    ZT_ENTRY();
    ZTSRegistration lResult{ZTRG_Ignored, 0, 0, sFindBoardRegistration(acrEvent->getSubcategory())};
    if (lResult.mpBoard != nullptr) {
        const ZTSBoardRegistration& lcrRow = *lResult.mpBoard;
        lResult.mHandle = apSystem->getLibkpmAbs()->LIBKPM_KpmRegEvent(
            acrInitiator.getBoardId(), lcrRow.mEventType, scpBoardContext, lcrRow.mSize, lcrRow.mpCallback);
        apSystem->getKindStates().noteHandle(acrInitiator.getBoardId(), *acrEvent, lResult.mHandle,
                                             !lcrRow.mIsRequired);
        const ZTERegistrationOutcome lOutcomeOfFailure = lcrRow.mIsRequired ? ZTRG_Refused : ZTRG_Missing;
        lResult.mOutcome = lResult.mHandle != 0 ? ZTRG_Registered : lOutcomeOfFailure;
    }
    ZT_EXIT();
    return lResult;
}

}  // namespace

ZTCTavikProtocolHandler::ZTCTavikProtocolHandler(ZTCTavikSystem* apSystem) : mpTavikSystem(apSystem) {
    ZT_ENTRY();
    ZT_ASSERT(__null != this->mpTavikSystem);
    gpTavikSystem = apSystem;
    mDoScopeCollection = false;
    mEventsRegistered = false;
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::process(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableInStream lStream(acrRequest);
    unsigned char lType = 0;
    lStream >> lType;
    ZT_TRACE_MSG("Command to handle: %u", lType);
    if (lType >= sizeof scCommandHandlers / sizeof scCommandHandlers[0]) {
        ZT_NEVER_GET_HERE();
    }
    (this->*scCommandHandlers[lType])(acrRequest, arResponse);
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleStartScopeCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                                      ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableInStream lStream(acrRequest);
    unsigned char lType = 0;
    lStream >> lType;
    ZT_ASSERT(lType == ZTSTVKC_StartScope);
    unsigned int lMaxEventDataSize = 0;
    lStream >> lMaxEventDataSize;
    mpTavikSystem->setMaxEventDataSize(lMaxEventDataSize);
    mpTavikSystem->getStatusPage().setRecordLimit(lMaxEventDataSize);
    mDoScopeCollection = true;
    mpTavikSystem->getKindStates().setCollecting(true);
    if (mEventsRegistered) {
        ZT_LOG_NOTICE("ScopeEvents Already Registered. Hence Starting ScopeData Collection.");
        createSuccessResponse(arResponse);
        ZT_EXIT();
        return;
    }

    bool lIsRefused = false;
    for (const auto& lrEntry : mpTavikSystem->getInitiators()) {
        ZTCTavikInitiator& lrInitiator = *lrEntry.second;
        const ZTCString lWwnn = lrInitiator.getWwnn()->getString();
        const ZTCString lWwpn = lrInitiator.getWwpn()->getString();
        for (const ZTCPointer<ZTCScopeEvent>& lrEvent : mpTavikSystem->getEventCatalogue()->getAll()) {
            if (lIsRefused) {
                break;
            }
            const unsigned int lCategory = lrEvent->getCategory();
            const unsigned int lSubcategory = lrEvent->getSubcategory();
            const bool lIsOfBoard = lCategory == gcBoardEventCategory;
            const ZTSRegistration lResult = lIsOfBoard ? sRegisterForBoard(mpTavikSystem, lrInitiator, lrEvent)
                                                       : sRegisterForPort(mpTavikSystem, lrInitiator, lrEvent);
            lIsRefused = lResult.mOutcome == ZTRG_Refused;
            if (lResult.mOutcome == ZTRG_Ignored) {
                ZT_TRACE_MSG("Ignore other events for now");
            } else if (lResult.mOutcome == ZTRG_Missing) {
                ZT_LOG_WARN(lResult.mpBoard->mpFailedText, lWwnn.get(), lWwpn.get(), lResult.mStatus);
            } else if (lIsRefused && lIsOfBoard) {
                ZT_LOG_ERR(lResult.mpBoard->mpFailedText, lWwnn.get(), lWwpn.get(), lResult.mStatus);
            } else if (lIsRefused) {
                ZT_LOG_ERR("Failed to register event (%u, %u) for Initiator <%s, %s> - Error %u", lCategory,
                           lSubcategory, lWwnn.get(), lWwpn.get(), lResult.mStatus);
            } else {
                if (lIsOfBoard) {
                    ZT_LOG_NOTICE(lResult.mpBoard->mpRegisteredText, lWwnn.get(), lWwpn.get());
                } else {
                    ZT_LOG_NOTICE("Registered event (%u, %u) for Initiator <%s, %s>", lCategory, lSubcategory,
                                  lWwnn.get(), lWwpn.get());
                }
                lrInitiator.addRegEvent(lrEvent, lResult.mHandle);
            }
        }
    }
    mEventsRegistered = !lIsRefused;
    if (lIsRefused) {
        createFailedResponse(ZTSAPS_NotAllowed, arResponse);
    } else {
        createSuccessResponse(arResponse);
    }
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleGetScopeDataCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                                        ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableInStream lInStream(acrRequest);
    unsigned char lType = 0;
    lInStream >> lType;
    ZT_ASSERT(lType == ZTSTVKC_GetScopeData);

    ZTCEncodableOutStream lOutStream(scResponseCapacity);
    lOutStream << static_cast<unsigned char>(ZTRO_ScopeData) << mpTavikSystem->getNumRecordLists();

    ZTCTavikRecordsMap lFreshLists;
    ZTCTavikRecordsMap lTakenLists;
    mpTavikSystem->makeRecordLists(lFreshLists);
    Size lRoom;
    {
        const ZTCPrevDataHold lHold(*mpTavikSystem);
        lRoom = mpTavikSystem->getTotalEventDataSize();
        mpTavikSystem->clearPrevScopeData();
        mpTavikSystem->clearRecordsMap(lTakenLists);
        mpTavikSystem->addNewRecordListsToRecordsMap(lFreshLists);
        mpTavikSystem->resetTotalEventDataSize();
        mpTavikSystem->noteRetrieval();
    }

    // All of the room at once: growing step by step would copy the response again and again.
    for (const auto& lrEntry : lTakenLists) {
        lRoom += scInitiatorKeySize + lrEntry.second->size() * ZTCTavikRecord::gcMostBesideData;
    }
    lOutStream.reserve(lRoom);

    unsigned int lTotalRecords = 0;
    for (const auto& lrEntry : lTakenLists) {
        const ZTCPointer<ZTCTavikRecordList>& lrList = lrEntry.second;
        try {
            lOutStream << mpTavikSystem->getFcInitiator(lrList->getBoardId())->getKey();
        } catch (const ZTCNotFoundEx&) {
            // The list count in front still counts this list.
            ZT_LOG_ERR("Bad boardid %d detected during handle GetScopeDataCommand command",
                       static_cast<int>(lrList->getBoardId()));
            continue;
        }
        lTotalRecords += lrList->size();
        lrList->encode(lOutStream);
        ZT_LOG_NOTICE("Wrote <%u> Scope records from record-list", lrList->size());
        lrList->clear();
    }
    arResponse = lOutStream.getBuffer();
    ZT_LOG_NOTICE("Wrote total <%u> Scope Events", lTotalRecords);
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleStopCommand(const ZTCPointer<ZTCBuffer>&, ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZT_LOG_NOTICE("Stopping Scope Data Collection.");
    mDoScopeCollection = false;
    mpTavikSystem->getKindStates().setCollecting(false);
    createSuccessResponse(arResponse);
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleUnregisterEvents() {
    ZT_ENTRY();
    for (const auto& lrEntry : mpTavikSystem->getInitiators()) {
        ZTCLibkpmAbs& lrLibkpm = *mpTavikSystem->getLibkpmAbs();
        const ZTCTavikEventCatalogue& lrCatalogue = *mpTavikSystem->getEventCatalogue();
        const ZTCPointer<ZTCTavikInitiator>& lrInitiator = lrEntry.second;
        for (auto lRegistration = lrInitiator->r_begin(); lRegistration != lrInitiator->r_end(); ++lRegistration) {
            const unsigned short lKeyForm = lRegistration->first;
            const unsigned int lHandle = lRegistration->second;
            if (lHandle == 0) {
                continue;
            }
            const ZTCPointer<ZTCScopeEvent>* lpEvent;
            try {
                lpEvent = &lrCatalogue.get(lKeyForm);
            } catch (const ZTCNotFoundEx&) {
                ZT_LOG_ERR("Bad event keyform %d has beed detected in map of registered events", lKeyForm);
                continue;
            }
            const unsigned int lCategory = (*lpEvent)->getCategory();
            const unsigned int lSubcategory = (*lpEvent)->getSubcategory();
            if (lCategory == gcBoardEventCategory) {
                lrLibkpm.LIBKPM_KpmUnregEvent(lrInitiator->getBoardId(), lHandle);
                continue;
            }
            const unsigned int lResult =
                lrLibkpm.LIBKPM_ZtapiUnregEvent(lrInitiator->getBoardId(), lrInitiator->getWwpn(), lHandle);
            if (lResult != 0) {
                ZT_LOG_WARN("Failed to Unregister event (%u, %u) for Initiator <%s, %s> - Error %u", lCategory,
                            lSubcategory, lrInitiator->getWwnn()->getString().get(),
                            lrInitiator->getWwpn()->getString().get(), lResult);
            } else {
                ZT_LOG_NOTICE("Successfully Unregistered event (%u, %u) for Initiator <%s, %s> ", lCategory,
                              lSubcategory, lrInitiator->getWwnn()->getString().get(),
                              lrInitiator->getWwpn()->getString().get());
            }
        }
        lrInitiator->cleanRegs();
    }
    mEventsRegistered = false;
    mpTavikSystem->getKindStates().clearRegistrations();
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleRegisterTargetsCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                                           ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableInStream lStream(acrRequest);
    unsigned char lType = 0;
    lStream >> lType;
    ZT_ASSERT(ZTSTVKC_RegisterTargets == lType);
    unsigned int lTargetCount = 0;
    lStream >> lTargetCount;
    if (lTargetCount == 0) {
        createFailedResponse(ZTSAPS_Invalid, arResponse);
        ZT_EXIT();
        return;
    }
    for (unsigned int lIndex = 0; lIndex < lTargetCount; ++lIndex) {
        const ZTCPointer<ZTCWorldWideName> lWwnn(NEW ZTCWorldWideName());
        const ZTCPointer<ZTCWorldWideName> lWwpn(NEW ZTCWorldWideName());
        unsigned int lFcId = 0;
        lWwnn->decode(lStream);
        lWwpn->decode(lStream);
        lStream >> lFcId;
        const ZTCPointer<ZTCTavikTarget> lTarget(NEW ZTCTavikTarget(lWwnn, lWwpn, lFcId));
        mpTavikSystem->addFcTarget(lTarget);
        mpTavikSystem->addWwpnTarget(lTarget);
    }
    createSuccessResponse(arResponse);
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleSetCollectionPeriodCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                                               ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableInStream lStream(acrRequest);
    unsigned char lType = 0;
    lStream >> lType;
    ZT_ASSERT(ZTSTVKC_CollectionPeriod == lType);
    unsigned int lPeriod = 0;
    lStream >> lPeriod;
    if (lPeriod == 0) {
        createFailedResponse(ZTSAPS_Invalid, arResponse);
    } else {
        ZT_LOG_NOTICE("The limit set is %u", gcMaxScopeDataSize);
        createSuccessResponse(arResponse);
    }
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::handleShutDownCommand(const ZTCPointer<ZTCBuffer>&, ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    mpTavikSystem->closeLibkpm();
    mpTavikSystem->getStatusPage().setEnd(ZTSE_ShutDown);
    createSuccessResponse(arResponse);
    ZT_THROW(ZTCShutDownEx, "Shutting down Tavik", 19);
}

void ZTCTavikProtocolHandler::createSuccessResponse(ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZTCEncodableOutStream lStream(scResponseCapacity);
    lStream << static_cast<unsigned char>(ZTRO_Success) << static_cast<int>(0);
    arResponse = lStream.getBuffer();
    ZT_EXIT();
}

void ZTCTavikProtocolHandler::createFailedResponse(ZTESensorAgentProtocolStatus aStatus,
                                                   ZTCPointer<ZTCBuffer>& arResponse) {
    ZT_ENTRY();
    ZT_TRACE_MSG("Creating Failed Response...");
    ZTCEncodableOutStream lStream(scResponseCapacity);
    lStream << static_cast<unsigned char>(ZTRO_Failed) << static_cast<unsigned short>(aStatus);
    arResponse = lStream.getBuffer();
    ZT_EXIT();
}
