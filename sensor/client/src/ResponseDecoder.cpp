#include "sensor/client/include/ResponseDecoder.h"

#include "sensor/client/include/RecordView.h"

namespace {

/// Makes values of everything it visits.
class ZTCResponseBuilder : public ZTCResponseVisitor {
public:
    explicit ZTCResponseBuilder(ZTSResponse& arResponse) : mrResponse(arResponse) {}

    void visitOutcome(const ZTSResponse& acrResponse) override { mrResponse = acrResponse; }
    void visitList(std::string_view aInitiatorKey) override {
        mrResponse.mLists.emplace_back().mInitiatorKey = aInitiatorKey;
    }
    void visitRecord(const ZTSRecordView& acrRecord) override {
        mrResponse.mLists.back().mRecords.push_back(acrRecord.toRecord());
    }

private:
    ZTSResponse& mrResponse;
};

}  // namespace

ZTSDecodeResult decodeAsFarAsPossible(std::span<const std::uint8_t> aBody) {
    ZTSDecodeResult lResult;
    ZTCResponseBuilder lBuilder(lResult.mResponse);
    std::size_t lUnreadBytes = 0;
    lResult.mProblem = visitResponse(aBody, lBuilder, lUnreadBytes);
    lResult.mResponse.mUnreadBytes = lUnreadBytes;
    return lResult;
}

ZTSResponse decodeResponse(std::span<const std::uint8_t> aBody) {
    ZTSDecodeResult lResult = decodeAsFarAsPossible(aBody);
    if (lResult.mProblem) {
        throw ZTCDecodeEx(*lResult.mProblem);
    }
    return std::move(lResult.mResponse);
}
