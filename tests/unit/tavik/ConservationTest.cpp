#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <map>
#include <optional>
#include <random>
#include <set>
#include <shared_mutex>
#include <thread>

#include "common/include/Log.h"
#include "tests/support/Seed.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

// What goes in comes out, once: threads of events against starts, stops, retrievals and registrations of targets, by
// random schedules. A schedule follows from its seed as far as the operating system's own choices let it; the
// environment variable ZT_TEST_SEED replays one.

namespace {

constexpr unsigned scBoards = 3;
constexpr unsigned scThreads = 4;

/// Some schedules are always the same, and one is new in every run.
std::optional<unsigned> sSeed(unsigned aSchedule) {
    return aSchedule == 0 ? std::nullopt : std::optional(aSchedule);
}

/// Category, subcategory and board.
using ZTCKindOnBoard = std::array<unsigned, 3>;
using ZTCCounts = std::map<ZTCKindOnBoard, std::uint64_t>;

/// Random events of one thread, and what is to become of them.
class ZTCEventSource {
public:
    ZTCEventSource(unsigned aSeed, unsigned aThread) : mRandom(aSeed * 1000 + aThread + 1), mThread(aThread) {}

    /// Delivers one event, which is noted where it is to be consolidated.
    void deliverOne(bool aIsCollecting) {
        const unsigned lBoard = below(scBoards);
        switch (below(10)) {
            case 0:
                deliverNumbered(lBoard, aIsCollecting);
                break;
            case 1:
                deliverPages(lBoard, aIsCollecting);
                break;
            case 2:
                deliverWaste(lBoard);
                break;
            case 3:
                deliverTemperature(lBoard);
                note(8, 4, lBoard, aIsCollecting);
                break;
            case 4:
                deliverLink(lBoard, makeWwn(mRandom()));
                note(8, 2, lBoard, aIsCollecting);
                break;
            default:
                deliverAnyKind(lBoard, aIsCollecting);
                break;
        }
    }

    const ZTCCounts& consolidated() const { return mConsolidated; }
    /// The numbers of the numbered events that were consolidated, by board.
    const std::set<std::pair<unsigned, std::uint64_t>>& numbers() const { return mNumbers; }

private:
    unsigned below(unsigned aBound) { return static_cast<unsigned>(mRandom() % aBound); }

    void note(unsigned aCategory, unsigned aSubcategory, unsigned aBoard, bool aIsCollecting) {
        if (aIsCollecting) {
            ++mConsolidated[{aCategory, aSubcategory, aBoard}];
        }
    }

    /// One of the nineteen kinds, from one of two remote ports.
    void deliverAnyKind(unsigned aBoard, bool aIsCollecting) {
        const ZTSDeliveredKind& lcrKind = allKinds()[below(static_cast<unsigned>(allKinds().size()))];
        if (lcrKind.mCategory == 1 && lcrKind.mSubcategory == 0x08) {
            deliverNumbered(aBoard, aIsCollecting);
            return;
        }
        ZTCBytes lPayload = lcrKind.mPayload;
        if (!lPayload.empty() && below(4) == 0) {
            lPayload[11] ^= 1;
        }
        deliverScope(aBoard, lcrKind.mCategory, lcrKind.mSubcategory, lPayload);
        note(lcrKind.mCategory, lcrKind.mSubcategory, aBoard, aIsCollecting);
    }

    /// An LS_RJT whose two reason codes are a number that no other event has: it can be found again.
    void deliverNumbered(unsigned aBoard, bool aIsCollecting) {
        const unsigned lNumber = mNextNumber++;
        deliverScope(aBoard, 1, 0x08, makePortPayload(gcKindPort, {3, mThread, lNumber}));
        note(1, 0x08, aBoard, aIsCollecting);
        if (aIsCollecting) {
            mNumbers.emplace(aBoard, std::uint64_t{mThread} << 32 | lNumber);
        }
    }

    void deliverPages(unsigned aBoard, bool aIsCollecting) {
        std::vector<std::uint32_t> lPages(below(4));
        for (std::uint32_t& lrPage : lPages) {
            lrPage = below(3);
            note(1, 0x20, aBoard, aIsCollecting);
        }
        if (lPages.empty()) {
            deliverRscn(aBoard, makeRscn({7}, 4));
        } else {
            deliverRscn(aBoard, makeRscn(lPages));
        }
    }

    /// An event that nothing comes of.
    void deliverWaste(unsigned aBoard) {
        switch (below(4)) {
            case 0:
                deliverScope(aBoard, 4, 0x01, ZTCBytes(15, 0));
                break;
            case 1:
                deliverScope(aBoard, 4, 0x80, ZTCBytes(64, 0));
                break;
            case 2:
                deliverNullEvent(scBoards + aBoard, 1, 1);
                break;
            default:
                deliverRscn(aBoard, ZTCBytes(7, 0));
                break;
        }
    }

