#include <gtest/gtest.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class TargetRegistration : public ZTCTavikFixture {
protected:
    TargetRegistration() { bringUp(); }

    static std::string namesText(const ZTSTestTarget& acrTarget) {
        return wwnText(acrTarget.mNodeName) + ", " + wwnText(acrTarget.mPortName) + ", " +
               std::to_string(acrTarget.mFcId);
    }
    static std::string fcText(const ZTSTestTarget& acrTarget) {
        return "-N- Registered Target <" + namesText(acrTarget) + ">";
    }
    static std::string wwpnText(const ZTSTestTarget& acrTarget) {
        return "-N- Added Target <" + namesText(acrTarget) + "> to Wwpn Target Map";
    }

    static ZTCBytes requestOf(const std::vector<ZTSTestTarget>& acrTargets) {
        ZTCByteWriter lBody;
        lBody.u8(3).u32(acrTargets.size());
        for (const ZTSTestTarget& lcrTarget : acrTargets) {
            lBody.wwn(lcrTarget.mNodeName).wwn(lcrTarget.mPortName).u32(lcrTarget.mFcId);
        }
        return lBody.bytes();
    }

    void expectBoth(const ZTSTestTarget& acrTarget) {
        EXPECT_EQ(namesText(acrTarget), mSystem->targetByFcId(acrTarget.mFcId));
        EXPECT_EQ(namesText(acrTarget), mSystem->targetByPortName(acrTarget.mPortName));
    }
    void expectNeither(const ZTSTestTarget& acrTarget) {
        EXPECT_EQ("", mSystem->targetByFcId(acrTarget.mFcId));
        EXPECT_EQ("", mSystem->targetByPortName(acrTarget.mPortName));
    }

    const ZTSTestTarget mFirst{makeWwn(0x200000000000000A), makeWwn(0x100000000000000A), 0x010203};
    const ZTSTestTarget mSecond{makeWwn(0x200000000000000B), makeWwn(0x100000000000000B), 0x040506};
};

}  // namespace

TEST_F(TargetRegistration, EveryTargetIsAddedByItsFcIdAndThenByItsPortName) {
    EXPECT_EQ(gcSuccessHex, registerTargets({mFirst, mSecond}));
    EXPECT_EQ((std::vector<std::string>{fcText(mFirst), wwpnText(mFirst), fcText(mSecond), wwpnText(mSecond)}),
              mLog.texts());
    EXPECT_EQ(".//TavikSystem", mLog.lines().at(0).mLabel);
    EXPECT_EQ("addFcTarget", mLog.lines().at(0).mFunction);
    EXPECT_EQ("addWwpnTarget", mLog.lines().at(1).mFunction);
    expectBoth(mFirst);
    expectBoth(mSecond);
    EXPECT_TRUE(mLibrary.calls().empty());
}

TEST_F(TargetRegistration, TheSameTargetAgainChangesNothingAndLogsNothing) {
    registerTargets({mFirst});
    mLog.forget();
    EXPECT_EQ(gcSuccessHex, registerTargets({mFirst, mFirst}));
    EXPECT_TRUE(mLog.texts().empty());
    expectBoth(mFirst);
}

TEST_F(TargetRegistration, OfTwoTargetsWithOneFcIdTheFirstKeepsItAndBothAreFoundByTheirPortNames) {
    const ZTSTestTarget lSameId{mSecond.mNodeName, mSecond.mPortName, mFirst.mFcId};
    EXPECT_EQ(gcSuccessHex, registerTargets({mFirst, lSameId}));
    EXPECT_EQ((std::vector<std::string>{fcText(mFirst), wwpnText(mFirst), wwpnText(lSameId)}), mLog.texts());
    expectBoth(mFirst);
    EXPECT_EQ(namesText(lSameId), mSystem->targetByPortName(lSameId.mPortName));
}

TEST_F(TargetRegistration, OfTwoTargetsWithOnePortNameTheFirstKeepsItAndBothAreFoundByTheirFcIds) {
    const ZTSTestTarget lSamePort{mSecond.mNodeName, mFirst.mPortName, mSecond.mFcId};
    EXPECT_EQ(gcSuccessHex, registerTargets({mFirst, lSamePort}));
    EXPECT_EQ((std::vector<std::string>{fcText(mFirst), wwpnText(mFirst), fcText(lSamePort)}), mLog.texts());
    expectBoth(mFirst);
    EXPECT_EQ(namesText(lSamePort), mSystem->targetByFcId(lSamePort.mFcId));
}

