#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <map>
#include <optional>
#include <stdexcept>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikCore.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

/// How a kind is registered per board, written down a second time.
struct ZTSBoardKind {
    unsigned mType;
    unsigned mSize;
    std::string mFailedName;
    std::string mRegisteredName;
    KPM_EventCallback mpCallback;
};

const std::vector<ZTSBoardKind>& sBoardKinds() {
    static const auto& srKinds = *new std::vector<ZTSBoardKind>{
        {2, 1024, "RSCN", "RSCN", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmRscn)},
        {1, 168, "LINK", "LINK", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmLink)},
        {32, 0, "TEMPERATURE", "Temperature Event", reinterpret_cast<KPM_EventCallback>(&ScopeCb_KpmTemp)},
    };
    return srKinds;
}

const ZTSBoardKind& sBoardKind(unsigned aType) {
    for (const ZTSBoardKind& lcrKind : sBoardKinds()) {
        if (lcrKind.mType == aType) {
            return lcrKind;
        }
    }
    throw std::runtime_error("no such board kind");
}

std::string sOf(unsigned aBoard) {
    return " for Initiator <" + ZTCAdaptersLibraryDouble::namesText(aBoard) + ">";
}

/// The call that registers a kind, as the double notes it.
std::string sCallOf(unsigned aBoard, const ZTSScopeEventKind& acrKind) {
    if (acrKind.mRegisteredCategory == 0) {
        return "KpmRegEvent board " + std::to_string(aBoard) + " type " +
               std::to_string(acrKind.mRegisteredSubcategory) + " context 65535 size " +
               std::to_string(sBoardKind(acrKind.mRegisteredSubcategory).mSize);
    }
    return "ZtapiRegEvent board " + std::to_string(aBoard) + " port " +
           wwnText(ZTCAdaptersLibraryDouble::portName(aBoard)) + " kind " +
           std::to_string(acrKind.mRegisteredCategory) + "/" + std::to_string(acrKind.mRegisteredSubcategory) +
           " preset 0";
}

std::string sPair(const ZTSScopeEventKind& acrKind) {
    return "(" + std::to_string(acrKind.mRegisteredCategory) + ", " + std::to_string(acrKind.mRegisteredSubcategory) +
           ")";
}

std::string sRegisteredText(unsigned aBoard, const ZTSScopeEventKind& acrKind) {
    return "-N- Registered " +
           (acrKind.mRegisteredCategory == 0 ? sBoardKind(acrKind.mRegisteredSubcategory).mRegisteredName
                                             : "event " + sPair(acrKind)) +
           sOf(aBoard);
}

unsigned sKeyForm(const ZTSScopeEventKind& acrKind) {
    return unsigned{acrKind.mRegisteredCategory} << 8 | acrKind.mRegisteredSubcategory;
}

ZTCRegistrationKey sKey(unsigned aBoard, const ZTSScopeEventKind& acrKind) {
    return {aBoard, acrKind.mRegisteredCategory, acrKind.mRegisteredSubcategory};
}

class EventRegistration : public ZTCTavikFixture {
protected:
    using ZTCRegistrations = std::map<unsigned, unsigned>;  ///< key form to handle

    ZTCRegistrations registrations(unsigned aBoard) const {
        ZTCRegistrations lRegistrations;
        const ZTCTavikInitiator& lcrInitiator = *mSystem->getFcInitiator(aBoard);
        for (auto lEntry = lcrInitiator.r_begin(); lEntry != lcrInitiator.r_end(); ++lEntry) {
            lRegistrations[lEntry->first] = lEntry->second;
        }
        return lRegistrations;
    }

    /// What the double gave out for a board, as far as it was asked.
    ZTCRegistrations givenHandles(unsigned aBoard) const {
        ZTCRegistrations lHandles;
        for (const auto& [lcrKey, lHandle] : mLibrary.mHandles) {
            const auto [lBoard, lCategory, lSubcategory] = lcrKey;
            if (lBoard == aBoard) {
                lHandles[lCategory << 8 | lSubcategory] = lHandle;
            }
        }
        return lHandles;
    }

