#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class ScopeDataRetrieval : public ZTCTavikFixture {
protected:
    static void deliver(const ZTSDeliveredKind& acrKind, unsigned aBoard = 0) {
        deliverScope(aBoard, acrKind.mCategory, acrKind.mSubcategory, acrKind.mPayload);
    }

    static std::string textOf(const ZTSDeliveredKind& acrKind, unsigned aCount = 1) {
        std::string lText = std::to_string(acrKind.mCategory) + "/" + std::to_string(acrKind.mSubcategory) + " x" +
                            std::to_string(aCount) + " " + acrKind.mRecordHex;
        for (unsigned lEvent = 1; lEvent < aCount; ++lEvent) {
            lText += acrKind.mAppendedHex;
        }
        return lText;
    }

    /// The key under which a board's list is delivered.
    static std::string keyOf(unsigned aBoard) {
        return wwnText(ZTCAdaptersLibraryDouble::nodeName(aBoard)) + "." +
               wwnText(ZTCAdaptersLibraryDouble::portName(aBoard));
    }
    static ZTCByteWriter& writeKey(ZTCByteWriter& arWriter, unsigned aBoard) {
        const std::string lKey = keyOf(aBoard);
        return arWriter.u32(lKey.size()).raw(ZTCBytes(lKey.begin(), lKey.end()));
    }

    static std::vector<std::string> keysOf(const ZTSScopeDataResponse& acrResponse) {
        std::vector<std::string> lKeys;
        for (const ZTSEncodedRecordList& lcrList : acrResponse.mLists) {
            lKeys.push_back(lcrList.mInitiatorKey);
        }
        return lKeys;
    }

    static std::string listText(unsigned aRecords) {
        return "-N- Wrote <" + std::to_string(aRecords) + "> Scope records from record-list";
    }
    static std::string totalText(unsigned aRecords) {
        return "-N- Wrote total <" + std::to_string(aRecords) + "> Scope Events";
    }
    static std::string badBoardText(unsigned aBoard) {
        return "-E- Bad boardid " + std::to_string(aBoard) + " detected during handle GetScopeDataCommand command";
    }
};

}  // namespace

TEST_F(ScopeDataRetrieval, EmptyListsAreTheirKeysAndZeroes) {
    bringUp(3);
    ZTCByteWriter lExpected;
    lExpected.u8(2).u32(3);
    for (unsigned lBoard = 0; lBoard < 3; ++lBoard) {
        writeKey(lExpected, lBoard).u32(0);
    }
    EXPECT_EQ(lExpected.hex(), requestHex("01"));
    EXPECT_EQ((std::vector<std::string>{listText(0), listText(0), listText(0), totalText(0)}), mLog.texts());
    EXPECT_EQ(lExpected.hex(), requestHex("01 ff 00")) << "what follows the code is ignored";
}

TEST_F(ScopeDataRetrieval, EveryByteOfARecordHasItsPlace) {
    collect(1);
    const ZTSWwn lNode = makeWwn(0x2000000000000077);
    registerTargets({{lNode, makeWwn(gcKindPort), 1}});
    const ZTSDeliveredKind& lcrKind = kindNamed("lsrjt");
    deliver(lcrKind);
    deliver(lcrKind);
    deliver(kindNamed("bus-reset"));
    const std::string lResponse = requestHex("01");

    ZTCByteWriter lHead;
    lHead.u8(2).u32(1);
    writeKey(lHead, 0).u32(2).u32(2);
    ASSERT_EQ(lHead.hex(), lResponse.substr(0, lHead.hex().size()));
    const std::string lFirstRest = ZTCByteWriter()
                                       .u8(1)
                                       .u8(8)
                                       .u8(1)
                                       .wwn(makeWwn(gcKindPort))
                                       .wwn(lNode)
                                       .u32(32)
                                       .raw(bytesOf(lcrKind.mRecordHex + lcrKind.mAppendedHex))
                                       .hex();
    const std::size_t lcTimes = 2 * 2 * 20;  // hex digits of two date-times
    std::size_t lPosition = lHead.hex().size() + lcTimes;
    ASSERT_EQ(lFirstRest, lResponse.substr(lPosition, lFirstRest.size()));
    lPosition += lFirstRest.size();
    ASSERT_EQ("00000001", lResponse.substr(lPosition, 8));
    lPosition += 8 + lcTimes;
    EXPECT_EQ(
        "04"
        "20"
        "00"
        "00000004"
        "01000000",
        lResponse.substr(lPosition));
}

