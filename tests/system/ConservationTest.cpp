#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <map>
#include <string>
#include <tuple>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/Seed.h"
#include "tests/system/AdapterEvents.h"

// Whatever the schedule of events, starts, stops, retrievals and registrations: what was consolidated is delivered,
// each occurrence once, kind by kind and board by board, and in the order of its time.

/// A kind, the events of it that a schedule draws from, and the notice that tells that one of it was consolidated.
struct ZTSDrawnKind {
    unsigned mCategory;
    unsigned mSubcategory;
    std::string mNotice;
    std::vector<ZTSLibraryEvent> mEvents;  ///< of board 0
};

static std::vector<ZTSDrawnKind> sKinds() {
    std::vector<ZTSDrawnKind> lKinds;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        std::vector<ZTCBytes> lData{lcrKind.mData, lcrKind.mSameIdentity};
        lData.insert(lData.end(), lcrKind.mOthers.begin(), lcrKind.mOthers.end());
        ZTSDrawnKind lKind{lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.notice(), {}};
        for (const ZTCBytes& lcrBytes : lData) {
            lKind.mEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrBytes));
        }
        // Too short: it is dropped, and nothing is consolidated.
        lKind.mEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, {1, 2, 3}));
        lKinds.push_back(lKind);
    }
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        lKinds.push_back({lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.notice(), {lcrKind.mEvent}});
    }
    lKinds.push_back({1,
                      0x20,
                      testKind("rscn").notice(),
                      {ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})),
                       ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203, 0x00010203, 0x01020000})),
                       ZTSLibraryEvent::rscn(0, rscnPayload({0x03000000, 0x00040506}))}});
    return lKinds;
}

/// The notices of the log, each taken once.
class ZTCNotices {
public:
    explicit ZTCNotices(std::string aPath) : mPath(std::move(aPath)) {}

    /// How often each text stands in the lines that are new.
    std::map<std::string, std::uint64_t> take() {
        std::map<std::string, std::uint64_t> lCounts;
        std::ifstream lFile(mPath, std::ios::binary);
        lFile.seekg(mPosition);
        std::string lLine;
        while (std::getline(lFile, lLine) && !lFile.eof()) {
            mPosition += static_cast<std::streamoff>(lLine.size() + 1);
            if (const auto lParsed = parseLogLine(lLine)) {
                EXPECT_NE(lParsed->mMark, "-E-") << lLine;
                ++lCounts[lParsed->mText];
            }
        }
        return lCounts;
    }

private:
    std::string mPath;
    std::streamoff mPosition = 0;
};

class ZTCSchedule {
public:
    explicit ZTCSchedule(ZTCTestSeed& arSeed)
        : mrSeed(arSeed), mBoards(1 + arSeed.below(4)), mAgent(mBoards), mNotices(mAgent.agentLogPath()) {}

    void run(unsigned aSteps) {
        mAgent.startAndConnectQuietly(8 | 32);
        start();
        for (unsigned i = 0; i < aSteps && !testing::Test::HasFailure(); ++i) {
            step();
        }
        endStorm();
        expectQuiet();
    }

    std::uint64_t consolidated() const {
        std::uint64_t lSum = 0;
        for (const auto& [lKey, lCount] : mConsolidated) {
            lSum += lCount;
        }
        return lSum;
    }

private:
    using Key = std::tuple<unsigned, unsigned, unsigned>;  // board, category, subcategory

