#include "libkpm/linux/src/TraceFormat.h"

#include <algorithm>
#include <charconv>

static bool sIsSpace(char aChar) {
    return aChar == ' ' || aChar == '\t' || aChar == '\r';
}

static std::string_view sTrimmed(std::string_view aText) {
    while (!aText.empty() && sIsSpace(aText.front())) {
        aText.remove_prefix(1);
    }
    while (!aText.empty() && sIsSpace(aText.back())) {
        aText.remove_suffix(1);
    }
    return aText;
}

static std::optional<std::size_t> sNumber(std::string_view aText) {
    std::size_t lNumber = 0;
    const auto [lpEnd, lError] = std::from_chars(aText.data(), aText.data() + aText.size(), lNumber);
    if (lError != std::errc() || lpEnd != aText.data() + aText.size()) {
        return std::nullopt;
    }
    return lNumber;
}

/// The text before the next `aSeparator`, which is taken from `arText` with it.
static std::string_view sTake(std::string_view& arText, char aSeparator) {
    const std::size_t lEnd = std::min(arText.find(aSeparator), arText.size());
    const std::string_view lTaken = arText.substr(0, lEnd);
    arText.remove_prefix(std::min(lEnd + 1, arText.size()));
    return lTaken;
}

/// The name in a declaration such as "unsigned char name[2][16]".
static std::string_view sDeclaredName(std::string_view aDeclaration) {
    std::size_t lBracket = aDeclaration.rfind('[');
    while (aDeclaration.ends_with(']') && lBracket != std::string_view::npos) {
        aDeclaration = sTrimmed(aDeclaration.substr(0, lBracket));
        lBracket = aDeclaration.rfind('[');
    }
    const std::size_t lBegin = aDeclaration.find_last_of(" \t*");
    return lBegin == std::string_view::npos ? aDeclaration : aDeclaration.substr(lBegin + 1);
}

/// A line such as "field:unsigned int host_no; offset:8; size:4; signed:0;".
static std::optional<ZTSTraceField> sField(std::string_view aLine) {
    ZTSTraceField lField;
    bool lHasOffset = false;
    bool lHasSize = false;
    while (!aLine.empty()) {
        std::string_view lPart = sTrimmed(sTake(aLine, ';'));
        const std::string_view lKey = sTake(lPart, ':');
        if (lKey == "field") {
            lField.mName = sDeclaredName(sTrimmed(lPart));
        } else if (lKey == "offset" || lKey == "size") {
            const std::optional<std::size_t> lNumber = sNumber(lPart);
            if (!lNumber || *lNumber > gcMostTraceOffset) {
                return std::nullopt;
            }
            (lKey == "size" ? lField.mSize : lField.mOffset) = *lNumber;
            (lKey == "size" ? lHasSize : lHasOffset) = true;
        }
    }
    if (lField.mName.empty() || !lHasOffset || !lHasSize) {
        return std::nullopt;
    }
    return lField;
}

const ZTSTraceField* ZTSTraceFormat::find(std::string_view aName) const {
    const auto lFound = std::find_if(mFields.begin(), mFields.end(),
                                     [aName](const ZTSTraceField& acrField) { return acrField.mName == aName; });
    return lFound == mFields.end() ? nullptr : &*lFound;
}

ZTSTraceFormat parseTraceFormat(std::string_view aText) {
    ZTSTraceFormat lFormat;
    while (!aText.empty()) {
        std::string_view lLine = sTrimmed(sTake(aText, '\n'));
        if (lLine.starts_with("ID:")) {
            const std::optional<std::size_t> lId = sNumber(sTrimmed(lLine.substr(3)));
            if (lId && *lId <= 0xFFFFFFFFu) {
                lFormat.mId = static_cast<std::uint32_t>(*lId);
            }
        } else if (lLine.starts_with("field:")) {
            if (std::optional<ZTSTraceField> lField = sField(lLine)) {
                lFormat.mFields.push_back(std::move(*lField));
            }
        }
    }
    return lFormat;
}

static bool sIsIntegerSize(std::size_t aSize) {
    return aSize == 1 || aSize == 2 || aSize == 4 || aSize == 8;
}

