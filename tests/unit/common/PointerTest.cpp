#include "common/include/Pointer.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include "tests/support/FailingAllocation.h"
#include "tests/support/TestThreads.h"

namespace {

/// Counts its objects, and notes the order of destruction.
struct ZTSObserved {
    explicit ZTSObserved(int aValue = 0) : mValue(aValue) { ++sAlive; }
    ZTSObserved(const ZTSObserved&) = delete;
    ZTSObserved& operator=(const ZTSObserved&) = delete;
    ~ZTSObserved() {
        --sAlive;
        sDestroyed.push_back(mValue);
    }

    int mValue;
    static inline int sAlive = 0;
    static inline std::vector<int> sDestroyed{};
};

struct ZTSBase {
    virtual ~ZTSBase() = default;
    virtual int kind() const { return 0; }
};

struct ZTSDerived : virtual ZTSBase {
    ZTSDerived() { ++sAlive; }
    ~ZTSDerived() override { --sAlive; }
    int kind() const override { return 1; }
    static inline int sAlive = 0;
};

struct ZTSNode {
    explicit ZTSNode(int aValue) : mValue(aValue) {}
    int mValue;
    ZTCPointer<ZTSNode> mNext{};
};

class Pointer : public testing::Test {
protected:
    Pointer() {
        ZTSObserved::sAlive = 0;
        ZTSObserved::sDestroyed.clear();
        ZTSDerived::sAlive = 0;
    }
};

using PointerDeathTest = Pointer;

/// What gtest matches against standard error, where the lines of a process without a log file appear at its end.
std::string sAssertion(const char* apCondition) {
    std::string lText = "-H- .*: Assertion \\[ ";
    for (const char* lpChar = apCondition; *lpChar != '\0'; ++lpChar) {
        lText += *lpChar == '.' ? std::string("\\.") : std::string(1, *lpChar);
    }
    return lText + " \\] failed\n";
}

}  // namespace

TEST_F(Pointer, TheLastOfThreeCopiesReleasesTheObjectOnce) {
    auto lpFirst = std::make_unique<ZTCPointer<ZTSObserved>>(NEW ZTSObserved(7));
    auto lpSecond = std::make_unique<ZTCPointer<ZTSObserved>>(*lpFirst);
    auto lpThird = std::make_unique<ZTCPointer<ZTSObserved>>(*lpSecond);
    lpFirst.reset();
    EXPECT_EQ(1, ZTSObserved::sAlive);
    lpSecond.reset();
    EXPECT_EQ(1, ZTSObserved::sAlive);
    EXPECT_EQ(7, (*lpThird)->mValue);
    lpThird.reset();
    EXPECT_EQ(0, ZTSObserved::sAlive);
    EXPECT_EQ(std::vector<int>{7}, ZTSObserved::sDestroyed);
}

TEST_F(Pointer, AssigningReleasesTheFormerObjectAndSharesTheNewOne) {
    ZTCPointer<ZTSObserved> lFirst(NEW ZTSObserved(1));
    ZTCPointer<ZTSObserved> lSecond(NEW ZTSObserved(2));
    lFirst = lSecond;
    EXPECT_EQ(std::vector<int>{1}, ZTSObserved::sDestroyed);
    EXPECT_EQ(lSecond.get(), lFirst.get());
    ZTCPointer<ZTSObserved> lEmpty;
    lEmpty = lFirst;
    EXPECT_EQ(2, lEmpty->mValue);
    EXPECT_EQ(1, ZTSObserved::sAlive);
}

TEST_F(Pointer, AssigningToItselfChangesNothing) {
    ZTCPointer<ZTSObserved> lPointer(NEW ZTSObserved(3));
    ZTCPointer<ZTSObserved>& lrSame = lPointer;
    lPointer = lrSame;
    EXPECT_EQ(3, lPointer->mValue);
    EXPECT_EQ(1, ZTSObserved::sAlive);
}

TEST_F(Pointer, AssigningAmongSharersKeepsTheObject) {
    ZTCPointer<ZTSObserved> lFirst(NEW ZTSObserved(3));
    ZTCPointer<ZTSObserved> lSecond(lFirst);
    lFirst = lSecond;
    EXPECT_EQ(1, ZTSObserved::sAlive);
    EXPECT_EQ(3, lFirst->mValue);
}

TEST_F(Pointer, TheSourceOfAnAssignmentMayLiveInTheReleasedObject) {
    ZTCPointer<ZTSNode> lHead(NEW ZTSNode(1));
    lHead->mNext = ZTCPointer<ZTSNode>(NEW ZTSNode(2));
    lHead->mNext->mNext = ZTCPointer<ZTSNode>(NEW ZTSNode(3));
    lHead = lHead->mNext;
    EXPECT_EQ(2, lHead->mValue);
    lHead = lHead->mNext;
    EXPECT_EQ(3, lHead->mValue);
}