    std::mt19937_64 mRandom;
    unsigned mThread;
    unsigned mNextNumber = 0;
    ZTCCounts mConsolidated;
    std::set<std::pair<unsigned, std::uint64_t>> mNumbers;
};

/// Everything that the responses of one run have delivered.
class ZTCDelivered {
public:
    void add(const ZTSScopeDataResponse& acrResponse) {
        ASSERT_EQ(scBoards, acrResponse.mListCount);
        ASSERT_EQ(scBoards, acrResponse.mLists.size());
        mLastSize = 0;
        for (unsigned lBoard = 0; lBoard < scBoards; ++lBoard) {
            for (const ZTSEncodedRecord& lcrRecord : acrResponse.mLists[lBoard].mRecords) {
                ASSERT_LE(mLastEnd[lBoard], lcrRecord.mBegin.total())
                    << "a record begins when the one before has ended";
                ASSERT_LE(lcrRecord.mBegin.total(), lcrRecord.mEnd.total());
                ASSERT_NE(0u, lcrRecord.mOccurrences);
                mLastEnd[lBoard] = lcrRecord.mEnd.total();
                mLastSize += lcrRecord.mData.size();
                mCounts[{lcrRecord.mCategory, lcrRecord.mSubcategory, lBoard}] += lcrRecord.mOccurrences;
                if (lcrRecord.mCategory == 1 && lcrRecord.mSubcategory == 0x08) {
                    addNumbers(lBoard, lcrRecord);
                }
            }
        }
    }

    const ZTCCounts& counts() const { return mCounts; }
    std::uint64_t count(unsigned aCategory, unsigned aSubcategory) const {
        std::uint64_t lCount = 0;
        for (unsigned lBoard = 0; lBoard < scBoards; ++lBoard) {
            const auto lFound = mCounts.find({aCategory, aSubcategory, lBoard});
            lCount += lFound != mCounts.end() ? lFound->second : 0;
        }
        return lCount;
    }
    const std::set<std::pair<unsigned, std::uint64_t>>& numbers() const { return mNumbers; }
    std::uint64_t lastSize() const { return mLastSize; }  ///< event-data bytes of the last response

private:
    void addNumbers(unsigned aBoard, const ZTSEncodedRecord& acrRecord) {
        ASSERT_EQ(16 + 8 * std::size_t{acrRecord.mOccurrences}, acrRecord.mData.size());
        for (std::size_t lAt = 16; lAt < acrRecord.mData.size(); lAt += 8) {
            const std::uint64_t lNumber =
                std::uint64_t{number(acrRecord.mData, lAt)} << 32 | number(acrRecord.mData, lAt + 4);
            ASSERT_TRUE(mNumbers.emplace(aBoard, lNumber).second) << "event " << lNumber << " is delivered twice";
        }
    }
    static std::uint32_t number(const ZTCBytes& acrData, std::size_t aAt) {
        return static_cast<std::uint32_t>(acrData[aAt] | acrData[aAt + 1] << 8 | acrData[aAt + 2] << 16) |
               static_cast<std::uint32_t>(acrData[aAt + 3]) << 24;
    }

    ZTCCounts mCounts;
    std::set<std::pair<unsigned, std::uint64_t>> mNumbers;
    std::array<std::uint64_t, scBoards> mLastEnd{};
    std::uint64_t mLastSize = 0;
};

class Conservation : public ZTCTavikFixture {
protected:
    void retrieveInto(ZTCDelivered& arDelivered) { arDelivered.add(retrieve()); }

    /// The last retrieval of a run: no thread delivers any more.
    void retrieveRestInto(ZTCDelivered& arDelivered) {
        const std::uint64_t lTotal = mSystem->getTotalEventDataSize();
        retrieveInto(arDelivered);
        EXPECT_EQ(arDelivered.lastSize(), lTotal);
        EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
        EXPECT_FALSE(mSystem->hasPendingRecord());
    }

    /// Commands that change nothing of what is counted.
    void commandAmongOthers(std::mt19937_64& arRandom) {
        if (arRandom() % 2 == 0) {
            registerTargets(
                {{makeWwn(arRandom()), makeWwn(gcKindPort ^ (arRandom() & 1)), static_cast<unsigned>(arRandom() % 4)}});
        } else {
            requestHex("0500000001");
        }
    }
};

}  // namespace

