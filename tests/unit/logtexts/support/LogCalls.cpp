#include "tests/unit/logtexts/support/LogCalls.h"

#include <cstddef>
#include <map>
#include <optional>

#include "tests/unit/logtexts/support/SourceText.h"

namespace {

enum class ZTEMacroSort {
    Format,     ///< its first argument is the format
    Condition,  ///< its only argument is an assertion's condition
    Never       ///< an assertion without one
};

struct ZTSLogMacro {
    const char* mpMark;
    ZTEMacroSort mSort;
};

const std::map<std::string, ZTSLogMacro>& sMacros() {
    static const auto& srMacros = *new std::map<std::string, ZTSLogMacro>{
        {"ZT_LOG_HALT", {"-H-", ZTEMacroSort::Format}},
        {"ZT_LOG_ALERT", {"-A-", ZTEMacroSort::Format}},
        {"ZT_LOG_CRIT", {"-C-", ZTEMacroSort::Format}},
        {"ZT_LOG_ERR", {"-E-", ZTEMacroSort::Format}},
        {"ZT_LOG_WARN", {"-W-", ZTEMacroSort::Format}},
        {"ZT_LOG_NOTICE", {"-N-", ZTEMacroSort::Format}},
        {"ZT_LOG_INFO", {"-I-", ZTEMacroSort::Format}},
        {"ZT_LOG_NAP", {"-PROT-", ZTEMacroSort::Format}},
        {"ZT_TRACE_MSG", {"-T-", ZTEMacroSort::Format}},
        {"ZT_REPORT_INCONSISTENCY", {"-E-", ZTEMacroSort::Format}},
        {"ZT_ASSERT", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_CHECK", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_REQUIRE", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_ENSURE", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_INVARIANT", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_BASE_INVARIANT", {"-H-", ZTEMacroSort::Condition}},
        {"ZT_NEVER_GET_HERE", {"-H-", ZTEMacroSort::Never}},
        // The log's own parts: a line object that has its mark, and the format that finishes it.
        {"sFinish", {"-W-", ZTEMacroSort::Format}},
        // Those that nothing uses; a first use is to be noticed, as a call of no known text.
        {"ZT_LOG", {"?", ZTEMacroSort::Format}},
        {"ZT_LOG_NOPREFIX", {"?", ZTEMacroSort::Format}},
        {"ZT_TRACE", {"?", ZTEMacroSort::Never}},
        {"ZT_LOGERR_THROW", {"?", ZTEMacroSort::Format}},
        {"CHECKLOGTHROWEXCEPTION", {"?", ZTEMacroSort::Format}},
        {"ZT_CHECK_CONSISTENCY", {"?", ZTEMacroSort::Condition}},
        {"ZT_CHECK_CONSISTENCY_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_ASSERT_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_CHECK_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_CHECK_RETERR", {"?", ZTEMacroSort::Condition}},
        {"ZT_REQUIRE_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_ENSURE_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_INVARIANT_MSG", {"?", ZTEMacroSort::Condition}},
        {"ZT_BASE_INVARIANT_MSG", {"?", ZTEMacroSort::Condition}},
    };
    return srMacros;
}

std::string sUnescaped(const std::string& acrQuoted) {
    std::string lText;
    for (std::size_t lAt = 1; lAt + 1 < acrQuoted.size(); ++lAt) {
        if (acrQuoted[lAt] == '\\') {
            ++lAt;
            lText += acrQuoted[lAt] == 'n' ? '\n' : acrQuoted[lAt];
        } else {
            lText += acrQuoted[lAt];
        }
    }
    return lText;
}

/// The texts in quotes that stand side by side from here on, joined, and where they end; nothing where none begins
/// here.
struct ZTSLiteral {
    std::string mText;
    std::size_t mEnd;
};

std::optional<ZTSLiteral> sReadLiteral(const std::string& acrText, std::size_t aBegin) {
    if (aBegin >= acrText.size() || acrText[aBegin] != '"') {
        return std::nullopt;
    }
    ZTSLiteral lLiteral{"", aBegin};
    for (std::size_t lAt = aBegin; lAt < acrText.size();) {
        if (acrText[lAt] == '"') {
            const std::size_t lEnd = endOfQuoted(acrText, lAt);
            lLiteral.mText += sUnescaped(acrText.substr(lAt, lEnd - lAt));
            lLiteral.mEnd = lEnd;
            lAt = skipBlanks(acrText, lEnd);
        } else if (acrText.compare(lAt, 6, "PRIu64") == 0) {
            lLiteral.mText += "lu";
            lAt = skipBlanks(acrText, lAt + 6);
        } else {
            break;
        }
    }
    return lLiteral;
}

/// The arguments of the call whose opening bracket stands here.
std::vector<std::string> sArguments(const std::string& acrText, std::size_t aOpen) {
    std::vector<std::string> lArguments(1);
    unsigned lDepth = 1;
    for (std::size_t lAt = aOpen + 1; lAt < acrText.size();) {
        const char lChar = acrText[lAt];
        if (lChar == '"' || lChar == '\'') {
            const std::size_t lEnd = endOfQuoted(acrText, lAt);
            lArguments.back() += acrText.substr(lAt, lEnd - lAt);
            lAt = lEnd;
            continue;
        }
        lDepth += lChar == '(' ? 1 : 0;
        lDepth -= lChar == ')' ? 1 : 0;
        if (lDepth == 0) {
            break;
        }
        if (lChar == ',' && lDepth == 1) {
            lArguments.emplace_back();
        } else {
            lArguments.back() += lChar;
        }
        ++lAt;
    }
    for (std::string& lrArgument : lArguments) {
        lrArgument = lrArgument.substr(skipBlanks(lrArgument, 0));
    }
    return lArguments;
}

std::string sTextOfFormat(const std::vector<std::string>& acrArguments, std::size_t aFormat) {
    const auto lFormat = aFormat < acrArguments.size() ? sReadLiteral(acrArguments[aFormat], 0) : std::nullopt;
    if (!lFormat) {
        return "";
    }
    std::string lText = lFormat->mText;
    if (lText == "%s" && aFormat + 1 < acrArguments.size()) {
        if (const auto lArgument = sReadLiteral(acrArguments[aFormat + 1], 0)) {
            lText = lArgument->mText;
        }
    }
    if (lText.ends_with('\n')) {
        lText.pop_back();
    }
    return lText;
}

std::string sTextOfCall(const std::string& acrMacro, ZTEMacroSort aSort, const std::vector<std::string>& acrArguments) {
    switch (aSort) {
        case ZTEMacroSort::Condition:
            return "Assertion [ " + acrArguments[0] + " ] failed";
        case ZTEMacroSort::Never:
            return "Assertion [ false ] failed";
        case ZTEMacroSort::Format:
            break;
    }
    return sTextOfFormat(acrArguments, acrMacro == "sFinish" ? 1 : 0);
}

}  // namespace

ZTSLogSource readLogCalls(const std::string& acrSource) {
    const std::string lText = withoutComments(acrSource);
    ZTSLogSource lSource;
    for (std::size_t lAt = 0; lAt < lText.size();) {
        if (const auto lLiteral = sReadLiteral(lText, lAt)) {
            lSource.mLiterals.push_back(lLiteral->mText);
            lAt = lLiteral->mEnd;
            continue;
        }
        if (!isWordChar(lText[lAt])) {
            lAt = lText[lAt] == '\'' ? endOfQuoted(lText, lAt) : lAt + 1;
            continue;
        }
        std::size_t lEnd = lAt;
        while (lEnd < lText.size() && (isWordChar(lText[lEnd]) || isDigitSeparator(lText, lEnd))) {
            ++lEnd;
        }
        const std::string lWord = lText.substr(lAt, lEnd - lAt);
        const auto lMacro = sMacros().find(lWord);
        const std::size_t lOpen = skipBlanks(lText, lEnd);
        if (lMacro != sMacros().end() && lOpen < lText.size() && lText[lOpen] == '(') {
            const std::vector<std::string> lArguments = sArguments(lText, lOpen);
            const bool lIsDeclaration = lWord == "sFinish" && lArguments[0].find('&') != std::string::npos;
            if (!lIsDeclaration) {
                lSource.mCalls.push_back({lMacro->second.mpMark, sTextOfCall(lWord, lMacro->second.mSort, lArguments)});
            }
        }
        lAt = lEnd;
    }
    return lSource;
}
