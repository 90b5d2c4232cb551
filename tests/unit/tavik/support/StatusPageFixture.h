/// The agent's system in the test's own process, with a status page, a bell, and a reader of the page.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_STATUSPAGEFIXTURE_H
#define TESTS_UNIT_TAVIK_SUPPORT_STATUSPAGEFIXTURE_H

#include <cstdint>
#include <string>

#include "sensor/client/include/StatusPageReader.h"
#include "tests/unit/tavik/support/TavikFixture.h"

class ZTCStatusPageFixture : public ZTCTavikFixture {
protected:
    ZTCStatusPageFixture();
    ~ZTCStatusPageFixture() override;

    std::string pagePath() const { return mDirectory.path("page"); }

    /// The page now; fails the test where it cannot be read.
    ZTSStatusSnapshot page();

    /// The row of a board by the name of its kind, or "other".
    ZTSStatusRowCopy row(unsigned aBoard, const std::string& acrKind);

    /// How often the bell was rung since the last call.
    std::uint64_t takeRings();

    /// Expects of a page at rest that both equations hold, that they agree with the totals of its header, and that
    /// nothing is held where nothing is expected to be.
    static void expectEquations(const ZTSStatusSnapshot& acrPage);

private:
    int mBell = -1;
    ZTCStatusPageReader mReader;
};

/// The row of this name, in a board of a copy.
const ZTSStatusRowCopy& rowNamed(const ZTSStatusBoardCopy& acrBoard, const std::string& acrKind);

#endif
