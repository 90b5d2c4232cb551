#include <gtest/gtest.h>

#include <functional>
#include <new>
#include <stdexcept>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class Callback : public ZTCTavikFixture {};

}  // namespace

TEST_F(Callback, LetsNothingIntoTheLibraryWhateverItsType) {
    const struct {
        std::function<void()> mThrow;
        std::string mText;
    } lcThrown[] = {
        {[] { throw ZTCInvalidEx("one of the family"); }, "one of the family"},
        {[] { throw std::runtime_error("a foreign one"); }, "a foreign one"},
        {[] { throw std::bad_alloc(); }, std::bad_alloc().what()},
        {[] { throw 7; }, "unknown exception"},
        {[] { throw "a text"; }, "unknown exception"},
    };
    const std::function<void()> lcDeliveries[] = {
        [] { deliverScope(0, 1, 1, ZTCBytes(20)); },
        [] { deliverLink(0, makeWwn(1)); },
        [] { deliverTemperature(0); },
        [] { deliverRscn(0, makeRscn({1})); },
    };
    collect();
    for (const auto& lcrThrown : lcThrown) {
        SCOPED_TRACE(lcrThrown.mText);
        for (const auto& lcrDeliver : lcDeliveries) {
            mLog.forget();
            const ZTCReplacement lThrowing(gReplaced.mBeforeTotalLimit, lcrThrown.mThrow);
            EXPECT_NO_THROW(lcrDeliver());
            EXPECT_EQ(std::vector<std::string>{"-E- Error: " + lcrThrown.mText + ", processing event callback"},
                      mLog.texts());
        }
    }
    EXPECT_FALSE(mSystem->hasPendingRecord());
}
