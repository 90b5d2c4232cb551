// The reader of typed fields: each field is what its bytes say, or is refused with nothing read; what was read can be
// written again to the same bytes. And the two decoders that are made of it alone.
//
// Input: the number of fields, one byte a field that chooses its type, then the message.
#include <string>
#include <vector>

#include "common/include/EncodableStream.h"
#include "common/include/Exception.h"
#include "fuzz/support/FuzzInput.h"
#include "sensor/agentcommon/include/WorldWideName.h"

static std::uint64_t sBigEndian(std::span<const std::uint8_t> aBytes) {
    std::uint64_t lNumber = 0;
    for (const std::uint8_t lByte : aBytes) {
        lNumber = lNumber << 8 | lByte;
    }
    return lNumber;
}

/// One message that is read, the bytes that are left of it by the definition, and what is written of it again.
struct ZTSReading {
    explicit ZTSReading(std::span<const std::uint8_t> aMessage)
        : mRest(aMessage), mBuffer(new ZTCBuffer(static_cast<Size>(aMessage.size()))), mStream(mBuffer) {
        mBuffer->append(aMessage.data(), static_cast<Size>(aMessage.size()));
    }

    /// Reads with `aRead`, which is to take so many bytes; false where they are not there.
    template <class Read>
    bool read(std::uint64_t aWanted, Read aRead) {
        const Size lBefore = mStream.remaining();
        ZT_FUZZ_REQUIRE(lBefore == mRest.size(), std::to_string(lBefore));
        try {
            aRead();
        } catch (const ZTCInvalidEx& lrException) {
            ZT_FUZZ_REQUIRE(std::string(lrException.what()) == "Not enough data in stream", lrException.what());
            ZT_FUZZ_REQUIRE(aWanted > lBefore, std::to_string(aWanted));
            ZT_FUZZ_REQUIRE(mStream.remaining() == lBefore, "something was read");
            return false;
        }
        ZT_FUZZ_REQUIRE(aWanted <= lBefore, std::to_string(aWanted));
        ZT_FUZZ_REQUIRE(mStream.remaining() == lBefore - aWanted, std::to_string(mStream.remaining()));
        mRest = mRest.subspan(static_cast<std::size_t>(aWanted));
        return true;
    }

    template <class Number>
    void readNumber() {
        const auto lExpected = sBigEndian(mRest.first(std::min(sizeof(Number), mRest.size())));
        Number lNumber = static_cast<Number>(0x5A);
        if (read(sizeof(Number), [&] { mStream >> lNumber; })) {
            ZT_FUZZ_REQUIRE(lNumber == static_cast<Number>(lExpected), std::to_string(lNumber));
            mWritten << lNumber;
        } else {
            ZT_FUZZ_REQUIRE(lNumber == static_cast<Number>(0x5A), "the target was changed");
        }
    }

    void readString() {
        std::uint64_t lWanted = 4;
        std::string lExpected;
        if (mRest.size() >= 4) {
            lWanted += sBigEndian(mRest.first(4));
        }
        if (lWanted <= mRest.size()) {
            lExpected.assign(mRest.begin() + 4, mRest.begin() + static_cast<std::ptrdiff_t>(lWanted));
        }
        ZTCString lText("before");
        if (read(lWanted, [&] { mStream >> lText; })) {
            ZT_FUZZ_REQUIRE(std::string(lText.get(), lText.length()) == lExpected, lText.get());
            mWritten << lText;
        } else {
            ZT_FUZZ_REQUIRE(lText == ZTCString("before"), "the target was changed");
        }
    }

    void readBytes(Size aCount) {
        std::vector<std::uint8_t> lBytes(aCount);
        const std::vector<std::uint8_t> lExpected(
            mRest.begin(), mRest.begin() + std::min<std::ptrdiff_t>(static_cast<std::ptrdiff_t>(aCount),
                                                                    static_cast<std::ptrdiff_t>(mRest.size())));
        if (read(aCount, [&] { mStream.readBytes(lBytes.data(), aCount); })) {
            ZT_FUZZ_REQUIRE(lBytes == lExpected, "other bytes");
            mWritten.writeBytes(lBytes.data(), aCount);
        }
    }

    void readName() {
        ZTCWorldWideName lName;
        if (read(8, [&] { lName.decode(mStream); })) {
            lName.encode(mWritten);
        } else {
            ZT_FUZZ_REQUIRE(lName == ZTCWorldWideName(), "the target was changed");
        }
    }

    std::span<const std::uint8_t> mRest;
    ZTCPointer<ZTCBuffer> mBuffer;
    ZTCEncodableInStream mStream;
    ZTCEncodableOutStream mWritten;
};

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    const std::span<const std::uint8_t> lFields = lInput.take(lInput.takeByte());
    const std::span<const std::uint8_t> lMessage = lInput.takeRest();
    ZTSReading lReading(lMessage);
    for (const std::uint8_t lField : lFields) {
        switch (lField % 9) {
            case 0:
                lReading.readNumber<unsigned char>();
                break;
            case 1:
                lReading.readNumber<unsigned short>();
                break;
            case 2:
                lReading.readNumber<unsigned int>();
                break;
            case 3:
                lReading.readNumber<unsigned long>();
                break;
            case 4:
                lReading.readNumber<int>();
                break;
            case 5:
                lReading.readNumber<long>();
                break;
            case 6:
                lReading.readString();
                break;
            case 7:
                lReading.readBytes(lField / 9u);
                break;
            default:
                lReading.readName();
                break;
        }
    }
    const ZTCBuffer& lrWritten = *lReading.mWritten.getBuffer();
    const std::span<const std::uint8_t> lRead = lMessage.first(lMessage.size() - lReading.mRest.size());
    ZT_FUZZ_REQUIRE(
        std::equal(lRead.begin(), lRead.end(), lrWritten.getData(), lrWritten.getData() + lrWritten.getSize()),
        "what was read is written to other bytes");
    return 0;
}
