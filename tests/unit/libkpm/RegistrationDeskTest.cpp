#include "libkpm/common/include/RegistrationDesk.h"

#include <gtest/gtest.h>

#include <vector>

#include "libkpm/common/include/PortName.h"

static constexpr HBA_wwn scNode{{0x20, 0, 0, 0, 0, 0, 0, 1}};
static constexpr HBA_wwn scPort{{0x10, 0, 0, 0, 0, 0, 0, 1}};
static constexpr HBA_wwn scOther{{0x10, 0, 0, 0, 0, 0, 0, 2}};

static void sOnScope(unsigned, HBA_wwn, unsigned, unsigned, void*, ZT_event*) {}
static void sOnEvent(unsigned, ...) {}

/// Two boards with one port name, and two kinds: 0 is registered as (4, 1), 1 per board as 2.
class RegistrationDesk : public testing::Test, protected ZTCRegistrationDesk {
protected:
    RegistrationDesk() : ZTCRegistrationDesk(2) {}

    std::uint32_t getNumberOfAdapters() const override { return mAdapters; }
    std::uint32_t getNumberOfBoardsEver() const override { return 3; }
    std::uint32_t answerAdapterInfo(std::uint32_t, ZTSBoardNames& arNames) override {
        arNames = {scNode, scPort};
        return mInfoStatus;
    }
    bool isPortOf(std::uint32_t, const HBA_wwn& acrPort) const override { return isSameName(acrPort, scPort); }
    std::optional<std::size_t> findKind(std::uint32_t aCategory, std::uint32_t aSubcategory) const override {
        if (aCategory == 4 && aSubcategory == 1) {
            return 0;
        }
        return aCategory == 0 && aSubcategory == 2 ? std::optional<std::size_t>(1) : std::nullopt;
    }
    ZTSRegistrationAnswer answerRegistration(std::uint32_t, std::size_t) override { return mAnswer; }
    std::uint32_t answerUnregistration(std::uint32_t, std::size_t) override { return mUnregisterStatus; }
    void noteRegistration(std::uint32_t, std::size_t aKind) override { mNoted.push_back(aKind); }

    std::uint32_t registerPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                               std::uint32_t aSubcategory) {
        mHandle = 4711;
        return registerForPort(aBoard, acrPort, aCategory, aSubcategory, this, &mHandle, &sOnScope);
    }

    std::uint32_t mAdapters = 2;
    std::uint32_t mInfoStatus = 0;
    std::uint32_t mUnregisterStatus = 0;
    ZTSRegistrationAnswer mAnswer;
    std::vector<std::size_t> mNoted;
    std::uint32_t mHandle = 0;
};

TEST_F(RegistrationDesk, NamesAreWrittenForABoardThereIsAndForNoOther) {
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    EXPECT_EQ(getAdapterInfo(1, &lNode, &lPort), ZTLST_Success);
    EXPECT_TRUE(isSameName(lNode, scNode));
    EXPECT_TRUE(isSameName(lPort, scPort));
    lPort = {};
    EXPECT_EQ(getAdapterInfo(2, &lNode, &lPort), ZTLST_NoSuchBoard);
    EXPECT_EQ(getAdapterInfo(1, nullptr, &lPort), ZTLST_NullPointer);
    EXPECT_EQ(getAdapterInfo(1, &lNode, nullptr), ZTLST_NullPointer);
    mInfoStatus = 77;
    EXPECT_EQ(getAdapterInfo(1, &lNode, &lPort), 77u);
    EXPECT_TRUE(isZeroName(lPort)) << "nothing is written for a refusal";
}

TEST_F(RegistrationDesk, WrongArgumentsAreRefusedEachWithItsStatusAndLeaveTheHandleAlone) {
    EXPECT_EQ(registerPort(2, scPort, 4, 1), ZTLST_NoSuchBoard);
    EXPECT_EQ(registerPort(0, scOther, 4, 1), ZTLST_NotItsPort);
    EXPECT_EQ(registerPort(0, scPort, 4, 2), ZTLST_NoSuchKind);
    EXPECT_EQ(registerPort(0, scPort, 0, 2), ZTLST_NoSuchKind) << "that one is registered per board";
    EXPECT_EQ(mHandle, 4711u);
    EXPECT_EQ(registerForPort(0, scPort, 4, 1, this, nullptr, &sOnScope), ZTLST_NullPointer);
    EXPECT_EQ(registerForPort(0, scPort, 4, 1, this, &mHandle, nullptr), ZTLST_NullPointer);
    EXPECT_EQ(registerForBoard(2, 2, nullptr, &sOnEvent), 0u);
    EXPECT_EQ(registerForBoard(0, 1, nullptr, &sOnEvent), 0u);
    EXPECT_EQ(registerForBoard(0, 2, nullptr, nullptr), 0u);
    EXPECT_EQ(getRegistry().size(), 0u);
    EXPECT_TRUE(mNoted.empty());
}

