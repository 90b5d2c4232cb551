#include "system/include/System.h"

#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/TestSystem.h"

class ZTCEchoReader : public ZTCReader {
public:
    void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) override {
        arBuffer = ZTCPointer<ZTCBuffer>(NEW ZTCBuffer());
        arBuffer->append("echo", 4);
        arCount = 4;
    }
    void waitForActivity(unsigned aSeconds) override { mSeconds = aSeconds; }
    unsigned mSeconds = 0;
};

class ZTCCountingWriter : public ZTCWriter {
public:
    void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) override { arCount = acrBuffer->getSize(); }
};

class ZTCItem : public ZTCQueueable {};

static ZTCPointer<ZTCQueueable> sItem() {
    return ZTCPointer<ZTCQueueable>(NEW ZTCItem());
}

TEST(System, ConstructionIsTracedFromItsHeader) {
    ZTCLogCapture lLog;
    const ZTCSystem lSystem{ZTCString("a name")};
    const auto lLines = lLog.file().lines();
    ASSERT_EQ(lLines.size(), 2u);
    for (const ZTSLogLine& lcrLine : lLines) {
        EXPECT_EQ(lcrLine.mMark, "-T-");
        EXPECT_EQ(lcrLine.mLabel, "system/include/System");
        EXPECT_EQ(lcrLine.mFunction, "ZTCSystem");
    }
    EXPECT_EQ(lLines[0].mText, "Entered");
    EXPECT_EQ(lLines[1].mText, "Left");
}

TEST(System, AfterConstructionItsStateIsAtItsDefaults) {
    ZTCSystem lSystem{ZTCString("a name")};
    EXPECT_STREQ(lSystem.getName().get(), "a name");
    EXPECT_STREQ(lSystem.getHostName().get(), "localhost");
    EXPECT_STREQ(lSystem.getConfFilePathStr().get(), "");
    EXPECT_FALSE(lSystem.isSetForExit());
    EXPECT_FALSE(lSystem.isInited(0));
    EXPECT_TRUE(lSystem.isToRunAsDaemon());
    EXPECT_STREQ(lSystem.getOs().get(), "Linux");
    EXPECT_STRNE(lSystem.getOsVariant().get(), "");
}

TEST(System, OnceSetForExitItStaysSo) {
    ZTCSystem lSystem{ZTCString("a name")};
    lSystem.setForExit();
    EXPECT_TRUE(lSystem.isSetForExit());
    lSystem.setForExit();
    EXPECT_TRUE(lSystem.isSetForExit());
}

TEST(System, AnIndexPastTheReadersOrWritersEndsTheProcess) {
    const struct {
        std::function<void(ZTCSystem&)> mUse;
        const char* mpText;
    } lcRows[] = {
        {[](ZTCSystem& arSystem) { arSystem.getReader(0); },
         "Assertion [ acReaderNo < this->mReaders.numberOfElements() ] failed"},
        {[](ZTCSystem& arSystem) { arSystem.getWriter(0); },
         "Assertion [ acWriterNo < this->mWriters.numberOfElements() ] failed"},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCLogCapture lLog(63);
        ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
            ZTCSystem lSystem{ZTCString("a name")};
            lcrRow.mUse(lSystem);
            return 0;
        });
        EXPECT_EQ(lChild.waitForExit(), 1);
        const auto lLines = lLog.file().lines();
        ASSERT_EQ(lLines.size(), 1u);
        EXPECT_EQ(lLines[0].mMark, "-H-");
        EXPECT_EQ(lLines[0].mLabel, "system/include/System");
        EXPECT_EQ(lLines[0].mText, lcrRow.mpText);
    }
}

TEST(System, ReadersAndWritersAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    auto* lpReader = NEW ZTCEchoReader();
    auto* lpWriter = NEW ZTCCountingWriter();
    lSystem.addReader(lpReader);
    lSystem.addWriter(lpWriter);
    EXPECT_EQ(lSystem.getReader(0).get(), lpReader);
    EXPECT_EQ(lSystem.getWriter(0).get(), lpWriter);
    lSystem.waitForActivity(0, 3);
    EXPECT_EQ(lpReader->mSeconds, 3u);
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 0;
    lSystem.receive(0, lBuffer, lCount);
    EXPECT_EQ(lCount, 4u);
    lCount = 0;
    lSystem.send(0, lBuffer, lCount);
    EXPECT_EQ(lCount, 4u);
}

TEST(System, InitMakesTheProtocolHelperAndTheBuffers) {
    ZTCTestSystem lSystem;
    lSystem.init();
    EXPECT_TRUE(lSystem.getProtocolHelper() != nullptr);
    ZTCPointer<ZTCBuffer> lBuffer;
    lSystem.getBuffer(10, lBuffer);
    lBuffer->append("x", 1);
    lSystem.clearBuffer(lBuffer);
    EXPECT_EQ(lBuffer->getSize(), 0u);
    lSystem.reuseBuffer(lBuffer);
}

