#include "libkpm/sim/src/Scenario.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <limits>
#include <set>
#include <system_error>
#include <utility>

static constexpr std::uint32_t gcMax32 = std::numeric_limits<std::uint32_t>::max();
static constexpr std::uint32_t gcMaxFcId = 0xFFFFFF;
static constexpr std::size_t gcMaxNamedWord = 40;
static constexpr std::size_t gcSimMaxPages = 16382;  // the length field of an RSCN holds no more

/// A word as it can stand in a message: cut where it is long and with its control characters escaped.
static std::string sShown(std::string_view aWord) {
    std::string lText;
    for (const char lChar : aWord.substr(0, gcMaxNamedWord)) {
        const auto lByte = static_cast<unsigned char>(lChar);
        if (lByte < 0x20 || lByte == 0x7F) {
            static constexpr char scDigits[] = "0123456789abcdef";
            lText += "\\x";
            lText += scDigits[lByte >> 4];
            lText += scDigits[lByte & 15];
        } else {
            lText += lChar;
        }
    }
    return aWord.size() > gcMaxNamedWord ? lText + "..." : lText;
}

static std::string sQuoted(std::string_view aWord) {
    return "\"" + sShown(aWord) + "\"";
}

[[noreturn]] static void sRefuse(const std::string& acrReason) {
    throw ZTCSimRefusal(0, acrReason);
}

static std::string sField(std::string_view aName) {
    return sShown(aName) + "= ";
}

/// The words of a line. A word with `=` is a field; every field is taken once, and those that are left are refused.
class ZTCSimLine {
public:
    explicit ZTCSimLine(std::string_view aText);

    bool isEmpty() const { return mWords.empty(); }
    std::string_view getDirective() const { return mWords.front(); }

    /// The word after the directive; refused where there is none.
    std::string_view takeWord(const char* apWhat);
    std::optional<std::string_view> takeOptionalWord();
    std::optional<std::string_view> take(std::string_view aField);
    std::string_view takeRequired(std::string_view aField);
    void finish() const;

private:
    std::vector<std::string_view> mWords;
    std::size_t mNextWord = 1;
    std::vector<std::pair<std::string_view, std::string_view>> mFields;
};

static bool sIsBlank(char aChar) {
    return aChar == ' ' || aChar == '\t' || aChar == '\r';
}

ZTCSimLine::ZTCSimLine(std::string_view aText) {
    if (aText.size() > gcSimMaxLineSize) {
        sRefuse("the line has " + std::to_string(aText.size()) + " bytes, more than " +
                std::to_string(gcSimMaxLineSize));
    }
    std::size_t lPlace = 0;
    while (lPlace < aText.size()) {
        if (sIsBlank(aText[lPlace])) {
            ++lPlace;
            continue;
        }
        if (aText[lPlace] == '#') {
            break;
        }
        std::size_t lEnd = lPlace;
        while (lEnd < aText.size() && !sIsBlank(aText[lEnd])) {
            ++lEnd;
        }
        const std::string_view lWord = aText.substr(lPlace, lEnd - lPlace);
        lPlace = lEnd;
        const std::size_t lEquals = lWord.find('=');
        if (lEquals == std::string_view::npos) {
            mWords.push_back(lWord);
            continue;
        }
        const std::string_view lName = lWord.substr(0, lEquals);
        if (mWords.empty()) {
            sRefuse("the line begins with " + sQuoted(lWord) + ", not with a directive or an event kind");
        }
        if (lEquals + 1 == lWord.size()) {
            sRefuse(sField(lName) + "has no value");
        }
        for (const auto& [lrName, lrValue] : mFields) {
            if (lrName == lName) {
                sRefuse(sField(lName) + "stands twice");
            }
        }
        mFields.emplace_back(lName, lWord.substr(lEquals + 1));
    }
}

std::optional<std::string_view> ZTCSimLine::takeOptionalWord() {
    if (mNextWord < mWords.size()) {
        return mWords[mNextWord++];
    }
    return std::nullopt;
}

std::string_view ZTCSimLine::takeWord(const char* apWhat) {
    const std::optional<std::string_view> lWord = takeOptionalWord();
    if (!lWord) {
        sRefuse(std::string(getDirective()) + " needs " + apWhat);
    }
    return *lWord;
}

std::optional<std::string_view> ZTCSimLine::take(std::string_view aField) {
    for (auto lField = mFields.begin(); lField != mFields.end(); ++lField) {
        if (lField->first == aField) {
            const std::string_view lValue = lField->second;
            mFields.erase(lField);
            return lValue;
        }
    }
    return std::nullopt;
}

