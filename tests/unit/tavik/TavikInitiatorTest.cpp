#include "tavik/include/TavikInitiator.h"

#include <gtest/gtest.h>

#include <map>
#include <string>

#include "common/include/Log.h"
#include "tests/support/Bytes.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/agentcommon/support/TestLog.h"

namespace {

class TavikInitiator : public testing::Test {
protected:
    TavikInitiator()
        : mLog(mDirectory.path("log")),
          mNode(new ZTCWorldWideName(makeWwn(1).mBytes.data())),
          mPort(new ZTCWorldWideName(makeWwn(2).mBytes.data())),
          mInitiator(5, mNode, mPort) {}

    void add(unsigned char aCategory, unsigned char aSubcategory, unsigned aHandle) {
        mInitiator.addRegEvent(ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(aCategory, aSubcategory)), aHandle);
    }

    std::vector<std::pair<unsigned, unsigned>> registrations() const {
        std::vector<std::pair<unsigned, unsigned>> lRegistrations;
        for (auto lEntry = mInitiator.r_begin(); lEntry != mInitiator.r_end(); ++lEntry) {
            lRegistrations.emplace_back(lEntry->first, lEntry->second);
        }
        return lRegistrations;
    }

    using ZTCRegistrations = std::vector<std::pair<unsigned, unsigned>>;

    ZTCTemporaryDirectory mDirectory;
    ZTCTestLog mLog;
    ZTCPointer<ZTCWorldWideName> mNode;
    ZTCPointer<ZTCWorldWideName> mPort;
    ZTCTavikInitiator mInitiator;
};

}  // namespace

TEST_F(TavikInitiator, SharesItsNamesAndStartsWithoutRegistrations) {
    EXPECT_EQ(5u, mInitiator.getBoardId());
    EXPECT_EQ(mNode.get(), mInitiator.getWwnn().get());
    EXPECT_EQ(mPort.get(), mInitiator.getWwpn().get());
    EXPECT_TRUE(registrations().empty());
}

TEST_F(TavikInitiator, KeyIsTheNodeNameADotAndThePortName) {
    EXPECT_EQ(std::string(mNode->getString().get()) + "." + mPort->getString().get(), mInitiator.getKey().get());
}

TEST_F(TavikInitiator, WalksItsRegistrationsInTheOrderOfTheirKeyForms) {
    add(16, 1, 30);
    add(0, 2, 10);
    add(1, 1, 20);
    EXPECT_EQ((ZTCRegistrations{{0x0002, 10}, {0x0101, 20}, {0x1001, 30}}), registrations());
    EXPECT_TRUE(mLog.texts().empty());
}

TEST_F(TavikInitiator, ARegistrationOfTheSameKindIsReportedAndReplacesTheHandle) {
    add(1, 1, 20);
    add(1, 1, 21);
    EXPECT_EQ((ZTCRegistrations{{0x0101, 21}}), registrations());
    const auto lLine = mLog.find("-E- addRegEvent FAILED due duplicated keyform 257 has been detected");
    ASSERT_TRUE(lLine.has_value());
    EXPECT_EQ("tavik/include/TavikInitiator", lLine->mLabel);
    EXPECT_EQ("addRegEvent", lLine->mFunction);
}

TEST_F(TavikInitiator, CleaningDropsEveryRegistration) {
    add(1, 1, 20);
    add(1, 2, 21);
    mInitiator.cleanRegs();
    EXPECT_TRUE(registrations().empty());
    add(1, 1, 22);
    EXPECT_EQ((ZTCRegistrations{{0x0101, 22}}), registrations());
    EXPECT_TRUE(mLog.texts().empty());
}
