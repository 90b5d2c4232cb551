#include <gtest/gtest.h>
#include <sys/stat.h>

#include <nlohmann/json.hpp>

#include "sensor/collector/include/HistoryWriter.h"
#include "sensor/metrics/include/Metrics.h"
#include "tests/unit/store/StoreFixture.h"

/// What the adapters' library says it has lost, over the starts of the agent.
class LibraryLoss : public ZTCStoreTest {
protected:
    void note(const std::string& acrGeneration, std::uint64_t aTotal) {
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        lpPage->mStartId = acrGeneration;
        lpPage->mLosses.emplace_back();
        lpPage->mLosses.back().mName = "FC messages";
        lpPage->mLosses.back().mTotal = aTotal;
        const ZTCSpool lSpool(mDirectory.path());
        ZTCHistoryWriter lWriter(store(), lSpool, [](const std::string&) {});  // each is a new process
        inTransaction([&] { lWriter.notePage(lpPage); });
    }
    std::uint64_t total() {
        return nlohmann::json::parse(store().getValue(gcLibraryLossesValue))["total"]["FC messages"];
    }
};

TEST_F(LibraryLoss, CountsOnThroughStartsOfTheAgentAndOfTheCollector) {
    note("a1", 3);
    EXPECT_EQ(total(), 3U);
    note("a1", 5);
    EXPECT_EQ(total(), 5U);
    note("a1", 5);
    EXPECT_EQ(total(), 5U);
    note("a2", 4);
    EXPECT_EQ(total(), 9U);
    note("a2", 6);
    EXPECT_EQ(total(), 11U);
}