std::string_view ZTCSimLine::takeRequired(std::string_view aField) {
    const std::optional<std::string_view> lValue = take(aField);
    if (!lValue) {
        sRefuse(std::string(getDirective()) + " needs " + std::string(aField) + "=");
    }
    return *lValue;
}

void ZTCSimLine::finish() const {
    if (mNextWord < mWords.size()) {
        sRefuse(std::string(getDirective()) + " does not take the word " + sQuoted(mWords[mNextWord]));
    }
    if (!mFields.empty()) {
        sRefuse(std::string(getDirective()) + " has no field " + sQuoted(mFields.front().first));
    }
}

/// A number in decimal or 0x-hexadecimal.
static std::uint64_t sNumber(std::string_view aField, std::string_view aText, std::uint64_t aLeast,
                             std::uint64_t aMost) {
    const bool lHex = aText.starts_with("0x") || aText.starts_with("0X");
    const std::string_view lDigits = lHex ? aText.substr(2) : aText;
    std::uint64_t lValue = 0;
    const auto [lpEnd, lError] =
        std::from_chars(lDigits.data(), lDigits.data() + lDigits.size(), lValue, lHex ? 16 : 10);
    const bool lIsWhole = lpEnd == lDigits.data() + lDigits.size();
    if (lDigits.empty() || !lIsWhole || lError == std::errc::invalid_argument) {
        sRefuse(sField(aField) + "takes a number, not " + sQuoted(aText));
    }
    if (lError != std::errc() || lValue < aLeast || lValue > aMost) {
        sRefuse(sField(aField) + "takes a number from " + std::to_string(aLeast) + " to " + std::to_string(aMost) +
                ", not " + sQuoted(aText));
    }
    return lValue;
}

static std::uint32_t sNumber32(std::string_view aField, std::string_view aText) {
    return static_cast<std::uint32_t>(sNumber(aField, aText, 0, gcMax32));
}

static int sHexDigit(char aChar) {
    if (aChar >= '0' && aChar <= '9') {
        return aChar - '0';
    }
    if (aChar >= 'a' && aChar <= 'f') {
        return aChar - 'a' + 10;
    }
    if (aChar >= 'A' && aChar <= 'F') {
        return aChar - 'A' + 10;
    }
    return -1;
}

/// Pairs of hex digits, with or without a colon between two pairs.
static std::optional<std::vector<std::uint8_t>> sHexBytes(std::string_view aText) {
    std::vector<std::uint8_t> lBytes;
    for (std::size_t lPlace = 0; lPlace < aText.size(); lPlace += 2) {
        if (aText[lPlace] == ':' && lPlace > 0) {
            ++lPlace;
        }
        if (lPlace + 2 > aText.size()) {
            return std::nullopt;
        }
        const int lHigh = sHexDigit(aText[lPlace]);
        const int lLow = sHexDigit(aText[lPlace + 1]);
        if (lHigh < 0 || lLow < 0) {
            return std::nullopt;
        }
        lBytes.push_back(static_cast<std::uint8_t>(lHigh * 16 + lLow));
    }
    return lBytes;
}

static std::vector<std::uint8_t> sBytes(std::string_view aField, std::string_view aText, std::size_t aMost) {
    std::optional<std::vector<std::uint8_t>> lBytes = sHexBytes(aText);
    if (!lBytes) {
        sRefuse(sField(aField) + "takes pairs of hex digits, not " + sQuoted(aText));
    }
    if (lBytes->size() > aMost) {
        sRefuse(sField(aField) + "takes at most " + std::to_string(aMost) + " bytes, not " +
                std::to_string(lBytes->size()));
    }
    return std::move(*lBytes);
}

static std::optional<HBA_wwn> sLiteralWwn(std::string_view aText) {
    if (aText.size() != 23 || aText[2] != ':') {
        return std::nullopt;
    }
    const std::optional<std::vector<std::uint8_t>> lBytes = sHexBytes(aText);
    if (!lBytes || lBytes->size() != sizeof(HBA_wwn::wwn)) {
        return std::nullopt;
    }
    HBA_wwn lWwn{};
    std::copy(lBytes->begin(), lBytes->end(), lWwn.wwn);
    return lWwn;
}

static const ZTSSimPort* sFindPort(const std::vector<ZTSSimPort>& acrPorts, std::string_view aName) {
    const auto lFound = std::find_if(acrPorts.begin(), acrPorts.end(),
                                     [&](const ZTSSimPort& acrPort) { return acrPort.mName == aName; });
    return lFound == acrPorts.end() ? nullptr : &*lFound;
}

