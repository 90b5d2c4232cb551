#include "libkpm/common/include/Losses.h"

#include <string>

#include "libkpm/common/include/AgentLink.h"

static constexpr std::chrono::seconds scSilence{1};

void ZTCLosses::tellRow(std::size_t aKind) {
    Row& lrRow = mRows[aKind];
    const std::string lLine = std::to_string(lrRow.mTotal - lrRow.mTold) + " " + mKinds[aKind].mpText + " (" +
                              std::to_string(lrRow.mTotal) + " since the start)";
    lrRow.mTold = lrRow.mTotal;
    logLibraryLine(KPM_LOG_WARNING, lLine);
    reportLibraryLoss(mKinds[aKind].mpName, lrRow.mTotal);
}

void ZTCLosses::tell(Clock::time_point aNow) {
    for (std::size_t lKind = 0; lKind < mRows.size(); ++lKind) {
        Row& lrRow = mRows[lKind];
        if (lrRow.mTotal != lrRow.mTold && (!lrRow.mToldAt || aNow - *lrRow.mToldAt >= scSilence)) {
            tellRow(lKind);
            lrRow.mToldAt = aNow;
        }
    }
}

void ZTCLosses::tellAll() {
    for (std::size_t lKind = 0; lKind < mRows.size(); ++lKind) {
        if (mRows[lKind].mTotal != mRows[lKind].mTold) {
            tellRow(lKind);
        }
    }
}
