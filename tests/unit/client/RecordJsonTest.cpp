#include "sensor/client/include/RecordJson.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "sensor/client/include/ResponseDecoder.h"
#include "tests/unit/client/WireSamples.h"

using ZTCJson = nlohmann::ordered_json;

TEST(RecordJson, SuccessAndFailureCarryTheirValues) {
    EXPECT_EQ(toJson(decodeResponse(bytesOf("00 00000000"))), ZTCJson::parse(R"({"outcome":"success","result":0})"));
    EXPECT_EQ(toJson(decodeResponse(bytesOf("01 0009"))),
              ZTCJson::parse(R"({"outcome":"failed","status":{"code":9,"name":"ZTSAPS_NotAllowed"}})"));
}

TEST(RecordJson, ScopeDataCarriesListsRecordsAndTotals) {
    const ZTSResponse lResponse = decodeResponse(makeSampleResponse(
        3, {makeSampleList(gcSampleKey, {makeSampleRecord(8, 0x04, bytesOf("01000000"), false, 5),
                                         makeSampleRecord(1, 0x02, makeSampleKinds()[1].mData, true, 2)}),
            makeSampleList("no names", {})}));
    const ZTCJson lExpected = ZTCJson::parse(R"({
        "outcome": "scope-data", "announcedLists": 3,
        "lists": [
          {"initiatorKey": "20:00:00:00:c9:00:00:01.10:00:00:00:c9:00:00:01",
           "initiator": {"portName": "10:00:00:00:c9:00:00:01", "nodeName": "20:00:00:00:c9:00:00:01"},
           "records": [
             {"kind": "temperature", "category": 8, "subcategory": 4, "occurrences": 5,
              "begin": {"local": "2026-03-04 05:06:07.089012", "epochSeconds": 1772600767, "microseconds": 89012},
              "end": {"local": "2026-03-04 05:06:07.089012", "epochSeconds": 1772600767, "microseconds": 89012},
              "remotePort": null, "data": {"version": 1}, "dataProblem": null, "dataHex": "01000000"},
             {"kind": "prlo", "category": 1, "subcategory": 2, "occurrences": 2,
              "begin": {"local": "2026-03-04 05:06:07.089012", "epochSeconds": 1772600767, "microseconds": 89012},
              "end": {"local": "2026-03-04 05:06:07.089012", "epochSeconds": 1772600767, "microseconds": 89012},
              "remotePort": {"portName": "50:06:01:60:3b:a0:12:34", "nodeName": "50:06:01:60:bb:a0:12:34"},
              "data": {"version": 1, "portName": "50:06:01:60:3b:a0:12:34"},
              "dataProblem": null, "dataHex": "01000000500601603ba01234"}]},
          {"initiatorKey": "no names", "initiator": null, "records": []}],
        "totals": {"lists": 2, "records": 2, "occurrences": 7}})");
    EXPECT_EQ(toJson(lResponse), lExpected);
}

TEST(RecordJson, AKeyThatIsNoUtf8StillYieldsValidJson) {
    const ZTSResponse lResponse = decodeResponse(makeSampleResponse(1, {makeSampleList("\xff\xfe\n", {})}));
    EXPECT_TRUE(ZTCJson::accept(dumpJson(toJson(lResponse), -1)));
}
