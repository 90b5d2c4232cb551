#include "common/include/HeldLines.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <vector>

#include "tests/support/FailingAllocation.h"

namespace {

class HeldLines : public testing::Test {
protected:
    ~HeldLines() override { mLines.drop(); }

    int add(const std::string& acrLine) { return mLines.add(acrLine.data(), acrLine.size()); }

    std::vector<std::string> lines() const {
        std::vector<std::string> lLines;
        for (std::size_t lBegin = 0; lBegin < mLines.getLength(); lBegin += lLines.back().size()) {
            lLines.emplace_back(mLines.getData() + lBegin, mLines.getLineLength(lBegin));
        }
        return lLines;
    }

    ZTCHeldLines mLines;
};

}  // namespace

TEST_F(HeldLines, ComeBackAsTheyWereInTheirOrder) {
    EXPECT_EQ(0, add("one\n"));
    EXPECT_EQ(0, add("\n"));
    EXPECT_EQ(0, add("three\n"));
    EXPECT_EQ((std::vector<std::string>{"one\n", "\n", "three\n"}), lines());
    mLines.drop();
    EXPECT_EQ(0u, mLines.getLength());
    EXPECT_EQ(0, add("four\n"));
    EXPECT_EQ(std::vector<std::string>{"four\n"}, lines());
}

TEST_F(HeldLines, HaveRoomForExactlyTheirBound) {
    EXPECT_EQ(0, add(std::string(ZTCHeldLines::gcCapacity - 1, 'x') + '\n'));
    EXPECT_EQ(ZTCHeldLines::gcFull, add("\n"));
    EXPECT_EQ(1u, lines().size());
    mLines.drop();
    EXPECT_EQ(ZTCHeldLines::gcFull, add(std::string(ZTCHeldLines::gcCapacity, 'x') + '\n'));
    EXPECT_EQ(0u, mLines.getLength());
}

TEST_F(HeldLines, ALineThatFindsNoMemoryIsNotHeldAndTheOthersStay) {
    EXPECT_EQ(0, add("one\n"));
    const std::string lLong = std::string(5000, 'x') + '\n';
    {
        const ZTCFailingAllocation lFailure(1);
        EXPECT_EQ(ENOMEM, add(lLong));
        EXPECT_TRUE(lFailure.hasFailed());
    }
    EXPECT_EQ(std::vector<std::string>{"one\n"}, lines());
    EXPECT_EQ(0, add(lLong));
    EXPECT_EQ((std::vector<std::string>{"one\n", lLong}), lines());
}
