#include <gmock/gmock.h>

#include "sensor/views/include/StatusView.h"
#include "sensor/views/include/TextTable.h"
#include "tests/unit/views/ViewSamples.h"

using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

class StatusText : public LocalTime {
protected:
    static std::string format(const ZTSStatusFacts& acrFacts, std::size_t aWidth = 80) {
        return formatStatus(acrFacts, {.mWidth = aWidth, .mHasColor = false});
    }
};

TEST_F(StatusText, AHealthyHostShowsItsLinksItsPathsAndHowQuietItIs) {
    EXPECT_EQ(format(makeHealthyFacts()),
              R"(  host: db07                                              2026-11-21 10:04:12
 state: COLLECTING since 14 Nov 08:12; nothing lost
 links: host7  10:..:01  Online  listening to 6 kinds, 14 have no source
        host8  10:..:02  Online  listening to 6 kinds, 14 have no source
 paths: 96 LUNs, 8 paths each, all running
 quiet: last event 3 h ago (rscn); asked 2 s ago; 0 of 256 KiB held
   SAN: no trouble
)");
}

/// The healthy host, whose second initiator has lost a port 6 minutes ago.
static ZTSStatusFacts sWithoutAPort() {
    const ZTSTopology lBefore = makeSan({.mLuns = 40});
    ZTSTopology lSan = lBefore;
    removePort(lSan, "rport-8:0-1");
    ZTSSanPast lPast{.mEarlier = {lBefore}};
    lPast.mStates["rport-8:0-1"] = {.mSince = timeOf("2026-11-21T09:57:40+01:00"), .mChanges = 1};
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mNames.addName(wwnOf("50:06:01:60:00:00:01:01"), "array7 ctrl-B");
    setSan(lFacts, lSan, lPast);
    return lFacts;
}

TEST_F(StatusText, ATroubleOfTheSanHasStatusActionAndSee) {
    EXPECT_EQ(format(sWithoutAPort()),
              R"(  host: db07                                              2026-11-21 10:04:12
 state: COLLECTING; nothing lost
   SAN: 1 trouble
[1] PATH LOST   array7 ctrl-B  50:06:01:60:00:00:01:01  from host8
status: Not Present since 09:57:40. 40 LUNs run on 7 of 8 paths; I/O goes on.
        host8 still reaches its 3 other ports: not its cable.
action: Look at array7 ctrl-B on the array and the switch, then at its zone.
   see: tavik explain path-lost
)");
}

TEST_F(StatusText, SeveralTroublesOfTheSanAreNumberedTheWorstFirst) {
    ZTSTopology lSan = makeSan({.mHosts = 1, .mPortsOfAHost = 2, .mLuns = 40});
    losePort(lSan, "rport-7:0-1");
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, lSan);
    EXPECT_EQ(format(lFacts), R"(  host: db07                                              2026-11-21 10:04:12
 state: COLLECTING; nothing lost
   SAN: 2 troubles
[1] REDUNDANCY LOST   40 LUNs
status: mpath0 (/data/0), mpath1 (/data/1), mpath2 (/data/2) and 37 more are
        down to one path, initiator or remote port.
        40 LUNs run on 1 of 2 paths; I/O goes on.
action: Mend the cause before the next fault;  tavik paths --trouble
   see: tavik explain redundancy-lost
[2] PATH LOST   50:06:01:60:00:00:00:01  from host7
status: Blocked. 40 LUNs run on 1 of 2 paths; I/O goes on.
        host7 still reaches its other port: not its cable.
action: Look at 50:06:01:60:00:00:00:01 on the array and the switch, then at
        its zone.
   see: tavik explain path-lost
)");
}

TEST_F(StatusText, ManyTroublesOfTheSanAreCutToAFew) {
    ZTSTopology lSan = makeSan({.mPortsOfAHost = 8});
    for (const char* lpPort : {"0", "1", "2", "3", "4"}) {
        losePort(lSan, std::string("rport-7:0-") + lpPort);
    }
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, lSan);
    const std::string lText = format(lFacts);
    EXPECT_THAT(lText, HasSubstr("   SAN: 5 troubles\n"));
    EXPECT_THAT(lText, HasSubstr("\nand 2 more: tavik paths --trouble\n"));
}

