#include "sensor/client/include/FifoConversation.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <atomic>
#include <future>

#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/client/WireSamples.h"

using std::chrono::milliseconds;
using testing::HasSubstr;

/// For what is bound to happen, and for what is bound not to.
static ZTCTimeLimit sPatience() {
    return ZTCTimeLimit(gcTestPatience);
}
static ZTCTimeLimit sMoment() {
    return ZTCTimeLimit(milliseconds(60));
}

static const ZTCWireBytes scGet{1};

static ZTCWireBytes sAsk(ZTCFifoConversation& arConversation, const ZTCWireBytes& acrRequest = scGet) {
    const ZTCTimeLimit lLimit = sPatience();
    arConversation.send(acrRequest, lLimit);
    return arConversation.receive(lLimit);
}

/// The failure's reason, and its text.
template <typename T>
static std::pair<ZTENoAnswerReason, std::string> sFailureOf(T aAction) {
    try {
        aAction();
    } catch (const ZTCNoAnswerEx& lrEx) {
        return {lrEx.getReason(), lrEx.what()};
    }
    throw std::runtime_error("an answer came");
}

TEST(FifoConversation, SendsAFrameAndReturnsTheAnswersBody) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({9, 8, 7})});
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation, {5, 0, 0, 14, 16}), (ZTCWireBytes{9, 8, 7}));
    EXPECT_EQ(lAgent.getRequests(), (std::vector<ZTCWireBytes>{{5, 0, 0, 14, 16}}));
    EXPECT_TRUE(lConversation.isConnected());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{9, 8, 7}));
}

TEST(FifoConversation, AnAnswerOfNoBytesIsAnEmptyBody) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({})});
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_TRUE(sAsk(lConversation).empty());
}

TEST(FifoConversation, LargeRequestsAndAnswersPassWhole) {
    ZTCWireBytes lLarge(gcMaxRequestSize);
    for (std::size_t i = 0; i < lLarge.size(); ++i) {
        lLarge[i] = static_cast<std::uint8_t>(i * 7 + i / 256);
    }
    ZTCWireBytes lAnswer = lLarge;
    lAnswer.resize(3 * lLarge.size() + 1, 0x5A);
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering(lAnswer)});
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_TRUE(sAsk(lConversation, lLarge) == lAnswer);
    EXPECT_TRUE(lAgent.getRequests().at(0) == lLarge);
}

TEST(FifoConversation, ReadsNoByteBehindTheFrame) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answeringRaw({0, 0, 0, 1, 7, 0, 0, 0, 2, 8, 9})});
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{7}));
    EXPECT_EQ(lConversation.receive(sPatience()), (ZTCWireBytes{8, 9}));
}

TEST(FifoConversation, MissingFifosAreAnOutcomeWithAName) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCFifoConversation lConversation(lDirectory.path());
    const auto [lReason, lText] = sFailureOf([&] { lConversation.connect(sMoment()); });
    EXPECT_EQ(lReason, ZTNA_NoFifo);
    EXPECT_THAT(lText, HasSubstr(lDirectory.path("qrvtvkout.fifo") + " does not exist (waited 0.06 s)"));
    EXPECT_FALSE(lConversation.isConnected());
}

TEST(FifoConversation, FifosThatNobodyReadsAreAnOutcomeWithAName) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    ZTCFifoConversation lConversation(lDirectory.path());
    const auto [lReason, lText] = sFailureOf([&] { lConversation.connect(sMoment()); });
    EXPECT_EQ(lReason, ZTNA_NobodyListens);
    EXPECT_THAT(lText, HasSubstr("no process listens on " + lDirectory.path("qrvtvkcmd.fifo")));
}

TEST(FifoConversation, AFileInAFifosPlaceIsRefusedAndKept) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    ASSERT_EQ(unlink(lDirectory.path("qrvtvkcmd.fifo").c_str()), 0);
    writeFile(lDirectory.path("qrvtvkcmd.fifo"), "precious");
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_THROW(lConversation.connect(sPatience()), ZTCBadInputEx);
    EXPECT_EQ(readFile(lDirectory.path("qrvtvkcmd.fifo")), "precious");
}

