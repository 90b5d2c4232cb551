#include "common/include/EncodableStream.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "tests/support/FailingAllocation.h"

namespace {

std::vector<unsigned> sBytes(const ZTCEncodableOutStream& acrStream) {
    const ZTCPointer<ZTCBuffer> lBuffer = acrStream.getBuffer();
    return {lBuffer->getData(), lBuffer->getData() + lBuffer->getSize()};
}

ZTCPointer<ZTCBuffer> sBuffer(const std::string& acrBytes) {
    ZTCPointer<ZTCBuffer> lBuffer(NEW ZTCBuffer);
    lBuffer->append(acrBytes.data(), static_cast<Size>(acrBytes.size()));
    return lBuffer;
}

/// Whether reading a T from fewer bytes than it has throws the one exception, reads nothing and changes nothing.
template <typename T>
void sExpectRefusedBelow(Size aWidth) {
    for (Size lHad = 0; lHad < aWidth; ++lHad) {
        ZTCEncodableInStream lStream(sBuffer(std::string(lHad, '\x5a')));
        T lValue = 77;
        try {
            lStream >> lValue;
            ADD_FAILURE() << "nothing thrown with " << lHad << " of " << aWidth << " bytes";
        } catch (const ZTCInvalidEx& lrException) {
            EXPECT_STREQ("Not enough data in stream", lrException.what());
            EXPECT_EQ(6u, lrException.getError());
        }
        EXPECT_EQ(T{77}, lValue);
        EXPECT_EQ(lHad, lStream.remaining());
    }
}

template <typename T>
concept Writable = requires(ZTCEncodableOutStream& arStream, T aValue) {
    arStream << aValue;
};

enum class ZTESample { One };

}  // namespace

TEST(EncodableOutStream, WritesNumbersInNetworkOrderBackToBack) {
    ZTCEncodableOutStream lStream(4);
    lStream << static_cast<unsigned char>(0x01) << static_cast<unsigned short>(0x0203) << 0x04050607u
            << std::uint64_t{0x08090a0b0c0d0e0f} << -2 << -3L;
    EXPECT_EQ((std::vector<unsigned>{0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08, 0x09, 0x0a, 0x0b, 0x0c, 0x0d, 0x0e,
                                     0x0f, 0xff, 0xff, 0xff, 0xfe, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xfd}),
              sBytes(lStream));
}

TEST(EncodableOutStream, WritesAStringAsItsCountAndItsBytes) {
    ZTCEncodableOutStream lStream;
    lStream << ZTCString("ab\0c", 4) << ZTCString("");
    EXPECT_EQ((std::vector<unsigned>{0, 0, 0, 4, 'a', 'b', 0, 'c', 0, 0, 0, 0}), sBytes(lStream));
}

TEST(EncodableOutStream, WritesBytesAsTheyAre) {
    ZTCEncodableOutStream lStream;
    lStream.writeBytes("\x01\xff", 2).writeBytes(nullptr, 0);
    EXPECT_EQ((std::vector<unsigned>{1, 255}), sBytes(lStream));
}

TEST(EncodableOutStream, SharesItsBuffer) {
    ZTCEncodableOutStream lStream;
    const ZTCPointer<ZTCBuffer> lBuffer = lStream.getBuffer();
    lStream << 1u;
    EXPECT_EQ(4u, lBuffer->getSize());
}

TEST(EncodableOutStream, TakesOnlyTypesWithAWidthOnTheWire) {
    EXPECT_TRUE(Writable<unsigned char>);
    EXPECT_TRUE(Writable<unsigned short>);
    EXPECT_TRUE(Writable<std::uint32_t>);
    EXPECT_TRUE(Writable<std::uint64_t>);
    EXPECT_TRUE(Writable<std::int32_t>);
    EXPECT_TRUE(Writable<std::int64_t>);
    EXPECT_TRUE(Writable<ZTCString>);
    EXPECT_FALSE(Writable<bool>);
    EXPECT_FALSE(Writable<char>);
    EXPECT_FALSE(Writable<short>);
    EXPECT_FALSE(Writable<double>);
    EXPECT_FALSE(Writable<const char*>);
    EXPECT_FALSE(Writable<ZTESample>);
}

TEST(EncodableOutStream, AFailedAllocationLeavesNoPartOfAField) {
    const ZTCString lText(std::string(500, 'x').c_str());
    const unsigned lFailures = failEachAllocation(
        [&lText] {
            try {
                ZTCEncodableOutStream lStream(6);
                lStream << static_cast<unsigned short>(1);
                const ZTCPointer<ZTCBuffer> lBuffer = lStream.getBuffer();
                try {
                    lStream << lText;
                } catch (const ZTCNoMemoryEx&) {
                    EXPECT_EQ(2u, lBuffer->getSize());
                    throw;
                }
                EXPECT_EQ(506u, lBuffer->getSize());
            } catch (const ZTCNoMemoryEx&) {
            }
        },
        [] {});
    EXPECT_EQ(4u, lFailures) << "buffer, its bytes, its count, its growth";
}

