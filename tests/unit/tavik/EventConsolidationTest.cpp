#include "tavik/include/EventConsolidation.h"

#include <gtest/gtest.h>

#include "common/include/Log.h"
#include "tavik/include/TavikCore.h"
#include "tests/unit/tavik/support/ConsolidationFixture.h"

namespace {

class EventConsolidation : public ZTCConsolidationFixture {};

std::string sLunRecordHex(const std::vector<unsigned>& acrBits) {
    return hexOf(bytesOf("01000000 500601603ba01234 00010000")) + bitFieldHex(acrBits);
}

std::string sCheckRecordHex(const std::string& acrLuns, const std::string& acrCommands, const std::string& acrAscqs) {
    return hexOf(bytesOf("01000000 500601603ba01234 06000000 29000000")) + "00010000" + acrLuns + "00010000" +
           acrCommands + "00010000" + acrAscqs;
}

}  // namespace

TEST_F(EventConsolidation, EveryKindMakesARecordOfItsBytesAfterItsNotice) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        mLog.forget();
        deliver(lcrKind);
        EXPECT_EQ(std::vector<std::string>{"-N- " + lcrKind.notice()}, mLog.texts());
        EXPECT_EQ(".//TavikCore", mLog.lines().at(0).mLabel);
        EXPECT_EQ(lcrKind.mRecordSize, mSystem->getTotalEventDataSize());
        EXPECT_EQ(std::vector<std::string>{textOf(lcrKind)}, retrieveTexts());
    }
}

TEST_F(EventConsolidation, EveryKindContinuesItsRecordInItsWay) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        deliver(lcrKind);
        deliver(lcrKind);
        deliver(lcrKind);
        EXPECT_EQ(lcrKind.mRecordSize + 2 * lcrKind.mAppendedSize, mSystem->getTotalEventDataSize());
        EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, 3)}, retrieveTexts());
    }
}

TEST_F(EventConsolidation, BytesBehindThePayloadAreNotRead) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        SCOPED_TRACE(lcrKind.mpName);
        ZTCBytes lLonger = lcrKind.mPayload;
        lLonger.insert(lLonger.end(), 100, 0xCC);
        deliver(lcrKind, lLonger);
        deliver(lcrKind);
        EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, 2)}, retrieveTexts());
    }
}

TEST_F(EventConsolidation, EveryPayloadByteStartsANewRecordExactlyWhereItBelongsToTheIdentity) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        for (std::size_t lByte = 0; lByte < lcrKind.mMinimumLength; ++lByte) {
            SCOPED_TRACE(std::string(lcrKind.mpName) + " byte " + std::to_string(lByte));
            ZTCBytes lChanged = lcrKind.mPayload;
            lChanged[lByte] ^= 0x41;
            deliver(lcrKind);
            deliver(lcrKind, lChanged);
            const ZTSScopeDataResponse lResponse = retrieve();
            const std::vector<ZTSEncodedRecord>& lcrRecords = lResponse.mLists.at(0).mRecords;
            if (lcrKind.isIdentityByte(lByte)) {
                ASSERT_EQ(2u, lcrRecords.size());
                EXPECT_EQ(1u, lcrRecords[1].mOccurrences);
                EXPECT_EQ(lcrKind.mRecordSize, lcrRecords[1].mData.size());
            } else {
                ASSERT_EQ(1u, lcrRecords.size());
                EXPECT_EQ(2u, lcrRecords[0].mOccurrences);
            }
        }
    }
}

TEST_F(EventConsolidation, AnIdentityThatComesBackStartsAThirdRecord) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        SCOPED_TRACE(lcrKind.mpName);
        deliver(lcrKind);
        deliver(lcrKind, otherPayload(lcrKind));
        deliver(lcrKind);
        deliver(lcrKind);
        EXPECT_EQ((std::vector<std::string>{textOf(lcrKind), otherTextOf(lcrKind), textOf(lcrKind, 2)}),
                  retrieveTexts());
    }
}