    /// Calls and notices of the boards before `aBoards`, and of that board up to and without `aKinds` kinds.
    static std::vector<std::string> callsUpTo(unsigned aBoards, std::size_t aKinds) {
        std::vector<std::string> lCalls;
        walkUpTo(aBoards, aKinds, [&](unsigned aBoard, const ZTSScopeEventKind& acrKind) {
            lCalls.push_back(sCallOf(aBoard, acrKind));
        });
        return lCalls;
    }
    static std::vector<std::string> noticesUpTo(unsigned aBoards, std::size_t aKinds) {
        std::vector<std::string> lNotices;
        walkUpTo(aBoards, aKinds, [&](unsigned aBoard, const ZTSScopeEventKind& acrKind) {
            lNotices.push_back(sRegisteredText(aBoard, acrKind));
        });
        return lNotices;
    }

    std::string startHex(unsigned aMaxEventDataSize = 4096) {
        return hexOf(request(ZTCByteWriter().u8(0).u32(aMaxEventDataSize).bytes()));
    }

    void addRegistration(unsigned aBoard, unsigned char aCategory, unsigned char aSubcategory, unsigned aHandle) {
        mSystem->getFcInitiator(aBoard)->addRegEvent(
            ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(aCategory, aSubcategory)), aHandle);
    }

    void unregister() {
        mLog.forget();
        mLibrary.forgetCalls();
        mSystem->getProtocolHandler()->handleUnregisterEvents();
    }

    static std::string unregisterCall(unsigned aBoard, unsigned aHandle) {
        return "ZtapiUnregEvent board " + std::to_string(aBoard) + " port " +
               wwnText(ZTCAdaptersLibraryDouble::portName(aBoard)) + " handle " + std::to_string(aHandle);
    }
    static std::string unregisterBoardCall(unsigned aBoard, unsigned aHandle) {
        return "KpmUnregEvent board " + std::to_string(aBoard) + " handle " + std::to_string(aHandle);
    }

private:
    template <typename TDo>
    static void walkUpTo(unsigned aBoards, std::size_t aKinds, TDo aDo) {
        for (unsigned lBoard = 0; lBoard <= aBoards; ++lBoard) {
            for (std::size_t lKind = 0; lKind < (lBoard < aBoards ? gcScopeEventKinds.size() : aKinds); ++lKind) {
                aDo(lBoard, gcScopeEventKinds[lKind]);
            }
        }
    }
};

}  // namespace

// ---- The start command ----

TEST_F(EventRegistration, AStartRegistersEveryKindOnEveryInitiatorInOrder) {
    bringUp(3);
    EXPECT_EQ(gcSuccessHex, startHex(777));
    EXPECT_EQ(callsUpTo(3, 0), mLibrary.calls());
    EXPECT_EQ(noticesUpTo(3, 0), mLog.texts());
    EXPECT_TRUE(mDoScopeCollection);
    EXPECT_EQ(777u, mSystem->getMaxEventDataSize());
    for (unsigned lBoard = 0; lBoard < 3; ++lBoard) {
        EXPECT_EQ(20u, registrations(lBoard).size());
        EXPECT_EQ(givenHandles(lBoard), registrations(lBoard));
    }
}

TEST_F(EventRegistration, EveryKindGetsItsCallbackAndItsContext) {
    bringUp(2);
    startScope();
    for (unsigned lBoard = 0; lBoard < 2; ++lBoard) {
        for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
            SCOPED_TRACE(lcrKind.mpName);
            const ZTCRegistrationKey lKey = sKey(lBoard, lcrKind);
            if (lcrKind.mRegisteredCategory == 0) {
                EXPECT_EQ(sBoardKind(lcrKind.mRegisteredSubcategory).mpCallback, mLibrary.mEventCallbacks.at(lKey));
            } else {
                EXPECT_EQ(&ScopeCb_Generic, mLibrary.mScopeCallbacks.at(lKey));
                EXPECT_EQ(static_cast<ZTCTavikSystem*>(mSystem.get()), mLibrary.mContexts.at(lKey));
            }
        }
    }
}