TEST_F(ScopeDataRetrieval, RecordsOfInterleavedBoardsComeInTheirOwnListsInOrder) {
    collect(3);
    std::vector<std::vector<std::string>> lExpected(3);
    unsigned lNext = 0;
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        for (const unsigned lBoard : {lNext % 3, (lNext + 1) % 3, lNext % 3}) {
            deliver(lcrKind, lBoard);
            lExpected[lBoard].push_back(textOf(lcrKind));
        }
        // Now the last one goes on.
        deliver(lcrKind, lNext % 3);
        lExpected[lNext % 3].back() = textOf(lcrKind, 2);
        ++lNext;
    }
    const ZTSScopeDataResponse lResponse = retrieve();
    EXPECT_EQ(3u, lResponse.mListCount);
    EXPECT_EQ((std::vector<std::string>{keyOf(0), keyOf(1), keyOf(2)}), keysOf(lResponse));
    std::vector<std::string> lTexts;
    unsigned lTotal = 0;
    for (unsigned lBoard = 0; lBoard < 3; ++lBoard) {
        EXPECT_EQ(lExpected[lBoard], lResponse.texts(lBoard));
        const auto lSize = static_cast<unsigned>(lExpected[lBoard].size());
        lTexts.push_back(listText(lSize));
        lTotal += lSize;
    }
    lTexts.push_back(totalText(lTotal));
    EXPECT_EQ(lTexts, mLog.texts("", ".//TavikProtocolHandler"));
}

TEST_F(ScopeDataRetrieval, ThePendingRecordIsPartOfItAndNothingIsPendingBehindIt) {
    collect(2);
    deliver(kindNamed("queue-full"), 1);
    EXPECT_EQ(0u, mSystem->recordListSize(1));
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("queue-full"))}, retrieve().texts(1));
    EXPECT_FALSE(mSystem->hasPendingRecord());
    EXPECT_EQ(0u, mSystem->recordListSize(1));
    EXPECT_TRUE(retrieve().texts(1).empty()) << "nothing is delivered twice";
}

TEST_F(ScopeDataRetrieval, TheRunningTotalBeginsAnew) {
    collect();
    for (unsigned lRound = 0; lRound < 3; ++lRound) {
        for (const ZTSDeliveredKind& lcrKind : allKinds()) {
            deliver(lcrKind);
        }
        EXPECT_NE(0u, mSystem->getTotalEventDataSize());
        retrieve();
        EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
    }
}

TEST_F(ScopeDataRetrieval, WorksWithCollectionOffAndBeforeTheFirstStart) {
    bringUp();
    EXPECT_EQ(std::vector<std::string>{}, retrieveTexts());
    startScope();
    deliver(kindNamed("prlo"));
    requestHex("02");
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("prlo"))}, retrieveTexts());
    EXPECT_FALSE(mDoScopeCollection);
}

TEST_F(ScopeDataRetrieval, AListWithoutItsInitiatorIsCountedReportedAndDropped) {
    collect(2);
    mSystem->exchangeRecordLists(4);
    mSystem->makePendingRecord(3, 8);
    mSystem->makePendingRecord(2, 8);
    mSystem->makePendingRecord(1, 4);
    const ZTSScopeDataResponse lResponse = retrieve();
    EXPECT_EQ(4u, lResponse.mListCount);
    EXPECT_EQ((std::vector<std::string>{keyOf(0), keyOf(1)}), keysOf(lResponse));
    EXPECT_EQ(std::vector<std::string>{"238/238 x1 eeeeeeee"}, lResponse.texts(1));
    EXPECT_EQ((std::vector<std::string>{listText(0), listText(1), badBoardText(2), badBoardText(3), totalText(1)}),
              mLog.texts("", ".//TavikProtocolHandler"));
    EXPECT_EQ(0u, mSystem->getTotalEventDataSize());
    EXPECT_EQ(2u, retrieve().mListCount) << "the lists are those of the adapters again";
}

TEST_F(ScopeDataRetrieval, ABoardThatHasLostItsListIsNotDeliveredAndItsPendingRecordIsReported) {
    collect(2);
    deliver(kindNamed("plogi"), 1);
    mSystem->exchangeRecordLists(1);
    mLog.forget();
    const ZTSScopeDataResponse lResponse = retrieve();
    EXPECT_EQ(1u, lResponse.mListCount);
    EXPECT_EQ(std::vector<std::string>{keyOf(0)}, keysOf(lResponse));
    EXPECT_TRUE(lResponse.texts(0).empty());
    EXPECT_EQ((std::vector<std::string>{
                  "-E- Dropping the pending scope record of board 1: the board has no record list any more",
                  listText(0), totalText(0)}),
              mLog.texts());
    deliver(kindNamed("plogi"), 1);
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("plogi"))}, retrieve().texts(1));
}