TEST(FifoConversation, RefusesFifosBehindSymbolicLinks) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCTemporaryDirectory lOther;
    const ZTCFakeAgent lAgent(lOther.path(), {ZTCFakeAgent::answering({1})});
    for (const char* lpName : {"qrvtvkcmd.fifo", "qrvtvkout.fifo"}) {
        ASSERT_EQ(symlink(lOther.path(lpName).c_str(), lDirectory.path(lpName).c_str()), 0);
    }
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_THROW(lConversation.connect(sPatience()), ZTCSystemCallEx);
}

TEST(FifoConversation, IsTheReaderThatAStartingAgentWaitsFor) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());  // left by an agent that was killed
    ZTCFifoConversation lConversation(lDirectory.path());
    ZTCTestThread lAsking([&] { EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{4})); });
    // A blocking open for writing returns as soon as there is a reader.
    waitUntil(
        [&] {
            return ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_WRONLY | O_NONBLOCK).isOpen();
        },
        "a reader of the response FIFO");
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({4})});
    lAsking.join();
}

TEST(FifoConversation, FollowsFifosThatAreMadeAnewWhileItWaits) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    ZTCFifoConversation lConversation(lDirectory.path());
    ZTCTestThread lAsking([&] { EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{4})); });
    waitUntil([&] { return exists(lDirectory.path("qrv-sn.lock")); }, "the client's lock");
    ASSERT_EQ(unlink(lDirectory.path("qrvtvkcmd.fifo").c_str()), 0);
    ASSERT_EQ(unlink(lDirectory.path("qrvtvkout.fifo").c_str()), 0);
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({4})});
    lAsking.join();
}

TEST(FifoConversation, ASilentAgentIsGivenUpAtTheDeadline) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::silent()});
    ZTCFifoConversation lConversation(lDirectory.path());
    lConversation.send(scGet, sPatience());
    const auto [lReason, lText] = sFailureOf([&] { lConversation.receive(sMoment()); });
    EXPECT_EQ(lReason, ZTNA_Silence);
    EXPECT_THAT(lText, HasSubstr("sent only 0 of 4 bytes of its answer's length within 0.06 s"));
    EXPECT_FALSE(lConversation.isConnected());
}

TEST(FifoConversation, AnAnswerThatStopsHalfWayIsGivenUpWithTheBytesHadAndWanted) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answeringRaw({0xFF, 0xFF, 0xFF, 0xFF, 1, 2, 3})});
    ZTCFifoConversation lConversation(lDirectory.path());
    const ZTCFileDescriptor lOtherReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    lConversation.send(scGet, sPatience());
    int lStanding = 0;
    waitUntil([&] { return ioctl(lOtherReader.get(), FIONREAD, &lStanding) == 0 && lStanding == 7; }, "the bytes");
    const auto [lReason, lText] = sFailureOf([&] { lConversation.receive(sMoment()); });
    EXPECT_EQ(lReason, ZTNA_Silence);
    EXPECT_THAT(lText, HasSubstr("sent only 3 of 4294967295 bytes of its answer"));
}

TEST(FifoConversation, AnAgentThatStopsTakingTheRequestIsGivenUp) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    const ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkcmd.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    ZTCFifoConversation lConversation(lDirectory.path());
    const ZTCWireBytes lLarge(gcMaxRequestSize, 3);
    const auto [lReason, lText] = sFailureOf([&] { lConversation.send(lLarge, sMoment()); });
    EXPECT_EQ(lReason, ZTNA_Silence);
    EXPECT_THAT(lText, HasSubstr("of 1048580 bytes of the request"));
}

TEST(FifoConversation, AnAgentThatDiesBeforeItAnswersIsNoticedAtOnce) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::dying({})});
    ZTCFifoConversation lConversation(lDirectory.path());
    const auto [lReason, lText] = sFailureOf([&] { sAsk(lConversation); });
    EXPECT_EQ(lReason, ZTNA_AgentDied);
    EXPECT_THAT(lText, HasSubstr("ended: it had sent 0 of 4 bytes"));
}

TEST(FifoConversation, AnAgentThatDiesInTheMiddleOfItsAnswerIsNoticedAtOnce) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::dying({0, 0, 0, 9, 2, 2})});
    ZTCFifoConversation lConversation(lDirectory.path());
    const auto [lReason, lText] = sFailureOf([&] { sAsk(lConversation); });
    EXPECT_EQ(lReason, ZTNA_AgentDied);
    EXPECT_THAT(lText, HasSubstr("ended: it had sent 2 of 9 bytes of its answer"));
}

