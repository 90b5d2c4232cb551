#include <gtest/gtest.h>

#include "common/include/Log.h"
#include "tavik/include/EventConsolidation.h"
#include "tavik/include/TavikCore.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/tavik/support/ConsolidationFixture.h"

// Pending state changes as one: an allocation that fails leaves record, identity and totals as they were.

namespace {

class EventConsolidationMemory : public ZTCConsolidationFixture {};

}  // namespace

TEST_F(EventConsolidationMemory, ANewRecordThatFindsNoMemoryChangesNothing) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        const ZTCBytes lOther = otherPayload(lcrKind);
        unsigned lFailures = 0;
        for (bool lFailed = true; lFailed;) {
            SCOPED_TRACE(std::string(lcrKind.mpName) + " allocation " + std::to_string(lFailures + 1));
            mLog.forget();
            deliver(lcrKind);
            // Delivered by hand: nothing but the callback's own allocations may count.
            ZT_event_payload lPayload{0, const_cast<unsigned char*>(lOther.data())};
            ZT_event lEvent{0, 40 + lOther.size(), &lPayload};
            lFailed = failAllocation(lFailures + 1, [&] {
                ScopeCb_Generic(0, HBA_wwn{}, lcrKind.mCategory, lcrKind.mSubcategory, nullptr, &lEvent);
            });
            deliver(lcrKind);
            EXPECT_EQ(lFailed ? 1u : 0u, mLog.count("-E- Error: Out of Memory, processing event callback"));
            const std::size_t lTotal = mSystem->getTotalEventDataSize();
            const ZTSScopeDataResponse lResponse = retrieve();
            EXPECT_EQ(lFailed ? std::vector<std::string>{textOf(lcrKind, 2)}
                              : (std::vector<std::string>{textOf(lcrKind), otherTextOf(lcrKind), textOf(lcrKind)}),
                      lResponse.texts());
            EXPECT_EQ(dataSizeOf(lResponse), lTotal);
            lFailures += lFailed ? 1 : 0;
        }
        EXPECT_EQ(4u, lFailures) << lcrKind.mpName << ": data object, data, record, and its place in the list";
    }
}

TEST_F(EventConsolidationMemory, AnAppendThatFindsNoMemoryChangesNothing) {
    collect();
    for (const ZTSDeliveredKind& lcrKind : kindsWithData()) {
        unsigned lFailures = 0;
        for (bool lFailed = true; lFailed;) {
            SCOPED_TRACE(std::string(lcrKind.mpName) + " allocation " + std::to_string(lFailures + 1));
            deliver(lcrKind);
            ZT_event_payload lPayload{0, const_cast<unsigned char*>(lcrKind.mPayload.data())};
            ZT_event lEvent{0, 40 + lcrKind.mPayload.size(), &lPayload};
            lFailed = failAllocation(lFailures + 1, [&] {
                ScopeCb_Generic(0, HBA_wwn{}, lcrKind.mCategory, lcrKind.mSubcategory, nullptr, &lEvent);
            });
            const std::size_t lTotal = mSystem->getTotalEventDataSize();
            const ZTSScopeDataResponse lResponse = retrieve();
            EXPECT_EQ(std::vector<std::string>{textOf(lcrKind, lFailed ? 1 : 2)}, lResponse.texts());
            EXPECT_EQ(dataSizeOf(lResponse), lTotal);
            lFailures += lFailed ? 1 : 0;
        }
        // Appending alone asks for memory.
        EXPECT_EQ(lcrKind.mOnMatch == ZTEOnMatch::Appends ? 1u : 0u, lFailures) << lcrKind.mpName;
    }
}
