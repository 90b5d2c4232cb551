#include "system/include/BufferManager.h"

#include <gtest/gtest.h>

#include <set>
#include <vector>

#include "common/include/Memory.h"

#include "tests/support/TestThreads.h"

TEST(BufferManager, ABufferIsEmptyAndHasRoom) {
    ZTCBufferManager lManager;
    ZTCPointer<ZTCBuffer> lBuffer;
    lManager.getBuffer(100, lBuffer);
    EXPECT_EQ(lBuffer->getSize(), 0u);
    EXPECT_GE(lBuffer->getCapacity(), 100u);
}

TEST(BufferManager, ABufferThatIsGivenBackIsHandedOutAgainCleared) {
    ZTCBufferManager lManager;
    ZTCPointer<ZTCBuffer> lBuffer;
    lManager.getBuffer(100, lBuffer);
    const ZTCBuffer* lpFirst = lBuffer.get();
    lBuffer->append("secret", 6);
    lManager.reuseBuffer(lBuffer);
    EXPECT_NE(lBuffer.get(), lpFirst) << "the caller still holds what is handed out again";

    ZTCPointer<ZTCBuffer> lAgain;
    lManager.getBuffer(10, lAgain);
    EXPECT_EQ(lAgain.get(), lpFirst);
    EXPECT_EQ(lAgain->getSize(), 0u);

    ZTCPointer<ZTCBuffer> lOther;
    lManager.getBuffer(10, lOther);
    EXPECT_NE(lOther.get(), lpFirst);
}

TEST(BufferManager, AFewBuffersAreKeptAndNoLargeOnes) {
    ZTCBufferManager lManager;
    std::vector<ZTCPointer<ZTCBuffer>> lBuffers(ZTCBufferManager::gcMaxKeptBuffers + 2);
    std::set<const ZTCBuffer*> lGiven;
    for (ZTCPointer<ZTCBuffer>& lrBuffer : lBuffers) {
        lManager.getBuffer(8, lrBuffer);
        lGiven.insert(lrBuffer.get());
    }
    // Held here as well, so that no address is used twice.
    const std::vector<ZTCPointer<ZTCBuffer>> lcHeld(lBuffers);
    for (ZTCPointer<ZTCBuffer>& lrBuffer : lBuffers) {
        lManager.reuseBuffer(lrBuffer);
    }
    unsigned lAgain = 0;
    for (ZTCPointer<ZTCBuffer>& lrBuffer : lBuffers) {
        lManager.getBuffer(8, lrBuffer);
        lAgain += lGiven.count(lrBuffer.get()) != 0 ? 1 : 0;
    }
    EXPECT_EQ(lAgain, ZTCBufferManager::gcMaxKeptBuffers);

    ZTCPointer<ZTCBuffer> lLarge;
    lManager.getBuffer(ZTCBufferManager::gcMaxKeptSize + 1, lLarge);
    const ZTCPointer<ZTCBuffer> lcHeldLarge(lLarge);
    lManager.reuseBuffer(lLarge);
    lManager.getBuffer(8, lLarge);
    EXPECT_NE(lLarge.get(), lcHeldLarge.get());
}

TEST(BufferManager, ClearingLeavesTheBufferWithItsOwner) {
    ZTCBufferManager lManager;
    ZTCPointer<ZTCBuffer> lBuffer;
    lManager.getBuffer(8, lBuffer);
    const ZTCBuffer* lpBuffer = lBuffer.get();
    lBuffer->append("x", 1);
    lManager.clearBuffer(lBuffer);
    EXPECT_EQ(lBuffer.get(), lpBuffer);
    EXPECT_EQ(lBuffer->getSize(), 0u);
}

TEST(BufferManager, ThreadsMayUseItAtOnce) {
    ZTCBufferManager lManager;
    runOnThreads(4, [&](unsigned) {
        for (int lRound = 0; lRound < 500; ++lRound) {
            ZTCPointer<ZTCBuffer> lBuffer;
            lManager.getBuffer(16, lBuffer);
            ASSERT_EQ(lBuffer->getSize(), 0u);
            lBuffer->append("0123456789abcdef", 16);
            lManager.reuseBuffer(lBuffer);
        }
    });
}