/// A world wide name: as it stands, or that of an adapter or a remote port.
static HBA_wwn sWwn(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario,
                    bool aIsNodeName) {
    if (const std::optional<HBA_wwn> lWwn = sLiteralWwn(aText)) {
        return *lWwn;
    }
    const ZTSSimPort* lpPort = sFindPort(acrScenario.mAdapters, aText);
    if (lpPort == nullptr) {
        lpPort = sFindPort(acrScenario.mPorts, aText);
    }
    if (lpPort == nullptr) {
        sRefuse(sField(aField) +
                "takes a world wide name (30:00:00:00:00:00:00:01) or the name of an adapter or a port, not " +
                sQuoted(aText));
    }
    return aIsNodeName ? lpPort->mWwnn : lpPort->mWwpn;
}

/// Calls `aEach` for every part of a list with commas.
template <class Each>
static void sForEachPart(std::string_view aField, std::string_view aText, Each aEach) {
    std::size_t lPlace = 0;
    while (true) {
        const std::size_t lComma = aText.find(',', lPlace);
        const std::string_view lPart =
            aText.substr(lPlace, lComma == std::string_view::npos ? lComma : lComma - lPlace);
        if (lPart.empty()) {
            sRefuse(sField(aField) + "has an empty value in its list");
        }
        aEach(lPart);
        if (lComma == std::string_view::npos) {
            return;
        }
        lPlace = lComma + 1;
    }
}

static void sCheckListSize(std::string_view aField, std::size_t aSize) {
    if (aSize > gcSimMaxListSize) {
        sRefuse(sField(aField) + "lists more than " + std::to_string(gcSimMaxListSize) + " values");
    }
}

/// A list of numbers: 1,2, 0-15, all, unknown.
static std::vector<std::uint32_t> sNumberList(std::string_view aField, std::string_view aText, std::uint32_t aMost) {
    std::vector<std::uint32_t> lNumbers;
    sForEachPart(aField, aText, [&](std::string_view aPart) {
        if (aPart == "all" || aPart == "unknown") {
            if (aMost != gcMax32) {
                sRefuse(sField(aField) + "takes a number from 0 to " + std::to_string(aMost) + ", not " +
                        sQuoted(aPart));
            }
            lNumbers.push_back(gcMax32);
            sCheckListSize(aField, lNumbers.size());
            return;
        }
        const std::size_t lDash = aPart.find('-', 1);
        const std::uint64_t lFirst = sNumber(aField, aPart.substr(0, lDash), 0, aMost);
        const std::uint64_t lLast =
            lDash == std::string_view::npos ? lFirst : sNumber(aField, aPart.substr(lDash + 1), 0, aMost);
        if (lLast < lFirst) {
            sRefuse(sField(aField) + "has the range " + sQuoted(aPart) + " that ends before it begins");
        }
        for (std::uint64_t lNumber = lFirst; lNumber <= lLast; ++lNumber) {
            lNumbers.push_back(static_cast<std::uint32_t>(lNumber));
            sCheckListSize(aField, lNumbers.size());
        }
    });
    return lNumbers;
}

static std::uint32_t sBoard(std::string_view aField, std::string_view aText, const ZTSSimScenario& acrScenario) {
    const std::vector<ZTSSimPort>& lrAdapters = acrScenario.mAdapters;
    if (const ZTSSimPort* lpAdapter = sFindPort(lrAdapters, aText)) {
        return static_cast<std::uint32_t>(lpAdapter - lrAdapters.data());
    }
    if (aText.front() < '0' || aText.front() > '9') {
        sRefuse(sField(aField) + "names " + sQuoted(aText) + ", which is no adapter of the lines above");
    }
    const std::uint32_t lBoard = sNumber32(aField, aText);
    if (lBoard >= lrAdapters.size()) {
        sRefuse(sField(aField) + "names the board " + std::to_string(lBoard) + ", but the lines above hold " +
                std::to_string(lrAdapters.size()) + " adapters");
    }
    return lBoard;
}

static ZTSSimBoards sBoards(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault) {
    const std::optional<std::string_view> lText = arLine.take("board");
    ZTSSimBoards lBoards;
    if (lText ? *lText == "all" : aAllByDefault) {
        lBoards.mAll = true;
        return lBoards;
    }
    sForEachPart("board", lText.value_or("0"), [&](std::string_view aPart) {
        lBoards.mBoards.push_back(sBoard("board", aPart, acrScenario));
        sCheckListSize("board", lBoards.mBoards.size());
    });
    return lBoards;
}

