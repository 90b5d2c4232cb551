#include "libkpm/linux/src/Losses.h"

static constexpr std::chrono::seconds scSilence{1};

/// What a number of each kind is a number of, and what follows from it; one row a kind, in the order of the
/// enumeration.
static constexpr std::array<const char*, gcLinuxLossCount> scTexts{
    "times the FC event socket overran: events are lost, and the link states are read again",
    "FC events are lost: their numbers were passed over; the link states are read again",
    "FC messages are dropped: the kernel did not send them",
    "FC messages are dropped: they do not parse",
    "SCSI outcomes are lost: a trace buffer overran",
    "trace records are dropped: they do not parse",
    "events are lost: they could not be read or handled"};

void ZTCLinuxLosses::tellRow(std::size_t aKind) {
    Row& lrRow = mRows[aKind];
    const std::uint64_t lNew = lrRow.mTotal - lrRow.mTold;
    lrRow.mTold = lrRow.mTotal;
    mSink(std::to_string(lNew) + " " + scTexts[aKind] + " (" + std::to_string(lrRow.mTotal) + " since the start)");
}

void ZTCLinuxLosses::tell(Clock::time_point aNow) {
    for (std::size_t lKind = 0; lKind < mRows.size(); ++lKind) {
        Row& lrRow = mRows[lKind];
        if (lrRow.mTotal != lrRow.mTold && (!lrRow.mToldAt || aNow - *lrRow.mToldAt >= scSilence)) {
            lrRow.mToldAt = aNow;
            tellRow(lKind);
        }
    }
}

void ZTCLinuxLosses::tellAll() {
    for (std::size_t lKind = 0; lKind < mRows.size(); ++lKind) {
        if (mRows[lKind].mTotal != mRows[lKind].mTold) {
            tellRow(lKind);
        }
    }
}