std::variant<ZTSTracePageLayout, ZTSTraceProblem> makeTracePageLayout(const ZTSTraceFormat& acrFormat) {
    const ZTSTraceField* lpCommit = acrFormat.find("commit");
    const ZTSTraceField* lpData = acrFormat.find("data");
    if (lpCommit == nullptr || lpData == nullptr) {
        return ZTSTraceProblem{std::string("header_page has no field ") + (lpCommit == nullptr ? "commit" : "data")};
    }
    const bool lIsPlausible = (lpCommit->mSize == 4 || lpCommit->mSize == 8) && lpData->mSize >= 64 &&
                              lpData->mOffset >= lpCommit->mOffset + lpCommit->mSize &&
                              lpData->mOffset + lpData->mSize <= gcMostTraceOffset;
    if (!lIsPlausible) {
        return ZTSTraceProblem{"header_page gives commit " + std::to_string(lpCommit->mSize) + " bytes at " +
                               std::to_string(lpCommit->mOffset) + " and data " + std::to_string(lpData->mSize) +
                               " bytes at " + std::to_string(lpData->mOffset) + ", which cannot be"};
    }
    ZTSTracePageLayout lLayout{lpCommit->mOffset, lpCommit->mSize, lpData->mOffset, lpData->mOffset + lpData->mSize};
    if (const ZTSTraceField* lpTime = acrFormat.find("timestamp"); lpTime != nullptr && lpTime->mSize == 8) {
        lLayout.mTime = {lpTime->mOffset, lpTime->mSize};
    }
    return lLayout;
}

std::optional<ZTSTraceProblem> fillTracePlaces(const ZTSTraceFormat& acrFormat,
                                               std::span<const ZTSTraceFieldRow> aRows) {
    for (const ZTSTraceFieldRow& lrRow : aRows) {
        const ZTSTraceField* lpField = acrFormat.find(lrRow.mpName);
        const bool lIsUsable = lpField != nullptr && sIsIntegerSize(lpField->mSize);
        if (lIsUsable) {
            *lrRow.mpPlace = {lpField->mOffset, lpField->mSize};
        } else if (lrRow.mIsNeeded) {
            return ZTSTraceProblem{lpField == nullptr
                                       ? std::string("the format has no field ") + lrRow.mpName
                                       : std::string("the format's field ") + lrRow.mpName + " has " +
                                             std::to_string(lpField->mSize) + " bytes, which is no integer's size"};
        }
    }
    return std::nullopt;
}

std::variant<ZTSScsiDoneLayout, ZTSTraceProblem> makeScsiDoneLayout(const ZTSTraceFormat& acrFormat) {
    ZTSScsiDoneLayout lLayout;
    if (!acrFormat.mId) {
        return ZTSTraceProblem{"the format has no ID"};
    }
    lLayout.mId = *acrFormat.mId;
    const ZTSTraceFieldRow lRows[] = {{"common_type", &lLayout.mType, true},
                                      {"host_no", &lLayout.mHost, true},
                                      {"channel", &lLayout.mChannel, true},
                                      {"id", &lLayout.mTarget, true},
                                      {"lun", &lLayout.mLun, true},
                                      {"result", &lLayout.mResult, true},
                                      {"opcode", &lLayout.mOpcode, true},
                                      {"driver_tag", &lLayout.mDriverTag, false},
                                      {"scheduler_tag", &lLayout.mSchedulerTag, false},
                                      {"sense_key", &lLayout.mSenseKey, false},
                                      {"asc", &lLayout.mAsc, false},
                                      {"ascq", &lLayout.mAscq, false}};
    if (std::optional<ZTSTraceProblem> lProblem = fillTracePlaces(acrFormat, lRows)) {
        return std::move(*lProblem);
    }
    if (lLayout.mSenseKey.mSize == 0 || lLayout.mAsc.mSize == 0 || lLayout.mAscq.mSize == 0) {
        lLayout.mSenseKey = lLayout.mAsc = lLayout.mAscq = {};
    }
    return lLayout;
}