/// The remote ports of a line: those it names, or by default the first one (`aAllByDefault`: all) of the scenario. A
/// name that no line above declares may stand as a world wide name. Never empty.
static std::vector<ZTSSimPort> sPorts(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, bool aAllByDefault) {
    const std::vector<ZTSSimPort>& lrDeclared = acrScenario.mPorts;
    const std::optional<std::string_view> lText = arLine.take("port");
    std::vector<ZTSSimPort> lPorts;
    if (lText ? *lText == "all" : aAllByDefault) {
        lPorts = lrDeclared;
    } else if (!lText) {
        lPorts.assign(lrDeclared.begin(), lrDeclared.begin() + (lrDeclared.empty() ? 0 : 1));
    } else {
        sForEachPart("port", *lText, [&](std::string_view aPart) {
            if (const ZTSSimPort* lpPort = sFindPort(lrDeclared, aPart)) {
                lPorts.push_back(*lpPort);
            } else if (const std::optional<HBA_wwn> lWwn = sLiteralWwn(aPart)) {
                const auto lKnown = std::find_if(lrDeclared.begin(), lrDeclared.end(), [&](const ZTSSimPort& acrPort) {
                    return std::equal(std::begin(lWwn->wwn), std::end(lWwn->wwn), std::begin(acrPort.mWwpn.wwn));
                });
                lPorts.push_back(lKnown != lrDeclared.end() ? *lKnown : ZTSSimPort{std::string(aPart), *lWwn, {}, 0});
            } else {
                sRefuse("port= names " + sQuoted(aPart) +
                        ", which is neither a port of the lines above nor a world wide name");
            }
            sCheckListSize("port", lPorts.size());
        });
    }
    if (lPorts.empty()) {
        lPorts.emplace_back();
    }
    return lPorts;
}

static std::vector<std::uint8_t> sStoredNumber(const ZTSSimField& acrField, std::uint32_t aNumber) {
    std::vector<std::uint8_t> lBytes(acrField.mWidth);
    storeSimNumber(acrField, aNumber, lBytes.data());
    return lBytes;
}

static ZTSSimSetting sSetting(const ZTSSimField& acrField, std::string_view aText, const ZTSSimScenario& acrScenario) {
    ZTSSimSetting lSetting;
    lSetting.mpField = &acrField;
    switch (acrField.mForm) {
        case ZTSFF_Number:
        case ZTSFF_BigEndian: {
            const std::uint32_t lMost = acrField.mWidth >= 4 ? gcMax32 : (1u << (8 * acrField.mWidth)) - 1;
            for (const std::uint32_t lNumber : sNumberList(acrField.mpName, aText, lMost)) {
                lSetting.mValues.push_back(sStoredNumber(acrField, lNumber));
            }
            break;
        }
        case ZTSFF_Wwn:
            sForEachPart(acrField.mpName, aText, [&](std::string_view aPart) {
                const bool lIsNodeName = acrField.mDefault == ZTSDF_RemoteNode || acrField.mDefault == ZTSDF_LocalNode;
                const HBA_wwn lWwn = sWwn(acrField.mpName, aPart, acrScenario, lIsNodeName);
                lSetting.mValues.emplace_back(std::begin(lWwn.wwn), std::end(lWwn.wwn));
                sCheckListSize(acrField.mpName, lSetting.mValues.size());
            });
            break;
        case ZTSFF_Bytes:
            sForEachPart(acrField.mpName, aText, [&](std::string_view aPart) {
                lSetting.mValues.push_back(sBytes(acrField.mpName, aPart, acrField.mWidth));
                sCheckListSize(acrField.mpName, lSetting.mValues.size());
            });
            break;
    }
    return lSetting;
}

/// A page of an RSCN: port:ID, area:ID, domain:ID, fabric, word:NUMBER.
static std::uint32_t sPage(std::string_view aText, const ZTSSimScenario& acrScenario) {
    static constexpr std::array<std::pair<std::string_view, std::uint32_t>, 5> scFormats{{
        {"port", 0x00000000},
        {"area", 0x01000000},
        {"domain", 0x02000000},
        {"fabric", 0x03000000},
        {"word", 0},
    }};
    const std::size_t lColon = aText.find(':');
    const std::string_view lFormat = aText.substr(0, lColon);
    for (const auto& [lrName, lrBits] : scFormats) {
        if (lFormat != lrName) {
            continue;
        }
        if (lColon == std::string_view::npos) {
            if (lrName == "fabric") {
                return lrBits;
            }
            break;
        }
        const std::string_view lId = aText.substr(lColon + 1);
        if (const ZTSSimPort* lpPort = sFindPort(acrScenario.mPorts, lId)) {
            return lrBits | lpPort->mFcId;
        }
        const std::uint32_t lMost = lrName == "word" ? gcMax32 : gcMaxFcId;
        return lrBits | static_cast<std::uint32_t>(sNumber("pages", lId, 0, lMost));
    }
    sRefuse("pages= takes port:ID, area:ID, domain:ID, fabric or word:NUMBER, not " + sQuoted(aText));
}