TEST_F(EventRegistration, TheStatuses0And5And6And7AreSuccessForEveryKind) {
    bringUp();
    unsigned lNext = 0;
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        mLibrary.mRegisterStatuses[sKey(0, lcrKind)] = (std::array{0u, 5u, 6u, 7u})[lNext++ % 4];
    }
    for (unsigned lRound = 0; lRound < 4; ++lRound) {
        mLog.forget();
        EXPECT_EQ(gcSuccessHex, startHex());
        EXPECT_EQ(noticesUpTo(1, 0), mLog.texts());
        EXPECT_EQ(givenHandles(0), registrations(0));
        // Every kind has had every status after four rounds.
        for (auto& [lcrKey, lrStatus] : mLibrary.mRegisterStatuses) {
            lrStatus = lrStatus == 0 ? 5 : (lrStatus + 1) % 8;
        }
        unregister();
    }
}

TEST_F(EventRegistration, AHandleOfZeroIsNotedForAKindThatThePortHasNoSourceFor) {
    bringUp();
    mLibrary.mRegisterStatuses[{0, 4, 0x01}] = KPM_STATUS_NO_SOURCE;
    mLibrary.mRegisterHandles[{0, 4, 0x01}] = 0;
    EXPECT_EQ(gcSuccessHex, startHex());
    EXPECT_EQ(noticesUpTo(1, 0), mLog.texts());
    EXPECT_EQ(0u, registrations(0).at(0x0401));
}

TEST_F(EventRegistration, EveryOtherStatusOfAnyKindEndsTheStartThere) {
    for (const unsigned lStatus : {1u, 2u, 3u, 4u, 8u, 9u, 255u, 256u, 0x10000u, 0xFFFFFFFFu}) {
        mSystem = std::make_unique<ZTCTestTavikSystem>();
        setSystemObject(mSystem.get());
        unlink(responseFifoPath().c_str());
        bringUp(2);
        for (std::size_t lKind = 0; lKind < gcScopeEventKinds.size(); ++lKind) {
            const ZTSScopeEventKind& lcrKind = gcScopeEventKinds[lKind];
            if (lcrKind.mRegisteredCategory == 0) {
                continue;
            }
            SCOPED_TRACE(std::string(lcrKind.mpName) + " status " + std::to_string(lStatus));
            unregister();
            mLog.forget();
            mLibrary.forgetCalls();
            mLibrary.mHandles.clear();
            mLibrary.mRegisterStatuses = {{sKey(1, lcrKind), lStatus}};
            EXPECT_EQ(gcNotAllowedHex, startHex());
            EXPECT_EQ(callsUpTo(1, lKind + 1), mLibrary.calls());
            std::vector<std::string> lTexts = noticesUpTo(1, lKind);
            lTexts.push_back("-E- Failed to register event " + sPair(lcrKind) + sOf(1) + " - Error " +
                             std::to_string(lStatus));
            EXPECT_EQ(lTexts, mLog.texts());
            EXPECT_EQ(givenHandles(0), registrations(0));
            EXPECT_EQ(givenHandles(1), registrations(1));
            EXPECT_EQ(lKind, registrations(1).size());
            EXPECT_TRUE(mDoScopeCollection) << "what is registered is collected";
        }
    }
}

