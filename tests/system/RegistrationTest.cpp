#include <gtest/gtest.h>

#include <string>
#include <tuple>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

using ZTCTexts = std::vector<std::string>;

/// The calls that register the twenty kinds for one board, in order, each succeeding.
static ZTCTexts sRegistrationCalls(unsigned aBoard) {
    const std::string lBoard = " board=" + std::to_string(aBoard);
    const std::string lPort = " port=" + wwnText(ZTCScriptedLibrary::portName(aBoard));
    const auto lScope = [&](unsigned aCategory, unsigned aSubcategory) {
        return "ZtapiRegEvent" + lBoard + lPort + " category=" + std::to_string(aCategory) +
               " subcategory=" + std::to_string(aSubcategory) + " context=set preset=0 -> 0";
    };
    const auto lKpm = [&](unsigned aType, unsigned aSize) {
        return "KpmRegEvent" + lBoard + " type=" + std::to_string(aType) +
               " context=0xffff size=" + std::to_string(aSize) + " -> handle";
    };
    return {lScope(1, 1),  lScope(1, 2),  lScope(1, 4), lScope(1, 8), lScope(1, 16), lKpm(2, 1024), lScope(2, 1),
            lScope(2, 2),  lScope(2, 4),  lScope(4, 1), lScope(4, 2), lScope(4, 4),  lScope(4, 8),  lScope(4, 16),
            lScope(4, 32), lScope(4, 64), lScope(8, 1), lKpm(1, 168), lKpm(32, 0),   lScope(16, 1)};
}

static std::string sInitiator(unsigned aBoard = 0) {
    return "<" + wwnText(ZTCScriptedLibrary::nodeName(aBoard)) + ", " + wwnText(ZTCScriptedLibrary::portName(aBoard)) +
           ">";
}

/// The registrations among the library's calls.
static ZTCTexts sRegistrations(const ZTCScriptedLibrary& acrLibrary) {
    ZTCTexts lCalls;
    for (const std::string& lcrCall : acrLibrary.calls()) {
        if (lcrCall.starts_with("ZtapiRegEvent") || lcrCall.starts_with("KpmRegEvent")) {
            lCalls.push_back(lcrCall);
        }
    }
    return lCalls;
}

TEST(Registration, AStartRegistersEveryKindForEveryBoardInCatalogueOrder) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    EXPECT_TRUE(sRegistrations(lAgent.library()).empty());
    EXPECT_EQ(lAgent.request("0000001000"), "0000000000");
    ZTCTexts lExpected = sRegistrationCalls(0);
    const ZTCTexts lSecond = sRegistrationCalls(1);
    lExpected.insert(lExpected.end(), lSecond.begin(), lSecond.end());
    EXPECT_EQ(sRegistrations(lAgent.library()), lExpected);
    for (unsigned lBoard : {0u, 1u}) {
        const std::string lFor = " for Initiator " + sInitiator(lBoard);
        EXPECT_EQ(lAgent.log().count("Registered event (1, 1)" + lFor, "-N-"), 1u);
        EXPECT_EQ(lAgent.log().count("Registered event (16, 1)" + lFor, "-N-"), 1u);
        EXPECT_EQ(lAgent.log().count("Registered RSCN" + lFor, "-N-"), 1u);
        EXPECT_EQ(lAgent.log().count("Registered LINK" + lFor, "-N-"), 1u);
        EXPECT_EQ(lAgent.log().count("Registered Temperature Event" + lFor, "-N-"), 1u);
    }
    EXPECT_EQ(lAgent.log().containing("Registered event (").size(), 34u);
}

TEST(Registration, ASecondStartRegistersNothingAndSetsTheNewLimit) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope(0);
    const auto lCalls = lAgent.library().calls();
    lAgent.startScope(1000);
    EXPECT_EQ(lAgent.library().calls(), lCalls);
    EXPECT_EQ(lAgent.log().count("ScopeEvents Already Registered. Hence Starting ScopeData Collection.", "-N-"), 1u);
    lAgent.library().deliverAll({ZTSLibraryEvent::scope(0, 4, 0x08, scsiData(gcRemotePort, 1)),
                                 ZTSLibraryEvent::scope(0, 4, 0x08, scsiData(gcRemotePort, 2))});
    EXPECT_EQ(lAgent.retrieve().occurrences(4, 8), 2u);
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Registration, AStartAfterAStopOnlySwitchesCollectionOnAgain) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    const auto lCalls = lAgent.library().calls();
    lAgent.startScope();
    EXPECT_EQ(lAgent.library().calls(), lCalls);
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 1));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{"2/1 x1 01000000"});
}

TEST(Registration, TheInformationalStatusesCountAsSuccess) {
    for (unsigned lStatus : {5u, 6u, 7u}) {
        SCOPED_TRACE(lStatus);
        ZTCAgentProcess lAgent;
        lAgent.library().configure("register-status 0 1 2 " + std::to_string(lStatus));
        lAgent.library().configure("register-handle 0 1 2 0");
        lAgent.startAndConnect();
        lAgent.startScope();
        EXPECT_EQ(lAgent.log().count("Registered event (1, 2) for Initiator " + sInitiator(), "-N-"), 1u);
        EXPECT_EQ(sRegistrations(lAgent.library()).size(), 20u);
    }
}

