// The sensor's decoder and the printers behind it: whatever an answer holds, what can be decoded is, and it prints as a
// table of whole lines without control characters and as JSON that reads back.
//
// Input: the body of a response.
#include <nlohmann/json.hpp>
#include <string>

#include "fuzz/support/FuzzInput.h"
#include "sensor/client/include/RecordJson.h"
#include "sensor/client/include/RecordTable.h"
#include "sensor/client/include/ResponseDecoder.h"

static void sCheckTable(const std::string& acrTable) {
    ZT_FUZZ_REQUIRE(acrTable.ends_with("\n"), acrTable);
    for (const char lCharacter : acrTable) {
        const auto lByte = static_cast<unsigned char>(lCharacter);
        ZT_FUZZ_REQUIRE(lCharacter == '\n' || (lByte >= 0x20 && lByte < 0x7F), std::to_string(lByte));
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const ZTCExactBlock lBody({apData, aSize}, 0);
    const std::span<const std::uint8_t> lBytes(lBody.get(), aSize);
    const ZTSDecodeResult lResult = decodeAsFarAsPossible(lBytes);
    try {
        const ZTSResponse lWhole = decodeResponse(lBytes);
        ZT_FUZZ_REQUIRE(!lResult.mProblem && lWhole == lResult.mResponse, "the two decoders differ");
    } catch (const ZTCDecodeEx& lrProblem) {
        ZT_FUZZ_REQUIRE(lResult.mProblem.has_value(), lrProblem.what());
    }

    const ZTSResponse& lrResponse = lResult.mResponse;
    ZT_FUZZ_REQUIRE(lrResponse.mUnreadBytes <= aSize, std::to_string(lrResponse.mUnreadBytes));
    const std::string lTable = formatTable(lrResponse);
    sCheckTable(lTable);
    const auto lRows = static_cast<std::uint64_t>(std::count(lTable.begin(), lTable.end(), '\n'));
    ZT_FUZZ_REQUIRE(lRows >= lrResponse.countRecords() + 1, std::to_string(lRows));
    sCheckTable(formatTable(lrResponse, false));

    for (const int lIndent : {-1, 2}) {
        const std::string lText = dumpJson(toJson(lrResponse), lIndent);
        const nlohmann::json lRead = nlohmann::json::parse(lText);
        ZT_FUZZ_REQUIRE(lRead.contains("outcome"), lText);
        if (lrResponse.mOutcome == ZTRO_ScopeData) {
            ZT_FUZZ_REQUIRE(lRead.at("lists").size() == lrResponse.mLists.size(), lText);
        }
    }
    return 0;
}
