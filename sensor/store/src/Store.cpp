#include "sensor/store/include/Store.h"

#include "sensor/store/src/StoreFile.h"
#include "sensor/store/src/StoreImplementation.h"

ZTCStoreTransaction::ZTCStoreTransaction(ZTCStore& arStore, std::uint64_t aSerial)
    : mpStore(&arStore), mSerial(aSerial) {}

ZTCStoreTransaction::ZTCStoreTransaction(ZTCStoreTransaction&& arOther) noexcept
    : mpStore(std::exchange(arOther.mpStore, nullptr)), mSerial(arOther.mSerial) {}

ZTCStoreTransaction::~ZTCStoreTransaction() {
    if (mpStore != nullptr && mpStore->mpImplementation->isInTransaction(mSerial)) {
        mpStore->mpImplementation->rollBack();
    }
}

void ZTCStoreTransaction::commit() {
    ZTCStore* const lpStore = std::exchange(mpStore, nullptr);
    if (lpStore == nullptr || !lpStore->mpImplementation->isInTransaction(mSerial)) {
        throw std::logic_error("history: commit of a transaction that is over");
    }
    lpStore->mpImplementation->commit();
}

ZTCStore::ZTCStore(const std::string& acrStateDirectory, const ZTSStoreLimits& acrLimits, Report aReport)
    : mpImplementation(std::make_unique<ZTCImplementation>(acrStateDirectory, acrLimits, std::move(aReport))) {}

ZTCStore::~ZTCStore() = default;

void ZTCStore::reopen() {
    mpImplementation->reopen();
}

const std::string& ZTCStore::getStoreId() const {
    return mpImplementation->mStoreId;
}

const std::string& ZTCStore::getPath() const {
    return mpImplementation->mPath;
}

void ZTCStore::setLimits(const ZTSStoreLimits& acrLimits) {
    mpImplementation->keepUp("setLimits", [&] {
        mpImplementation->mLimits = acrLimits;
        mpImplementation->mpOpen->mEpisodes.setLimits(acrLimits.mEpisodeGap.count(), acrLimits.mRecordsPerEnd);
    });
}

void ZTCStore::setAddressResolver(ZTCAddressResolver aResolver) {
    mpImplementation->mResolver = std::move(aResolver);
}

ZTCStoreTransaction ZTCStore::begin() {
    mpImplementation->begin();
    return ZTCStoreTransaction(*this, mpImplementation->mSerial);
}

bool ZTCStore::hasFrame(std::uint64_t aNumber) const {
    return mpImplementation->hasFrame(aNumber);
}

std::uint64_t ZTCStore::getLastFrame() const {
    mpImplementation->loadAgain();
    return mpImplementation->mpOpen->mCounter.mLastFrame;
}

ZTSTakenIn ZTCStore::takeIn(std::uint64_t aNumber, const std::string& acrGeneration,
                            std::span<const std::uint8_t> aBody, bool aIsTorn, ZTCHistoryTime aNow) {
    return mpImplementation->change("takeIn", [&] {
        return mpImplementation->takeIn(aNumber, acrGeneration, aBody, aIsTorn, toMicroseconds(aNow));
    });
}

std::size_t ZTCStore::closeEpisodes(ZTCHistoryTime aNow, const ZTCNothingHeld& acrNothingHeld) {
    return mpImplementation->change("closeEpisodes", [&] {
        ZTSOpenStore& lrOpen = *mpImplementation->mpOpen;
        return lrOpen.mEpisodes.close(toMicroseconds(aNow), [&](std::uint32_t aInitiator, ZTCKindKey aKind) {
            return acrNothingHeld(lrOpen.mNames.getInitiator(aInitiator), aKind);
        });
    });
}

void ZTCStore::noteInitiator(const ZTSInitiator& acrInitiator) {
    mpImplementation->change("noteInitiator",
                             [&] { mpImplementation->mpOpen->mNames.findOrAddInitiator(acrInitiator); });
}

void ZTCStore::noteRemotePort(const ZTSRemotePort& acrPort) {
    mpImplementation->change("noteRemotePort", [&] {
        mpImplementation->mpOpen->mNames.findOrAddPort(acrPort.mWwpn, acrPort.mWwnn, acrPort.mFcId);
    });
}

bool ZTCStore::noteTopology(std::int64_t aTime, const ZTSTopology& acrTopology, std::uint32_t aMostRows) {
    return mpImplementation->change(
        "noteTopology", [&] { return mpImplementation->mpOpen->mTopology.note(aTime, acrTopology, aMostRows); });
}