TEST_F(EventConsolidation, TheSameEventOnAnotherBoardInBetweenMakesThreeRecords) {
    collect(2);
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        deliver(lcrKind, 0u);
        deliver(lcrKind, 1u);
        deliver(lcrKind, 0u);
        const ZTSScopeDataResponse lResponse = retrieve();
        EXPECT_EQ((std::vector<std::string>{textOf(lcrKind), textOf(lcrKind)}), lResponse.texts(0));
        EXPECT_EQ(std::vector<std::string>{textOf(lcrKind)}, lResponse.texts(1));
    }
}

TEST_F(EventConsolidation, EveryOtherKindInBetweenStartsANewRecord) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        for (const ZTSDeliveredKind& lcrOther : allKinds()) {
            if (&lcrKind != &lcrOther) {
                SCOPED_TRACE(std::string(lcrKind.mpName) + " and " + lcrOther.mpName);
                deliver(lcrKind);
                deliver(lcrOther);
                deliver(lcrKind);
                ASSERT_EQ((std::vector<std::string>{textOf(lcrKind), textOf(lcrOther), textOf(lcrKind)}),
                          retrieveTexts());
            }
        }
    }
}

TEST_F(EventConsolidation, AnEventThatIsDroppedDoesNotInterruptARun) {
    collect();
    const ZTSDeliveredKind& lcrKind = kindNamed("plogi");
    deliver(lcrKind);
    deliver(lcrKind, ZTCBytes(19, 0));
    deliverScope(0, 1, 0x40, {});
    deliver(kindNamed("queue-full"), ZTCBytes(15, 0));
    deliverRscn(0, makeRscn({1}, 4));
    deliver(lcrKind);
    EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, 2)}, retrieveTexts());
}

TEST_F(EventConsolidation, AfterARetrievalTheSameEventStartsANewRecord) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        for (unsigned lRound = 0; lRound < 3; ++lRound) {
            deliver(lcrKind);
            EXPECT_EQ(std::vector<std::string>{textOf(lcrKind)}, retrieveTexts());
        }
    }
}

TEST_F(EventConsolidation, AppendingKindsAppendWhileTheRecordStaysStrictlyBelowTheLimit) {
    collect();
    setLogCode(0);
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        if (lcrKind.mOnMatch != ZTEOnMatch::Appends) {
            continue;
        }
        const auto lRecord = static_cast<unsigned>(lcrKind.mRecordSize);
        const auto lAppended = static_cast<unsigned>(lcrKind.mAppendedSize);
        for (const unsigned lLimit :
             {0u, 1u, lRecord, lRecord + lAppended - 1, lRecord + lAppended, lRecord + lAppended + 1,
              lRecord + 2 * lAppended, lRecord + 2 * lAppended + 1, lRecord + 3 * lAppended, 0xFFFFFFFFu}) {
            SCOPED_TRACE(std::string(lcrKind.mpName) + " limit " + std::to_string(lLimit));
            startScope(lLimit);
            std::vector<unsigned> lCounts;
            std::uint64_t lSize = 0;
            for (unsigned lEvent = 0; lEvent < 7; ++lEvent) {
                deliver(lcrKind);
                if (!lCounts.empty() && lSize + lAppended < lLimit) {
                    ++lCounts.back();
                    lSize += lAppended;
                } else {
                    lCounts.push_back(1);
                    lSize = lRecord;
                }
            }
            std::vector<std::string> lExpected;
            for (const unsigned lCount : lCounts) {
                lExpected.push_back(textOf(lcrKind, lCount));
            }
            const std::size_t lTotal = mSystem->getTotalEventDataSize();
            const ZTSScopeDataResponse lResponse = retrieve();
            EXPECT_EQ(lExpected, lResponse.texts());
            EXPECT_EQ(dataSizeOf(lResponse), lTotal);
        }
    }
}

TEST_F(EventConsolidation, OtherKindsGoOnWhateverTheLimit) {
    collect();
    startScope(0);
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        if (lcrKind.mOnMatch != ZTEOnMatch::Appends) {
            SCOPED_TRACE(lcrKind.mpName);
            deliver(lcrKind);
            deliver(lcrKind);
            EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, 2)}, retrieveTexts());
        }
    }
}