TEST_F(StatusText, ANoticeOfTheSanIsNoTrouble) {
    ZTSTopology lSan = makeSan({});
    lSan.mInitiators.push_back({.mHost = "host9", .mState = "Linkdown"});
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, lSan);
    EXPECT_THAT(format(lFacts), HasSubstr(" paths: 4 LUNs, 8 paths each, all running\n"));
    EXPECT_THAT(format(lFacts), HasSubstr("   SAN: no trouble; 1 notice: tavik paths\n"));
}

TEST_F(StatusText, ADeafSensorNamesWhatItDoesNotHearAndWhy) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["kinds"] = {{{"initiator", {{"host", "host7"}}},
                       {"kinds", {{"rscn", "no_rights"}, {"link", "listening"}, {"adapter-arrival", "listening"}}},
                       {"words", {{"rscn", "needs CAP_NET_ADMIN"}, {"link", "polled every 2 s"}}}}};
    EXPECT_EQ(format(makeFacts(lLive)), R"(  host: db07                                              2026-11-21 10:04:12
 state: PARTLY DEAF; silence below proves nothing
status: no_rights  rscn                (needs CAP_NET_ADMIN)
        listening  link (polled every 2 s), adapter-arrival
action: sudo systemctl edit tavik      # AmbientCapabilities=
   see: tavik explain deaf
)");
}

TEST_F(StatusText, AKindThatOnlySomeAdaptersDoNotReportIsNamedWithThem) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["kinds"] = nlohmann::json::array();
    for (const char* lpHost : {"host7", "host8", "host9"}) {
        lLive["kinds"].push_back({{"initiator", {{"host", lpHost}}},
                                  {"kinds", {{"rscn", "no_rights"}, {"link", "listening"}, {"logo", "listening"}}},
                                  {"words", nlohmann::json::object()}});
    }
    lLive["kinds"][1]["kinds"]["link"] = "failed";
    lLive["kinds"][1]["kinds"]["logo"] = "off";
    EXPECT_THAT(format(makeFacts(lLive)), HasSubstr(R"(
status: no_rights  rscn
        failed     link of host8
        off        logo of host8
        listening  logo of host7 and host9, link of host7 and host9
)"));
}

