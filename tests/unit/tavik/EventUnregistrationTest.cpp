#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/include/Log.h"
#include "tavik/include/TavikCore.h"
#include "tests/unit/tavik/support/RegistrationFixture.h"

namespace {

class EventUnregistration : public ZTCRegistrationFixture {};

}  // namespace

TEST_F(EventUnregistration, AnUnregisterPassTakesEverythingBackInTheOrderOfTheKeyForms) {
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
                             std::to_string(lKeyForm & 0xFF) + ")" + ofInitiator(lBoard) + " ");
        }
        EXPECT_TRUE(registrations(lBoard).empty());
    }
    EXPECT_EQ(lCalls, mLibrary.calls());
    EXPECT_EQ(lTexts, mLog.texts());
    EXPECT_TRUE(mDoScopeCollection) << "collection is not touched";
}

TEST_F(EventUnregistration, AnUnregisterPassLeavesCollectionOffWhereItWasOff) {
    collect();
    requestHex("02");
    unregister();
    EXPECT_FALSE(mDoScopeCollection);
}

TEST_F(EventUnregistration, AStartAfterAnUnregisterPassRegistersEverythingAgain) {
    collect();
    unregister();
    mLog.forget();
    mLibrary.forgetCalls();
    startScope();
    EXPECT_EQ(callsUpTo(1, 0), mLibrary.calls());
    EXPECT_EQ(noticesUpTo(1, 0), mLog.texts()) << "no kind is a duplicate";
}

TEST_F(EventUnregistration, AnUnregisterPassSkipsHandlesOfZero) {
    bringUp();
    addRegistration(0, 1, 0x01, 0);
    addRegistration(0, 0, 0x02, 0);
    addRegistration(0, 4, 0x01, 9);
    unregister();
    EXPECT_EQ(std::vector<std::string>{unregisterCall(0, 9)}, mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
}

TEST_F(EventUnregistration, AnUnregisterPassReportsAKeyFormThatIsNotInTheCatalogueAndGoesOn) {
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
                  "-N- Successfully Unregistered event (1, 1)" + ofInitiator(0) + " ",
                  "-E- Bad event keyform 65535 has beed detected in map of registered events",
                  "-N- Successfully Unregistered event (16, 1)" + ofInitiator(1) + " ",
                  "-E- Bad event keyform 4098 has beed detected in map of registered events",
              }),
              mLog.texts());
    EXPECT_EQ((std::vector<std::string>{unregisterCall(0, 6), unregisterCall(1, 9)}), mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
    EXPECT_TRUE(registrations(1).empty());
}

TEST_F(EventUnregistration, AnUnregisterPassWarnsOfAFailureAndGoesOnAndIgnoresThoseOfBoardKinds) {
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
                  "-W- Failed to Unregister event (4, 2)" + ofInitiator(0) + " - Error 4294967295",
                  "-N- Successfully Unregistered event (8, 1)" + ofInitiator(0) + " ",
              }),
              mLog.texts());
    EXPECT_EQ((std::vector<std::string>{unregisterBoardCall(0, 3), unregisterBoardCall(0, 4), unregisterCall(0, 5),
                                        unregisterCall(0, 6)}),
              mLibrary.calls());
    EXPECT_TRUE(registrations(0).empty());
}