TEST_F(Conservation, WhatIsConsolidatedIsDeliveredOnceByKindAndBoard) {
    collect(scBoards);
    setLogCode(0);
    for (unsigned lSchedule = 0; lSchedule < 6; ++lSchedule) {
        ZTCTestSeed lSeed(sSeed(lSchedule));
        std::mt19937_64 lRandom(lSeed.seed());
        mDoScopeCollection = true;

        // Held shared over an event and alone over a start or stop, so that it is known of every event whether it was
        // admitted.
        std::shared_mutex lSwitch;
        std::vector<ZTCEventSource> lSources;
        for (unsigned lThread = 0; lThread < scThreads; ++lThread) {
            lSources.emplace_back(lSeed.seed(), lThread);
        }
        ZTCTestThreads lThreads;
        lThreads.start(scThreads, [&](unsigned aThread) {
            for (unsigned lEvent = 0; lEvent < 500; ++lEvent) {
                const std::shared_lock lHold(lSwitch);
                lSources[aThread].deliverOne(mDoScopeCollection);
            }
        });
        ZTCDelivered lDelivered;
        while (lThreads.isRunning() && !HasFatalFailure()) {
            switch (lRandom() % 4) {
                case 0: {
                    const std::unique_lock lHold(lSwitch);
                    requestHex("02");
                    break;
                }
                case 1: {
                    const std::unique_lock lHold(lSwitch);
                    startScope(static_cast<unsigned>(lRandom() % 512));
                    break;
                }
                case 2:
                    commandAmongOthers(lRandom);
                    break;
                default:
                    retrieveInto(lDelivered);
                    break;
            }
            std::this_thread::yield();
        }
        lThreads.join();
        retrieveRestInto(lDelivered);

        ZTCCounts lConsolidated;
        std::set<std::pair<unsigned, std::uint64_t>> lNumbers;
        for (const ZTCEventSource& lcrSource : lSources) {
            for (const auto& [lcrKey, lCount] : lcrSource.consolidated()) {
                lConsolidated[lcrKey] += lCount;
            }
            lNumbers.insert(lcrSource.numbers().begin(), lcrSource.numbers().end());
        }
        EXPECT_EQ(lConsolidated, lDelivered.counts());
        EXPECT_EQ(lNumbers, lDelivered.numbers());
        ASSERT_FALSE(HasFailure());
    }
}

TEST_F(Conservation, WithStopsThatRaceTheEventsWhatIsNotedAsProcessedIsDelivered) {
    collect(scBoards);
    std::uint64_t lProcessed = 0;
    for (unsigned lSchedule = 0; lSchedule < 3; ++lSchedule) {
        ZTCTestSeed lSeed(sSeed(lSchedule));
        std::mt19937_64 lRandom(lSeed.seed());
        mDoScopeCollection = true;
        mLog.forget();
        ZTCTestThreads lThreads;
        std::atomic<unsigned> lUnderWay{0};
        lThreads.start(scThreads, [&](unsigned aThread) {
            ZTCEventSource lSource(lSeed.seed(), aThread);
            for (unsigned lEvent = 0; lEvent < 300; ++lEvent) {
                lSource.deliverOne(false);
                ++lUnderWay;
            }
        });
        // The first events are consolidated in any case; then the race begins.
        while (lUnderWay < 40) {
            std::this_thread::yield();
        }
        ZTCDelivered lDelivered;
        while (lThreads.isRunning() && !HasFatalFailure()) {
            switch (lRandom() % 5) {
                case 0:
                    requestHex("02");
                    break;
                case 1:
                case 2:
                    startScope(static_cast<unsigned>(lRandom() % 512));
                    break;
                case 3:
                    // As good as full: the events that follow are refused, but for those that race.
                    mSystem->makePendingRecord(0, 262144);
                    break;
                default:
                    retrieveInto(lDelivered);
                    break;
            }
            std::this_thread::yield();
        }
        lThreads.join();
        retrieveRestInto(lDelivered);

        std::map<std::string, std::uint64_t> lNotices;
        for (const ZTSLogLine& lcrLine : mLog.lines()) {
            if (lcrLine.mText.starts_with("Processing ")) {
                ++lNotices[lcrLine.mText];
            }
        }
        for (const ZTSDeliveredKind& lcrKind : allKinds()) {
            EXPECT_EQ(lNotices[lcrKind.notice()], lDelivered.count(lcrKind.mCategory, lcrKind.mSubcategory))
                << lcrKind.mpName;
            lProcessed += lNotices[lcrKind.notice()];
        }
        EXPECT_EQ(lNotices["Processing Rscn Event Cat=1 SubCat=32"], lDelivered.count(1, 0x20));
        ASSERT_FALSE(HasFailure());
    }
    EXPECT_LT(0u, lProcessed);
}