TEST_F(EventConsolidation, AnAppendedPartHoldsWhatIsNewInItsEvent) {
    collect();
    const auto lDeliver = [](const char* apKind, const std::vector<std::uint32_t>& acrNumbers) {
        deliver(kindNamed(apKind), makePortPayload(gcKindPort, acrNumbers));
    };
    const std::string lHead = hexOf(bytesOf("01000000 500601603ba01234"));
    lDeliver("lsrjt", {3, 9, 0x29});
    lDeliver("lsrjt", {3, 0xA, 0x2A});
    lDeliver("fcp-read-check", {7, 0x28, 1});
    lDeliver("fcp-read-check", {7, 0x28, 2});
    lDeliver("lun-reset", {5});
    lDeliver("lun-reset", {6});
    lDeliver("target-reset", {7});
    lDeliver("target-reset", {8});
    lDeliver("queue-depth", {5, 32, 16});
    lDeliver("queue-depth", {6, 64, 48});
    EXPECT_EQ(
        (std::vector<std::string>{"1/8 x2 " + lHead + hexOf(bytesOf("03000000 09000000 29000000 0a000000 2a000000")),
                                  "2/4 x2 " + lHead + hexOf(bytesOf("28000000 07000000 01000000 02000000")),
                                  "4/8 x2 " + lHead + hexOf(bytesOf("05000000 06000000")),
                                  "4/16 x2 " + lHead + hexOf(bytesOf("07000000 08000000")),
                                  "4/64 x2 " + lHead + hexOf(bytesOf("05000000 10000000 06000000 30000000"))}),
        retrieveTexts());
}

TEST_F(EventConsolidation, LunBitsAreSetUpTo255AndAllAtOnceForEveryLun) {
    collect();
    struct ZTSLunCase {
        std::vector<std::uint32_t> mLuns;
        std::string mFieldHex;
    };
    const ZTSLunCase lCases[] = {
        {{3, 9}, bitFieldHex({3, 9})},
        {{0, 255, 7, 8}, bitFieldHex({0, 7, 8, 255})},
        {{3, 3, 3}, bitFieldHex({3})},
        {{3, 256, 300, 0xFFFFFFFE}, bitFieldHex({3})},
        {{256}, bitFieldHex({})},
        {{300}, bitFieldHex({})},
        {{0xFFFFFFFE, 4}, bitFieldHex({4})},
        {{0xFFFFFFFF}, std::string(64, 'f')},
        {{0xFFFFFFFF, 3}, std::string(64, 'f')},
        {{3, 0xFFFFFFFF}, std::string(64, 'f')},
    };
    for (const ZTSLunCase& lcrCase : lCases) {
        SCOPED_TRACE(testing::PrintToString(lcrCase.mLuns));
        const auto lCount = static_cast<unsigned>(lcrCase.mLuns.size());
        for (const char* lpName : {"queue-full", "device-busy"}) {
            const ZTSDeliveredKind& lcrKind = kindNamed(lpName);
            for (const std::uint32_t lLun : lcrCase.mLuns) {
                deliver(lcrKind, makePortPayload(gcKindPort, {lLun}));
            }
            EXPECT_EQ(48u, mSystem->getTotalEventDataSize());
            EXPECT_EQ(
                std::vector<std::string>{textOf(lcrKind, lCount, sLunRecordHex({}).substr(0, 32) + lcrCase.mFieldHex)},
                retrieveTexts());
        }
        const ZTSDeliveredKind& lcrCheck = kindNamed("check-condition");
        for (const std::uint32_t lLun : lcrCase.mLuns) {
            deliver(lcrCheck, makePortPayload(gcKindPort, {lLun, 1, 6, 0x29, 2}));
        }
        EXPECT_EQ(128u, mSystem->getTotalEventDataSize());
        EXPECT_EQ(std::vector<std::string>{textOf(
                      lcrCheck, lCount, sCheckRecordHex(lcrCase.mFieldHex, bitFieldHex({1}), bitFieldHex({2})))},
                  retrieveTexts());
    }
}

