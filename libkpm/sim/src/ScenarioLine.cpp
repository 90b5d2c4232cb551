#include "libkpm/sim/src/ScenarioLine.h"

#include "libkpm/sim/src/Scenario.h"

static constexpr std::size_t scMaxNamedWord = 40;

std::string showSimWord(std::string_view aWord) {
    std::string lText;
    for (const char lChar : aWord.substr(0, scMaxNamedWord)) {
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
    return aWord.size() > scMaxNamedWord ? lText + "..." : lText;
}

std::string quoteSimWord(std::string_view aWord) {
    return "\"" + showSimWord(aWord) + "\"";
}

[[noreturn]] void refuseSim(const std::string& acrReason) {
    throw ZTCSimRefusal(0, acrReason);
}

std::string nameSimField(std::string_view aName) {
    return showSimWord(aName) + "= ";
}

static bool sIsBlank(char aChar) {
    return aChar == ' ' || aChar == '\t' || aChar == '\r';
}

/// The end of the quoted text that begins at `aBegin`, behind its opening quotation mark.
static std::size_t sFindClosingQuote(std::string_view aText, std::size_t aBegin) {
    const std::size_t lClose = aText.find('"', aBegin);
    if (lClose == std::string_view::npos) {
        refuseSim("the quotation mark before " + quoteSimWord(aText.substr(aBegin)) + " is not closed");
    }
    if (lClose + 1 < aText.size() && !sIsBlank(aText[lClose + 1])) {
        refuseSim("there must be a blank after the quoted " + quoteSimWord(aText.substr(aBegin, lClose - aBegin)));
    }
    return lClose;
}

/// Takes the word or the field at `arPlace`, which is no blank, and moves behind it.
void ZTCSimLine::addWord(std::string_view aText, std::size_t& arPlace) {
    if (aText[arPlace] == '"') {
        const std::size_t lBegin = arPlace + 1;
        const std::size_t lClose = sFindClosingQuote(aText, lBegin);
        if (lClose == lBegin) {
            refuseSim("there is nothing between the quotation marks");
        }
        mWords.push_back(aText.substr(lBegin, lClose - lBegin));
        arPlace = lClose + 1;
        return;
    }
    std::size_t lEnd = arPlace;
    while (lEnd < aText.size() && !sIsBlank(aText[lEnd])) {
        ++lEnd;
    }
    const std::string_view lWord = aText.substr(arPlace, lEnd - arPlace);
    const std::size_t lEquals = lWord.find('=');
    if (lEquals == std::string_view::npos) {
        mWords.push_back(lWord);
        arPlace = lEnd;
        return;
    }
    const std::string_view lName = lWord.substr(0, lEquals);
    std::string_view lValue = lWord.substr(lEquals + 1);
    if (lValue.starts_with('"')) {
        const std::size_t lBegin = arPlace + lEquals + 2;
        lEnd = sFindClosingQuote(aText, lBegin);
        lValue = aText.substr(lBegin, lEnd - lBegin);
        ++lEnd;
    }
    arPlace = lEnd;
    if (mWords.empty()) {
        refuseSim("the line begins with " + quoteSimWord(lWord) + ", not with a directive or an event kind");
    }
    if (lValue.empty()) {
        refuseSim(nameSimField(lName) + "has no value");
    }
    for (const auto& [lrName, lrValue] : mFields) {
        if (lrName == lName) {
            refuseSim(nameSimField(lName) + "is given twice");
        }
    }
    mFields.emplace_back(lName, lValue);
}

ZTCSimLine::ZTCSimLine(std::string_view aText) {
    if (aText.size() > gcSimMaxLineSize) {
        refuseSim("the line has " + std::to_string(aText.size()) + " bytes, more than " +
                  std::to_string(gcSimMaxLineSize));
    }
    std::size_t lPlace = 0;
    while (lPlace < aText.size() && aText[lPlace] != '#') {
        if (sIsBlank(aText[lPlace])) {
            ++lPlace;
        } else {
            addWord(aText, lPlace);
        }
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
        refuseSim(std::string(getDirective()) + " needs " + apWhat);
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
        refuseSim(std::string(getDirective()) + " needs " + std::string(aField) + "=");
    }
    return *lValue;
}

void ZTCSimLine::finish() const {
    if (mNextWord < mWords.size()) {
        refuseSim(std::string(getDirective()) + " does not take the word " + quoteSimWord(mWords[mNextWord]));
    }
    if (!mFields.empty()) {
        refuseSim(std::string(getDirective()) + " has no field " + quoteSimWord(mFields.front().first));
    }
}
