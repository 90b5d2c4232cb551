#include "sensor/collector/include/ControlRequest.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using testing::HasSubstr;

TEST(ControlRequest, StatusAndMarkAreKnown) {
    EXPECT_EQ(parseControlRequest(R"({"request":"status"})").mKind, ZTCR_Status);
    const ZTSControlRequest lMark = parseControlRequest(R"({"request":"mark","name":"before update"})");
    EXPECT_EQ(lMark.mKind, ZTCR_Mark);
    EXPECT_EQ(lMark.mName, "before update");
    EXPECT_EQ(lMark.mTime, std::nullopt);
    const ZTSControlRequest lEarlier =
        parseControlRequest(R"({"request":"mark","name":"x","time":"2026-03-04T05:06:00Z"})");
    EXPECT_EQ(lEarlier.mKind, ZTCR_Mark);
    EXPECT_EQ(lEarlier.mTime, fromMicroseconds(1772600760LL * 1000000));
}

TEST(ControlRequest, AnythingElseIsWrongInWords) {
    const std::vector<std::pair<std::string, std::string>> lWrong{
        {"", "JSON object"},
        {"status", "JSON object"},
        {"[]", "JSON object"},
        {"{}", "\"request\""},
        {R"({"request":7})", "\"request\""},
        {R"({"request":"halt"})", "unknown request \"halt\""},
        {R"({"request":"mark"})", "\"name\""},
        {R"({"request":"mark","name":7})", "\"name\""},
        {R"({"request":"mark","name":"x","time":"yesterday"})", "RFC 3339"},
        {R"({"request":"mark","name":"x","time":7})", "RFC 3339"},
        {R"({"request":"status","lossesSince":"yesterday"})", "RFC 3339"},
        {R"({"request":"mark","name":""})", "1 to 200 bytes"},
        {R"({"request":"mark","name":"a\nb"})", "control characters"},
        {R"({"request":"mark","name":")" + std::string(gcMaxMarkName + 1, 'x') + "\"}", "this one has 201"},
        {std::string(3000, '['), "JSON object"},
    };
    for (const auto& [lrLine, lrWords] : lWrong) {
        const ZTSControlRequest lRequest = parseControlRequest(lrLine);
        EXPECT_EQ(lRequest.mKind, ZTCR_Wrong) << lrLine;
        EXPECT_THAT(lRequest.mError, HasSubstr(lrWords)) << lrLine;
    }
}

TEST(ControlRequest, AnAnswerIsOneLineWhateverIsQuoted) {
    const std::string lAnswer = toErrorJson(parseControlRequest("{\"request\":\"a\\nb\xFF\"}").mError);
    EXPECT_EQ(lAnswer.find('\n'), std::string::npos);
    EXPECT_THAT(toMarkJson({.mTicket = 1, .mName = "x", .mTime = {}, .mError = {}}), HasSubstr("\"mark\":\"x\""));
    EXPECT_THAT(toMarkJson({.mTicket = 1, .mName = "x", .mTime = {}, .mError = "full"}),
                HasSubstr("\"error\":\"full\""));
}
