#include "tests/unit/tavik/support/StatusPageFixture.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

ZTCStatusPageFixture::ZTCStatusPageFixture() : mBell(eventfd(0, EFD_NONBLOCK)) {
    setenv(gcStatusPageVariable, pagePath().c_str(), 1);
    setenv(gcBellVariable, std::to_string(mBell).c_str(), 1);
}

ZTCStatusPageFixture::~ZTCStatusPageFixture() {
    unsetenv(gcStatusPageVariable);
    unsetenv(gcBellVariable);
    close(mBell);
}

ZTSStatusSnapshot ZTCStatusPageFixture::page() {
    ZTSStatusSnapshot lPage;
    if (!mReader.isOpen()) {
        EXPECT_TRUE(mReader.open(pagePath())) << mReader.getReason();
    }
    EXPECT_TRUE(mReader.read(lPage)) << mReader.getReason();
    return lPage;
}

ZTSStatusRowCopy ZTCStatusPageFixture::row(unsigned aBoard, const std::string& acrKind) {
    return rowNamed(page().mBoards.at(aBoard), acrKind);
}

std::uint64_t ZTCStatusPageFixture::takeRings() {
    std::uint64_t lRings = 0;
    return read(mBell, &lRings, sizeof lRings) == static_cast<ssize_t>(sizeof lRings) ? lRings : 0;
}

void ZTCStatusPageFixture::expectEquations(const ZTSStatusSnapshot& acrPage) {
    EXPECT_TRUE(acrPage.mIsConsistent);
    std::uint64_t lHandedOver = 0;
    const auto lCheck = [&lHandedOver](const ZTSStatusRowCopy& acrRow) {
        EXPECT_EQ(acrRow.getReceived(), acrRow.mConsolidated + acrRow.getRefused());
        EXPECT_GE(acrRow.mConsolidated, acrRow.mHandedOver + acrRow.mDropped);
        EXPECT_EQ(acrRow.mConsolidated, acrRow.mHandedOver + acrRow.getHeld() + acrRow.mDropped);
        EXPECT_EQ(acrRow.getReceived() == 0, acrRow.mLastEvent == 0);
        lHandedOver += acrRow.mHandedOver;
    };
    lCheck(acrPage.mUnknownBoards);
    for (const ZTSStatusBoardCopy& lcrBoard : acrPage.mBoards) {
        for (const ZTSStatusRowCopy& lcrRow : lcrBoard.mRows) {
            lCheck(lcrRow);
        }
    }
    EXPECT_EQ(lHandedOver, acrPage.mHandedOverOccurrences);
    EXPECT_LE(acrPage.mHeldRecords, acrPage.getHeld());
    EXPECT_EQ(acrPage.mHeldRecords == 0, acrPage.getHeld() == 0);
}

const ZTSStatusRowCopy& rowNamed(const ZTSStatusBoardCopy& acrBoard, const std::string& acrKind) {
    for (std::size_t lRow = 0; lRow < acrBoard.mRows.size(); ++lRow) {
        if (acrKind == getStatusRowName(lRow)) {
            return acrBoard.mRows[lRow];
        }
    }
    throw std::runtime_error("no row is named " + acrKind);
}
