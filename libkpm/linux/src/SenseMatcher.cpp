#include "libkpm/linux/src/SenseMatcher.h"

#include <algorithm>

/// Inserts in the order of the times, behind entries of the same time.
template <class Entry>
static void sInsert(std::vector<Entry>& arEntries, const Entry& acrEntry) {
    const auto lPlace =
        std::upper_bound(arEntries.begin(), arEntries.end(), acrEntry,
                         [](const Entry& acrOne, const Entry& acrOther) { return acrOne.mTime < acrOther.mTime; });
    arEntries.insert(lPlace, acrEntry);
}

/// Reserves memory, so that taking needs none: an outcome that was accepted is always handed on.
void ZTCSenseMatcher::makeRoom() {
    if (mReady.capacity() <= mHeld) {
        mReady.clear();
        mReady.reserve(std::max<std::size_t>(2 * mHeld, 64));
    }
}

void ZTCSenseMatcher::addOutcome(const ZTSScsiOutcome& acrOutcome, std::uint64_t aTime, Clock::time_point aNow) {
    makeRoom();
    sInsert(mCommands[acrOutcome].mOutcomes, {acrOutcome, aTime, aNow + scWait});
    ++mHeld;
}

void ZTCSenseMatcher::addSense(const ZTSSenseRecord& acrRecord, std::uint64_t aTime, Clock::time_point aNow) {
    makeRoom();
    sInsert(mCommands[acrRecord.mCommand].mSenses, {acrRecord.mValues, aTime, aNow + scWait});
    ++mHeld;
}

void ZTCSenseMatcher::settle(Command& arCommand, Clock::time_point aNow) noexcept {
    std::vector<Outcome>& lrOutcomes = arCommand.mOutcomes;
    std::size_t lLeft = 0;
    for (std::size_t lIndex = 0; lIndex < lrOutcomes.size(); ++lIndex) {
        Outcome& lrOutcome = lrOutcomes[lIndex];
        const bool lIsLast = lIndex + 1 == lrOutcomes.size();
        const auto lSense =
            std::find_if(arCommand.mSenses.begin(), arCommand.mSenses.end(), [&](const Sense& acrSense) {
                return acrSense.mTime >= lrOutcome.mTime && (lIsLast || acrSense.mTime < lrOutcomes[lIndex + 1].mTime);
            });
        if (lSense != arCommand.mSenses.end()) {
            lrOutcome.mOutcome.mSenseKey = lSense->mValues.mSenseKey;
            lrOutcome.mOutcome.mAsc = lSense->mValues.mAsc;
            lrOutcome.mOutcome.mAscq = lSense->mValues.mAscq;
            arCommand.mSenses.erase(lSense);
            mReady.push_back(lrOutcome.mOutcome);
        } else if (lrOutcome.mEnd <= aNow) {
            mReady.push_back(lrOutcome.mOutcome);
        } else {
            lrOutcomes[lLeft++] = lrOutcome;
        }
    }
    lrOutcomes.erase(lrOutcomes.begin() + static_cast<std::ptrdiff_t>(lLeft), lrOutcomes.end());
    std::erase_if(arCommand.mSenses, [aNow](const Sense& acrSense) { return acrSense.mEnd <= aNow; });
}

const std::vector<ZTSScsiOutcome>& ZTCSenseMatcher::take(Clock::time_point aNow) noexcept {
    const Clock::time_point lUntil = mHeld > scMostHeld ? Clock::time_point::max() : aNow;
    mReady.clear();
    mHeld = 0;
    for (auto lCommand = mCommands.begin(); lCommand != mCommands.end();) {
        settle(lCommand->second, lUntil);
        const std::size_t lLeft = lCommand->second.mOutcomes.size() + lCommand->second.mSenses.size();
        mHeld += lLeft;
        lCommand = lLeft == 0 ? mCommands.erase(lCommand) : std::next(lCommand);
    }
    return mReady;
}

std::optional<ZTCSenseMatcher::Clock::time_point> ZTCSenseMatcher::getNextTime() const {
    std::optional<Clock::time_point> lNext;
    for (const auto& [lrName, lrCommand] : mCommands) {
        for (const Outcome& lrOutcome : lrCommand.mOutcomes) {
            lNext = std::min(lNext.value_or(lrOutcome.mEnd), lrOutcome.mEnd);
        }
    }
    return lNext;
}