TEST_F(Pointer, AnArrayIsReleasedElementByElementLastFirst) {
    {
        ZTCPointer<ZTSObserved> lArray(new ZTSObserved[3], ZTPST_Array);
        for (int i = 0; i < 3; ++i) {
            lArray.get()[i].mValue = i;
        }
        EXPECT_EQ(3, ZTSObserved::sAlive);
    }
    EXPECT_EQ((std::vector<int>{2, 1, 0}), ZTSObserved::sDestroyed);
}

TEST_F(Pointer, DereferencingAnArrayYieldsItsFirstElement) {
    ZTCPointer<int> lArray(new int[2]{41, 42}, ZTPST_Array);
    EXPECT_EQ(41, *lArray);
}

TEST_F(Pointer, AMallocdBlockIsFreedWithoutADestructor) {
    // The sanitizer's run shows that free is what releases it.
    void* const lpBlock = std::malloc(sizeof(ZTSObserved));
    ASSERT_NE(nullptr, lpBlock);
    ZTSObserved* const lpObject = ::new (lpBlock) ZTSObserved(9);
    { ZTCPointer<ZTSObserved> lPointer(lpObject, ZTPST_Individual, ZTPAT_Malloc); }
    EXPECT_EQ(1, ZTSObserved::sAlive);
    EXPECT_TRUE(ZTSObserved::sDestroyed.empty());
}

TEST_F(Pointer, ANullObjectIsOutOfMemory) {
    try {
        ZTCPointer<int> lPointer(nullptr);
        FAIL() << "nothing thrown";
    } catch (const ZTCNoMemoryEx& lrException) {
        EXPECT_STREQ("Out of Memory", lrException.what());
        EXPECT_EQ(2u, lrException.getError());
    }
}

TEST_F(Pointer, AFailedAllocationOfTheCountFreesTheObject) {
    ZTSObserved* const lpObject = NEW ZTSObserved(5);
    bool lIsOutOfMemory = false;
    {
        ZTCFailingAllocation lFailure(1);
        try {
            ZTCPointer<ZTSObserved> lPointer(lpObject);
        } catch (const ZTCNoMemoryEx& lrException) {
            lIsOutOfMemory = std::strcmp("Out of Memory", lrException.what()) == 0 && lrException.getError() == 2;
        }
    }
    EXPECT_TRUE(lIsOutOfMemory);
    EXPECT_EQ(0, ZTSObserved::sAlive);
}

TEST_F(Pointer, ComparesWithARawPointer) {
    ZTCPointer<int> lEmpty;
    EXPECT_FALSE(lEmpty != nullptr);
    EXPECT_FALSE(lEmpty != 0);
    int* const lpObject = new int(1);
    ZTCPointer<int> lPointer(lpObject);
    EXPECT_TRUE(lPointer != nullptr);
    EXPECT_FALSE(lPointer != lpObject);
    EXPECT_EQ(lpObject, lPointer.get());
}

TEST_F(Pointer, ConvertsToAVirtualBaseAndIsReleasedThroughIt) {
    {
        ZTCPointer<ZTSBase> lBase(NEW ZTSBase);
        {
            ZTCPointer<ZTSDerived> lDerived(NEW ZTSDerived);
            lBase = lDerived;
            ZTCPointer<ZTSBase> lConverted(lDerived);
            EXPECT_EQ(lConverted.get(), lBase.get());
        }
        EXPECT_EQ(1, ZTSDerived::sAlive);
        EXPECT_EQ(1, lBase->kind());
    }
    EXPECT_EQ(0, ZTSDerived::sAlive);
}

TEST_F(Pointer, ConvertsToAPointerToConst) {
    ZTCPointer<int> lPointer(new int(4));
    ZTCPointer<const int> lConst(lPointer);
    EXPECT_EQ(4, *lConst);
}

TEST_F(Pointer, CopiesMayComeAndGoOnManyThreads) {
    {
        ZTCPointer<ZTSObserved> lPointer(NEW ZTSObserved(1));
        runOnThreads(4, [lPointer](unsigned) {
            for (int lRound = 0; lRound < 2000; ++lRound) {
                ZTCPointer<ZTSObserved> lCopy(lPointer);
                ZTCPointer<ZTSObserved> lOther;
                lOther = lCopy;
            }
        });
        EXPECT_EQ(1, ZTSObserved::sAlive);
    }
    EXPECT_EQ(std::vector<int>{1}, ZTSObserved::sDestroyed);
}

TEST_F(Pointer, HasTheLayoutAndTheOneByteTypesThatItPromises) {
    EXPECT_EQ(1u, sizeof(ZTEPointerSizeType));
    EXPECT_EQ(1u, sizeof(ZTEPointerAllocType));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3}), (std::vector<int>{ZTPST_None, ZTPST_Individual, ZTPST_Array, ZTPST_Max}));
    EXPECT_EQ((std::vector<int>{0, 1, 2, 3}), (std::vector<int>{ZTPAT_None, ZTPAT_New, ZTPAT_Malloc, ZTPAT_Max}));
    EXPECT_EQ(3 * sizeof(void*), sizeof(ZTCPointer<int>));

    // The fields in order: object, count, size type, allocation type, filler.
    ZTCPointer<int> lPointer(new int[1], ZTPST_Array, ZTPAT_New);
    int* lpObject = nullptr;
    unsigned char lTypes[4];
    std::memcpy(static_cast<void*>(&lpObject), &lPointer, sizeof(lpObject));
    std::memcpy(lTypes, reinterpret_cast<const char*>(&lPointer) + 2 * sizeof(void*), sizeof(lTypes));
    EXPECT_EQ(lPointer.get(), lpObject);
    EXPECT_EQ(ZTPST_Array, lTypes[0]);
    EXPECT_EQ(ZTPAT_New, lTypes[1]);
    EXPECT_EQ(0, lTypes[2]);
    EXPECT_EQ(0, lTypes[3]);
}