TEST_F(RegistrationDesk, ARefusalOfTheLibraryIsHandedOnAndRegistersNothing) {
    mAnswer.mStatus = 99;
    EXPECT_EQ(registerPort(0, scPort, 4, 1), 99u);
    EXPECT_EQ(mHandle, 4711u);
    EXPECT_EQ(registerForBoard(0, 2, nullptr, &sOnEvent), 0u);
    EXPECT_EQ(getRegistry().size(), 0u);
}

TEST_F(RegistrationDesk, EveryStatusThatCountsAsSuccessRegistersAndIsHandedOn) {
    for (const std::uint32_t lStatus : {0u, 5u, 6u, 7u}) {
        mAnswer.mStatus = lStatus;
        mAnswer.mHasSource = lStatus != 6;
        EXPECT_EQ(registerPort(1, scPort, 4, 1), lStatus);
        EXPECT_EQ(getRegistry().find(1, 0)->mHandle, mHandle);
        EXPECT_EQ(getRegistry().find(1, 0)->mHasSource, lStatus != 6);
        EXPECT_EQ(getRegistry().find(1, 0)->mpContext, this);
        const std::uint32_t lHandle = registerForBoard(1, 2, nullptr, &sOnEvent);
        EXPECT_EQ(getRegistry().find(1, 1)->mHandle, lHandle);
    }
    EXPECT_EQ(mNoted, (std::vector<std::size_t>{0, 1, 0, 1, 0, 1, 0, 1}));
}

TEST_F(RegistrationDesk, ALibraryMayChooseTheHandle) {
    mAnswer.mHandle = 12;
    EXPECT_EQ(registerPort(0, scPort, 4, 1), 0u);
    EXPECT_EQ(mHandle, 12u);
    mAnswer.mHandle = 0;
    EXPECT_EQ(registerForBoard(0, 2, nullptr, &sOnEvent), 0u);
    EXPECT_FALSE(getRegistry().find(0, 1).has_value());
}

TEST_F(RegistrationDesk, ARegistrationIsEndedByItsHandleThroughTheEntryThatMadeIt) {
    ASSERT_EQ(registerPort(0, scPort, 4, 1), 0u);
    const std::uint32_t lLink = registerForBoard(0, 2, nullptr, &sOnEvent);
    EXPECT_EQ(unregisterForPort(3, scPort, mHandle), ZTLST_NoSuchBoard);
    EXPECT_EQ(unregisterForPort(0, scOther, mHandle), ZTLST_NotItsPort);
    EXPECT_EQ(unregisterForPort(1, scPort, mHandle), ZTLST_NoSuchHandle) << "another board's";
    EXPECT_EQ(unregisterForPort(0, scPort, lLink), ZTLST_NoSuchHandle);
    EXPECT_EQ(unregisterForBoard(0, mHandle), ZTLST_NoSuchHandle);
    EXPECT_EQ(unregisterForBoard(3, lLink), ZTLST_NoSuchBoard);
    EXPECT_EQ(unregisterForBoard(2, lLink), ZTLST_NoSuchHandle) << "a board that there was";
    mUnregisterStatus = 88;
    EXPECT_EQ(unregisterForPort(0, scPort, mHandle), 88u);
    EXPECT_EQ(unregisterForBoard(0, lLink), 88u);
    mUnregisterStatus = 0;
    EXPECT_EQ(unregisterForPort(0, scPort, mHandle), ZTLST_Success);
    EXPECT_EQ(unregisterForPort(0, scPort, mHandle), ZTLST_NoSuchHandle);
    EXPECT_EQ(unregisterForBoard(0, lLink), ZTLST_Success);
    EXPECT_EQ(getRegistry().size(), 0u);
}

TEST_F(RegistrationDesk, RegistrationsOfABoardThatHasGoneCanStillBeEnded) {
    ASSERT_EQ(registerPort(1, scPort, 4, 1), 0u);
    const std::uint32_t lLink = registerForBoard(1, 2, nullptr, &sOnEvent);
    mAdapters = 1;
    EXPECT_EQ(unregisterForPort(1, scPort, mHandle), ZTLST_Success);
    EXPECT_EQ(unregisterForBoard(1, lLink), ZTLST_Success);
    EXPECT_EQ(getRegistry().size(), 0u);
    EXPECT_EQ(registerPort(1, scPort, 4, 1), ZTLST_NoSuchBoard);
}