TEST(Registration, ARefusedKindFailsTheStartAtOnce) {
    for (unsigned lStatus : {1u, 2u, 3u, 4u, 8u, 0xFFFFFFFFu}) {
        SCOPED_TRACE(lStatus);
        ZTCAgentProcess lAgent(2);
        lAgent.library().configure("register-status 0 4 16 " + std::to_string(lStatus));
        lAgent.startAndConnect();
        EXPECT_EQ(lAgent.request("0000001000"), "010009");
        EXPECT_EQ(lAgent.log().count("Failed to register event (4, 16) for Initiator " + sInitiator() + " - Error " +
                                         std::to_string(lStatus),
                                     "-E-"),
                  1u);
        const ZTCTexts lCalls = sRegistrations(lAgent.library());
        ASSERT_EQ(lCalls.size(), 14u);
        EXPECT_TRUE(lCalls.back().find("category=4 subcategory=16") != std::string::npos);
    }
}

TEST(Registration, ARefusedRscnOrLinkFailsTheStartWithErrorZero) {
    for (const auto& [lType, lpName, lCalls] : {std::tuple{2u, "RSCN", 6u}, std::tuple{1u, "LINK", 18u}}) {
        SCOPED_TRACE(lpName);
        ZTCAgentProcess lAgent;
        lAgent.library().configure("register-handle 0 0 " + std::to_string(lType) + " 0");
        lAgent.startAndConnect();
        EXPECT_EQ(lAgent.request("0000001000"), "010009");
        EXPECT_EQ(
            lAgent.log().count(
                std::string("Failed to register ") + lpName + " for Initiator " + sInitiator() + " - Error 0", "-E-"),
            1u);
        EXPECT_EQ(sRegistrations(lAgent.library()).size(), lCalls);
    }
}

TEST(Registration, ARefusedTemperatureIsOnlyAWarning) {
    ZTCAgentProcess lAgent;
    lAgent.library().configure("register-handle 0 0 32 0");
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("0000001000"), "0000000000");
    EXPECT_EQ(lAgent.log().count("Failed to register TEMPERATURE for Initiator " + sInitiator() + " - Error 0", "-W-"),
              1u);
    EXPECT_EQ(sRegistrations(lAgent.library()).size(), 20u);
    EXPECT_TRUE(lAgent.log().containing("Registered Temperature Event").empty());
    // Everything is registered: a second start registers nothing.
    lAgent.startScope();
    EXPECT_EQ(sRegistrations(lAgent.library()).size(), 20u);
}

TEST(Registration, AStartAfterAHalfFailedOneRegistersEverythingAgain) {
    ZTCAgentProcess lAgent;
    lAgent.library().configure("register-handle 0 0 2 0");
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("0000001000"), gcNotAllowedHex);

    // Collection is on all the same, for what could be registered.
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().occurrences(1, 2), 1u);

    lAgent.library().configure("register-handle 0 0 2 77");
    EXPECT_EQ(lAgent.request("0000001000"), gcSuccessHex);
    const ZTCTexts lCalls = sRegistrations(lAgent.library());
    EXPECT_EQ(ZTCTexts(lCalls.begin() + 6, lCalls.end()), sRegistrationCalls(0));
    for (const char* lpKey : {"257", "258", "260", "264", "272"}) {
        EXPECT_EQ(lAgent.log().count(
                      std::string("addRegEvent FAILED due duplicated keyform ") + lpKey + " has been detected", "-E-"),
                  1u);
    }
    const auto lLines = lAgent.log().containing("addRegEvent FAILED");
    ASSERT_EQ(lLines.size(), 5u);
    EXPECT_EQ(lLines[0].mLabel, "tavik/include/TavikInitiator");
    EXPECT_EQ(lLines[0].mFunction, "addRegEvent");
    EXPECT_TRUE(lAgent.library().callsOf("ZtapiUnregEvent").empty());

    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().occurrences(1, 2), 1u);
}

TEST(Registration, AStopAfterAHalfFailedStartSwitchesCollectionOff) {
    ZTCAgentProcess lAgent;
    lAgent.library().configure("register-handle 0 0 1 0");
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request("0000001000"), gcNotAllowedHex);
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 0x02, prloData(gcRemotePort)));
    EXPECT_EQ(lAgent.retrieve().texts(), ZTCTexts{});
}

TEST(Registration, EventsThatComeBeforeARegistrationReturnsAreCollected) {
    ZTCAgentProcess lAgent;
    const auto lDuring = [&](const std::string& acrKind, const ZTSLibraryEvent& acrEvent) {
        lAgent.library().configure("deliver-on-register " + acrKind + " " + acrEvent.text());
    };
    lDuring("0 1 1", ZTSLibraryEvent::scope(0, 1, 0x01, plogiData(gcRemotePort, gcRemoteNode)));
    lDuring("0 0 2", ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})));
    lDuring("0 0 1", ZTSLibraryEvent::link(0, ZTCScriptedLibrary::portName(0)));
    lDuring("0 0 32", ZTSLibraryEvent::temperature(0));
    lAgent.startAndConnect();
    lAgent.startScope();
    EXPECT_EQ(lAgent.library().callsOf("deliver-on-register returned").size(), 4u);
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    EXPECT_EQ(lResponse.texts().size(), 4u);
    EXPECT_EQ(lResponse.occurrences(1, 1) + lResponse.occurrences(1, 32) + lResponse.occurrences(8, 2) +
                  lResponse.occurrences(8, 4),
              4u);
}

TEST(Registration, NothingIsUnregisteredWhenTheAgentStops) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.library().callsOf("ZtapiUnregEvent").empty());
    EXPECT_TRUE(lAgent.library().callsOf("KpmUnregEvent").empty());
}