TEST_F(StatusText, ManyKindsThatAreHeardStayInTheirColumn) {
    nlohmann::json lLive = makeHealthyJson();
    nlohmann::json lStates = {{"rscn", "no_rights"}};
    for (const char* lpKind : {"plogi", "prlo", "adisc", "lsrjt", "logo", "fabric-busy", "port-busy", "fcp-read-check",
                               "queue-full", "device-busy", "check-condition"}) {
        lStates[lpKind] = "listening";
    }
    lLive["kinds"] = {{{"initiator", {{"host", "host7"}}}, {"kinds", lStates}, {"words", nlohmann::json::object()}}};
    EXPECT_THAT(format(makeFacts(lLive)), HasSubstr(R"(
status: no_rights  rscn
        listening  plogi, prlo, adisc, lsrjt, logo, fabric-busy, port-busy,
                   fcp-read-check, queue-full, device-busy, check-condition
action: )"));
}

static ZTSStatusFacts sVanished() {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mAnswer = ZTAN_NoSensor;
    lFacts.mLive.reset();
    lFacts.mHistory->mLastRun->mTo = timeOf("2026-11-21T09:41:22+01:00");
    lFacts.mHistory->mRetrievals.mLast = timeOf("2026-11-21T09:41:20+01:00");
    lFacts.mLeftPage = ZTSLeftPage{.mHeld = 1204, .mIsAgentAlive = false, .mHasEndedInOrder = false, .mLast = {}};
    return lFacts;
}

TEST_F(StatusText, AVanishedSensorSaysWhatIsLostAndHowFarTheDataGo) {
    EXPECT_EQ(format(sVanished()), R"(  host: db07                                              2026-11-21 10:04:12
 state: NOT COLLECTING; no sensor is running
status: It vanished about 09:41:22 without an orderly stop. Lost: the 1,204
        events its agent held (from the page it left). Unseen: all since.
action: sudo systemctl start tavik;  journalctl -u tavik -n 50
   see: tavik explain gap
  data: complete to 09:41:20; tavik events still works
)");
}

TEST_F(StatusText, ASensorThatWasStoppedInOrderHasLostNothing) {
    ZTSStatusFacts lFacts = sVanished();
    lFacts.mHistory->mLastRun->mIsOpen = false;
    lFacts.mLeftPage.reset();
    const std::string lText = format(lFacts);
    EXPECT_THAT(lText, HasSubstr("status: It was stopped in order at 09:41:22. Unseen: all since.\n"));
    EXPECT_THAT(lText, HasSubstr("  data: complete to 09:41:22;"));
    EXPECT_THAT(lText, Not(HasSubstr("Lost")));
}

TEST_F(StatusText, AnAgentThatOutlivedItsSensorStillHoldsItsEvents) {
    ZTSStatusFacts lFacts = sVanished();
    lFacts.mLeftPage->mIsAgentAlive = true;
    EXPECT_THAT(format(lFacts), HasSubstr("Its agent runs on\n        and holds 1,204 events. Unseen: all since.\n"));
}

TEST_F(StatusText, APageThatWasLeftTellsOfASensorThatVanishedWhateverTheHistorySays) {
    ZTSStatusFacts lFacts = sVanished();
    lFacts.mHistory->mLastRun->mIsOpen = false;
    EXPECT_THAT(format(lFacts), HasSubstr("status: It vanished about 09:41:22 without an orderly stop. Lost:"));
    lFacts.mHistory.reset();
    EXPECT_THAT(format(lFacts), HasSubstr("status: It vanished without an orderly stop. Lost: the 1,204 events"));
}

TEST_F(StatusText, AWideTerminalHasRoomForWholeWwpns) {
    EXPECT_THAT(
        format(makeHealthyFacts(), 100),
        HasSubstr("\n links: host7  10:00:00:00:c9:00:00:01  Online  listening to 6 kinds, 14 have no source\n"));
    EXPECT_THAT(format(makeHealthyFacts(), 99), HasSubstr("\n links: host7  10:..:01  Online"));
}

TEST_F(StatusText, AdaptersWithoutAHostHaveNoEmptyColumn) {
    nlohmann::json lLive = makeHealthyJson();
    for (nlohmann::json& lrKinds : lLive["kinds"]) {
        lrKinds["initiator"]["host"] = nullptr;
    }
    EXPECT_THAT(format(makeFacts(lLive)), HasSubstr("\n links: 10:..:01  Online  listening to 6 kinds"));
}

TEST_F(StatusText, WithoutAHistoryTheReasonIsNamed) {
    ZTSStatusFacts lFacts = sVanished();
    lFacts.mHistory.reset();
    lFacts.mLeftPage.reset();
    lFacts.mHistoryProblem = "there is no history in /var/lib/tavik yet";
    lFacts.mPageProblem = "cannot look into /run/tavik/agent: Permission denied";
    const std::string lText = format(lFacts);
    EXPECT_THAT(lText, HasSubstr(" state: NOT COLLECTING; no sensor is running\n"));
    EXPECT_THAT(lText, HasSubstr("  note: there is no history in /var/lib/tavik yet\n"));
    EXPECT_THAT(lText, HasSubstr("  note: cannot look into /run/tavik/agent: Permission denied\n"));
    EXPECT_THAT(lText, Not(HasSubstr("data:")));
}

TEST_F(StatusText, ADamagedHistoryThatWasSetAsideIsNamedWithWhatToDo) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mDamagedHistories.emplace();
    EXPECT_THAT(format(lFacts), Not(HasSubstr("note:")));
    lFacts.mDamagedHistories->push_back("/var/lib/tavik/history.damaged-20261120-070000.db");
    const std::string lText = format(lFacts, 200);
    EXPECT_THAT(lText, HasSubstr(" state: COLLECTING since 14 Nov 08:12; nothing lost\n"));
    EXPECT_THAT(lText,
                HasSubstr("  note: a damaged history was set aside as "
                          "/var/lib/tavik/history.damaged-20261120-070000.db; events in it are not shown. When nobody "
                          "needs them any more, remove it and the -wal file beside it\n"));
    lFacts.mDamagedHistories->push_back("/var/lib/tavik/history.damaged-20261121-080000.db");
    EXPECT_THAT(format(lFacts, 200), HasSubstr("  note: 2 damaged histories were set aside, the last as "
                                               "/var/lib/tavik/history.damaged-20261121-080000.db; "));
}

