#include <gtest/gtest.h>

#include <vector>

#include "common/include/Pointer.h"
#include "tests/support/FailingAllocation.h"

namespace {

/// Counts its objects, and notes the order of destruction.
struct ZTSPart {
    explicit ZTSPart(int aValue) : mValue(aValue) { ++sAlive; }
    ZTSPart(const ZTSPart&) = delete;
    ZTSPart& operator=(const ZTSPart&) = delete;
    ~ZTSPart() {
        --sAlive;
        sDestroyed.push_back(mValue);
    }

    int mValue;
    static inline int sAlive = 0;
    static inline std::vector<int> sDestroyed{};
};

struct ZTSMade : ZTSPart {
    using ZTMadeWithItsCount = void;
    using ZTSPart::ZTSPart;
};

struct ZTSMadeBase {
    using ZTMadeWithItsCount = void;
    virtual ~ZTSMadeBase() = default;
    virtual int kind() const { return 0; }
};

struct ZTSMadeDerived : virtual ZTSMadeBase {
    ZTSMadeDerived() { ++sAlive; }
    ~ZTSMadeDerived() override { --sAlive; }
    int kind() const override { return 1; }
    static inline int sAlive = 0;
};

struct ZTSThrowing {
    using ZTMadeWithItsCount = void;
    ZTSThrowing() { throw ZTCInvalidEx(); }
};

class MadePointer : public testing::Test {
protected:
    MadePointer() {
        ZTSPart::sAlive = 0;
        ZTSPart::sDestroyed.clear();
    }
};

}  // namespace

TEST_F(MadePointer, TakesOneAllocationAndReleasesLikeAnyOther) {
    {
        ZTCPointer<ZTSMade> lMade = ZTCPointer<ZTSMade>::make(7);
        const ZTCPointer<ZTSMade> lCopy(lMade);
        EXPECT_EQ(7, lCopy->mValue);
        lMade = ZTCPointer<ZTSMade>::make(8);
        EXPECT_EQ(2, ZTSPart::sAlive);
    }
    EXPECT_EQ(0, ZTSPart::sAlive);
    EXPECT_EQ((std::vector<int>{7, 8}), ZTSPart::sDestroyed);
    ZTSPart::sDestroyed.reserve(16);
    const unsigned lFailures = failEachAllocation(
        [] {
            try {
                ZTCPointer<ZTSMade>::make(1);
            } catch (const ZTCNoMemoryEx& lrException) {
                EXPECT_STREQ("Out of Memory", lrException.what());
                EXPECT_EQ(2u, lrException.getError());
            }
        },
        [] {});
    EXPECT_EQ(1u, lFailures);
}

TEST_F(MadePointer, IsReleasedThroughABaseToo) {
    {
        const ZTCPointer<ZTSMadeBase> lBase(ZTCPointer<ZTSMadeDerived>::make());
        EXPECT_EQ(1, lBase->kind());
        EXPECT_EQ(1, ZTSMadeDerived::sAlive);
    }
    EXPECT_EQ(0, ZTSMadeDerived::sAlive);
}

TEST_F(MadePointer, AConstructorThatThrowsLeavesNothingBehind) {
    EXPECT_THROW(ZTCPointer<ZTSThrowing>::make(), ZTCInvalidEx);
}

TEST_F(MadePointer, ACountedPartOfAnOwnerGoesWithTheOwnerAlone) {
    {
        ZTCCounted<ZTSPart> lOwned(5);
        {
            const ZTCPointer<ZTSPart> lFirst(lOwned);
            const ZTCPointer<ZTSPart> lSecond(lFirst);
            EXPECT_EQ(lFirst.get(), lSecond.get());
            EXPECT_EQ(5, lSecond->mValue);
        }
        EXPECT_EQ(1, ZTSPart::sAlive);
        const ZTCPointer<ZTSPart> lAgain(lOwned);
        EXPECT_EQ(5, lAgain->mValue);
    }
    EXPECT_EQ(0, ZTSPart::sAlive);
    EXPECT_EQ((std::vector<int>{5}), ZTSPart::sDestroyed);
}