static std::uint64_t sOptionalNumber(ZTCSimLine& arLine, std::string_view aField, std::uint64_t aLeast,
                                     std::uint64_t aMost, std::uint64_t aDefault) {
    const std::optional<std::string_view> lText = arLine.take(aField);
    return lText ? sNumber(aField, *lText, aLeast, aMost) : aDefault;
}

/// The fields by which a line sets aside what its kind's callback is told.
static void sParseOverrides(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, ZTSSimEvent& arEvent) {
    const ZTESimDelivery lDelivery = getSimKind(arEvent.mKind).mDelivery;
    if (lDelivery == ZTSD_Temperature) {
        return;
    }
    if (const auto lText = arLine.take("data")) {
        if (*lText == "null" && lDelivery == ZTSD_Scope) {
            arEvent.mDataNull = true;
        } else {
            const std::size_t lMost = lDelivery == ZTSD_Link ? sizeof(LINKINFO) : gcSimMaxDataSize;
            arEvent.mData = sBytes("data", *lText, lMost);
        }
    }
    if (lDelivery == ZTSD_Link) {
        return;
    }
    if (const auto lText = arLine.take("length")) {
        arEvent.mLength = static_cast<std::uint32_t>(sNumber("length", *lText, 0, gcSimMaxDataSize));
    }
    if (lDelivery == ZTSD_Rscn) {
        if (const auto lText = arLine.take("pages")) {
            arEvent.mPages.emplace();
            if (*lText == "none") {
                return;
            }
            sForEachPart("pages", *lText, [&](std::string_view aPart) {
                arEvent.mPages->push_back(sPage(aPart, acrScenario));
                if (arEvent.mPages->size() > gcSimMaxPages) {
                    sRefuse("pages= lists more than " + std::to_string(gcSimMaxPages) + " pages");
                }
            });
        }
        return;
    }
    if (const auto lText = arLine.take("category")) {
        arEvent.mCategory = sNumber32("category", *lText);
    }
    if (const auto lText = arLine.take("subcategory")) {
        arEvent.mSubcategory = sNumber32("subcategory", *lText);
    }
    if (const auto lText = arLine.take("local")) {
        arEvent.mLocal = sWwn("local", *lText, acrScenario, false);
    }
    if (const auto lText = arLine.take("payload")) {
        if (*lText != "null") {
            sRefuse("payload= takes null, not " + sQuoted(*lText));
        }
        arEvent.mPayloadNull = true;
    }
    if (const auto lText = arLine.take("size")) {
        arEvent.mSize = sNumber("size", *lText, 0, std::numeric_limits<std::uint64_t>::max());
        const std::uint64_t lClaimed = *arEvent.mSize & gcMax32;
        if (lClaimed > ZT_EVENT_HEADER_SIZE + gcSimMaxDataSize) {
            sRefuse("size= has low 32 bits of " + std::to_string(lClaimed) + ", more than " +
                    std::to_string(ZT_EVENT_HEADER_SIZE + gcSimMaxDataSize));
        }
    }
}

static ZTSSimEvent sParseEvent(ZTCSimLine& arLine, std::size_t aKind, const ZTSSimScenario& acrScenario) {
    ZTSSimEvent lEvent;
    lEvent.mKind = aKind;
    lEvent.mBoards = sBoards(arLine, acrScenario, false);
    lEvent.mPorts = sPorts(arLine, acrScenario, false);
    if (const auto lText = arLine.take("as")) {
        lEvent.mAs = sNumber32("as", *lText);
    }
    if (const auto lText = arLine.take("at")) {
        lEvent.mAt = sNumber("at", *lText, 0, gcSimMaxMilliseconds);
        lEvent.mIsTimed = true;
    }
    if (const auto lText = arLine.take("every")) {
        lEvent.mEvery = sNumber("every", *lText, 0, gcSimMaxMilliseconds);
        lEvent.mIsTimed = true;
    }
    if (const auto lText = arLine.take("times")) {
        lEvent.mTimes = *lText == "forever" ? 0 : sNumber("times", *lText, 1, gcSimMaxTimes);
    }
    if (lEvent.mTimes == 0 && lEvent.mEvery == 0) {
        sRefuse("times=forever needs every= of at least 1");
    }
    lEvent.mThreads = sOptionalNumber(arLine, "threads", 1, gcSimMaxThreads, 1);
    for (const ZTSSimField& lrField : getSimKind(aKind).mFields) {
        if (const auto lText = arLine.take(lrField.mpName)) {
            lEvent.mSettings.push_back(sSetting(lrField, *lText, acrScenario));
        }
    }
    sParseOverrides(arLine, acrScenario, lEvent);
    arLine.finish();
    if (lEvent.mData && (!lEvent.mSettings.empty() || lEvent.mPages)) {
        sRefuse(std::string(arLine.getDirective()) + " takes either data= or fields of its data, not both");
    }
    return lEvent;
}

