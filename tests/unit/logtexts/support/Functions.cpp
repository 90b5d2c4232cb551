#include "tests/unit/logtexts/support/Functions.h"

#include <algorithm>
#include <cctype>
#include <cstddef>
#include <regex>

#include "tests/unit/logtexts/support/SourceText.h"

namespace {

/// The text with everything in quotes emptied, so that no brace stands in one.
std::string sWithoutQuoted(const std::string& acrText) {
    std::string lBare;
    for (std::size_t lAt = 0; lAt < acrText.size();) {
        const bool lIsQuote = acrText[lAt] == '"' || (acrText[lAt] == '\'' && !isDigitSeparator(acrText, lAt));
        lBare += lIsQuote ? std::string(2, acrText[lAt]) : std::string(1, acrText[lAt]);
        lAt = lIsQuote ? endOfQuoted(acrText, lAt) : lAt + 1;
    }
    return lBare;
}

/// The place of the bracket that closes the one here.
std::size_t sClosing(const std::string& acrText, std::size_t aOpen) {
    const char lOpen = acrText[aOpen];
    const char lClose = lOpen == '{' ? '}' : lOpen == '(' ? ')' : ']';
    unsigned lDepth = 0;
    for (std::size_t lAt = aOpen; lAt < acrText.size(); ++lAt) {
        lDepth += acrText[lAt] == lOpen ? 1 : 0;
        lDepth -= acrText[lAt] == lClose ? 1 : 0;
        if (lDepth == 0) {
            return lAt;
        }
    }
    return acrText.size() - 1;
}

std::string sTrimmed(const std::string& acrText) {
    const auto lIsBlank = [](unsigned char aChar) { return std::isspace(aChar) != 0; };
    const auto lBegin = std::find_if_not(acrText.begin(), acrText.end(), lIsBlank);
    const auto lEnd = std::find_if_not(acrText.rbegin(), acrText.rend(), lIsBlank).base();
    return lBegin < lEnd ? std::string(lBegin, lEnd) : "";
}

/// The body with what stands inside of each lambda emptied: its ways out are not the function's.
std::string sWithoutLambdas(std::string aBody) {
    static const std::regex scLambda(R"(\[[^\[\]]*\]\s*(\([^()]*(\([^()]*\)[^()]*)*\))?\s*(mutable|noexcept)?\s*\{)");
    std::smatch lMatch;
    for (auto lFrom = aBody.cbegin(); std::regex_search(lFrom, aBody.cend(), lMatch, scLambda);) {
        const auto lOpen = static_cast<std::size_t>(lMatch[0].second - aBody.cbegin()) - 1;
        const std::size_t lClose = sClosing(aBody, lOpen);
        aBody.replace(lOpen + 1, lClose - lOpen - 1, "");
        lFrom = aBody.cbegin() + static_cast<std::ptrdiff_t>(lOpen);
    }
    return aBody;
}

enum class ZTEBrace { Scope, Function, Other };

/// What the brace behind this head opens.
ZTEBrace sSortOf(const std::string& acrHead) {
    static const std::regex scScope(
        R"(^((inline )?namespace\b|extern ""|(template\s*<.*>\s*)?(class|struct|union)\b))");
    static const std::regex scBodyFollows(R"((\)|\bconst|\bnoexcept|\boverride|\bfinal|\bZT_\w+)$)");
    static const std::regex scOperator(R"(operator\s*[^\s\w(]+)");
    if (std::regex_search(acrHead, scScope) && acrHead.find('(') == std::string::npos) {
        return ZTEBrace::Scope;
    }
    const std::string lPlain = std::regex_replace(acrHead, scOperator, "operator");
    const bool lIsInitializer = lPlain.substr(0, lPlain.find('(')).find('=') != std::string::npos;
    const bool lHasBody = acrHead.find('(') != std::string::npos && std::regex_search(acrHead, scBodyFollows);
    return lHasBody && !lIsInitializer ? ZTEBrace::Function : ZTEBrace::Other;
}

std::string sNameOf(const std::string& acrHead, const std::vector<std::string>& acrScopes) {
    static const std::regex scName(R"(([~\w:]+|operator[^(]*)\s*$)");
    const std::string lBefore = acrHead.substr(0, acrHead.find('('));
    std::smatch lMatch;
    std::string lName = std::regex_search(lBefore, lMatch, scName) ? lMatch[1].str() : lBefore;
    for (auto lScope = acrScopes.rbegin(); lScope != acrScopes.rend(); ++lScope) {
        lName = lScope->empty() ? lName : *lScope + "::" + lName;
    }
    return lName;
}

/// The name that a class brings to what is defined inside of it; empty for a namespace.
std::string sScopeOf(const std::string& acrHead) {
    static const std::regex scClass(R"((class|struct|union)\s+(?:ZT_\w+\s+)*(\w+))");
    std::smatch lMatch;
    return std::regex_search(acrHead, lMatch, scClass) ? lMatch[2].str() : "";
}

/// The statements of the block that the place lies in, from its beginning up to the place, without inner blocks.
std::string sBlockBefore(const std::string& acrBody, std::size_t aPlace) {
    std::string lReversed;
    unsigned lDepth = 0;
    for (std::size_t lAt = aPlace; lAt > 0; --lAt) {
        const char lChar = acrBody[lAt - 1];
        if (lChar == '{' && lDepth == 0) {
            break;
        }
        lDepth += lChar == '}' ? 1 : 0;
        if (lDepth == 0) {
            lReversed += lChar;
        }
        lDepth -= lChar == '{' ? 1 : 0;
    }
    return {lReversed.rbegin(), lReversed.rend()};
}

}  // namespace