TEST_F(TargetRegistration, AnFcIdIsKeptWholeAndAPortNameIsFoundByItsBytesInOrder) {
    const ZTSTestTarget lWide{makeWwn(1), makeWwn(0x0102030405060708), 0xFF010203};
    registerTargets({lWide, {makeWwn(2), makeWwn(0xFFFFFFFFFFFFFFFF), 0}});
    EXPECT_EQ(namesText(lWide), mSystem->targetByFcId(0xFF010203));
    EXPECT_EQ("", mSystem->targetByFcId(0x010203));
    EXPECT_EQ("", mSystem->targetByPortName(makeWwn(0x0807060504030201)));
    EXPECT_NE("", mSystem->targetByPortName(makeWwn(0xFFFFFFFFFFFFFFFF)));
    EXPECT_NE("", mSystem->targetByFcId(0));
}

TEST_F(TargetRegistration, NoTargetsAreInvalidAndNothingIsAdded) {
    EXPECT_EQ(gcInvalidHex, requestHex("03 00000000"));
    // The count decides, whatever follows.
    EXPECT_EQ(gcInvalidHex, requestHex("03 00000000 200000000000000a 100000000000000a 00010203"));
    EXPECT_TRUE(mLog.texts().empty());
    expectNeither(mFirst);
}

TEST_F(TargetRegistration, ARequestThatIsCutAnywhereAddsTheTargetsThatAreWhole) {
    const ZTCBytes lWhole = requestOf({mFirst, mSecond});
    for (std::size_t lLength = 1; lLength < lWhole.size(); ++lLength) {
        SCOPED_TRACE(lLength);
        mSystem = std::make_unique<ZTCTestTavikSystem>();
        ZTCTavikProtocolHandler lHandler(mSystem.get());
        ZTCPointer<ZTCBuffer> lResponse;
        const ZTCBytes lCut(lWhole.begin(), lWhole.begin() + static_cast<std::ptrdiff_t>(lLength));
        try {
            lHandler.process(makeBuffer(lCut), lResponse);
            ADD_FAILURE() << "no exception";
        } catch (const ZTCInvalidEx& lcrException) {
            EXPECT_STREQ("Not enough data in stream", lcrException.what());
            EXPECT_EQ(6u, lcrException.getError());
        }
        EXPECT_FALSE(lResponse != nullptr);
        const bool lHasFirst = lLength >= 5 + 20;
        lHasFirst ? expectBoth(mFirst) : expectNeither(mFirst);
        expectNeither(mSecond);
    }
}

TEST_F(TargetRegistration, ACountBeyondTheTargetsThatFollowTakesNoMemoryForThem) {
    EXPECT_THROW(requestHex("03 ffffffff 200000000000000a 100000000000000a 00010203"), ZTCInvalidEx);
    expectBoth(mFirst);
    EXPECT_EQ((std::vector<std::string>{fcText(mFirst), wwpnText(mFirst)}), mLog.texts());
}

TEST_F(TargetRegistration, TargetsBeyondTheCountAreIgnored) {
    EXPECT_EQ(gcSuccessHex, requestHex("03 00000001 200000000000000a 100000000000000a 00010203"
                                       "200000000000000b 100000000000000b 00040506 ff"));
    expectBoth(mFirst);
    expectNeither(mSecond);
}

TEST_F(TargetRegistration, ATargetThatFindsNoMemoryIsAddedByTheNextRequest) {
    const ZTCPointer<ZTCBuffer> lRequest = makeBuffer(requestOf({mFirst}));
    unsigned lFailures = 0;
    for (bool lFailed = true; lFailed;) {
        SCOPED_TRACE(lFailures);
        mSystem = std::make_unique<ZTCTestTavikSystem>();
        ZTCTavikProtocolHandler lHandler(mSystem.get());
        ZTCPointer<ZTCBuffer> lResponse;
        bool lHasThrown = false;
        lFailed = failAllocation(lFailures + 1, [&] {
            try {
                lHandler.process(lRequest, lResponse);
            } catch (const ZTCNoMemoryEx&) {
                lHasThrown = true;
            }
        });
        EXPECT_EQ(lFailed, lHasThrown);
        EXPECT_EQ(!lFailed, lResponse != nullptr);
        lHandler.process(lRequest, lResponse);
        expectBoth(mFirst);
        lFailures += lFailed ? 1 : 0;
    }
    EXPECT_LT(8u, lFailures);
}

TEST_F(TargetRegistration, AHandlerWithAnotherCodeEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            ZTCPointer<ZTCBuffer> lResponse;
            mSystem->getProtocolHandler()->handleRegisterTargetsCommand(makeBuffer(bytesOf("05 00000001")), lResponse);
        },
        testing::ExitedWithCode(1), failedAssertion("ZTSTVKC_RegisterTargets == lType"));
}