static ZTSSimStorm sParseStorm(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    ZTSSimStorm lStorm;
    lStorm.mCount = sNumber("count", arLine.takeRequired("count"), 1, gcSimMaxTimes);
    lStorm.mSeed = sOptionalNumber(arLine, "seed", 0, std::numeric_limits<std::uint64_t>::max(), lStorm.mSeed);
    lStorm.mThreads = sOptionalNumber(arLine, "threads", 1, gcSimMaxThreads, lStorm.mThreads);
    if (const auto lText = arLine.take("at")) {
        lStorm.mAt = sNumber("at", *lText, 0, gcSimMaxMilliseconds);
        lStorm.mIsTimed = true;
    }
    if (const auto lText = arLine.take("over")) {
        lStorm.mOver = sNumber("over", *lText, 0, gcSimMaxMilliseconds);
        lStorm.mIsTimed = true;
    }
    const std::string_view lKinds = arLine.take("kind").value_or("all");
    if (lKinds == "all") {
        for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
            lStorm.mKinds.push_back(lKind);
        }
    } else {
        sForEachPart("kind", lKinds, [&](std::string_view aPart) {
            const std::optional<std::size_t> lKind = findKindIndex(aPart);
            if (!lKind) {
                sRefuse("kind= names " + sQuoted(aPart) + ", which is no event kind");
            }
            lStorm.mKinds.push_back(*lKind);
            sCheckListSize("kind", lStorm.mKinds.size());
        });
    }
    ZTSSimBoards lBoards = sBoards(arLine, acrScenario, true);
    if (lBoards.mAll) {
        for (std::uint32_t lBoard = 0; lBoard < acrScenario.mAdapters.size(); ++lBoard) {
            lBoards.mBoards.push_back(lBoard);
        }
    }
    if (lBoards.mBoards.empty()) {
        sRefuse("storm needs an adapter in the lines above");
    }
    lStorm.mBoards = std::move(lBoards.mBoards);
    lStorm.mPorts = sPorts(arLine, acrScenario, true);
    lStorm.mLuns = sNumberList("lun", arLine.take("lun").value_or("0-15"), gcMax32);
    arLine.finish();
    return lStorm;
}

static void sCheckNewName(std::string_view aName, const ZTSSimScenario& acrScenario) {
    const bool lStartsWithLetter =
        (aName.front() >= 'a' && aName.front() <= 'z') || (aName.front() >= 'A' && aName.front() <= 'Z');
    const bool lHasMark = aName.find_first_of(",:") != std::string_view::npos;
    if (!lStartsWithLetter || lHasMark || aName == "all" || aName == "none") {
        sRefuse(sQuoted(aName) + " is no name: it begins with a letter, has no comma or colon, and is not all or none");
    }
    if (sFindPort(acrScenario.mAdapters, aName) != nullptr || sFindPort(acrScenario.mPorts, aName) != nullptr) {
        sRefuse("the name " + sQuoted(aName) + " stands twice");
    }
}

static HBA_wwn sNewWwn(ZTCSimLine& arLine, std::string_view aField) {
    const std::string_view lText = arLine.takeRequired(aField);
    const std::optional<HBA_wwn> lWwn = sLiteralWwn(lText);
    if (!lWwn) {
        sRefuse(sField(aField) + "takes a world wide name (30:00:00:00:00:00:00:01), not " + sQuoted(lText));
    }
    return *lWwn;
}

static ZTSSimPort sParsePort(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    ZTSSimPort lPort;
    lPort.mName = arLine.takeWord("a name");
    sCheckNewName(lPort.mName, acrScenario);
    lPort.mWwpn = sNewWwn(arLine, "wwpn");
    lPort.mWwnn = sNewWwn(arLine, "wwnn");
    lPort.mFcId = static_cast<std::uint32_t>(sOptionalNumber(arLine, "fcid", 0, gcMaxFcId, 0));
    return lPort;
}

static std::uint32_t sParseStatus(ZTCSimLine& arLine) {
    return sNumber32("status", arLine.takeRequired("status"));
}