std::vector<ZTSFunction> readFunctions(const std::string& acrSource) {
    const std::string lText = sWithoutQuoted(withoutComments(acrSource));
    std::vector<ZTSFunction> lFunctions;
    std::vector<std::string> lScopes;
    std::string lHead;
    for (std::size_t lAt = 0; lAt < lText.size(); ++lAt) {
        const std::string lTrimmed = sTrimmed(lHead);
        switch (lText[lAt]) {
            case ';':
                lHead.clear();
                break;
            case ':':
                lHead = lTrimmed == "public" || lTrimmed == "protected" || lTrimmed == "private" ? "" : lHead + ':';
                break;
            case '}':
                lHead.clear();
                if (!lScopes.empty()) {
                    lScopes.pop_back();
                }
                break;
            case '{': {
                const ZTEBrace lSort = sSortOf(lTrimmed);
                if (lSort == ZTEBrace::Scope) {
                    lScopes.push_back(sScopeOf(lTrimmed));
                    lHead.clear();
                    break;
                }
                const std::size_t lEnd = sClosing(lText, lAt);
                if (lSort == ZTEBrace::Function) {
                    const bool lIsForCompiler = std::regex_search(lTrimmed, std::regex(R"(\b(constexpr|consteval)\b)"));
                    if (!lIsForCompiler) {
                        const std::string lBody = lText.substr(lAt + 1, lEnd - lAt - 1);
                        lFunctions.push_back({sNameOf(lTrimmed, lScopes), sTrimmed(sWithoutLambdas(lBody))});
                    }
                    lHead.clear();
                }
                lAt = lEnd;
                break;
            }
            default:
                lHead += lText[lAt];
        }
    }
    return lFunctions;
}

bool isTraced(const ZTSFunction& acrFunction) {
    return acrFunction.mBody.starts_with("ZT_ENTRY();");
}

std::string findUntracedExit(const ZTSFunction& acrFunction) {
    static const std::regex scExit(R"(\b(return|throw)\b[^;]*;)");
    static const std::regex scLast(
        R"((ZT_EXIT\(\);|ZT_THROW\([^;]*\);|ZT_RETHROW\([^;]*\);|\b(return|throw)\b[^;]*;)$)");
    const std::string& lcrBody = acrFunction.mBody;
    for (std::sregex_iterator lMatch(lcrBody.begin(), lcrBody.end(), scExit), lcEnd; lMatch != lcEnd; ++lMatch) {
        const auto lPlace = static_cast<std::size_t>(lMatch->position());
        if (sBlockBefore(lcrBody, lPlace).find("ZT_EXIT();") == std::string::npos) {
            return "no \"Left\" before: " + lMatch->str();
        }
    }
    return std::regex_search(lcrBody, scLast) ? "" : "no \"Left\" at the end";
}
