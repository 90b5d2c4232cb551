#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <map>
#include <optional>
#include <stdexcept>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "system/include/SystemGlobals.h"
#include "tavik/include/TavikCore.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/RegistrationFixture.h"

namespace {

class EventRegistration : public ZTCRegistrationFixture {};

}  // namespace

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
        for (const ZTSTestKind& lcrKind : gcTestKinds) {
            SCOPED_TRACE(lcrKind.mpName);
            const ZTCRegistrationKey lKey = registrationKeyOf(lBoard, lcrKind);
            if (lcrKind.mRegisteredCategory == 0) {
                EXPECT_EQ(boardKind(lcrKind.mRegisteredSubcategory).mpCallback, mLibrary.mEventCallbacks.at(lKey));
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
    for (const ZTSTestKind& lcrKind : gcTestKinds) {
        mLibrary.mRegisterStatuses[registrationKeyOf(0, lcrKind)] = (std::array{0u, 5u, 6u, 7u})[lNext++ % 4];
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
        for (std::size_t lKind = 0; lKind < gcTestKinds.size(); ++lKind) {
            const ZTSTestKind& lcrKind = gcTestKinds[lKind];
            if (lcrKind.mRegisteredCategory == 0) {
                continue;
            }
            SCOPED_TRACE(std::string(lcrKind.mpName) + " status " + std::to_string(lStatus));
            unregister();
            mLog.forget();
            mLibrary.forgetCalls();
            mLibrary.mHandles.clear();
            mLibrary.mRegisterStatuses = {{registrationKeyOf(1, lcrKind), lStatus}};
            EXPECT_EQ(gcNotAllowedHex, startHex());
            EXPECT_EQ(callsUpTo(1, lKind + 1), mLibrary.calls());
            std::vector<std::string> lTexts = noticesUpTo(1, lKind);
            lTexts.push_back("-E- Failed to register event " + pairText(lcrKind) + ofInitiator(1) + " - Error " +
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
    for (std::size_t lKind = 0; lKind < gcTestKinds.size(); ++lKind) {
        const ZTSTestKind& lcrKind = gcTestKinds[lKind];
        if (lcrKind.mRegisteredCategory != 0) {
            continue;
        }
        SCOPED_TRACE(lcrKind.mpName);
        unregister();
        mLog.forget();
        mLibrary.forgetCalls();
        mLibrary.mRegisterHandles = {{registrationKeyOf(1, lcrKind), 0}};
        // An earlier kind's status is not taken for that of a board registration.
        mLibrary.mRegisterStatuses[{1, 8, 0x01}] = KPM_STATUS_NO_RIGHTS;
        const ZTSBoardKind& lcrBoardKind = boardKind(lcrKind.mRegisteredSubcategory);
        const bool lIsWarning = lcrBoardKind.mType == FC_REG_TEMPERATURE_EVENT;
        EXPECT_EQ(lIsWarning ? gcSuccessHex : gcNotAllowedHex, startHex());
        const std::string lText = "Failed to register " + lcrBoardKind.mFailedName + ofInitiator(1) + " - Error 0";
        std::vector<std::string> lTexts = noticesUpTo(lIsWarning ? 2 : 1, lIsWarning ? 0 : lKind);
        if (lIsWarning) {
            lTexts.at(gcTestKinds.size() + lKind) = "-W- " + lText;
        } else {
            lTexts.push_back("-E- " + lText);
        }
        EXPECT_EQ(lTexts, mLog.texts());
        EXPECT_EQ(lIsWarning ? callsUpTo(2, 0) : callsUpTo(1, lKind + 1), mLibrary.calls());
        EXPECT_EQ(0u, registrations(1).count(keyFormOf(lcrKind)));
        EXPECT_EQ(lIsWarning ? 19u : lKind, registrations(1).size());
        EXPECT_TRUE(mDoScopeCollection);
    }
}

TEST_F(EventRegistration, AStartAfterAHalfFailedOneRegistersEverythingAgainAndReplacesTheHandles) {
    bringUp(2);
    const std::size_t lcFailedKind = 7;
    mLibrary.mRegisterStatuses[registrationKeyOf(1, gcTestKinds[lcFailedKind])] = 1;
    EXPECT_EQ(gcNotAllowedHex, startHex());
    const ZTCRegistrations lFormer = registrations(0);
    mLibrary.mRegisterStatuses.clear();
    mLibrary.forgetCalls();
    mLog.forget();
    EXPECT_EQ(gcSuccessHex, startHex());
    EXPECT_EQ(callsUpTo(2, 0), mLibrary.calls()) << "the former registrations are not taken back";
    std::vector<std::string> lTexts;
    for (unsigned lBoard = 0; lBoard < 2; ++lBoard) {
        for (std::size_t lKind = 0; lKind < gcTestKinds.size(); ++lKind) {
            lTexts.push_back(registeredText(lBoard, gcTestKinds[lKind]));
            if (lBoard == 0 || lKind < lcFailedKind) {
                // The map says so first.
                lTexts.emplace_back("-E- Element already existed in the map");
                lTexts.push_back("-E- addRegEvent FAILED due duplicated keyform " +
                                 std::to_string(keyFormOf(gcTestKinds[lKind])) + " has been detected");
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