TEST_F(StatusText, SeveralTroublesOfTavikAreAllShown) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["kinds"][0]["kinds"]["rscn"] = "failed";
    lLive["losses"]["refused"] = {{"total-limit", 1200}, {"collection-off", 5}};
    const std::string lText = format(makeFacts(lLive));
    EXPECT_THAT(lText, HasSubstr(" state: PARTLY DEAF;"));
    EXPECT_THAT(lText, HasSubstr("status: failed     rscn of host7\n"));
    EXPECT_THAT(lText, HasSubstr("status: 1,200 refused (total-limit); since 20 Nov 10:04.\n"));
    EXPECT_THAT(lText, HasSubstr("   see: tavik explain refused\n"));
    EXPECT_THAT(lText, Not(HasSubstr("collection-off")));
}

TEST_F(StatusText, UnknownFiguresAreLeftOutAndNamedInsteadOfBeingZero) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["collector"] = nullptr;
    lLive["losses"] = nullptr;
    lLive["adapters"] = nullptr;
    lLive["agent"].erase("heldBytes");
    ZTSStatusFacts lFacts = makeFacts(lLive);
    lFacts.mHistory->mSan.reset();
    const std::string lText = format(lFacts);
    EXPECT_THAT(lText, HasSubstr(" quiet: no event yet\n"));
    EXPECT_THAT(lText, HasSubstr(" links: host7  10:..:01  -  listening"));
    EXPECT_THAT(lText, HasSubstr("  note: the sensor did not say what was refused in the last 24 h\n"));
    EXPECT_THAT(lText, HasSubstr("   SAN: no open episode"));
}

TEST_F(StatusText, OpenEpisodesAreCountedAlsoWhereThePathsHaveNoTrouble) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mHistory->mOpenEpisodes = 3;
    lFacts.mHistory->mOpenPorts = 1;
    EXPECT_THAT(format(lFacts),
                HasSubstr("   SAN: no trouble\n        3 open episodes, 1 remote port: tavik events --open\n"));
    lFacts.mHistory->mSan.reset();
    EXPECT_THAT(format(lFacts), HasSubstr("   SAN: 3 open episodes, 1 remote port: tavik events --open\n"));
}

TEST_F(StatusText, ManyAdaptersAreCutToAFewLines) {
    nlohmann::json lLive = makeHealthyJson();
    while (lLive["kinds"].size() < 9) {
        lLive["kinds"].push_back(lLive["kinds"][0]);
    }
    const std::string lText = format(makeFacts(lLive));
    EXPECT_THAT(lText, HasSubstr("        and 6 more: tavik --json status\n"));
    EXPECT_LE(std::count(lText.begin(), lText.end(), '\n'), 10);
}

TEST_F(StatusText, NoLineIsWiderThanTheTerminalAllows) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["agent"]["running"] = false;
    lLive["agent"]["problem"] =
        "It was killed by signal 9 after it had run for 3 days and 4 hours without a word of warning";
    lLive["keeper"]["state"] = "waiting-to-restart";
    ZTSStatusFacts lFacts = makeFacts(lLive);
    lFacts.mHost = std::string(200, 'h');
    for (const std::size_t lWidth : {40U, 60U, 80U, 200U}) {
        std::istringstream lLines(format(lFacts, lWidth));
        for (std::string lLine; std::getline(lLines, lLine);) {
            EXPECT_LE(countCharacters(lLine), lWidth - 3) << lLine;
        }
    }
}

TEST_F(StatusText, ColorStandsAroundTheVerdictAlone) {
    const std::string lPlain = format(makeHealthyFacts());
    const std::string lColored = formatStatus(makeHealthyFacts(), {.mWidth = 80, .mHasColor = true});
    EXPECT_THAT(lColored, HasSubstr(" state: \x1b[1;32mCOLLECTING\x1b[0m since"));
    EXPECT_EQ(lColored.size(), lPlain.size() + std::string("\x1b[1;32m\x1b[0m").size());
}

TEST_F(StatusText, TextsFromElsewhereCannotSteerTheTerminal) {
    ZTSStatusFacts lFacts = sWithoutAPort();
    lFacts.mNames.addName(wwnOf("50:06:01:60:00:00:01:01"), "\x1b[2Jgone");
    EXPECT_THAT(format(lFacts), HasSubstr("] PATH LOST   \\x1b[2Jgone  50:06"));
}