TEST_F(EventConsolidation, CommandCodeAndAscqBitsAreSetBelow256AndNeverAllAtOnce) {
    collect();
    const ZTSDeliveredKind& lcrKind = kindNamed("check-condition");
    for (const std::uint32_t lNumber : {0u, 1u, 7u, 8u, 254u, 255u, 256u, 257u, 300u, 0xFFFFFFFEu, 0xFFFFFFFFu}) {
        SCOPED_TRACE(lNumber);
        const std::vector<unsigned> lBit = lNumber < 256 ? std::vector<unsigned>{lNumber} : std::vector<unsigned>{};
        std::vector<unsigned> lCommands = lBit;
        std::vector<unsigned> lAscqs = lBit;
        lCommands.push_back(0x10);
        lAscqs.push_back(0x20);
        // Once as the first event of a record, and once as one that continues it.
        deliver(lcrKind, makePortPayload(gcKindPort, {9, lNumber, 6, 0x29, lNumber}));
        deliver(lcrKind, makePortPayload(gcKindPort, {9, 0x10, 6, 0x29, 0x20}));
        const std::string lExpected =
            textOf(lcrKind, 2, sCheckRecordHex(bitFieldHex({9}), bitFieldHex(lCommands), bitFieldHex(lAscqs)));
        EXPECT_EQ(std::vector<std::string>{lExpected}, retrieveTexts());
        deliver(lcrKind, makePortPayload(gcKindPort, {9, 0x10, 6, 0x29, 0x20}));
        deliver(lcrKind, makePortPayload(gcKindPort, {9, lNumber, 6, 0x29, lNumber}));
        EXPECT_EQ(std::vector<std::string>{lExpected}, retrieveTexts());
    }
}

TEST_F(EventConsolidation, ARecordGetsTheNamesOfTheTargetThatIsItsRemotePort) {
    collect();
    const ZTSWwn lNode = makeWwn(0x2000000000000077);
    ASSERT_EQ(gcSuccessHex, registerTargets({{lNode, makeWwn(gcKindPort), 0x010203}}));
    const std::string lNames = "names " + wwnText(makeWwn(gcKindPort)) + " " + wwnText(lNode) + " ";
    for (const ZTSDeliveredKind& lcrKind : allKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        deliver(lcrKind);
        std::string lExpected = textOf(lcrKind);
        if (lcrKind.mMinimumLength != 0) {
            lExpected.insert(lExpected.find(' ', lExpected.find('x')) + 1, lNames);
        }
        EXPECT_EQ(std::vector<std::string>{lExpected}, retrieveTexts());
        if (lcrKind.mMinimumLength != 0) {
            deliver(lcrKind, otherPayload(lcrKind));
            EXPECT_EQ(std::vector<std::string>{otherTextOf(lcrKind)}, retrieveTexts());
        }
    }
}

TEST_F(EventConsolidation, ATargetIsFoundByThePortAndNotByTheNode) {
    collect();
    ASSERT_EQ(gcSuccessHex, registerTargets({{makeWwn(gcKindPort), makeWwn(gcKindNode), 0x010203}}));
    deliver(kindNamed("plogi"));
    EXPECT_EQ(std::vector<std::string>{textOf(kindNamed("plogi"))}, retrieveTexts());
}

TEST_F(EventConsolidation, ATargetThatIsRegisteredLaterNamesTheNextRecord) {
    collect();
    const ZTSDeliveredKind& lcrKind = kindNamed("prlo");
    deliver(lcrKind);
    ASSERT_EQ(gcSuccessHex, registerTargets({{makeWwn(7), makeWwn(gcKindPort), 1}}));
    deliver(lcrKind);
    EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, 2)}, retrieveTexts());
    deliver(lcrKind);
    EXPECT_EQ(
        std::vector<std::string>{"1/2 x1 names 50:06:01:60:3b:a0:12:34 00:00:00:00:00:00:00:07 " + lcrKind.mRecordHex},
        retrieveTexts());
}

TEST_F(EventConsolidation, ARecordsTimesSpanItsEvents) {
    collect();
    deliver(kindNamed("prlo"));
    deliver(kindNamed("prlo"));
    deliver(kindNamed("plogi"));
    const std::vector<ZTSEncodedRecord> lRecords = retrieve().mLists.at(0).mRecords;
    ASSERT_EQ(2u, lRecords.size());
    EXPECT_LE(lRecords[0].mBegin.total(), lRecords[0].mEnd.total());
    EXPECT_LE(lRecords[0].mEnd.total(), lRecords[1].mBegin.total());
}
