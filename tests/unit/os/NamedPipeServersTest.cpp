#include <gtest/gtest.h>

#include <string>

#include "common/include/Memory.h"
#include "os/common/include/NamedPipeReaderServer.h"
#include "os/common/include/NamedPipeWriterServer.h"
#include "tests/unit/os/LogCapture.h"

TEST(NamedPipeServers, AMessageGoesFromTheWriterToTheReader) {
    ZTCLogCapture lLog;
    ZTCTemporaryDirectory lDirectory;
    const ZTCString lPath(lDirectory.path("a.fifo").c_str());
    const ZTCPointer<ZTCReader> lReader(NEW ZTCNamedPipeReaderServer(lPath, ZTNPS_NonBlock));
    const ZTCPointer<ZTCWriter> lWriter(NEW ZTCNamedPipeWriterServer(lPath, ZTNPS_Block));
    auto* lpReaderServer = dynamic_cast<ZTCServer*>(lReader.get());
    auto* lpWriterServer = dynamic_cast<ZTCServer*>(lWriter.get());
    ASSERT_NE(lpReaderServer, nullptr);
    ASSERT_NE(lpWriterServer, nullptr);

    lpReaderServer->create();
    EXPECT_TRUE(isFifo(lPath.get()));
    lpReaderServer->open();
    lpReaderServer->accept();
    lpWriterServer->create();
    lpWriterServer->open();
    lpWriterServer->accept();

    ZTCPointer<ZTCBuffer> lOut(NEW ZTCBuffer());
    lOut->append("message", 7);
    unsigned lCount = 0;
    lWriter->write(lOut, lCount);
    EXPECT_EQ(lCount, 7u);

    lReader->waitForActivity(20);
    ZTCPointer<ZTCBuffer> lIn;
    lReader->read(lIn, lCount);
    EXPECT_EQ(lCount, 7u);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(lIn->getData()), lIn->getSize()), "message");

    lpWriterServer->close();
    lpWriterServer->destroy();
    EXPECT_FALSE(exists(lPath.get()));
    lpReaderServer->close();
    lpReaderServer->destroy();
}
