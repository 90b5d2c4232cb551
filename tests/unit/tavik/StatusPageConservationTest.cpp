#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <map>
#include <random>
#include <shared_mutex>
#include <thread>

#include "common/include/Log.h"
#include "libkpm/include/ScopeEventKinds.h"
#include "tavik/include/TavikCore.h"
#include "tests/support/FailingAllocation.h"
#include "tests/support/Seed.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/StatusPageFixture.h"

// The two equations of the status page, against counts that the tests keep by themselves: by random schedules of events
// from several threads, refusals of every reason, retrievals, starts and stops, adapters that leave and come back, and
// allocations that fail.

namespace {

constexpr unsigned scBoards = 3;
constexpr unsigned scThreads = 4;
constexpr unsigned scSteps = 150;

/// Events of one thread, counted by board and row as they are delivered: for an RSCN that may be admitted, pages.
class ZTCCountedSource {
public:
    ZTCCountedSource(unsigned aSeed, unsigned aThread) : mRandom(aSeed * 1000 + aThread + 1) {}

    /// Delivers one event.
    void deliverOne() {
        const unsigned lBoard = below(scBoards + 1);
        switch (below(8)) {
            case 0:
                deliverScope(lBoard, 4, 0x80, ZTCBytes(64, 0));
                count(lBoard, gcStatusOtherRow, 1);
                break;
            case 1:
                deliverTemperature(lBoard);
                count(lBoard, 8, 4, 1);
                break;
            case 2:
                deliverLink(lBoard, makeWwn(mRandom()));
                count(lBoard, 8, 2, 1);
                break;
            case 3: {
                const ZTSDeliveredKind& lcrKind = kindsWithData()[below(static_cast<unsigned>(kindsWithData().size()))];
                deliverScope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, ZTCBytes(lcrKind.mMinimumLength - 1, 0));
                count(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, 1);
                break;
            }
            default: {
                const ZTSDeliveredKind& lcrKind = allKinds()[below(static_cast<unsigned>(allKinds().size()))];
                ZTCBytes lPayload = lcrKind.mPayload;
                if (!lPayload.empty() && below(4) == 0) {
                    lPayload[11] ^= 1;
                }
                deliverScope(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, lPayload);
                count(lBoard, lcrKind.mCategory, lcrKind.mSubcategory, 1);
                break;
            }
        }
    }

    /// Delivers an event by hand, one of whose allocations fails, if it makes so many. One thread at a time.
    void deliverWithoutMemory(unsigned aBoard) {
        ZT_scsi_generic_v0 lData{};
        lData.zt_scsi_generic_lun = below(4);
        lData.zt_scsi_generic_rport.wwn[0] = static_cast<std::uint8_t>(below(200));
        ZT_event_payload lPayload{0, &lData};
        ZT_event lEvent{ZT_EVENT_VERSION, ZT_EVENT_HEADER_SIZE + sizeof lData, &lPayload};
        failAllocation(1 + below(4), [&] { ScopeCb_Generic(aBoard, HBA_wwn{}, 4, 1, nullptr, &lEvent); });
        count(aBoard, 4, 1, 1);
    }

    /// Delivers an RSCN of which it is known whether its pages are read: they are where the board has a list and events
    /// are admitted. Otherwise it is one event.
    void deliverPages(unsigned aBoard, bool aAreRead) {
        std::vector<std::uint32_t> lPages(1 + below(5));
        for (std::uint32_t& lrPage : lPages) {
            lrPage = below(3);
        }
        deliverRscn(aBoard, makeRscn(lPages));
        count(aBoard, 1, 0x20, aAreRead ? lPages.size() : 1);
    }

    /// By board, then row; the last board stands for all unknown ones, in its first row.
    using ZTCCounts = std::array<std::array<std::uint64_t, gcStatusRowsPerBoard>, scBoards + 1>;
    const ZTCCounts& counts() const { return mCounts; }

private:
    unsigned below(unsigned aBound) { return static_cast<unsigned>(mRandom() % aBound); }

    void count(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, std::uint64_t aEvents) {
        unsigned lRow = 0;
        while (gcScopeEventKinds[lRow].mDeliveredCategory != aCategory ||
               gcScopeEventKinds[lRow].mDeliveredSubcategory != aSubcategory) {
            ++lRow;
        }
        count(aBoard, lRow, aEvents);
    }
    void count(unsigned aBoard, unsigned aRow, std::uint64_t aEvents) {
        mCounts[aBoard][aBoard == scBoards ? 0 : aRow] += aEvents;
    }

    std::mt19937_64 mRandom;
    ZTCCounts mCounts{};
};