TEST(EncodableInStream, ReadsWhatWasWritten) {
    ZTCEncodableOutStream lOut;
    lOut << static_cast<unsigned char>(200) << static_cast<unsigned short>(60000) << 4000000000u
         << std::numeric_limits<unsigned long>::max() << std::numeric_limits<int>::min()
         << std::numeric_limits<long>::min() << ZTCString("text\0more", 9);
    lOut.writeBytes("xyz", 3);

    ZTCEncodableInStream lIn(lOut.getBuffer());
    unsigned char lByte = 0;
    unsigned short lShort = 0;
    unsigned lUnsigned = 0;
    unsigned long lUnsignedLong = 0;
    int lInt = 0;
    long lLong = 0;
    ZTCString lText;
    char lBytes[3];
    lIn >> lByte >> lShort >> lUnsigned >> lUnsignedLong >> lInt >> lLong >> lText;
    EXPECT_EQ(3u, lIn.remaining());
    lIn.readBytes(lBytes, 3).readBytes(nullptr, 0);

    EXPECT_EQ(200, lByte);
    EXPECT_EQ(60000, lShort);
    EXPECT_EQ(4000000000u, lUnsigned);
    EXPECT_EQ(std::numeric_limits<unsigned long>::max(), lUnsignedLong);
    EXPECT_EQ(std::numeric_limits<int>::min(), lInt);
    EXPECT_EQ(std::numeric_limits<long>::min(), lLong);
    EXPECT_EQ(9u, lText.length());
    EXPECT_EQ(0, std::memcmp("text\0more", lText.get(), 9));
    EXPECT_EQ(0, std::memcmp("xyz", lBytes, 3));
    EXPECT_EQ(0u, lIn.remaining());
}

TEST(EncodableInStream, AFieldThatIsNotThereWholeIsRefusedAndNothingIsRead) {
    sExpectRefusedBelow<unsigned char>(1);
    sExpectRefusedBelow<unsigned short>(2);
    sExpectRefusedBelow<unsigned int>(4);
    sExpectRefusedBelow<unsigned long>(8);
    sExpectRefusedBelow<int>(4);
    sExpectRefusedBelow<long>(8);
}

TEST(EncodableInStream, AStringThatIsCutAnywhereIsRefusedAndNothingIsRead) {
    ZTCEncodableOutStream lOut;
    lOut << ZTCString("abcdef");
    const ZTCPointer<ZTCBuffer> lWhole = lOut.getBuffer();
    for (Size lHad = 0; lHad < lWhole->getSize(); ++lHad) {
        ZTCPointer<ZTCBuffer> lPart(NEW ZTCBuffer);
        lPart->append(lWhole->getData(), lHad);
        ZTCEncodableInStream lIn(lPart);
        ZTCString lText("before");
        EXPECT_THROW(lIn >> lText, ZTCInvalidEx);
        EXPECT_STREQ("before", lText.get());
        EXPECT_EQ(lHad, lIn.remaining());
    }
}

TEST(EncodableInStream, AHugeStringCountIsRefusedBeforeAnyAllocation) {
    ZTCEncodableInStream lIn(
        sBuffer("\xff\xff\xff\xff"
                "abc"));
    ZTCString lText("before");
    bool lIsRefused = false;
    {
        ZTCFailingAllocation lFailure(1);
        try {
            lIn >> lText;
        } catch (const ZTCInvalidEx&) {
            lIsRefused = true;
        }
    }
    EXPECT_TRUE(lIsRefused);
    EXPECT_EQ(7u, lIn.remaining());
}

TEST(EncodableInStream, BytesPastTheEndAreRefusedAndNothingIsRead) {
    ZTCEncodableInStream lIn(sBuffer("abc"));
    char lBytes[4] = {'-', '-', '-', '-'};
    EXPECT_THROW(lIn.readBytes(lBytes, 4), ZTCInvalidEx);
    EXPECT_EQ('-', lBytes[0]);
    EXPECT_EQ(3u, lIn.remaining());
    EXPECT_THROW(lIn.readBytes(lBytes, 4294967295u), ZTCInvalidEx);
    lIn.readBytes(lBytes, 3);
    EXPECT_EQ('c', lBytes[2]);
}

TEST(EncodableInStream, AnEmptyBufferHasNothing) {
    ZTCEncodableInStream lIn(ZTCPointer<ZTCBuffer>(NEW ZTCBuffer));
    EXPECT_EQ(0u, lIn.remaining());
    lIn.readBytes(nullptr, 0);
    unsigned char lByte = 1;
    EXPECT_THROW(lIn >> lByte, ZTCInvalidEx);
}

TEST(EncodableInStream, AFailedAllocationOfAStringReadsNothing) {
    ZTCEncodableOutStream lOut;
    lOut << ZTCString(std::string(100, 'x').c_str());
    ZTCEncodableInStream lIn(lOut.getBuffer());
    ZTCString lText("before");
    const unsigned lFailures = failEachAllocation(
        [&] {
            try {
                lIn >> lText;
            } catch (const ZTCNoMemoryEx&) {
            }
        },
        [&] {
            EXPECT_EQ(104u, lIn.remaining());
            EXPECT_STREQ("before", lText.get());
        });
    EXPECT_GE(lFailures, 3u);
    EXPECT_EQ(0u, lIn.remaining());
    EXPECT_EQ(100u, lText.length());
}
