#include "tavik/include/Bell.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cstdlib>

#include "sensor/agentcommon/include/StatusPage.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/StatusPageFixture.h"

namespace {

class Bell : public ZTCStatusPageFixture {
protected:
    static constexpr unsigned scHalf = gcMaxScopeDataSize / 2;
};

/// A bell that the test rings by itself.
class OpenedBell : public ::testing::Test {
protected:
    ~OpenedBell() override { close(mDescriptor); }

    std::uint64_t takeRings() const {
        std::uint64_t lRings = 0;
        return read(mDescriptor, &lRings, sizeof lRings) > 0 ? lRings : 0;
    }

    const int mDescriptor = eventfd(0, EFD_NONBLOCK);
    ZTCBell mBell{100};
};

}  // namespace

TEST_F(Bell, IsRungOnceWhenTheBytesHeldPassHalfOfTheLimit) {
    collect();
    mSystem->makePendingRecord(0, scHalf);
    mSystem->getBell().ringIfDue();
    EXPECT_EQ(0u, takeRings()) << "half is not past half";
    deliverTemperature(0);
    EXPECT_EQ(1u, takeRings());
    deliverLink(0, makeWwn(1));
    deliverRscn(0, makeRscn({1, 2}));
    EXPECT_EQ(0u, takeRings()) << "once until the next retrieval";
    retrieve();
    deliverTemperature(0);
    EXPECT_EQ(0u, takeRings());
    mSystem->makePendingRecord(0, scHalf);
    deliverLink(0, makeWwn(1));
    EXPECT_EQ(1u, takeRings());
}

TEST_F(Bell, IsRungForBytesThatAreAppendedToARecord) {
    collect(1, 0xFFFFFFFF);
    mSystem->makePendingRecord(0, scHalf);
    mSystem->appendToPendingRecord(ZTCBytes(1, 0));
    mSystem->getBell().ringIfDue();
    EXPECT_EQ(1u, takeRings());
}

TEST_F(Bell, IsRungInTheMiddleOfAnRscn) {
    collect();
    mSystem->makePendingRecord(0, scHalf - 4);
    deliverRscn(0, makeRscn({1}));
    EXPECT_EQ(1u, takeRings());
}

TEST_F(Bell, IsRungOnceForEventsThatAreRefusedForTheTotal) {
    collect();
    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
    mSystem->getBell().ringIfDue();
    EXPECT_EQ(1u, takeRings());
    deliverTemperature(0);
    EXPECT_EQ(1u, takeRings());
    deliverTemperature(0);
    EXPECT_EQ(0u, takeRings());
    retrieve();
    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
    mSystem->getBell().ringIfDue();
    deliverTemperature(0);
    EXPECT_EQ(2u, takeRings()) << "for what is held, and for the refusal";
}

TEST_F(Bell, IsNotRungForOtherRefusals) {
    collect();
    deliverTemperature(7);
    deliverScope(0, 4, 1, ZTCBytes(3, 0));
    requestHex("02");
    deliverTemperature(0);
    EXPECT_EQ(0u, takeRings());
}

TEST_F(Bell, WithoutTheVariableNothingIsRung) {
    unsetenv(gcBellVariable);
    collect();
    mSystem->makePendingRecord(0, gcMaxScopeDataSize);
    deliverTemperature(0);
    EXPECT_EQ(0u, takeRings());
}

TEST_F(OpenedBell, IsClosedInPrograms) {
    mBell.open(std::to_string(mDescriptor).c_str());
    EXPECT_EQ(FD_CLOEXEC, fcntl(mDescriptor, F_GETFD) & FD_CLOEXEC);
}

TEST_F(OpenedBell, ARingThatARetrievalOvertookDoesNotSilenceTheNextOne) {
    mBell.open(std::to_string(mDescriptor).c_str());
    // The refusal was seen before the retrieval, and rings after it.
    const std::uint64_t lRetrievals = mBell.getRetrievals();
    mBell.noteRetrieval();
    mBell.ringForRefusal(lRetrievals);
    EXPECT_EQ(1u, takeRings());
    mBell.ringForRefusal(mBell.getRetrievals());
    EXPECT_EQ(1u, takeRings());
    mBell.ringForRefusal(mBell.getRetrievals());
    EXPECT_EQ(0u, takeRings());
}

TEST_F(OpenedBell, AfterRetrievalsWithoutARefusalOneRefusalRingsOnce) {
    mBell.open(std::to_string(mDescriptor).c_str());
    for (int i = 0; i < 5; ++i) {
        mBell.noteRetrieval();
    }
    for (int i = 0; i < 3; ++i) {
        mBell.ringForRefusal(mBell.getRetrievals());
    }
    EXPECT_EQ(1u, takeRings());
}

TEST_F(OpenedBell, WhatCannotBeOneIsNotUsed) {
    const int lBlocking = eventfd(0, 0);
    const int lFile = open("/dev/null", O_RDWR | O_NONBLOCK);
    const int lClosed = fcntl(lFile, F_DUPFD, 100);
    close(lClosed);
    for (const std::string& lcrText :
         {std::string("0"), std::string("1"), std::string("2"), std::string("-1"), std::string("x"), std::string("12x"),
          std::string(" 12"), std::string("99999999999"), std::to_string(lBlocking), std::to_string(lFile),
          std::to_string(lClosed)}) {
        SCOPED_TRACE(lcrText);
        ZTCBell lBell(100);
        lBell.open(lcrText.c_str());
        lBell.noteHeld(100);
        lBell.ringIfDue();
        lBell.ringForRefusal(0);
    }
    std::uint64_t lRings = 0;
    EXPECT_EQ(0, fcntl(lBlocking, F_SETFL, O_NONBLOCK));
    EXPECT_EQ(-1, read(lBlocking, &lRings, sizeof lRings)) << "a blocking one was rung";
    close(lBlocking);
    close(lFile);
}