void ZTCStore::noteCounters(std::span<const ZTSCounterSample> aSamples) {
    mpImplementation->change("noteCounters", [&] { mpImplementation->mpOpen->mPortCounters.note(aSamples); });
}

void ZTCStore::noteLedger(const std::string& acrGeneration, std::span<const ZTSPageCounts> aCounts) {
    mpImplementation->change("noteLedger", [&] { mpImplementation->mpOpen->mLedger.note(acrGeneration, aCounts); });
}

bool ZTCStore::endAgent(const std::string& acrGeneration, ZTCHistoryTime aFrom, ZTCHistoryTime aTo, bool aIsVanished,
                        const std::string& acrReason, bool aHasLastPage) {
    return mpImplementation->change("endAgent", [&] {
        return mpImplementation->mpOpen->mLedger.endAgent(acrGeneration, toMicroseconds(aFrom), toMicroseconds(aTo),
                                                          aIsVanished, acrReason, aHasLastPage);
    });
}

bool ZTCStore::hasEnded(const std::string& acrGeneration) const {
    return mpImplementation->look("hasEnded",
                                  [&] { return mpImplementation->mpOpen->mLedger.hasEnded(acrGeneration); });
}

std::vector<ZTSPageCounts> ZTCStore::sumCountsOfOthers(const std::string& acrGeneration) const {
    return mpImplementation->look("sumCountsOfOthers",
                                  [&] { return mpImplementation->mpOpen->mLedger.sumOthers(acrGeneration); });
}

bool ZTCStore::noteGap(const ZTSGap& acrGap) {
    return mpImplementation->change("noteGap", [&] { return mpImplementation->mpOpen->mLedger.noteGap(acrGap); });
}

void ZTCStore::beginRun(ZTCHistoryTime aNow) {
    mpImplementation->change("beginRun", [&] { mpImplementation->mpOpen->mCoverage.beginRun(toMicroseconds(aNow)); });
}

void ZTCStore::noteRunning(ZTCHistoryTime aNow) {
    mpImplementation->change("noteRunning",
                             [&] { mpImplementation->mpOpen->mCoverage.noteRunning(toMicroseconds(aNow)); });
}

void ZTCStore::endRun(ZTCHistoryTime aNow) {
    mpImplementation->change("endRun", [&] { mpImplementation->mpOpen->mCoverage.endRun(toMicroseconds(aNow)); });
}

void ZTCStore::noteCoverage(ZTCHistoryTime aNow, std::span<const ZTSKindStateNow> aStates) {
    mpImplementation->change("noteCoverage",
                             [&] { mpImplementation->mpOpen->mCoverage.note(toMicroseconds(aNow), aStates); });
}

void ZTCStore::setMark(const std::string& acrName, ZTCHistoryTime aTime) {
    mpImplementation->change("setMark", [&] {
        ZTCStatement(mpImplementation->mpOpen->mDatabase,
                     "INSERT INTO mark(name, time) VALUES (?, ?) ON CONFLICT DO UPDATE SET time = excluded.time")
            .run(acrName, toMicroseconds(aTime));
    });
}

void ZTCStore::setValue(const std::string& acrName, const std::string& acrValue) {
    mpImplementation->change("setValue", [&] {
        ZTCStatement(mpImplementation->mpOpen->mDatabase,
                     "INSERT INTO value(name, value) VALUES (?, ?) ON CONFLICT DO UPDATE SET value = excluded.value")
            .run(acrName, acrValue);
    });
}

std::string ZTCStore::getValue(const std::string& acrName) const {
    return mpImplementation->look("getValue", [&] {
        ZTCStatement lFind(mpImplementation->mpOpen->mDatabase, "SELECT value FROM value WHERE name = ?");
        return lFind.query(acrName).step() ? lFind.text(0) : std::string();
    });
}

bool ZTCStore::retireStep(ZTCHistoryTime aNow, std::chrono::steady_clock::time_point aSteadyNow) {
    return mpImplementation->retireStep(toMicroseconds(aNow), aSteadyNow);
}

void ZTCStore::checkpoint() {
    mpImplementation->checkpoint();
}

std::uint64_t ZTCStore::getDatabaseBytes() const {
    return getFileBytes(mpImplementation->mPath);
}

std::uint64_t ZTCStore::getJournalBytes() const {
    return getFileBytes(mpImplementation->mPath + "-wal");
}

std::size_t ZTCStore::countOpenEpisodes() const {
    mpImplementation->loadAgain();
    return mpImplementation->mpOpen->mEpisodes.size();
}
