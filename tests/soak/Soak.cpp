/// Runs the agent under a mixed load, and reports what it takes of the machine. Ends with status 1 where that grows, or
/// where an answer is not what it has to be.
///
/// soak SECONDS
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <vector>

#include "tests/faults/FaultInjection.h"
#include "tests/soak/SoakFigures.h"
#include "tests/soak/SoakLoad.h"

namespace {

constexpr unsigned scBoards = 3;
constexpr double scLeastSeconds = 10;

double sSecondsSince(std::chrono::steady_clock::time_point aBegin) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - aBegin).count();
}

int sSoak(double aSeconds) {
    ZTCAgentProcess lAgent(scBoards);
    const ZTCFaultInjection lBlocks(lAgent);  // it counts them
    lAgent.startAndConnectQuietly(63, {"-b", "2"});
    ZTCSoakLoad lLoad(lAgent, scBoards);

    const std::vector<std::string> lFiles = {lAgent.agentLogPath(), lAgent.agentLogPath() + ".1",
                                             lAgent.defaultLogPath(), lAgent.pidFilePath()};
    std::vector<ZTSSoakFigures> lFigures;
    unsigned lRounds = 0;
    const auto lBegin = std::chrono::steady_clock::now();
    while (sSecondsSince(lBegin) < aSeconds) {
        lLoad.playRound();
        ++lRounds;
        lFigures.push_back(takeSoakFigures(lAgent.process().getPid(), lFiles));
        lFigures.back().mSeconds = sSecondsSince(lBegin);
        lFigures.back().mBlocks = lBlocks.liveBlocks();
        // The load is a mixture, not a race: others use the machine too.
        const ZTCDeadline lPause(std::chrono::milliseconds(20));
        waitUntil([&] { return lPause.isOver(); }, "a pause");
    }

    const ZTSSoakCounts& lcrCounts = lLoad.counts();
    std::printf(
        "%.0f seconds, %u rounds: %llu events, %llu records, %llu commands, %llu broken frames, "
        "%llu reconnections\n\n",
        aSeconds, lRounds, static_cast<unsigned long long>(lcrCounts.mEvents),
        static_cast<unsigned long long>(lcrCounts.mRecords), static_cast<unsigned long long>(lcrCounts.mCommands),
        static_cast<unsigned long long>(lcrCounts.mBrokenFrames),
        static_cast<unsigned long long>(lcrCounts.mReconnections));
    std::printf("%-18s %10s %10s %10s %10s\n", "", "begin", "middle", "end", "at most");
    bool lIsFine = true;
    for (const ZTSSoakVerdict& lcrVerdict : judgeSoak(lFigures, aSeconds)) {
        std::printf("%-18s %10lld %10lld %10lld %10lld%s\n", lcrVerdict.mpName,
                    static_cast<long long>(lcrVerdict.mBegin), static_cast<long long>(lcrVerdict.mMiddle),
                    static_cast<long long>(lcrVerdict.mEnd), static_cast<long long>(lcrVerdict.mMost),
                    lcrVerdict.isFine() ? "" : "  it grows");
        lIsFine = lIsFine && lcrVerdict.isFine();
    }
    const int lStatus = lAgent.stop();
    if (lStatus != 0) {
        std::printf("the agent ended with status %d\n", lStatus);
    }
    return lIsFine && lStatus == 0 ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
    testing::InitGoogleTest(&argc, argv);
    const double lSeconds = argc == 2 ? std::atof(argv[1]) : 0;
    if (lSeconds < scLeastSeconds) {
        std::fprintf(stderr, "Usage: soak SECONDS, %.0f at least\n", scLeastSeconds);
        return 2;
    }
    try {
        const int lStatus = sSoak(lSeconds);
        return testing::UnitTest::GetInstance()->ad_hoc_test_result().Failed() ? 1 : lStatus;
    } catch (const std::exception& lcrError) {
        std::fprintf(stderr, "soak: %s\n", lcrError.what());
        return 1;
    }
}