class StatusPageConservation : public ZTCStatusPageFixture {
protected:
    /// Occurrences that the responses delivered, by board and row.
    void retrieveInto(std::map<std::pair<std::size_t, std::string>, std::uint64_t>& arDelivered) {
        const ZTSScopeDataResponse lResponse = retrieve();
        for (std::size_t lBoard = 0; lBoard < lResponse.mLists.size(); ++lBoard) {
            for (const ZTSEncodedRecord& lcrRecord : lResponse.mLists[lBoard].mRecords) {
                const ZTSScopeEventKind* lpKind = findDeliveredKind(static_cast<std::uint8_t>(lcrRecord.mCategory),
                                                                    static_cast<std::uint8_t>(lcrRecord.mSubcategory));
                arDelivered[{lBoard, lpKind != nullptr ? lpKind->mpName : "other"}] += lcrRecord.mOccurrences;
            }
        }
    }
};

}  // namespace

TEST_F(StatusPageConservation, EveryEventIsCountedOnceAndWhatIsHandedOverIsWhatTheResponsesDeliver) {
    collect(scBoards);
    setLogCode(0);
    mLibrary.mNotesCounting = false;
    ZTCTestSeed lSeed;

    std::vector<ZTCCountedSource> lSources;
    for (unsigned lThread = 0; lThread < scThreads; ++lThread) {
        lSources.emplace_back(lSeed.seed(), lThread);
    }
    // Held shared over an event. An RSCN whose pages are counted needs to know what becomes of it: it is held alone.
    std::shared_mutex lSwitch;
    unsigned lAdapters = scBoards;
    bool lIsOn = true;
    bool lIsFull = false;
    // Readers of such a lock may starve its writer.
    std::atomic<bool> lIsWanted{false};
    std::atomic<bool> lIsToEnd{false};
    ZTCTestThreads lThreads;
    lThreads.start(scThreads, [&](unsigned aThread) {
        while (!lIsToEnd) {
            while (lIsWanted && !lIsToEnd) {
                std::this_thread::yield();
            }
            const std::shared_lock lHold(lSwitch);
            lSources[aThread].deliverOne();
        }
    });
    const auto lAlone = [&lSwitch, &lIsWanted] {
        lIsWanted = true;
        std::unique_lock lHold(lSwitch);
        lIsWanted = false;
        return lHold;
    };
    ZTCCountedSource lOwn(lSeed.seed(), scThreads);
    std::map<std::pair<std::size_t, std::string>, std::uint64_t> lDelivered;
    std::uint64_t lFillers = 0;
    std::uint64_t lLast = 0;
    for (unsigned lStep = 0; lStep < scSteps && !HasFatalFailure(); ++lStep) {
        switch (lSeed.below(9)) {
            case 0: {
                const std::unique_lock lHold = lAlone();
                lIsOn = !lIsOn;
                if (lIsOn) {
                    startScope(lSeed.below(512));
                } else {
                    requestHex("02");
                }
                break;
            }
            case 1: {
                const std::unique_lock lHold = lAlone();
                lAdapters = lSeed.below(scBoards + 1);
                mLibrary.mNumberOfAdapters = lAdapters;
                retrieveInto(lDelivered);
                lIsFull = false;
                break;
            }
            case 2: {
                const std::unique_lock lHold = lAlone();
                if (lAdapters > 0 && !lIsFull) {
                    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
                    lIsFull = true;
                    ++lFillers;
                }
                break;
            }
            case 3:
            case 4: {
                const std::unique_lock lHold = lAlone();
                const unsigned lBoard = lSeed.below(scBoards + 1);
                lOwn.deliverPages(lBoard,
                                  lIsOn && mSystem->getTotalEventDataSize() < gcMaxScopeDataSize && lBoard < lAdapters);
                break;
            }
            case 5:
                lOwn.deliverWithoutMemory(lSeed.below(scBoards + 1));
                break;
            case 6: {
                // While the others deliver: of each row what is read is not less than before, nor out of balance.
                const ZTSStatusSnapshot lPage = page();
                std::uint64_t lNow = lPage.mUnknownBoards.getReceived();
                for (const ZTSStatusBoardCopy& lcrBoard : lPage.mBoards) {
                    for (const ZTSStatusRowCopy& lcrRow : lcrBoard.mRows) {
                        EXPECT_GE(lcrRow.mConsolidated, lcrRow.mHandedOver + lcrRow.mDropped);
                        lNow += lcrRow.getReceived();
                    }
                }
                EXPECT_LE(lLast, lNow);
                lLast = lNow;
                break;
            }
            default: {
                // A retrieval in the middle of the events.
                retrieveInto(lDelivered);
                const std::unique_lock lHold = lAlone();
                lIsFull = mSystem->getTotalEventDataSize() >= gcMaxScopeDataSize;
                break;
            }
        }
        std::this_thread::yield();
    }
    lIsToEnd = true;
    lThreads.join();
    // Each reason once at least, whatever the schedule was.
    mLibrary.mNumberOfAdapters = 0;
    retrieveInto(lDelivered);
    startScope();
    lOwn.deliverPages(0, false);
    mLibrary.mNumberOfAdapters = scBoards;
    retrieveInto(lDelivered);
    lOwn.deliverPages(0, true);
    lOwn.deliverPages(scBoards, false);
    for (unsigned lEvent = 0; lEvent < 100; ++lEvent) {
        lOwn.deliverWithoutMemory(0);
        lOwn.deliverOne();
    }
    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
    ++lFillers;
    lOwn.deliverPages(0, false);
    requestHex("02");
    lOwn.deliverPages(0, false);
    retrieveInto(lDelivered);

    const ZTSStatusSnapshot lPage = page();
    expectEquations(lPage);
    EXPECT_EQ(0u, lPage.getHeld());
    lSources.push_back(lOwn);
    std::array<std::uint64_t, gcStatusRefusals> lRefused = lPage.mUnknownBoards.mRefused;
    std::uint64_t lUnknown = 0;
    for (const ZTCCountedSource& lcrSource : lSources) {
        lUnknown += lcrSource.counts()[scBoards][0];
    }
    EXPECT_EQ(lUnknown, lPage.mUnknownBoards.getReceived());
    for (std::size_t lBoard = 0; lBoard < scBoards; ++lBoard) {
        for (std::size_t lRow = 0; lRow < gcStatusRowsPerBoard; ++lRow) {
            SCOPED_TRACE("board " + std::to_string(lBoard) + " " + getStatusRowName(lRow));
            const ZTSStatusRowCopy& lcrRow = lPage.mBoards[lBoard].mRows[lRow];
            std::uint64_t lSent = lBoard == 0 && lRow == gcStatusOtherRow ? lFillers : 0;
            for (const ZTCCountedSource& lcrSource : lSources) {
                lSent += lcrSource.counts()[lBoard][lRow];
            }
            EXPECT_EQ(lSent, lcrRow.getReceived());
            EXPECT_EQ(0u, lcrRow.mDropped);
            const auto lFound = lDelivered.find({lBoard, getStatusRowName(lRow)});
            EXPECT_EQ(lFound != lDelivered.end() ? lFound->second : 0, lcrRow.mHandedOver);
            for (std::size_t lReason = 0; lReason < gcStatusRefusals; ++lReason) {
                lRefused[lReason] += lcrRow.mRefused[lReason];
            }
        }
    }
    for (std::size_t lReason = 0; lReason < gcStatusRefusals; ++lReason) {
        EXPECT_LT(0u, lRefused[lReason]) << "the schedule never led to " << gcStatusRefusalNames[lReason];
    }
}

