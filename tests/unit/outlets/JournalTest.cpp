#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <map>
#include <set>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/outlets/include/JournalOutlet.h"
#include "sensor/views/include/KindTexts.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/store/Frames.h"

using testing::HasSubstr;

/// A journal of the test's own: it reads the native protocol, written down here once more.
class Journal : public testing::Test {
protected:
    void listen() {
        mSocket = ZTCFileDescriptor(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
        sockaddr_un lAddress{};
        lAddress.sun_family = AF_UNIX;
        mPath.copy(lAddress.sun_path, sizeof(lAddress.sun_path) - 1);
        ASSERT_EQ(bind(mSocket.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)), 0);
        const timeval lPatience{.tv_sec = gcTestPatience.count(), .tv_usec = 0};
        setsockopt(mSocket.get(), SOL_SOCKET, SO_RCVTIMEO, &lPatience, sizeof(lPatience));
    }
    std::map<std::string, std::string> receive() {
        std::string lEntry(1 << 20, '\0');
        iovec lPart{lEntry.data(), lEntry.size()};
        alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> lControl{};
        msghdr lMessage{};
        lMessage.msg_iov = &lPart;
        lMessage.msg_iovlen = 1;
        lMessage.msg_control = lControl.data();
        lMessage.msg_controllen = lControl.size();
        const ssize_t lSize = recvmsg(mSocket.get(), &lMessage, 0);
        EXPECT_GE(lSize, 0) << std::strerror(errno);
        lEntry.resize(lSize > 0 ? static_cast<std::size_t>(lSize) : 0);
        if (const cmsghdr* const lpHeader = CMSG_FIRSTHDR(&lMessage)) {
            int lDescriptor = -1;
            std::memcpy(&lDescriptor, CMSG_DATA(lpHeader), sizeof(lDescriptor));
            const ZTCFileDescriptor lFile(lDescriptor);
            mSeals = fcntl(lFile.get(), F_GET_SEALS);
            struct stat lStatus {};
            fstat(lFile.get(), &lStatus);
            lEntry.resize(static_cast<std::size_t>(lStatus.st_size));
            EXPECT_EQ(pread(lFile.get(), lEntry.data(), lEntry.size(), 0), lStatus.st_size);
            mHasFile = true;
        }
        return parse(lEntry);
    }
    static std::map<std::string, std::string> parse(const std::string& acrEntry) {
        std::map<std::string, std::string> lFields;
        for (std::size_t lAt = 0; lAt < acrEntry.size();) {
            const std::size_t lEnd = acrEntry.find('\n', lAt);
            const std::string lLine = acrEntry.substr(lAt, lEnd - lAt);
            lAt = lEnd + 1;
            if (const std::size_t lEqual = lLine.find('='); lEqual != std::string::npos) {
                lFields[lLine.substr(0, lEqual)] = lLine.substr(lEqual + 1);
                continue;
            }
            std::size_t lLength = 0;
            for (std::size_t i = 8; i-- > 0;) {
                lLength = lLength << 8 | static_cast<unsigned char>(acrEntry.at(lAt + i));
            }
            lFields[lLine] = acrEntry.substr(lAt + 8, lLength);
            EXPECT_EQ(acrEntry.at(lAt + 8 + lLength), '\n');
            lAt += 8 + lLength + 1;
        }
        return lFields;
    }
    static ZTSOutletChange change(ZTCKindKey aKind, ZTEPhase aPhase) {
        ZTSOutletChange lChange;
        lChange.mEpisode.mKind = aKind;
        lChange.mEpisode.mPhase = aPhase;
        lChange.mEpisode.mSeq = 41;
        lChange.mEpisode.mEpisode = 12;
        lChange.mEpisode.mCount = 20000;
        lChange.mEpisode.mFirst = lChange.mEpisode.mLast = fromMicroseconds(gcBase);
        lChange.mEpisode.mInitiator.mWwpn = makeName(gcLocalPort);
        lChange.mEpisode.mInitiator.mHost = "host7";
        lChange.mEpisode.mRemotePort = ZTSRemotePort{.mWwpn = makeName(gcPortA), .mWwnn = {}, .mFcId = {}};
        lChange.mPort = "array7 ctrl-A";
        lChange.mLine = "{\"seq\":41}";
        return lChange;
    }

    ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("socket");
    ZTCFileDescriptor mSocket;
    bool mHasFile = false;
    int mSeals = 0;
};

TEST_F(Journal, AnEpisodeIsAnEntryWithItsFieldsAndTheIdOfItsKind) {
    listen();
    ZTCJournalOutlet lOutlet(mPath);
    const std::array<ZTSOutletChange, 2> lChanges{change(gcQueueFull, ZTP_Open), change(gcQueueFull, ZTP_Closed)};
    lOutlet.write(lChanges);
    const std::map<std::string, std::string> lOpened = receive();
    EXPECT_THAT(lOpened.at("MESSAGE"), HasSubstr("queue-full at host7 of array7 ctrl-A began: 20000 since"));
    EXPECT_EQ(lOpened.at("MESSAGE_ID"), getMessageId("queue-full"));
    EXPECT_EQ(lOpened.at("PRIORITY"), "5");
    EXPECT_EQ(lOpened.at("SYSLOG_IDENTIFIER"), "tavik");
    EXPECT_EQ(lOpened.at("TAVIK_PHASE"), "open");
    EXPECT_EQ(lOpened.at("TAVIK_SEQ"), "41");
    EXPECT_EQ(lOpened.at("TAVIK_EPISODE"), "12");
    EXPECT_EQ(lOpened.at("TAVIK_COUNT"), "20000");
    EXPECT_EQ(lOpened.at("TAVIK_INITIATOR"), makeName(gcLocalPort).toText());
    EXPECT_EQ(lOpened.at("TAVIK_REMOTE_PORT"), makeName(gcPortA).toText());
    EXPECT_EQ(lOpened.at("TAVIK_JSON"), "{\"seq\":41}");
    EXPECT_EQ(receive().at("TAVIK_PHASE"), "closed");
    EXPECT_FALSE(mHasFile);
}