TEST_F(EventRegistration, ABoardKindWithoutAHandleEndsTheStartThereWithErrorZeroOrIsAWarning) {
    bringUp(2);
    for (std::size_t lKind = 0; lKind < gcScopeEventKinds.size(); ++lKind) {
        const ZTSScopeEventKind& lcrKind = gcScopeEventKinds[lKind];
        if (lcrKind.mRegisteredCategory != 0) {
            continue;
        }
        SCOPED_TRACE(lcrKind.mpName);
        unregister();
        mLog.forget();
        mLibrary.forgetCalls();
        mLibrary.mRegisterHandles = {{sKey(1, lcrKind), 0}};
        // An earlier kind's status is not taken for that of a board registration.
        mLibrary.mRegisterStatuses[{1, 8, 0x01}] = KPM_STATUS_NO_RIGHTS;
        const ZTSBoardKind& lcrBoardKind = sBoardKind(lcrKind.mRegisteredSubcategory);
        const bool lIsWarning = lcrBoardKind.mType == FC_REG_TEMPERATURE_EVENT;
        EXPECT_EQ(lIsWarning ? gcSuccessHex : gcNotAllowedHex, startHex());
        const std::string lText = "Failed to register " + lcrBoardKind.mFailedName + sOf(1) + " - Error 0";
        std::vector<std::string> lTexts = noticesUpTo(lIsWarning ? 2 : 1, lIsWarning ? 0 : lKind);
        if (lIsWarning) {
            lTexts.at(gcScopeEventKinds.size() + lKind) = "-W- " + lText;
        } else {
            lTexts.push_back("-E- " + lText);
        }
        EXPECT_EQ(lTexts, mLog.texts());
        EXPECT_EQ(lIsWarning ? callsUpTo(2, 0) : callsUpTo(1, lKind + 1), mLibrary.calls());
        EXPECT_EQ(0u, registrations(1).count(sKeyForm(lcrKind)));
        EXPECT_EQ(lIsWarning ? 19u : lKind, registrations(1).size());
        EXPECT_TRUE(mDoScopeCollection);
    }
}

TEST_F(EventRegistration, AStartAfterAHalfFailedOneRegistersEverythingAgainAndReplacesTheHandles) {
    bringUp(2);
    const std::size_t lcFailedKind = 7;
    mLibrary.mRegisterStatuses[sKey(1, gcScopeEventKinds[lcFailedKind])] = 1;
    EXPECT_EQ(gcNotAllowedHex, startHex());
    const ZTCRegistrations lFormer = registrations(0);
    mLibrary.mRegisterStatuses.clear();
    mLibrary.forgetCalls();
    mLog.forget();
    EXPECT_EQ(gcSuccessHex, startHex());
    EXPECT_EQ(callsUpTo(2, 0), mLibrary.calls()) << "the former registrations are not taken back";
    std::vector<std::string> lTexts;
    for (unsigned lBoard = 0; lBoard < 2; ++lBoard) {
        for (std::size_t lKind = 0; lKind < gcScopeEventKinds.size(); ++lKind) {
            lTexts.push_back(sRegisteredText(lBoard, gcScopeEventKinds[lKind]));
            if (lBoard == 0 || lKind < lcFailedKind) {
                // The map says so first.
                lTexts.emplace_back("-E- Element already existed in the map");
                lTexts.push_back("-E- addRegEvent FAILED due duplicated keyform " +
                                 std::to_string(sKeyForm(gcScopeEventKinds[lKind])) + " has been detected");
            }
        }
    }
    EXPECT_EQ(lTexts, mLog.texts());
    EXPECT_EQ(givenHandles(0), registrations(0));
    EXPECT_EQ(givenHandles(1), registrations(1));
    for (const auto& [lKeyForm, lHandle] : lFormer) {
        EXPECT_NE(lHandle, registrations(0).at(lKeyForm));
    }
}