TEST_F(Pointer, MovingIsCopying) {
    ZTCPointer<int> lFirst(new int(1));
    ZTCPointer<int> lSecond(std::move(lFirst));
    EXPECT_EQ(lSecond.get(), lFirst.get());  // NOLINT(bugprone-use-after-move): there is no move
}

TEST_F(PointerDeathTest, CopyingAnEmptyPointerIsFatal) {
    const ZTCPointer<int> lEmpty;
    EXPECT_EXIT(ZTCPointer<int>{lEmpty}, testing::ExitedWithCode(1), sAssertion("0 != acrCopy.mPointer"));
}

TEST_F(PointerDeathTest, AssigningFromAnEmptyPointerIsFatal) {
    const ZTCPointer<int> lEmpty;
    ZTCPointer<int> lPointer(new int(1));
    EXPECT_EXIT(lPointer = lEmpty, testing::ExitedWithCode(1), sAssertion("0 != acrCopy.mPointer"));
}

TEST_F(PointerDeathTest, AssigningAnEmptyPointerToItselfIsFatalToo) {
    ZTCPointer<int> lEmpty;
    ZTCPointer<int>& lrSame = lEmpty;
    EXPECT_EXIT(lEmpty = lrSame, testing::ExitedWithCode(1), sAssertion("0 != acrCopy.mPointer"));
}

TEST_F(PointerDeathTest, ConvertingAnEmptyPointerIsFatal) {
    const ZTCPointer<ZTSDerived> lEmpty;
    EXPECT_EXIT(ZTCPointer<ZTSBase>{lEmpty}, testing::ExitedWithCode(1), sAssertion("0 != acrCopy.mPointer"));
}

TEST_F(PointerDeathTest, ConvertingAnArrayIsFatal) {
    const ZTCPointer<ZTSDerived> lArray(new ZTSDerived[2], ZTPST_Array);
    EXPECT_EXIT(ZTCPointer<ZTSBase>{lArray}, testing::ExitedWithCode(1),
                sAssertion("ZTPST_Individual == acrCopy.mSizeType"));
}

TEST_F(PointerDeathTest, UsingAnEmptyPointerIsFatal) {
    const ZTCPointer<std::string> lEmpty;
    EXPECT_EXIT(static_cast<void>(lEmpty->size()), testing::ExitedWithCode(1), sAssertion("0 != mPointer"));
    EXPECT_EXIT(static_cast<void>(*lEmpty), testing::ExitedWithCode(1), sAssertion("0 != mPointer"));
    EXPECT_EXIT(static_cast<void>(lEmpty.get()), testing::ExitedWithCode(1), sAssertion("0 != mPointer"));
}

TEST_F(PointerDeathTest, TheArrowOnAnArrayIsFatal) {
    const ZTCPointer<std::string> lArray(new std::string[2], ZTPST_Array);
    EXPECT_EXIT(static_cast<void>(lArray->size()), testing::ExitedWithCode(1),
                sAssertion("ZTPST_Individual == mSizeType"));
}

TEST_F(PointerDeathTest, DereferencingAnUnknownSizeTypeIsFatal) {
    const ZTCPointer<int> lPointer(static_cast<int*>(std::malloc(sizeof(int))), ZTPST_None, ZTPAT_Malloc);
    EXPECT_EXIT(static_cast<void>(*lPointer), testing::ExitedWithCode(1), sAssertion("false"));
}

TEST_F(PointerDeathTest, ReleasingAnUnknownTypeIsFatal) {
    static int sObject = 0;
    EXPECT_EXIT(ZTCPointer<int>(&sObject, ZTPST_None, ZTPAT_New), testing::ExitedWithCode(1), sAssertion("false"));
    EXPECT_EXIT(ZTCPointer<int>(&sObject, ZTPST_Max, ZTPAT_New), testing::ExitedWithCode(1), sAssertion("false"));
    EXPECT_EXIT(ZTCPointer<int>(&sObject, ZTPST_Individual, ZTPAT_None), testing::ExitedWithCode(1),
                sAssertion("false"));
}

TEST_F(PointerDeathTest, TheAssertionNamesFunctionAndFile) {
    const ZTCPointer<std::string> lEmpty;
    EXPECT_EXIT(static_cast<void>(lEmpty->size()), testing::ExitedWithCode(1),
                "-H- common/include/Pointer:[0-9]+ operator->: Assertion");
}