TEST_F(StatusPageConservation, AdaptersThatLeaveInAStormOfRscnsLeaveNoPageBehindAndEveryPageIsCounted) {
    collect(2);
    setLogCode(0);
    mLibrary.mNotesCounting = false;
    ZTCTestSeed lSeed;
    std::vector<std::uint32_t> lWords(400);
    for (std::uint32_t lWord = 0; lWord < lWords.size(); ++lWord) {
        lWords[lWord] = lWord;
    }
    const ZTCBytes lPayload = makeRscn(lWords);
    constexpr unsigned lcRscns = 300;
    ZTCTestThreads lThreads;
    lThreads.start(2, [&](unsigned aBoard) {
        for (unsigned lRscn = 0; lRscn < lcRscns; ++lRscn) {
            deliverRscn(aBoard, lPayload);
        }
    });
    std::uint64_t lDelivered = 0;
    const auto lRetrieve = [&] {
        for (const ZTSEncodedRecordList& lcrList : retrieve().mLists) {
            for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
                lDelivered += lcrRecord.mOccurrences;
            }
        }
    };
    while (lThreads.isRunning()) {
        mLibrary.mNumberOfAdapters = lSeed.below(3);
        lRetrieve();
    }
    lThreads.join();
    lRetrieve();

    const ZTSStatusSnapshot lPage = page();
    expectEquations(lPage);
    std::uint64_t lHandedOver = 0;
    for (unsigned lBoard = 0; lBoard < 2; ++lBoard) {
        const ZTSStatusRowCopy lRow = rowNamed(lPage.mBoards[lBoard], "rscn");
        EXPECT_EQ(0u, lRow.mDropped) << "a page was pending for a board whose list was gone";
        EXPECT_EQ(0u, lRow.getHeld());
        EXPECT_EQ(0u, lRow.mRefused[ZTSR_Failed]);
        // One that is refused before its pages are read counts as one; all others count by their pages.
        const std::uint64_t lPages = lRow.mConsolidated + lRow.mRefused[ZTSR_NoList] + lRow.mRefused[ZTSR_TotalLimit];
        EXPECT_EQ(lRow.getReceived(), lPages);
        EXPECT_LE(lcRscns, lPages);
        EXPECT_GE(std::uint64_t{lcRscns} * lWords.size(), lPages);
        EXPECT_EQ(0u, (std::uint64_t{lcRscns} * lWords.size() - lPages) % (lWords.size() - 1))
            << "an RSCN counts whole or as one";
        lHandedOver += lRow.mHandedOver;
    }
    EXPECT_EQ(lDelivered, lHandedOver);
    EXPECT_FALSE(mSystem->hasPendingRecord());
}
