#include "sensor/link/include/Inheritance.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdlib>

#include "sensor/client/include/ClientErrors.h"

static constexpr const char* scVariables[] = {gcLinkVariable, gcControlVariable, gcSettingsVariable,
                                              gcDirectoryVariable, gcStateVariable};

/// Sets the environment up as a keeper does.
class Inheritance : public testing::Test {
protected:
    Inheritance() {
        int lEnds[2];
        EXPECT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET, 0, lEnds), 0);
        mKeeper = ZTCLink(ZTCFileDescriptor(lEnds[0]));
        mLink = lEnds[1];
        mControl = socket(AF_UNIX, SOCK_STREAM, 0);
        mSettings = memfd_create("settings", 0);
        setenv(gcLinkVariable, std::to_string(mLink).c_str(), 1);
        setenv(gcControlVariable, std::to_string(mControl).c_str(), 1);
        setenv(gcSettingsVariable, std::to_string(mSettings).c_str(), 1);
        setenv(gcDirectoryVariable, "/run/tavik", 1);
        setenv(gcStateVariable, "/var/lib/tavik", 1);
    }
    ~Inheritance() override {
        for (const int lDescriptor : {mLink, mControl, mSettings}) {
            close(lDescriptor);  // in vain where it was taken: the taker has closed it
        }
        for (const char* lpName : scVariables) {
            unsetenv(lpName);
        }
    }

    /// What takeInheritance() says; empty where it says nothing.
    static std::string refusal() {
        try {
            takeInheritance();
        } catch (const ZTCBadInputEx& lcrEx) {
            return lcrEx.what();
        }
        return "";
    }

    ZTCLink mKeeper;
    int mLink = -1;
    int mControl = -1;
    int mSettings = -1;
};

TEST_F(Inheritance, IsTakenWholeAndLeftToNoChild) {
    ZTSInheritance lTaken = takeInheritance();
    EXPECT_EQ(lTaken.mDirectory, "/run/tavik");
    EXPECT_EQ(lTaken.mState, "/var/lib/tavik");
    for (const int lDescriptor : {lTaken.mLink.getDescriptor(), lTaken.mControl.get(), lTaken.mSettings.get()}) {
        EXPECT_NE(fcntl(lDescriptor, F_GETFD) & FD_CLOEXEC, 0);
    }
    for (const char* lpName : scVariables) {
        EXPECT_EQ(std::getenv(lpName), nullptr) << lpName;
    }
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Finish;
    ASSERT_EQ(mKeeper.send(lMessage), ZTLR_Done);
    ZTSLinkMessage lReceived;
    EXPECT_EQ(lTaken.mLink.receive(lReceived), ZTLR_Done);
    EXPECT_EQ(lReceived.mType, ZTLM_Finish);
}

TEST_F(Inheritance, AMissingVariableIsNamed) {
    unsetenv(gcLinkVariable);
    EXPECT_THAT(refusal(), testing::StartsWith("TAVIK_LINK_FD is not set"));
}

TEST_F(Inheritance, AVariableThatNamesNoDescriptorOfItsKindIsNamedWithItsValue) {
    for (const char* lpValue : {"", "x", "7x", "-1", "0", "99999", "99999999999999999999"}) {
        setenv(gcLinkVariable, lpValue, 1);
        EXPECT_THAT(refusal(), testing::StartsWith("TAVIK_LINK_FD is ")) << lpValue;
    }
    setenv(gcLinkVariable, std::to_string(mSettings).c_str(), 1);
    EXPECT_THAT(refusal(), testing::HasSubstr("\"" + std::to_string(mSettings) + "\""));
}

TEST(ReadWhole, YieldsAllOfALongFileWhereverItsPositionIs) {
    const ZTCFileDescriptor lFile(memfd_create("long", MFD_CLOEXEC));
    const std::string lText(10000, 'z');
    ASSERT_EQ(write(lFile.get(), lText.data(), lText.size()), 10000);
    EXPECT_EQ(readWhole(lFile), lText);
    EXPECT_EQ(readWhole(lFile), lText);
}