TEST(System, NumbersAreGivenOutOnceUntilTheyComeBack) {
    ZTCTestSystem lSystem;
    lSystem.init();
    unsigned lFirst = 0;
    unsigned lSecond = 0;
    unsigned lThird = 0;
    lSystem.generateNumericId(lFirst);
    lSystem.generateNumericId(lSecond);
    EXPECT_NE(lFirst, lSecond);
    lSystem.returnNumericId(lFirst);
    EXPECT_THROW(lSystem.returnNumericId(lFirst), ZTCNotFoundEx);
    lSystem.generateNumericId(lThird);
    EXPECT_EQ(lThird, lFirst);
}

TEST(System, SettingsFollowTheRulesOfTheMap) {
    ZTCTestSystem lSystem;
    lSystem.addSetting(ZTCString("key"), ZTCPointer<ZTCMultiType>(NEW ZTCMultiType(7)));
    ZTCPointer<ZTCMultiType> lValue;
    lSystem.getSetting(ZTCString("key"), lValue);
    EXPECT_EQ(lValue->getNumber(), 7u);
    EXPECT_THROW(lSystem.addSetting(ZTCString("key"), lValue), ZTCExistsEx);
    EXPECT_THROW(lSystem.getSetting(ZTCString("other"), lValue), ZTCNotFoundEx);
    EXPECT_THROW(lSystem.applySettings(), ZTCNotImplementedEx);
}

TEST(System, TheAddressIsTheOneThatWasSet) {
    ZTCTestSystem lSystem;
    lSystem.setAddress(ZTCPointer<ZTCIpAddress>(NEW ZTCIpAddress(ZTCString("192.0.2.1"))));
    EXPECT_STREQ(lSystem.getAddress()->getText().get(), "192.0.2.1");
    EXPECT_STREQ(lSystem.getVersion().get(), "3.0.1.2");
}

TEST(System, QueuesAndListsAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    lSystem.addQueue();
    lSystem.addList();
    const ZTCPointer<ZTCQueueable> lcFirst = sItem();
    const ZTCPointer<ZTCQueueable> lcSecond = sItem();

    EXPECT_THROW(lSystem.waitOnEmptyQueue(0, 0), ZTCTimeOutEx);
    lSystem.enqueue(0, lcFirst);
    lSystem.enqueue(0, lcSecond);
    lSystem.waitOnEmptyQueue(0, 60);
    EXPECT_EQ(lSystem.queueFront(0).get(), lcFirst.get());
    EXPECT_EQ(lSystem.dequeue(0).get(), lcFirst.get());
    EXPECT_FALSE(lSystem.isQueueEmpty(0));
    lSystem.queueClear(0);
    EXPECT_TRUE(lSystem.isQueueEmpty(0));
    EXPECT_THROW(lSystem.dequeue(1), ZTCInvalidEx);

    EXPECT_THROW(lSystem.waitOnEmptyList(0, 0), ZTCTimeOutEx);
    lSystem.enlist(0, lcFirst);
    lSystem.enlistFront(0, lcSecond);
    EXPECT_EQ(lSystem.listSize(0), 2u);
    EXPECT_EQ(lSystem.listFront(0).get(), lcSecond.get());
    ZTCSynchList::ZTIterator lPlace = lSystem.listBegin(0);
    lSystem.listErase(0, lPlace);
    EXPECT_EQ(lPlace->get(), lcFirst.get());
    const ZTCTestSystem& lcrSystem = lSystem;
    EXPECT_NE(lcrSystem.listBegin(0), lcrSystem.listEnd(0));
    EXPECT_NE(lSystem.listBegin(0), lSystem.listEnd(0));
    EXPECT_EQ(lSystem.delist(0).get(), lcFirst.get());
    lSystem.enlist(0, lcSecond);
    EXPECT_EQ(lSystem.delistBack(0).get(), lcSecond.get());
    lSystem.enlist(0, lcSecond);
    lSystem.listClear(0);
    EXPECT_TRUE(lSystem.isListEmpty(0));
}

TEST(System, ConditionalsAreReachedByTheirSlots) {
    ZTCTestSystem lSystem;
    lSystem.addConditional();
    lSystem.addConditional();
    lSystem.signal(1);
    lSystem.wait(1);
    EXPECT_THROW(lSystem.timedWait(1, 0), ZTCTimeOutEx);
    EXPECT_THROW(lSystem.signal(2), ZTCInvalidEx);
    EXPECT_THROW(lSystem.timedWait(2, 0), ZTCInvalidEx);
}
