#include "system/include/ProtocolHelper.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/include/Memory.h"
#include "tests/unit/os/LogCapture.h"

class ZTCFixedReader : public ZTCReader {
public:
    explicit ZTCFixedReader(std::string aMessage) : mMessage(std::move(aMessage)) {}
    void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) override {
        arBuffer = ZTCPointer<ZTCBuffer>(NEW ZTCBuffer());
        arBuffer->append(mMessage.data(), static_cast<Size>(mMessage.size()));
        arCount = arBuffer->getSize();
    }
    void waitForActivity(unsigned) override {}

private:
    const std::string mMessage;
};

class ZTCKeepingWriter : public ZTCWriter {
public:
    void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) override {
        mMessage.assign(reinterpret_cast<const char*>(acrBuffer->getData()), acrBuffer->getSize());
        arCount = acrBuffer->getSize();
    }
    std::string mMessage;
};

class ProtocolHelper : public testing::Test {
protected:
    ~ProtocolHelper() override { ZTCProtocolHelper::setSnifferMode(false); }

    std::string receive(const std::string& acrMessage) {
        const ZTCPointer<ZTCReader> lReader(NEW ZTCFixedReader(acrMessage));
        ZTCPointer<ZTCBuffer> lBuffer;
        mHelper.receive(lReader, lBuffer, 0);
        return std::string(reinterpret_cast<const char*>(lBuffer->getData()), lBuffer->getSize());
    }

    std::string send(const std::string& acrMessage) {
        auto* lpWriter = NEW ZTCKeepingWriter();
        const ZTCPointer<ZTCWriter> lWriter(lpWriter);
        const ZTCPointer<ZTCBuffer> lBuffer(NEW ZTCBuffer());
        lBuffer->append(acrMessage.data(), static_cast<Size>(acrMessage.size()));
        mHelper.send(lWriter, lBuffer, 0);
        return lpWriter->mMessage;
    }

    ZTCProtocolHelper mHelper;
};

TEST_F(ProtocolHelper, AMessageIsMovedAndNothingLogged) {
    ZTCLogCapture lLog;
    EXPECT_EQ(receive("request"), "request");
    EXPECT_EQ(send("response"), "response");
    EXPECT_TRUE(lLog.file().rawLines().empty());
}

TEST_F(ProtocolHelper, SnifferModeDumpsBothDirectionsWhateverTheLogCode) {
    ZTCLogCapture lLog(0);
    ZTCProtocolHelper::setSnifferMode(true);
    EXPECT_TRUE(ZTCProtocolHelper::isSnifferModeOn());
    EXPECT_EQ(receive("request"), "request");
    EXPECT_EQ(send("%s %n"), "%s %n");
    const std::vector<std::string> lcLines = {
        "-PROT- 72 65 71 75 65 73 74" + std::string(29, ' ') + "request",
        "-PROT- 25 73 20 25 6e" + std::string(35, ' ') + "%s %n",
    };
    EXPECT_EQ(lLog.file().rawLines(), lcLines);
}

TEST_F(ProtocolHelper, ADumpHasSixteenBytesALineAndDotsForWhatCannotBePrinted) {
    ZTCLogCapture lLog(0);
    ZTCProtocolHelper::setSnifferMode(true);
    std::string lMessage("0123456789abcdef");
    lMessage += std::string("\x00\x1f\x20\x7e\x7f\x80\xff\x0a", 8) + "%d%s%n..";
    lMessage += "Z";
    receive(lMessage);
    const std::vector<std::string> lcLines = {
        "-PROT- 30 31 32 33 34 35 36 37 38 39 61 62 63 64 65 66  0123456789abcdef",
        "-PROT- 00 1f 20 7e 7f 80 ff 0a 25 64 25 73 25 6e 2e 2e  .. ~....%d%s%n..",
        "-PROT- 5a                                               Z",
    };
    EXPECT_EQ(lLog.file().rawLines(), lcLines);
}

TEST_F(ProtocolHelper, AnEmptyMessageIsNoLine) {
    ZTCLogCapture lLog(0);
    ZTCProtocolHelper::setSnifferMode(true);
    EXPECT_EQ(receive(""), "");
    EXPECT_TRUE(lLog.file().rawLines().empty());
}
