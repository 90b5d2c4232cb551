// All bytes here are built by hand (KernelBytes.h).
#include "libkpm/linux/src/FcMessage.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/unit/linux/KernelBytes.h"

/// "HOST/NUMBER/CODE/BYTES" of all events, and how many messages did not parse.
static std::string sRead(const ZTCBytes& acrDatagram, std::endian aOrder = std::endian::native) {
    ZTCLinuxFcMessages lMessages(acrDatagram, aOrder);
    std::string lText;
    while (const auto lEvent = lMessages.next()) {
        lText += std::to_string(lEvent->mHost) + "/" + std::to_string(lEvent->mNumber) + "/" +
                 std::to_string(lEvent->mCode) + "/" + std::to_string(lEvent->mData.size()) + " ";
    }
    return lText + "malformed=" + std::to_string(lMessages.getMalformed());
}

static void sSet(ZTCBytes& arBytes, std::size_t aOffset, std::uint64_t aNumber, std::size_t aSize) {
    ZTCBytes lNumber;
    putNumber(lNumber, aNumber, aSize);
    std::copy(lNumber.begin(), lNumber.end(), arBytes.begin() + static_cast<std::ptrdiff_t>(aOffset));
}

TEST(FcMessage, TheUsualMessageHas56BytesAndIsReadInFull) {
    const ZTCBytes lMessage = ZTSFcMessage{.mHost = 7, .mNumber = 0xFFFFFFFF, .mCode = ZTLFC_LinkDown}.make();
    EXPECT_EQ(lMessage.size(), 56u);
    EXPECT_EQ(sRead(lMessage), "7/4294967295/3/4 malformed=0");
}

TEST(FcMessage, BothByteOrdersAreRead) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        const ZTCBytes lMessage =
            ZTSFcMessage{
                .mHost = 0x0102, .mNumber = 0x03040506, .mCode = 0x203, .mData = {1, 2, 3, 4, 5}, .mOrder = lOrder}
                .make();
        EXPECT_EQ(sRead(lMessage, lOrder), "258/50595078/515/5 malformed=0");
    }
}

TEST(FcMessage, LongerDataAreTakenWhole) {
    const ZTCBytes lMessage = ZTSFcMessage{.mCode = 0x500, .mData = ZTCBytes(65535, 0xAB)}.make();
    EXPECT_LE(lMessage.size(), gcMostFcMessageBytes);
    EXPECT_EQ(sRead(lMessage), "0/1/1280/65535 malformed=0");
}

TEST(FcMessage, SeveralMessagesInADatagramAreAllRead) {
    ZTCBytes lDatagram;
    for (std::uint32_t lNumber = 1; lNumber <= 3; ++lNumber) {
        const ZTCBytes lMessage = ZTSFcMessage{.mNumber = lNumber}.make();
        lDatagram.insert(lDatagram.end(), lMessage.begin(), lMessage.end());
    }
    EXPECT_EQ(sRead(lDatagram), "0/1/1/4 0/2/1/4 0/3/1/4 malformed=0");
}

TEST(FcMessage, CutAnywhereAMessageIsMalformedAndNeverReadPast) {
    const ZTCBytes lMessage = ZTSFcMessage{}.make();
    for (std::size_t lSize = 1; lSize < lMessage.size(); ++lSize) {
        const ZTCBytes lCut(lMessage.begin(), lMessage.begin() + static_cast<std::ptrdiff_t>(lSize));
        EXPECT_EQ(sRead(lCut), "malformed=1") << lSize;
    }
    EXPECT_EQ(sRead({}), "malformed=0");
}

TEST(FcMessage, CutAnywhereWithALengthThatFitsItIsMalformedUntilItsDataAreWhole) {
    const ZTCBytes lMessage = ZTSFcMessage{}.make();
    for (std::size_t lSize = 16; lSize < lMessage.size(); ++lSize) {
        ZTCBytes lCut(lMessage.begin(), lMessage.begin() + static_cast<std::ptrdiff_t>(lSize));
        sSet(lCut, 0, lSize, 4);
        EXPECT_EQ(sRead(lCut), "malformed=1") << lSize;
    }
}

TEST(FcMessage, OneWrongFieldIsMalformedAndTheNextMessageIsServed) {
    struct Row {
        std::size_t mOffset;
        std::size_t mSize;
        std::uint64_t mValue;
    };
    // Version, magic, and a length of the data past the end.
    for (const Row& lrRow : {Row{16, 1, 2}, Row{18, 2, 0xB2A1}, Row{42, 2, 5}, Row{42, 2, 0xFFFF}}) {
        ZTCBytes lDatagram = ZTSFcMessage{}.make();
        sSet(lDatagram, lrRow.mOffset, lrRow.mValue, lrRow.mSize);
        const ZTCBytes lGood = ZTSFcMessage{.mNumber = 2}.make();
        lDatagram.insert(lDatagram.end(), lGood.begin(), lGood.end());
        EXPECT_EQ(sRead(lDatagram), "0/2/1/4 malformed=1") << lrRow.mOffset;
    }
}

TEST(FcMessage, WhatIsNoFcEventIsPassedOverInSilence) {
    struct Row {
        std::size_t mOffset;
        std::size_t mSize;
        std::uint64_t mValue;
    };
    // Another netlink type, another transport, another kind.
    for (const Row& lrRow : {Row{4, 2, 3}, Row{17, 1, 0}, Row{20, 2, 0x101}}) {
        ZTCBytes lMessage = ZTSFcMessage{}.make();
        sSet(lMessage, lrRow.mOffset, lrRow.mValue, lrRow.mSize);
        EXPECT_EQ(sRead(lMessage), "malformed=0") << lrRow.mOffset;
    }
}

TEST(FcMessage, ALengthThatLeadsNowhereEndsTheDatagram) {
    for (const std::uint64_t lLength : {0u, 1u, 15u, 57u, 0xFFFFFFFFu}) {
        ZTCBytes lMessage = ZTSFcMessage{}.make();
        sSet(lMessage, 0, lLength, 4);
        EXPECT_EQ(sRead(lMessage), "malformed=1") << lLength;
    }
}

TEST(FcMessage, AnRscnIsMadeAsOnTheWire) {
    for (const std::endian lOrder : {std::endian::little, std::endian::big}) {
        EXPECT_EQ(makeLinuxRscn(rscnData(0x00010203, lOrder), lOrder),
                  (ZTCBytes{0x61, 4, 0, 8, 0x00, 0x01, 0x02, 0x03}));
    }
    ZTCBytes lTwo = rscnData(0x03000000);
    putNumber(lTwo, 0x010A0B00, 4);
    EXPECT_EQ(makeLinuxRscn(lTwo), (ZTCBytes{0x61, 4, 0, 12, 3, 0, 0, 0, 1, 0x0A, 0x0B, 0}));
}

TEST(FcMessage, AnRscnWithoutWholePagesIsNone) {
    for (const std::size_t lSize : {0u, 1u, 3u, 5u, 7u, 65532u, 65535u}) {
        EXPECT_FALSE(makeLinuxRscn(ZTCBytes(lSize)).has_value()) << lSize;
    }
    EXPECT_EQ(makeLinuxRscn(ZTCBytes(65528)).value().size(), 65532u);
}