TEST_F(EventRegistration, AStartThatIsRepeatedOnlySetsTheLimitAndSwitchesCollectionOn) {
    bringUp();
    startScope(100);
    for (const bool lIsStopped : {false, true}) {
        if (lIsStopped) {
            EXPECT_EQ(gcSuccessHex, requestHex("02"));
        }
        mLog.forget();
        mLibrary.forgetCalls();
        EXPECT_EQ(gcSuccessHex, startHex(200 + lIsStopped));
        EXPECT_EQ(std::vector<std::string>{"-N- ScopeEvents Already Registered. Hence Starting ScopeData Collection."},
                  mLog.texts());
        EXPECT_TRUE(mLibrary.calls().empty());
        EXPECT_TRUE(mDoScopeCollection);
        EXPECT_EQ(200u + lIsStopped, mSystem->getMaxEventDataSize());
    }
}

TEST_F(EventRegistration, AStartWithoutInitiatorsRegistersNothingAndSucceedsOnce) {
    ZTCTavikProtocolHandler lHandler(mSystem.get());
    const ZTCPointer<ZTCBuffer> lRequest = makeBuffer(bytesOf("00 00000100"));
    for (const char* lpText : {"", "-N- ScopeEvents Already Registered. Hence Starting ScopeData Collection."}) {
        mLog.forget();
        ZTCPointer<ZTCBuffer> lResponse;
        lHandler.process(lRequest, lResponse);
        EXPECT_EQ(gcSuccessHex, hexOf(contentOf(*lResponse)));
        EXPECT_EQ(*lpText == '\0' ? std::vector<std::string>{} : std::vector<std::string>{lpText}, mLog.texts());
    }
    EXPECT_TRUE(mLibrary.calls().empty());
    EXPECT_EQ(256u, mSystem->getMaxEventDataSize());
    lHandler.handleUnregisterEvents();
    EXPECT_TRUE(mDoScopeCollection);
}

TEST_F(EventRegistration, EventsAreAdmittedFromBeforeTheFirstRegistrationReturns) {
    bringUp();
    std::optional<bool> lWasAdmitted;
    mLibrary.mBeforeRegistered = [&](const ZTCRegistrationKey&) {
        if (!lWasAdmitted) {
            deliverTemperature(0);
            lWasAdmitted = mSystem->hasPendingRecord();
        }
    };
    startScope();
    EXPECT_EQ(true, lWasAdmitted);
    EXPECT_EQ(std::vector<std::string>{"8/4 x1 01000000"}, retrieveTexts());
}

TEST_F(EventRegistration, AStartThatIsCutShortChangesNothing) {
    bringUp();
    mSystem->setMaxEventDataSize(5);
    for (const char* lpRequest : {"00", "0000", "00000010", "00000000"}) {
        EXPECT_THROW(requestHex(lpRequest), ZTCInvalidEx) << lpRequest;
    }
    EXPECT_FALSE(mDoScopeCollection);
    EXPECT_EQ(5u, mSystem->getMaxEventDataSize());
    EXPECT_TRUE(mLibrary.calls().empty());
    EXPECT_EQ(gcSuccessHex, requestHex("00 00000010 ffff")) << "what is left over is ignored";
    EXPECT_EQ(16u, mSystem->getMaxEventDataSize());
}

TEST_F(EventRegistration, AStartHandlerWithAnotherCodeEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            bringUp();
            ZTCPointer<ZTCBuffer> lResponse;
            mSystem->getProtocolHandler()->handleStartScopeCommand(makeBuffer(bytesOf("01 00000010")), lResponse);
        },
        testing::ExitedWithCode(1), failedAssertion("lType == ZTSTVKC_StartScope"));
}

// ---- Taking registrations back ----

