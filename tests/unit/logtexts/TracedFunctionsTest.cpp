#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <set>
#include <string>
#include <vector>

#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/logtexts/support/Functions.h"
#include "tests/unit/logtexts/support/TracedFunctions.h"

namespace {

std::vector<std::string> sNamesOf(const std::string& acrSource) {
    std::vector<std::string> lNames;
    for (const ZTSFunction& lcrFunction : readFunctions(acrSource)) {
        lNames.push_back(lcrFunction.mName);
    }
    return lNames;
}

std::string sExitOf(const std::string& acrBody) {
    return findUntracedExit({"f", acrBody});
}

/// The functions that the agent's own sources define, as "PATH NAME".
const std::vector<ZTSFunction>& sAgentFunctions() {
    static const auto& srFunctions = *[] {
        auto* const lpFunctions = new std::vector<ZTSFunction>;
        const std::filesystem::path lRoot(TAVIK_SOURCE_ROOT);
        for (const auto& lcrEntry : std::filesystem::recursive_directory_iterator(lRoot / "tavik")) {
            const std::string lExtension = lcrEntry.path().extension().string();
            if ((lExtension == ".cpp" || lExtension == ".h")) {
                for (const ZTSFunction& lcrFunction : readFunctions(readFile(lcrEntry.path().string()))) {
                    lpFunctions->push_back(
                        {lcrEntry.path().filename().string() + ' ' + lcrFunction.mName, lcrFunction.mBody});
                }
            }
        }
        return lpFunctions;
    }();
    return srFunctions;
}

std::multiset<std::string> sRowsOf(bool aAreTraced) {
    std::multiset<std::string> lRows;
    for (const ZTSFunction& lcrFunction : sAgentFunctions()) {
        if (isTraced(lcrFunction) == aAreTraced) {
            lRows.insert(lcrFunction.mName);
        }
    }
    return lRows;
}

std::multiset<std::string> sMissing(const std::multiset<std::string>& acrFrom,
                                    const std::multiset<std::string>& acrIn) {
    std::multiset<std::string> lMissing;
    std::set_difference(acrFrom.begin(), acrFrom.end(), acrIn.begin(), acrIn.end(),
                        std::inserter(lMissing, lMissing.end()));
    return lMissing;
}

}  // namespace

// ---- Reading sources ----

TEST(TracedFunctions, EverySortOfDefinitionIsFound) {
    const char* const lpSource = R"source(
        namespace {
        constexpr int gcX[] = {1, 2};
        const struct { int a; } gcRows[] = {{f(1)}, {2}};
        template <typename T> T* sMake(int a = 1) { return 0; }
        bool sIs(const S& a) noexcept ZT_REQUIRES(a.getLock()) { return a.b(); }
        int sUnchecked() ZT_NO_THREAD_SAFETY_ANALYSIS { return 1; }
        constexpr int sCompute(int a) { return a; }
        constexpr auto gcTable = [] { int l = 1; return l; }();
        }  // namespace
        class ZT_SCOPED_CAPABILITY A : public B {
        public:
            explicit A(int a) : mX{a}, mY(a) { ZT_ENTRY(); }
            ~A() override = default;
            int get() const { return mX; }
            bool operator==(const A& b) const { return mX == b.mX; }
            struct Inner { void deep() {} };
        private:
            int mX = 0;
        };
        void A::run(unsigned) {
            if (a) { b(); }
        }
        void declared();
        extern "C" { void plain() {} }
    )source";
    EXPECT_EQ((std::vector<std::string>{"sMake", "sIs", "sUnchecked", "A::A", "A::get",
                                        "A::operator==", "A::Inner::deep", "A::run", "plain"}),
              sNamesOf(lpSource));
}

TEST(TracedFunctions, AFunctionIsTracedByItsFirstStatement) {
    EXPECT_TRUE(isTraced({"f", "ZT_ENTRY(); a();"}));
    EXPECT_FALSE(isTraced({"f", "a(); ZT_ENTRY();"}));
    EXPECT_TRUE(isTraced(readFunctions("void f() { // why\n ZT_ENTRY(); }").at(0)));
}

TEST(TracedFunctions, EveryWayOutOfAFunctionIsSeen) {
    EXPECT_EQ("", sExitOf("ZT_ENTRY(); a(); ZT_EXIT();"));
    EXPECT_EQ("", sExitOf("ZT_ENTRY(); if (a) { ZT_EXIT(); return 1; } ZT_EXIT(); return 2;"));
    EXPECT_EQ("", sExitOf("ZT_ENTRY(); ZT_THROW(ZTCInvalidEx, t, 1);"));
    EXPECT_EQ("", sExitOf("ZT_ENTRY(); ZT_EXIT(); log(); throw ZTCInvalidEx();"));
    EXPECT_NE("", sExitOf("ZT_ENTRY(); a();"));
    EXPECT_NE("", sExitOf("ZT_ENTRY(); if (a) { return; } ZT_EXIT();"));
    EXPECT_NE("", sExitOf("ZT_ENTRY(); if (a) { ZT_EXIT(); } else { throw; } ZT_EXIT();"));
    EXPECT_NE("", sExitOf("ZT_ENTRY(); if (a) { { ZT_EXIT(); } return; } ZT_EXIT();"));
    EXPECT_NE("", sExitOf("ZT_ENTRY(); ZT_EXIT(); if (a) { b(); }"));
}

TEST(TracedFunctions, AWayOutOfALambdaIsNoneOfItsFunction) {
    const auto lFunction = readFunctions(
        "void f() { ZT_ENTRY(); a([&](int b) { if (b) { return 1; } return 2; }, [] { return 3; }); ZT_EXIT(); }");
    EXPECT_EQ("", findUntracedExit(lFunction.at(0)));
    EXPECT_NE("", findUntracedExit(readFunctions("int f() { ZT_ENTRY(); int a[2] = {1, 2}; return a[0]; }").at(0)));
}

// ---- The agent's functions and the tables ----

TEST(TracedFunctions, EveryTracingFunctionStandsInTheTableAndEachOfTheTableTraces) {
    const std::multiset<std::string> lTable(tracedFunctions().begin(), tracedFunctions().end());
    EXPECT_EQ(std::multiset<std::string>{}, sMissing(sRowsOf(true), lTable)) << "not in the table";
    EXPECT_EQ(std::multiset<std::string>{}, sMissing(lTable, sRowsOf(true))) << "does not trace, or is gone";
}

TEST(TracedFunctions, WhatDoesNotTraceIsAnAccessor) {
    const std::multiset<std::string> lTable(accessorFunctions().begin(), accessorFunctions().end());
    EXPECT_EQ(std::multiset<std::string>{}, sMissing(sRowsOf(false), lTable)) << "does not trace";
    EXPECT_EQ(std::multiset<std::string>{}, sMissing(lTable, sRowsOf(false))) << "traces, or is gone";
    for (const ZTSFunction& lcrFunction : sAgentFunctions()) {
        if (!isTraced(lcrFunction)) {
            EXPECT_LE(std::count(lcrFunction.mBody.begin(), lcrFunction.mBody.end(), ';'), 1) << lcrFunction.mName;
        }
    }
}

TEST(TracedFunctions, EachSaysThatItWasLeftOnEveryPath) {
    for (const ZTSFunction& lcrFunction : sAgentFunctions()) {
        if (isTraced(lcrFunction)) {
            EXPECT_EQ("", findUntracedExit(lcrFunction)) << lcrFunction.mName;
        }
    }
}