TEST_F(ScopeDataRetrieval, AdaptersAreCountedAnewEachTime) {
    collect(2);
    struct ZTSStep {
        unsigned mAdapters;  ///< from now on
        unsigned mLists;     ///< in this response
        unsigned mDelivered;
    };
    // A retrieval delivers the lists that its forerunner made; a board that was not there at start has no initiator.
    for (const ZTSStep& lcrStep :
         std::initializer_list<ZTSStep>{{1, 2, 2}, {1, 1, 1}, {5, 1, 1}, {0, 5, 2}, {0, 0, 0}, {2, 0, 0}, {2, 2, 2}}) {
        mLibrary.mNumberOfAdapters = lcrStep.mAdapters;
        mLibrary.forgetCalls();
        mLog.forget();
        const ZTSScopeDataResponse lResponse = retrieve();
        EXPECT_EQ(lcrStep.mLists, lResponse.mListCount);
        EXPECT_EQ(lcrStep.mDelivered, lResponse.mLists.size());
        EXPECT_EQ(std::vector<std::string>{"GetNumberOfAdapters"}, mLibrary.calls());
        std::vector<std::string> lTexts(lcrStep.mDelivered, listText(0));
        for (unsigned lBoard = lcrStep.mDelivered; lBoard < lcrStep.mLists; ++lBoard) {
            lTexts.push_back(badBoardText(lBoard));
        }
        lTexts.push_back(totalText(0));
        EXPECT_EQ(lTexts, mLog.texts());
        for (unsigned lBoard = 0; lBoard < 6; ++lBoard) {
            EXPECT_EQ(lBoard < lcrStep.mAdapters, mSystem->hasRecordList(lBoard));
        }
    }
}

TEST_F(ScopeDataRetrieval, EventsOfABoardThatHasComeBackAreDeliveredAgain) {
    collect(2);
    mLibrary.mNumberOfAdapters = 1;
    deliver(kindNamed("prlo"), 1);
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("prlo"))}, retrieve().texts(1));
    deliver(kindNamed("prlo"), 1);  // dropped: no list
    mLibrary.mNumberOfAdapters = 2;
    EXPECT_EQ(1u, retrieve().mLists.size());
    deliver(kindNamed("prlo"), 1);
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("prlo"))}, retrieve().texts(1));
}

TEST_F(ScopeDataRetrieval, TheLibraryIsAskedWithoutTheRecordLockAndEventsThatComeMeanwhileAreDelivered) {
    collect(2);
    // The holder of the lock cannot take it again.
    mLibrary.mBeforeCounted = [] { deliver(kindNamed("prlo"), 1); };
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("prlo"))}, retrieve().texts(1));
}

TEST_F(ScopeDataRetrieval, AFailedAllocationDeliversNothingTwice) {
    const ZTCPointer<ZTCBuffer> lRequest = makeBuffer({1});
    unsigned lFailures = 0;
    unsigned lKept = 0;
    collect(2);
    mLibrary.mNotesCounting = false;
    setLogCode(0);
    for (bool lFailed = true; lFailed;) {
        SCOPED_TRACE(lFailures);
        deliver(kindNamed("lsrjt"), 0);
        deliver(kindNamed("lsrjt"), 1);
        deliver(kindNamed("queue-full"), 1);
        const unsigned lTotal = mSystem->getTotalEventDataSize();
        ZTCPointer<ZTCBuffer> lResponse;
        bool lHasThrown = false;
        lFailed = failAllocation(lFailures + 1, [&] {
            try {
                mSystem->getProtocolHandler()->process(lRequest, lResponse);
            } catch (const ZTCNoMemoryEx&) {
                lHasThrown = true;
            }
        });
        EXPECT_EQ(lFailed, lHasThrown);
        EXPECT_EQ(!lFailed, lResponse != nullptr);
        // All or nothing: before the exchange everything is still held, after it nothing is.
        const bool lIsKept = mSystem->getTotalEventDataSize() == lTotal;
        EXPECT_TRUE(lIsKept || mSystem->getTotalEventDataSize() == 0);
        const ZTSScopeDataResponse lNext = retrieve();
        EXPECT_EQ(lIsKept ? 2u : 0u, lNext.occurrences(1, 8));
        EXPECT_EQ(lIsKept ? 1u : 0u, lNext.occurrences(4, 1));
        lFailures += lFailed ? 1 : 0;
        lKept += lIsKept ? 1 : 0;
    }
    EXPECT_LT(0u, lKept);
    EXPECT_LT(lKept, lFailures);
}

TEST_F(ScopeDataRetrieval, ALargeResponseGrowsBeyondItsFirstCapacity) {
    collect(1, 0);
    setLogCode(0);
    const ZTSDeliveredKind& lcrKind = kindNamed("lun-reset");
    for (unsigned lEvent = 0; lEvent < 5000; ++lEvent) {
        deliver(lcrKind);  // with a limit of 0 every one is a record
    }
    EXPECT_EQ(std::vector<std::string>(5000, textOf(lcrKind)), retrieveTexts());
}

TEST_F(ScopeDataRetrieval, AHandlerWithAnotherCodeEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            bringUp();
            ZTCPointer<ZTCBuffer> lResponse;
            mSystem->getProtocolHandler()->handleGetScopeDataCommand(makeBuffer({0}), lResponse);
        },
        testing::ExitedWithCode(1), failedAssertion("lType == ZTSTVKC_GetScopeData"));
}