TEST_F(EventRegistration, AnUnregisterPassTakesEverythingBackInTheOrderOfTheKeyForms) {
    collect(2);
    const ZTCRegistrations lRegistered[] = {registrations(0), registrations(1)};
    unregister();
    std::vector<std::string> lCalls;
    std::vector<std::string> lTexts;
    for (unsigned lBoard = 0; lBoard < 2; ++lBoard) {
        for (const auto& [lKeyForm, lHandle] : lRegistered[lBoard]) {
            if (lKeyForm < 0x100) {
                lCalls.push_back(unregisterBoardCall(lBoard, lHandle));
                continue;
            }
            lCalls.push_back(unregisterCall(lBoard, lHandle));
            lTexts.push_back("-N- Successfully Unregistered event (" + std::to_string(lKeyForm >> 8) + ", " +
                             std::to_string(lKeyForm & 0xFF) + ")" + sOf(lBoard) + " ");
        }
        EXPECT_TRUE(registrations(lBoard).empty());
    }
    EXPECT_EQ(lCalls, mLibrary.calls());
    EXPECT_EQ(lTexts, mLog.texts());
    EXPECT_TRUE(mDoScopeCollection) << "collection is not touched";
}

TEST_F(EventRegistration, AnUnregisterPassLeavesCollectionOffWhereItWasOff) {
    collect();
    requestHex("02");
    unregister();
    EXPECT_FALSE(mDoScopeCollection);
}

TEST_F(EventRegistration, AStartAfterAnUnregisterPassRegistersEverythingAgain) {
    collect();
    unregister();
    mLog.forget();
    mLibrary.forgetCalls();
    startScope();
    EXPECT_EQ(callsUpTo(1, 0), mLibrary.calls());
    EXPECT_EQ(noticesUpTo(1, 0), mLog.texts()) << "no kind is a duplicate";
}

TEST_F(EventRegistration, AnUnregisterPassSkipsHandlesOfZero) {
    bringUp();
    addRegistration(0, 1, 0x01, 0);
    addRegistration(0, 0, 0x02, 0);
    addRegistration(0, 4, 0x01, 9);
    unregister();
    EXPECT_EQ(std::vector<std::string>{unregisterCall(0, 9)}, mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
}

TEST_F(EventRegistration, AnUnregisterPassReportsAKeyFormThatIsNotInTheCatalogueAndGoesOn) {
    bringUp(2);
    addRegistration(0, 0, 0x04, 5);
    addRegistration(0, 1, 0x01, 6);
    addRegistration(0, 255, 0xFF, 7);
    addRegistration(1, 16, 0x02, 8);
    addRegistration(1, 16, 0x01, 9);
    addRegistration(1, 16, 0x04, 0);
    unregister();
    EXPECT_EQ((std::vector<std::string>{
                  "-E- Bad event keyform 4 has beed detected in map of registered events",
                  "-N- Successfully Unregistered event (1, 1)" + sOf(0) + " ",
                  "-E- Bad event keyform 65535 has beed detected in map of registered events",
                  "-N- Successfully Unregistered event (16, 1)" + sOf(1) + " ",
                  "-E- Bad event keyform 4098 has beed detected in map of registered events",
              }),
              mLog.texts());
    EXPECT_EQ((std::vector<std::string>{unregisterCall(0, 6), unregisterCall(1, 9)}), mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
    EXPECT_TRUE(registrations(1).empty());
}

TEST_F(EventRegistration, AnUnregisterPassWarnsOfAFailureAndGoesOnAndIgnoresThoseOfBoardKinds) {
    bringUp();
    addRegistration(0, 0, 0x01, 3);
    addRegistration(0, 0, 0x20, 4);
    addRegistration(0, 4, 0x02, 5);
    addRegistration(0, 8, 0x01, 6);
    for (const unsigned lHandle : {3u, 4u, 5u}) {
        mLibrary.mUnregisterStatuses[lHandle] = 0xFFFFFFFF;
    }
    unregister();
    EXPECT_EQ((std::vector<std::string>{
                  "-W- Failed to Unregister event (4, 2)" + sOf(0) + " - Error 4294967295",
                  "-N- Successfully Unregistered event (8, 1)" + sOf(0) + " ",
              }),
              mLog.texts());
    EXPECT_EQ((std::vector<std::string>{unregisterBoardCall(0, 3), unregisterBoardCall(0, 4), unregisterCall(0, 5),
                                        unregisterCall(0, 6)}),
              mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
}