TEST(FifoConversation, AnAgentThatDiesWithoutEverOpeningTheResponseFifoIsNoticed) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkcmd.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    ZTCFifoConversation lConversation(lDirectory.path());
    lConversation.send(scGet, sPatience());
    lReader.reset();
    EXPECT_EQ(sFailureOf([&] { lConversation.receive(sPatience()); }).first, ZTNA_AgentDied);
}

TEST(FifoConversation, AnAnswerThatTheAgentSentBeforeItEndedIsRead) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::dying({0, 0, 0, 5, 0, 0, 0, 0, 0})});
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation, {4}), (ZTCWireBytes{0, 0, 0, 0, 0}));
}

TEST(FifoConversation, WritingToADeadAgentRaisesNoSignal) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkcmd.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    ZTCFifoConversation lConversation(lDirectory.path());
    lConversation.connect(sPatience());
    lReader.reset();
    ASSERT_EQ(signal(SIGPIPE, SIG_DFL), SIG_DFL);
    EXPECT_EQ(sFailureOf([&] { lConversation.send(scGet, sPatience()); }).first, ZTNA_AgentDied);
    sigset_t lPending;
    sigpending(&lPending);
    EXPECT_EQ(sigismember(&lPending, SIGPIPE), 0);
}

TEST(FifoConversation, ASignalOfTheProgramsOwnThatWaitedBeforeStillWaits) {
    const ZTCTemporaryDirectory lDirectory;
    makeFifos(lDirectory.path());
    const ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkcmd.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    sigset_t lPipe;
    sigemptyset(&lPipe);
    sigaddset(&lPipe, SIGPIPE);
    sigset_t lFormer;
    ASSERT_EQ(pthread_sigmask(SIG_BLOCK, &lPipe, &lFormer), 0);
    ASSERT_EQ(pthread_kill(pthread_self(), SIGPIPE), 0);
    ZTCFifoConversation lConversation(lDirectory.path());
    lConversation.send(scGet, sPatience());
    sigset_t lPending;
    sigpending(&lPending);
    EXPECT_EQ(sigismember(&lPending, SIGPIPE), 1);
    const timespec lNow{};
    EXPECT_EQ(sigtimedwait(&lPipe, nullptr, &lNow), SIGPIPE);
    pthread_sigmask(SIG_SETMASK, &lFormer, nullptr);
}

TEST(FifoConversation, StaleBytesAreThrownAwayBeforeTheFirstRequest) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({6})});
    lAgent.refusePeriodOfZero();
    // Bytes stay in a FIFO as long as somebody has it open.
    const ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    const ZTCFileDescriptor lWriter =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_WRONLY | O_NONBLOCK);
    const ZTCWireBytes lStale(10000, 0xEE);
    ASSERT_EQ(write(lWriter.get(), lStale.data(), lStale.size()), 10000);
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{6}));
    EXPECT_EQ(lConversation.getDiscardedBytes(), 10000U);
}

TEST(FifoConversation, AnAnswerThatIsStillBeingSentIsThrownAwayWhole) {
    // The agent sends what the FIFO does not hold at once; the client that asked for it is gone.
    const ZTCTemporaryDirectory lDirectory;
    ZTCFakeAgent lAgent(lDirectory.path(),
                        {ZTCFakeAgent::answering(ZTCWireBytes(1000000, 0x11)), ZTCFakeAgent::answering({6})});
    lAgent.refusePeriodOfZero();
    const ZTCFileDescriptor lOtherReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    {
        ZTCFifoConversation lGone(lDirectory.path());
        lGone.send(scGet, sPatience());
    }
    pollfd lStale{.fd = lOtherReader.get(), .events = POLLIN, .revents = 0};
    ASSERT_EQ(poll(&lStale, 1, 20000), 1);
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{6}));
    EXPECT_EQ(lConversation.getDiscardedBytes(), 1000004U);
}