    void step() {
        switch (mrSeed.below(12)) {
            case 0:
                EXPECT_EQ(mAgent.request(gcStopScopeHex), gcSuccessHex);
                break;
            case 1:
            case 2:
                start();
                break;
            case 3:
                mAgent.registerTargets({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 0x010203 + mrSeed.below(3)},
                                        {makeWwn(gcOtherNode), makeWwn(gcOtherPort), mrSeed.below(0xFFFFFF)}});
                break;
            case 4:
                endStorm();
                expectQuiet();
                break;
            case 5:
            case 6:
            case 7:
                endStorm();
                startStorm();
                break;
            default:
                retrieve();
                break;
        }
    }

    void start() {
        const unsigned lLimits[] = {0, 40, 100, 4096, 0xFFFFFFFF};
        mAgent.startScope(lLimits[mrSeed.below(5)]);
    }

    /// Each kind of it comes from one board, so that the notices, which name the kind alone, tell of that board.
    void startStorm() {
        std::vector<ZTSLibraryEvent> lEvents;
        mBoardOfNotice.clear();
        const unsigned lShare = 1 + mrSeed.below(4);
        for (const ZTSDrawnKind& lcrKind : mKinds) {
            const unsigned lBoard = mrSeed.below(mBoards);
            if (mrSeed.below(4) >= lShare) {
                continue;
            }
            mBoardOfNotice[lcrKind.mNotice] = {lBoard, lcrKind.mCategory, lcrKind.mSubcategory};
            for (unsigned lCount = 1 + mrSeed.below(4); lCount > 0; --lCount) {
                ZTSLibraryEvent lEvent = lcrKind.mEvents[mrSeed.below(static_cast<unsigned>(lcrKind.mEvents.size()))];
                lEvent.mBoard = lBoard;
                lEvent.mIsMisaligned = mrSeed.below(2) == 1;
                lEvents.insert(lEvents.begin() + mrSeed.below(static_cast<unsigned>(lEvents.size()) + 1), lEvent);
            }
        }
        if (!lEvents.empty()) {
            mAgent.library().startStorm(1 + mrSeed.below(8), 1 + mrSeed.below(20), lEvents);
            mIsStormOn = true;
        }
    }

    void endStorm() {
        if (!mIsStormOn) {
            return;
        }
        mAgent.library().waitForStorm();
        mIsStormOn = false;
        const std::map<std::string, std::uint64_t> lCounts = mNotices.take();
        for (const auto& [lNotice, lKey] : mBoardOfNotice) {
            const auto lFound = lCounts.find(lNotice);
            mConsolidated[lKey] += lFound != lCounts.end() ? lFound->second : 0;
        }
    }

    void retrieve() { account(mAgent.retrieve()); }

    void account(const ZTSScopeDataResponse& acrResponse) {
        ASSERT_EQ(acrResponse.mLists.size(), mBoards);
        for (unsigned lBoard = 0; lBoard < mBoards; ++lBoard) {
            for (const ZTSEncodedRecord& lcrRecord : acrResponse.mLists[lBoard].mRecords) {
                EXPECT_GE(lcrRecord.mOccurrences, 1u);
                EXPECT_LE(lcrRecord.mBegin.total(), lcrRecord.mEnd.total());
                EXPECT_GE(lcrRecord.mBegin.total(), mLatest[lBoard]) << "a record begins before the one in front ends";
                mLatest[lBoard] = lcrRecord.mEnd.total();
                mDelivered[{lBoard, lcrRecord.mCategory, lcrRecord.mSubcategory}] += lcrRecord.mOccurrences;
            }
        }
    }

    /// While no event comes: everything has been delivered after a retrieval, and the next one has nothing.
    void expectQuiet() {
        retrieve();
        for (const auto& [lKey, lCount] : mConsolidated) {
            EXPECT_EQ(mDelivered[lKey], lCount)
                << "board " << std::get<0>(lKey) << " kind " << std::get<1>(lKey) << "/" << std::get<2>(lKey);
        }
        for (const auto& [lKey, lCount] : mDelivered) {
            EXPECT_EQ(mConsolidated[lKey], lCount)
                << "board " << std::get<0>(lKey) << " kind " << std::get<1>(lKey) << "/" << std::get<2>(lKey);
        }
        const ZTSScopeDataResponse lNothing = mAgent.retrieve();
        for (const ZTSEncodedRecordList& lcrList : lNothing.mLists) {
            EXPECT_TRUE(lcrList.mRecords.empty()) << "records were delivered twice";
        }
    }

    ZTCTestSeed& mrSeed;
    const std::vector<ZTSDrawnKind> mKinds = sKinds();
    unsigned mBoards;
    ZTCAgentProcess mAgent;
    ZTCNotices mNotices;
    bool mIsStormOn = false;
    std::map<std::string, Key> mBoardOfNotice;
    std::map<Key, std::uint64_t> mConsolidated;
    std::map<Key, std::uint64_t> mDelivered;
    std::map<unsigned, std::uint64_t> mLatest;
};

TEST(Conservation, EveryOccurrenceThatWasConsolidatedIsDeliveredOnceAndInOrderWhateverTheSchedule) {
    ZTCTestSeed lSeed;
    std::uint64_t lConsolidated = 0;
    for (unsigned lRun = 0; lRun < 4; ++lRun) {
        SCOPED_TRACE(lRun);
        ZTCSchedule lSchedule(lSeed);
        lSchedule.run(60);
        lConsolidated += lSchedule.consolidated();
    }
    EXPECT_GT(lConsolidated, 1000u);
}
