/// Takes the records of one response into episodes, counts and the ledger.
#ifndef SENSOR_STORE_SRC_FRAMETAKER_H
#define SENSOR_STORE_SRC_FRAMETAKER_H

#include <vector>

#include "sensor/client/include/RecordView.h"
#include "sensor/store/include/Store.h"
#include "sensor/store/src/CountBook.h"
#include "sensor/store/src/EpisodeBook.h"
#include "sensor/store/src/LedgerBook.h"
#include "sensor/store/src/NameTable.h"

/// What the records go into.
struct ZTSBooks {
    ZTCNameTable& mrNames;
    ZTCEpisodeBook& mrEpisodes;
    ZTCCountBook& mrCounts;
    ZTCLedgerBook& mrLedger;
};

class ZTCFrameTaker : public ZTCResponseVisitor {
public:
    ZTCFrameTaker(const ZTSBooks& acrBooks, const ZTCAddressResolver& acrResolver, std::uint64_t aGeneration,
                  std::int64_t aNow)
        : mBooks(acrBooks), mrResolver(acrResolver), mGeneration(aGeneration), mNow(aNow) {}

    void visitOutcome(const ZTSResponse& acrResponse) override { mOutcome = acrResponse.mOutcome; }
    void visitList(std::string_view aInitiatorKey) override;
    void visitRecord(const ZTSRecordView& acrRecord) override;

    /// Adds to the ledger what is not in it yet. To be called last.
    void finish();
    const ZTSTakenIn& getTakenIn() const { return mTaken; }
    std::optional<ZTEResponseOutcome> getOutcome() const { return mOutcome; }

private:
    std::uint32_t findPort(const ZTSRecordView& acrRecord, const ZTSKindShape* apShape);

    ZTSBooks mBooks;
    const ZTCAddressResolver& mrResolver;
    std::uint64_t mGeneration;
    std::int64_t mNow;
    std::optional<ZTEResponseOutcome> mOutcome;
    std::uint32_t mInitiator = 0;
    ZTSTakenIn mTaken;
    std::vector<std::uint64_t> mListCounts;  ///< occurrences of this list, by row of the table of shapes
};

#endif