TEST(FifoConversation, AnAnswerThatPausesWhileItIsSentIsThrownAwayWhole) {
    const ZTCTemporaryDirectory lDirectory;
    std::promise<void> lMayGoOn;
    ZTCFakeAgent lAgent(lDirectory.path(), {[&](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
                                                arAgent.sendRaw({0, 0, 0, 8, 2, 0});
                                                lMayGoOn.get_future().wait();
                                                arAgent.sendRaw({0, 0, 0, 0, 0, 0});
                                            },
                                            ZTCFakeAgent::answering({6})});
    lAgent.refusePeriodOfZero();
    const ZTCFileDescriptor lOtherReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    {
        ZTCFifoConversation lGone(lDirectory.path());
        lGone.send(scGet, sPatience());
    }
    pollfd lStale{.fd = lOtherReader.get(), .events = POLLIN, .revents = 0};
    ASSERT_EQ(poll(&lStale, 1, 20000), 1);
    // The rest comes when the next client has taken what was there.
    const ZTCTestThread lRest([&] {
        int lWaiting = 1;
        waitUntil([&] { return ioctl(lOtherReader.get(), FIONREAD, &lWaiting) == 0 && lWaiting == 0; }, "the drain");
        poll(nullptr, 0, 200);  // longer than the quiet that a client takes for the end
        lMayGoOn.set_value();
    });
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{6}));
    EXPECT_EQ(lConversation.getDiscardedBytes(), 12U);
}

TEST(FifoConversation, StaleBytesOfAPeerThatMarksNoEndAreThrownAwayAllTheSame) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::silent(), ZTCFakeAgent::answering({6})});
    const ZTCFileDescriptor lReader =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_RDONLY | O_NONBLOCK);
    const ZTCFileDescriptor lWriter =
        ZTCFileDescriptor::open(lDirectory.path("qrvtvkout.fifo").c_str(), O_WRONLY | O_NONBLOCK);
    ASSERT_EQ(write(lWriter.get(), "stale", 5), 5);
    ZTCFifoConversation lConversation(lDirectory.path());
    EXPECT_EQ(sAsk(lConversation), (ZTCWireBytes{6}));
    EXPECT_EQ(lConversation.getDiscardedBytes(), 5U);
}

TEST(FifoConversation, ASecondClientWaitsForTheLock) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({6})});
    ZTCFifoConversation lFirst(lDirectory.path());
    lFirst.connect(sPatience());
    std::atomic<bool> lHasFirstFinished{false};
    ZTCTestThread lOther([&] {
        ZTCFifoConversation lSecond(lDirectory.path());
        EXPECT_EQ(sAsk(lSecond), (ZTCWireBytes{6}));
        EXPECT_TRUE(lHasFirstFinished);
    });
    EXPECT_EQ(sAsk(lFirst), (ZTCWireBytes{6}));
    EXPECT_EQ(sAsk(lFirst), (ZTCWireBytes{6}));
    lHasFirstFinished = true;
    lFirst.disconnect();
    lOther.join();
    EXPECT_EQ(lAgent.getRequests().size(), 3U);
}

TEST(FifoConversation, ALockThatIsNeverGivenUpIsAnOutcomeWithAName) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({6})});
    ZTCClientLock lOther(lDirectory.path());
    ASSERT_TRUE(lOther.tryAcquire());
    ZTCFifoConversation lConversation(lDirectory.path());
    const auto [lReason, lText] = sFailureOf([&] { lConversation.send(scGet, sMoment()); });
    EXPECT_EQ(lReason, ZTNA_LockHeld);
    EXPECT_THAT(lText, HasSubstr("another client holds " + lDirectory.path("qrv-sn.lock")));
    EXPECT_TRUE(lAgent.getRequests().empty());
}

TEST(FifoConversation, AFailureGivesTheLockUp) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::silent()});
    ZTCFifoConversation lConversation(lDirectory.path());
    lConversation.send(scGet, sPatience());
    EXPECT_THROW(lConversation.receive(sMoment()), ZTCNoAnswerEx);
    EXPECT_TRUE(ZTCClientLock(lDirectory.path()).tryAcquire());
}

TEST(FifoConversation, CancellingEndsTheWaitForAnAgent) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFileDescriptor lCancel(eventfd(1, EFD_CLOEXEC));
    ZTCFifoConversation lConversation(lDirectory.path(), lCancel.get());
    EXPECT_THROW(lConversation.connect(sPatience()), ZTCCancelledEx);
}

TEST(FifoConversation, CancellingDoesNotCutAnAnswerShort) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({6})});
    const ZTCFileDescriptor lCancel(eventfd(0, EFD_CLOEXEC));
    ZTCFifoConversation lConversation(lDirectory.path(), lCancel.get());
    lConversation.send(scGet, sPatience());
    ASSERT_EQ(eventfd_write(lCancel.get(), 1), 0);
    EXPECT_EQ(lConversation.receive(sPatience()), (ZTCWireBytes{6}));
}