static ZTSSimAnswer sParseAnswer(ZTCSimLine& arLine, ZTESimOperation aOperation, const ZTSSimScenario& acrScenario) {
    ZTSSimAnswer lAnswer;
    lAnswer.mOperation = aOperation;
    if (aOperation != ZTSO_GetAdapterInfo) {
        const std::string_view lName = arLine.takeWord("an event kind, or all");
        if (lName != "all") {
            lAnswer.mKind = findKindIndex(lName);
            if (!lAnswer.mKind) {
                sRefuse(sQuoted(lName) + " is no event kind");
            }
        }
    }
    if (const auto lText = arLine.take("board"); lText && *lText != "all") {
        lAnswer.mBoard = sBoard("board", *lText, acrScenario);
    }
    lAnswer.mStatus = sParseStatus(arLine);
    lAnswer.mTimes = sOptionalNumber(arLine, "times", 1, gcSimMaxTimes, 0);
    if (aOperation == ZTSO_Register) {
        if (const auto lText = arLine.take("handle")) {
            lAnswer.mHandle = sNumber32("handle", *lText);
        }
    }
    return lAnswer;
}

static void sParseCount(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    const std::string_view lText = arLine.takeWord("a number of boards");
    const std::uint32_t lCount = sNumber32("count", lText);
    if (lCount > arScenario.mAdapters.size()) {
        sRefuse("count " + std::to_string(lCount) + " is more than the " + std::to_string(arScenario.mAdapters.size()) +
                " adapters of the lines above");
    }
    if (const auto lAt = arLine.take("at")) {
        arScenario.mCountChanges.push_back({sNumber("at", *lAt, 0, gcSimMaxMilliseconds), lCount});
    } else {
        arScenario.mCount = lCount;
    }
}

/// A word that is one of a few.
template <class Value, std::size_t Count>
static Value sChoice(ZTCSimLine& arLine, const std::array<std::pair<std::string_view, Value>, Count>& acrChoices) {
    std::string lWords;
    for (const auto& [lrName, lrValue] : acrChoices) {
        lWords += (lWords.empty() ? "" : " or ") + std::string(lrName);
    }
    const std::string_view lWord = arLine.takeWord(lWords.c_str());
    for (const auto& [lrName, lrValue] : acrChoices) {
        if (lrName == lWord) {
            return lrValue;
        }
    }
    sRefuse(std::string(arLine.getDirective()) + " takes " + lWords + ", not " + sQuoted(lWord));
}

static void sParseAdapter(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    if (arScenario.mAdapters.size() >= gcSimMaxAdapters) {
        sRefuse("there are more than " + std::to_string(gcSimMaxAdapters) + " adapters");
    }
    arScenario.mAdapters.push_back(sParsePort(arLine, arScenario));
}

static void sParseRemotePort(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    if (arScenario.mPorts.size() >= gcSimMaxPorts) {
        sRefuse("there are more than " + std::to_string(gcSimMaxPorts) + " ports");
    }
    arScenario.mPorts.push_back(sParsePort(arLine, arScenario));
}

static void sParseInit(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mInitStatus = sParseStatus(arLine);
}

static void sParseInfo(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_GetAdapterInfo, arScenario));
}

static void sParseRegister(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_Register, arScenario));
}

static void sParseUnregister(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_Unregister, arScenario));
}

static void sParseZtapi(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, bool>, 2> scChoices{{{"yes", true}, {"no", false}}};
    arScenario.mIsZtapiSupported = sChoice(arLine, scChoices);
}

static void sParseStart(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, ZTESimStart>, 3> scChoices{
        {{"registered", ZTSS_Registered}, {"first", ZTSS_First}, {"init", ZTSS_Init}}};
    arScenario.mStart = sChoice(arLine, scChoices);
}

static void sParseAddresses(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, bool>, 2> scChoices{{{"odd", true}, {"aligned", false}}};
    arScenario.mHasOddAddresses = sChoice(arLine, scChoices);
}

struct ZTSSimDirective {
    std::string_view mName;
    void (*mpParse)(ZTCSimLine& arLine, ZTSSimScenario& arScenario);
};

static constexpr std::array<ZTSSimDirective, 10> gcDirectives{{
    {"adapter", sParseAdapter},
    {"port", sParseRemotePort},
    {"count", sParseCount},
    {"init", sParseInit},
    {"ztapi", sParseZtapi},
    {"info", sParseInfo},
    {"register", sParseRegister},
    {"unregister", sParseUnregister},
    {"start", sParseStart},
    {"addresses", sParseAddresses},
}};

