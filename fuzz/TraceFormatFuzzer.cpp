// The kernel's descriptions of its trace data: whatever a text has, the fields that are taken out of it stay within the
// limit, are found by their names, and are the same when they are written down and read again; a layout that is made of
// them points at integers inside, and one that cannot be made has a reason.
//
// Input: the text of a format or header_page file.
#include <algorithm>
#include <string>
#include <variant>

#include "fuzz/support/FuzzInput.h"
#include "libkpm/linux/src/TraceFormat.h"

static std::string sTextOf(const ZTSTraceFormat& acrFormat) {
    std::string lText = acrFormat.mId ? "ID: " + std::to_string(*acrFormat.mId) + "\n" : std::string();
    for (const ZTSTraceField& lrField : acrFormat.mFields) {
        lText += "\tfield:type " + lrField.mName + ";\toffset:" + std::to_string(lrField.mOffset) +
                 ";\tsize:" + std::to_string(lrField.mSize) + ";\tsigned:0;\n";
    }
    return lText;
}

static bool sIsSame(const ZTSTraceField& acrOne, const ZTSTraceField& acrOther) {
    return acrOne.mName == acrOther.mName && acrOne.mOffset == acrOther.mOffset && acrOne.mSize == acrOther.mSize;
}

static void sCheckPageLayout(const ZTSTraceFormat& acrFormat) {
    const auto lMade = makeTracePageLayout(acrFormat);
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lMade)) {
        ZT_FUZZ_REQUIRE(lpProblem->mText.find("header_page") != std::string::npos, lpProblem->mText);
        return;
    }
    const auto& lrLayout = std::get<ZTSTracePageLayout>(lMade);
    ZT_FUZZ_REQUIRE(lrLayout.mCommitSize == 4 || lrLayout.mCommitSize == 8, std::to_string(lrLayout.mCommitSize));
    ZT_FUZZ_REQUIRE(lrLayout.mCommitOffset + lrLayout.mCommitSize <= lrLayout.mDataOffset,
                    std::to_string(lrLayout.mCommitOffset));
    ZT_FUZZ_REQUIRE(lrLayout.mDataOffset < lrLayout.mPageSize, std::to_string(lrLayout.mDataOffset));
    ZT_FUZZ_REQUIRE(lrLayout.mPageSize <= gcMostTraceOffset, std::to_string(lrLayout.mPageSize));
}

static void sCheckDoneLayout(const ZTSTraceFormat& acrFormat) {
    const auto lMade = makeScsiDoneLayout(acrFormat);
    if (const auto* lpProblem = std::get_if<ZTSTraceProblem>(&lMade)) {
        ZT_FUZZ_REQUIRE(lpProblem->mText.starts_with("the format"), lpProblem->mText);
        return;
    }
    const auto& lrLayout = std::get<ZTSScsiDoneLayout>(lMade);
    ZT_FUZZ_REQUIRE(acrFormat.mId == lrLayout.mId, std::to_string(lrLayout.mId));
    const auto lIsIn = [&](const char* apName, const ZTSScsiDoneLayout::Place& acrPlace) {
        const ZTSTraceField* lpField = acrFormat.find(apName);
        return lpField != nullptr && lpField->mOffset == acrPlace.mOffset && lpField->mSize == acrPlace.mSize &&
               (acrPlace.mSize == 1 || acrPlace.mSize == 2 || acrPlace.mSize == 4 || acrPlace.mSize == 8);
    };
    ZT_FUZZ_REQUIRE(lIsIn("common_type", lrLayout.mType), "common_type");
    ZT_FUZZ_REQUIRE(lIsIn("host_no", lrLayout.mHost), "host_no");
    ZT_FUZZ_REQUIRE(lIsIn("channel", lrLayout.mChannel), "channel");
    ZT_FUZZ_REQUIRE(lIsIn("id", lrLayout.mTarget), "id");
    ZT_FUZZ_REQUIRE(lIsIn("lun", lrLayout.mLun), "lun");
    ZT_FUZZ_REQUIRE(lIsIn("result", lrLayout.mResult), "result");
    ZT_FUZZ_REQUIRE(lIsIn("opcode", lrLayout.mOpcode), "opcode");
    const bool lHasSense =
        lIsIn("sense_key", lrLayout.mSenseKey) && lIsIn("asc", lrLayout.mAsc) && lIsIn("ascq", lrLayout.mAscq);
    ZT_FUZZ_REQUIRE(lrLayout.hasSense() == lHasSense, "sense data");
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const ZTCExactBlock lBlock({apData, aSize}, 0);
    const std::string_view lText(reinterpret_cast<const char*>(lBlock.get()), aSize);
    const ZTSTraceFormat lFormat = parseTraceFormat(lText);
    const auto lLines = static_cast<std::size_t>(std::count(lText.begin(), lText.end(), '\n')) + 1;
    ZT_FUZZ_REQUIRE(lFormat.mFields.size() <= lLines, std::to_string(lFormat.mFields.size()));
    for (const ZTSTraceField& lrField : lFormat.mFields) {
        ZT_FUZZ_REQUIRE(lrField.mOffset <= gcMostTraceOffset, std::to_string(lrField.mOffset));
        ZT_FUZZ_REQUIRE(lrField.mSize <= gcMostTraceOffset, std::to_string(lrField.mSize));
        ZT_FUZZ_REQUIRE(!lrField.mName.empty(), "no name");
        ZT_FUZZ_REQUIRE(lText.find(lrField.mName) != std::string_view::npos, lrField.mName);
        const ZTSTraceField* lpFound = lFormat.find(lrField.mName);
        ZT_FUZZ_REQUIRE(lpFound != nullptr && lpFound <= &lrField, lrField.mName);
    }
    const ZTSTraceFormat lAgain = parseTraceFormat(sTextOf(lFormat));
    ZT_FUZZ_REQUIRE(lAgain.mId == lFormat.mId, "another ID");
    ZT_FUZZ_REQUIRE(std::equal(lAgain.mFields.begin(), lAgain.mFields.end(), lFormat.mFields.begin(),
                               lFormat.mFields.end(), sIsSame),
                    "other fields");
    sCheckPageLayout(lFormat);
    sCheckDoneLayout(lFormat);
    return 0;
}
