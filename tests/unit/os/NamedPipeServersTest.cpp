#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/include/Memory.h"
#include "os/common/include/NamedPipeReaderServer.h"
#include "os/common/include/NamedPipeWriterServer.h"
#include "tests/support/FailingAllocation.h"
#include "tests/support/VirtualSlot.h"
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

TEST(NamedPipeServers, TheReadersOperationsStandInTheirOrder) {
    using Server = ZTCNamedPipeReaderServer;
    const std::vector<std::size_t> lSlots = {
        virtualSlotOf(&Server::read),   virtualSlotOf(&Server::waitForActivity), virtualSlotOf(&Server::open),
        virtualSlotOf(&Server::close),  virtualSlotOf(&Server::create),          virtualSlotOf(&Server::destroy),
        virtualSlotOf(&Server::accept),
    };
    EXPECT_EQ(slotsBehindTheDestructor(lSlots.size()), lSlots);
}

TEST(NamedPipeServers, TheWritersOperationsStandInTheirOrder) {
    using Server = ZTCNamedPipeWriterServer;
    const std::vector<std::size_t> lSlots = {
        virtualSlotOf(&Server::write),  virtualSlotOf(&Server::open),    virtualSlotOf(&Server::close),
        virtualSlotOf(&Server::create), virtualSlotOf(&Server::destroy), virtualSlotOf(&Server::accept),
    };
    EXPECT_EQ(slotsBehindTheDestructor(lSlots.size()), lSlots);
}

TEST(NamedPipeServersDeathTest, APipeThatFindsNoMemoryStaysNullAndItsUseIsFatal) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const ZTCString lPath("a.fifo");
    const auto lUse = [&](auto aMake, auto aUse) {
        setLogFilePath("/dev/null/none");  // so the line goes to standard error
        const ZTCFailingAllocation lFailure(1);
        auto lServer = aMake();
        if (lFailure.hasFailed()) {
            aUse(lServer);
        }
    };
    const auto lMakeReader = [&] { return ZTCNamedPipeReaderServer(lPath, ZTNPS_NonBlock); };
    const auto lMakeWriter = [&] { return ZTCNamedPipeWriterServer(lPath, ZTNPS_Block); };
    EXPECT_EXIT(lUse(lMakeReader, [](ZTCNamedPipeReaderServer& arServer) { arServer.create(); }),
                testing::ExitedWithCode(1), "Assertion \\[ 0 != mPointer \\] failed");
    EXPECT_EXIT(lUse(lMakeWriter, [](ZTCNamedPipeWriterServer& arServer) { arServer.open(); }),
                testing::ExitedWithCode(1), "Assertion \\[ 0 != mPointer \\] failed");
}

TEST(NamedPipeServers, TheirEnumerationsAreOneByteEachWithTheirValues) {
    EXPECT_EQ(1u, sizeof(ZTEPipeState));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3}), (std::vector<int>{ZTNPS_None, ZTNPS_Block, ZTNPS_NonBlock, ZTNPS_Max}));
    EXPECT_EQ(1u, sizeof(ZTEFileMode));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3, 4, 5}),
              (std::vector<int>{ZTFM_None, ZTFM_Read, ZTFM_Write, ZTFM_ReadWrite, ZTFM_Append, ZTFM_Max}));
    EXPECT_EQ(1u, sizeof(ZTEConnectionMode));
    EXPECT_EQ((std::vector<int>{0, 1}), (std::vector<int>{ZTCM_Client, ZTCM_Server}));
}