static const ZTSSimDirective* sFindDirective(std::string_view aName) {
    const auto lFound = std::find_if(gcDirectives.begin(), gcDirectives.end(),
                                     [&](const ZTSSimDirective& acrDirective) { return acrDirective.mName == aName; });
    return lFound == gcDirectives.end() ? nullptr : &*lFound;
}

static std::optional<ZTSSimEventLine> sParseEventLine(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    if (arLine.getDirective() == "storm") {
        return sParseStorm(arLine, acrScenario);
    }
    if (const std::optional<std::size_t> lKind = findKindIndex(arLine.getDirective())) {
        return sParseEvent(arLine, *lKind, acrScenario);
    }
    return std::nullopt;
}

static void sCountThreads(std::uint64_t aThreads, ZTSSimScenario& arScenario) {
    arScenario.mThreads += aThreads;
    if (arScenario.mThreads > gcSimMaxTotalThreads) {
        sRefuse("threads= of all lines so far make " + std::to_string(arScenario.mThreads) + ", more than " +
                std::to_string(gcSimMaxTotalThreads));
    }
}

static void sParseLine(std::string_view aText, ZTSSimScenario& arScenario) {
    ZTCSimLine lLine(aText);
    if (lLine.isEmpty()) {
        return;
    }
    if (const ZTSSimDirective* lpDirective = sFindDirective(lLine.getDirective())) {
        lpDirective->mpParse(lLine, arScenario);
        lLine.finish();
        return;
    }
    std::optional<ZTSSimEventLine> lEventLine = sParseEventLine(lLine, arScenario);
    if (!lEventLine) {
        sRefuse(sQuoted(lLine.getDirective()) + " is neither a directive nor an event kind");
    }
    if (arScenario.mEvents.size() + arScenario.mStorms.size() >= gcSimMaxEventLines) {
        sRefuse("there are more than " + std::to_string(gcSimMaxEventLines) + " lines with events");
    }
    if (auto* lpEvent = std::get_if<ZTSSimEvent>(&*lEventLine)) {
        if (lpEvent->mBoards.mAll && arScenario.mAdapters.empty()) {
            sRefuse("board=all needs an adapter in the lines above");
        }
        sCountThreads(lpEvent->mThreads > 1 ? lpEvent->mThreads : 0, arScenario);
        arScenario.mEvents.push_back(std::move(*lpEvent));
    } else {
        ZTSSimStorm& lrStorm = std::get<ZTSSimStorm>(*lEventLine);
        sCountThreads(lrStorm.mThreads, arScenario);
        arScenario.mStorms.push_back(std::move(lrStorm));
    }
}

ZTSSimScenario parseSimScenario(std::string_view aText) {
    if (aText.size() > gcSimMaxTextSize) {
        throw ZTCSimRefusal(0, "the scenario has " + std::to_string(aText.size()) + " bytes, more than " +
                                   std::to_string(gcSimMaxTextSize));
    }
    ZTSSimScenario lScenario;
    std::size_t lLine = 0;
    while (!aText.empty()) {
        ++lLine;
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        try {
            sParseLine(aText.substr(0, lEnd), lScenario);
        } catch (const ZTCSimRefusal& lrRefusal) {
            throw ZTCSimRefusal(lLine, lrRefusal.what());
        }
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    return lScenario;
}

ZTSSimEventLine parseSimEventLine(std::string_view aLine, const ZTSSimScenario& acrScenario) {
    ZTCSimLine lLine(aLine);
    if (lLine.isEmpty()) {
        sRefuse("the line is empty");
    }
    std::optional<ZTSSimEventLine> lEventLine = sParseEventLine(lLine, acrScenario);
    if (!lEventLine) {
        sRefuse(sQuoted(lLine.getDirective()) + " is neither an event kind nor storm");
    }
    return std::move(*lEventLine);
}

std::string_view getDefaultSimScenario() {
    return "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80 fcid=0x010000\n"
           "adapter hba1 wwpn=30:00:00:00:00:01:00:01 wwnn=30:00:00:00:00:01:00:81 fcid=0x020000\n"
           "port disk0 wwpn=30:00:00:00:00:02:00:00 wwnn=30:00:00:00:00:02:00:80 fcid=0x010100\n"
           "port disk1 wwpn=30:00:00:00:00:02:00:01 wwnn=30:00:00:00:00:02:00:81 fcid=0x010200\n"
           "port disk2 wwpn=30:00:00:00:00:02:00:02 wwnn=30:00:00:00:00:02:00:82 fcid=0x020100\n"
           "port disk3 wwpn=30:00:00:00:00:02:00:03 wwnn=30:00:00:00:00:02:00:83 fcid=0x020200\n";
}
