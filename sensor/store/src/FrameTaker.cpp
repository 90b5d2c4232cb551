#include "sensor/store/src/FrameTaker.h"

#include <cstring>
#include <utility>

#include "sensor/store/src/ReceivedTime.h"

/// Where a record's category and subcategory begin: behind its count and its two times.
static constexpr std::size_t scKindOffset = 44;
/// The names in an RSCN record may be stale.
static constexpr ZTCKindKey scRscn = makeKindKey(1, 0x20);

void ZTCFrameTaker::finish() {
    for (std::size_t i = 0; i < mListCounts.size(); ++i) {
        if (const std::uint64_t lCount = std::exchange(mListCounts[i], 0)) {
            mBooks.mrLedger.addTaken(mGeneration, mInitiator, getKindShapes()[i].getKey(), lCount);
        }
    }
}

void ZTCFrameTaker::visitList(std::string_view aInitiatorKey) {
    finish();
    mListCounts.resize(getKindShapes().size());
    mInitiator = mBooks.mrNames.findOrAddListKey(aInitiatorKey);
}

/// 0: none, or not known. The port of an RSCN is what the resolver knows, never the record's names.
std::uint32_t ZTCFrameTaker::findPort(const ZTSRecordView& acrRecord, const ZTSKindShape* apShape) {
    if (apShape != nullptr && apShape->mIdentityForm == ZTIF_Page) {
        const auto lPage = static_cast<std::uint32_t>(readIdentity(*apShape, acrRecord.mEventData));
        static constexpr std::uint32_t scFormatMask = 0x03000000;
        const std::optional<ZTSFcName>& lrWwpn = mBooks.mrNames.getInitiator(mInitiator).mWwpn;
        if ((lPage & scFormatMask) != 0 || !mrResolver || !lrWwpn) {
            return 0;
        }
        const std::optional<ZTSRemotePort> lPort = mrResolver(*lrWwpn, lPage & 0xFFFFFF);
        return lPort ? mBooks.mrNames.findOrAddPort(lPort->mWwpn, lPort->mWwnn, lPort->mFcId) : 0;
    }
    const bool lHasNames = acrRecord.mNames.has_value();
    if (apShape != nullptr && apShape->mHasPort) {
        ZTSFcName lPort;
        std::memcpy(lPort.mBytes.data(), acrRecord.mEventData.data() + gcPortOffset, lPort.mBytes.size());
        const bool lIsNamed = lHasNames && acrRecord.mNames->mPortName == lPort;
        return mBooks.mrNames.findOrAddPort(lPort,
                                            lIsNamed ? std::optional(acrRecord.mNames->mNodeName) : std::nullopt);
    }
    const bool lMayHavePort = apShape == nullptr && makeKindKey(acrRecord.mCategory, acrRecord.mSubcategory) != scRscn;
    return lHasNames && lMayHavePort
               ? mBooks.mrNames.findOrAddPort(acrRecord.mNames->mPortName, acrRecord.mNames->mNodeName)
               : 0;
}

void ZTCFrameTaker::visitRecord(const ZTSRecordView& acrRecord) {
    ZTSEpisodeKey lKey;
    // Read from the wire's bytes: the view's two fields were just stored one by one, and one load of both would wait
    // for the stores (an eighth of the whole time).
    lKey.mKind = makeKindKey(acrRecord.mBytes[scKindOffset], acrRecord.mBytes[scKindOffset + 1]);
    const ZTSKindShape* lpShape = findKindShape(lKey.mKind);
    if (lpShape != nullptr) {
        mListCounts[static_cast<std::size_t>(lpShape - getKindShapes().data())] += acrRecord.mOccurrences;
    } else {
        mBooks.mrLedger.addTaken(mGeneration, mInitiator, lKey.mKind, acrRecord.mOccurrences);
    }
    if (lpShape != nullptr && acrRecord.mEventData.size() < lpShape->mSize) {
        lpShape = nullptr;
    }
    lKey.mIsMalformed = lpShape == nullptr;
    lKey.mInitiator = mInitiator;
    lKey.mPort = findPort(acrRecord, lpShape);
    lKey.mIdentity = lpShape == nullptr ? 0 : readIdentity(*lpShape, acrRecord.mEventData);

    const std::int64_t lBegin = toMicroseconds(acrRecord.mBegin);
    const std::int64_t lEnd = toMicroseconds(acrRecord.mEnd);
    ZTSCountPlace& lrPlace = mBooks.mrEpisodes.add(lKey, lpShape, acrRecord, lBegin, lEnd, mNow);
    mBooks.mrCounts.add({.mInitiator = mInitiator, .mPort = lKey.mPort, .mKind = lKey.mKind}, lrPlace, lBegin, lEnd,
                        acrRecord.mOccurrences);
    ++mTaken.mRecords;
    mTaken.mOccurrences += acrRecord.mOccurrences;
}
