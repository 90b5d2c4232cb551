/// What the tests of consolidation share: events of the kinds, and the texts of the records that they make.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_CONSOLIDATIONFIXTURE_H
#define TESTS_UNIT_TAVIK_SUPPORT_CONSOLIDATIONFIXTURE_H

#include <cstddef>
#include <string>

#include "tests/unit/tavik/support/DeliveredKinds.h"
#include "tests/unit/tavik/support/Deliveries.h"
#include "tests/unit/tavik/support/TavikFixture.h"

class ZTCConsolidationFixture : public ZTCTavikFixture {
protected:
    static void deliver(const ZTSDeliveredKind& acrKind, unsigned aBoard = 0) {
        deliver(acrKind, acrKind.mPayload, aBoard);
    }
    static void deliver(const ZTSDeliveredKind& acrKind, const ZTCBytes& acrPayload, unsigned aBoard = 0) {
        deliverScope(aBoard, acrKind.mCategory, acrKind.mSubcategory, acrPayload);
    }

    /// The kind's payload with another port, which is part of every identity.
    static ZTCBytes otherPayload(const ZTSDeliveredKind& acrKind) {
        ZTCBytes lPayload = acrKind.mPayload;
        lPayload.at(4) ^= 0xFF;
        return lPayload;
    }

    static std::string textOf(const ZTSDeliveredKind& acrKind, unsigned aCount, const std::string& acrDataHex) {
        return std::to_string(acrKind.mCategory) + "/" + std::to_string(acrKind.mSubcategory) + " x" +
               std::to_string(aCount) + " " + acrDataHex;
    }
    static std::string textOf(const ZTSDeliveredKind& acrKind, unsigned aCount = 1) {
        std::string lDataHex = acrKind.mRecordHex;
        for (unsigned lEvent = 1; lEvent < aCount; ++lEvent) {
            lDataHex += acrKind.mAppendedHex;
        }
        return textOf(acrKind, aCount, lDataHex);
    }
    /// The record that otherPayload makes.
    static std::string otherTextOf(const ZTSDeliveredKind& acrKind) {
        ZTCBytes lData = bytesOf(acrKind.mRecordHex);
        lData.at(4) ^= 0xFF;
        return textOf(acrKind, 1, hexOf(lData));
    }

    static std::size_t dataSizeOf(const ZTSScopeDataResponse& acrResponse) {
        std::size_t lSize = 0;
        for (const ZTSEncodedRecordList& lcrList : acrResponse.mLists) {
            for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
                lSize += lcrRecord.mData.size();
            }
        }
        return lSize;
    }
};

#endif
