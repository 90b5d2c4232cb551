#include "libkpm/common/include/OpenLibrary.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace {

/// Answers with what it is asked, and throws where the board is 7.
struct ZTSAskedEngine {
    static std::uint32_t answer(std::uint32_t aBoard) {
        if (aBoard == 7) {
            throw std::runtime_error("board 7 has failed");
        }
        return 100 + aBoard;
    }
    static std::uint32_t getNumberOfAdapters() { return 3; }
    static std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn*, HBA_wwn*) { return answer(aIndex); }
    static std::uint32_t registerForPort(std::uint32_t aBoard, HBA_wwn, std::uint32_t, std::uint32_t, void*,
                                         std::uint32_t*, KPM_ScopeCallback) {
        return answer(aBoard);
    }
    static std::uint32_t unregisterForPort(std::uint32_t aBoard, HBA_wwn, std::uint32_t) { return answer(aBoard); }
    static std::uint32_t registerForBoard(std::uint32_t aBoard, std::uint32_t, void*, KPM_EventCallback) {
        return answer(aBoard);
    }
    static std::uint32_t unregisterForBoard(std::uint32_t aBoard, std::uint32_t) { return answer(aBoard); }
};

struct ZTSAskedSession {
    explicit ZTSAskedSession(bool& arIsAlive) : mrIsAlive(arIsAlive) { mrIsAlive = true; }
    ~ZTSAskedSession() { mrIsAlive = false; }
    ZTSAskedSession(const ZTSAskedSession&) = delete;
    ZTSAskedSession& operator=(const ZTSAskedSession&) = delete;

    ZTSAskedEngine mEngine;
    bool& mrIsAlive;
};

std::string& sReported() {
    static auto& srReported = *new std::string;
    return srReported;
}

void sReport(const char* apWhat) noexcept {
    sReported() += apWhat;
}

using ZTCEntries = ZTCEngineEntries<ZTSAskedSession, sReport>;

class OpenLibrary : public testing::Test {
protected:
    OpenLibrary() { sReported().clear(); }
    ~OpenLibrary() override { mrLibrary.takeSession(); }

    void open() {
        ASSERT_TRUE(mrLibrary.beginOpening());
        mrLibrary.endOpening(std::make_shared<ZTSAskedSession>(mIsAlive));
    }

    ZTCOpenLibrary<ZTSAskedSession>& mrLibrary = ZTCOpenLibrary<ZTSAskedSession>::get();
    bool mIsAlive = false;
    HBA_wwn mName{};
};

}  // namespace

TEST_F(OpenLibrary, EveryEntryRefusesBeforeItIsOpen) {
    EXPECT_EQ(0u, ZTCEntries::getNumberOfAdapters());
    EXPECT_EQ(ZTLST_NotOpen, ZTCEntries::getAdapterInfo(0, &mName, &mName));
    EXPECT_EQ(ZTLST_NotOpen, ZTCEntries::registerForPort(0, mName, 4, 1, nullptr, nullptr, nullptr));
    EXPECT_EQ(ZTLST_NotOpen, ZTCEntries::unregisterForPort(0, mName, 1));
    EXPECT_EQ(0u, ZTCEntries::registerForBoard(0, 1, nullptr, 0, nullptr));
    EXPECT_EQ(ZTLST_NotOpen, ZTCEntries::unregisterForBoard(0, 1));
    EXPECT_EQ("", sReported());
}

TEST_F(OpenLibrary, EveryEntryAsksTheEngineOfTheOpenSession) {
    open();
    EXPECT_EQ(3u, ZTCEntries::getNumberOfAdapters());
    EXPECT_EQ(101u, ZTCEntries::getAdapterInfo(1, &mName, &mName));
    EXPECT_EQ(102u, ZTCEntries::registerForPort(2, mName, 4, 1, nullptr, nullptr, nullptr));
    EXPECT_EQ(103u, ZTCEntries::unregisterForPort(3, mName, 1));
    EXPECT_EQ(104u, ZTCEntries::registerForBoard(4, 1, nullptr, 0, nullptr));
    EXPECT_EQ(105u, ZTCEntries::unregisterForBoard(5, 1));
}

TEST_F(OpenLibrary, AnExceptionEndsInAStatusAndIsReported) {
    open();
    EXPECT_EQ(ZTLST_NoResources, ZTCEntries::getAdapterInfo(7, &mName, &mName));
    EXPECT_EQ("board 7 has failed", sReported());
    EXPECT_EQ(0u, ZTCEntries::registerForBoard(7, 1, nullptr, 0, nullptr)) << "a handle, not a status";
}

TEST_F(OpenLibrary, OnlyOneOpensIt) {
    ASSERT_TRUE(mrLibrary.beginOpening());
    EXPECT_FALSE(mrLibrary.beginOpening()) << "while another opens it";
    mrLibrary.endOpening(std::make_shared<ZTSAskedSession>(mIsAlive));
    EXPECT_FALSE(mrLibrary.beginOpening()) << "while it is open";
    mrLibrary.takeSession();
    EXPECT_TRUE(mrLibrary.beginOpening());
    mrLibrary.endOpening(nullptr);
    EXPECT_EQ(nullptr, mrLibrary.getSession()) << "opening has failed";
    EXPECT_TRUE(mrLibrary.beginOpening());
    mrLibrary.endOpening(nullptr);
}

TEST_F(OpenLibrary, ASessionLivesAsLongAsSomeoneUsesIt) {
    open();
    auto lpUsed = mrLibrary.getSession();
    mrLibrary.takeSession();
    EXPECT_EQ(ZTLST_NotOpen, ZTCEntries::unregisterForBoard(0, 1));
    EXPECT_TRUE(mIsAlive);
    lpUsed.reset();
    EXPECT_FALSE(mIsAlive);
}