TEST_F(Journal, AnEntryThatIsTooLargeForADatagramComesWholeAsASealedFile) {
    listen();
    ZTCJournalOutlet lOutlet(mPath);
    ZTSOutletChange lChange = change(gcQueueFull, ZTP_Open);
    lChange.mLine.assign(8 << 20, 'x');
    lOutlet.write({&lChange, 1});
    EXPECT_EQ(receive().at("TAVIK_JSON"), lChange.mLine);
    EXPECT_TRUE(mHasFile);
    EXPECT_EQ(mSeals & (F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE), F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE);
}

TEST_F(Journal, AValueWithALineBreakAddsNoFieldOfItsOwn) {
    const std::map<std::string, std::string> lFields =
        parse(toJournalEntry({{"MESSAGE", "one\nPRIORITY=0"}, {"LAST", "end"}}));
    EXPECT_EQ(lFields, (std::map<std::string, std::string>{{"MESSAGE", "one\nPRIORITY=0"}, {"LAST", "end"}}));
}

TEST_F(Journal, WithoutAJournalItIsAnErrorThatNamesTheSocketAndLaterItWorks) {
    ZTCJournalOutlet lOutlet(mPath);
    const ZTSOutletChange lChange = change(gcLink, ZTP_Open);
    try {
        lOutlet.write({&lChange, 1});
        FAIL() << "it was sent";
    } catch (const ZTCSystemCallEx& lrEx) {
        EXPECT_THAT(lrEx.what(), HasSubstr(mPath));
    }
    listen();
    lOutlet.write({&lChange, 1});
    EXPECT_EQ(receive().at("TAVIK_KIND"), "link");
}

TEST_F(Journal, AJournalThatDoesNotReadIsGivenUpAfterASecond) {
    listen();
    ZTCJournalOutlet lOutlet(mPath);
    const ZTSOutletChange lChange = change(gcLink, ZTP_Open);
    EXPECT_THROW(
        {
            for (int i = 0; i < 100000; ++i) {
                lOutlet.write({&lChange, 1});
            }
        },
        ZTCSystemCallEx);
}

TEST_F(Journal, WhatRetentionTookFirstIsAnEntryOfItsOwn) {
    listen();
    ZTCJournalOutlet(mPath).writeMissed(7, "{}");
    const std::map<std::string, std::string> lFields = receive();
    EXPECT_EQ(lFields.at("TAVIK_COUNT"), "7");
    EXPECT_EQ(lFields.at("MESSAGE_ID"), getMessageId("missed"));
    EXPECT_THAT(lFields.at("MESSAGE"), HasSubstr("7 changes"));
}

static std::string sPlain(const std::string& acrText) {
    std::string lPlain;
    for (const char lByte : acrText) {
        const char lMark = lByte == '\n' ? ' ' : lByte;
        if (lMark != '`' && lMark != '*' && !(lMark == ' ' && lPlain.ends_with(' '))) {
            lPlain += lMark;
        }
    }
    return lPlain;
}

TEST_F(Journal, TheCatalogueHasAnEntryOfEachKindWithTheTextOfTheEventsPage) {
    const std::string lCatalogue = readFile(TAVIK_SOURCE_DIR "/deploy/journal/tavik.catalog");
    std::set<std::string> lIds;
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        const std::string lHead = std::string("-- ") + getMessageId(lrKind.mpName) + "\n";
        EXPECT_TRUE(lIds.insert(lHead).second) << lrKind.mpName;
        const std::size_t lAt = lCatalogue.find(lHead);
        ASSERT_NE(lAt, std::string::npos) << lrKind.mpName;
        const std::string lText = sPlain(lCatalogue.substr(lAt, lCatalogue.find("\n-- ", lAt + 1) - lAt));
        const ZTSKindText* const lpKind = findKindText(lrKind.mpName);
        ASSERT_NE(lpKind, nullptr);
        EXPECT_THAT(lText, HasSubstr(sPlain("Subject: " + lpKind->mTitle)));
        EXPECT_THAT(lText, HasSubstr(sPlain(lpKind->mMeans)));
        EXPECT_THAT(lText, HasSubstr(sPlain(lpKind->mLookAt)));
    }
    for (const char* const lpOther : {"other", "missed"}) {
        EXPECT_TRUE(lIds.insert(getMessageId(lpOther)).second);
        EXPECT_NE(lCatalogue.find(std::string("-- ") + getMessageId(lpOther) + "\n"), std::string::npos);
    }
    EXPECT_STREQ(getMessageId("unknown-9-9"), getMessageId("other"));
}
