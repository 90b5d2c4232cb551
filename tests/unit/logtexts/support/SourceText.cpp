#include "tests/unit/logtexts/support/SourceText.h"

#include <algorithm>
#include <cctype>

bool isWordChar(char aChar) {
    return std::isalnum(static_cast<unsigned char>(aChar)) != 0 || aChar == '_';
}

std::size_t endOfQuoted(const std::string& acrText, std::size_t aBegin) {
    std::size_t lEnd = aBegin + 1;
    while (lEnd < acrText.size() && acrText[lEnd] != acrText[aBegin]) {
        lEnd += acrText[lEnd] == '\\' ? 2 : 1;
    }
    return std::min(lEnd + 1, acrText.size());
}

bool isDigitSeparator(const std::string& acrText, std::size_t aAt) {
    return acrText[aAt] == '\'' && aAt != 0 && isWordChar(acrText[aAt - 1]);
}

std::string withoutComments(const std::string& acrSource) {
    std::string lBare;
    bool lIsAtLineStart = true;
    for (std::size_t lAt = 0; lAt < acrSource.size();) {
        if (acrSource.compare(lAt, 2, "//") == 0) {
            lAt = std::min(acrSource.find('\n', lAt), acrSource.size());
        } else if (acrSource.compare(lAt, 2, "/*") == 0) {
            lAt = std::min(acrSource.find("*/", lAt), acrSource.size() - 2) + 2;
        } else if (lIsAtLineStart && acrSource[lAt] == '#') {
            while (lAt < acrSource.size() && acrSource[lAt] != '\n') {
                lAt += acrSource[lAt] == '\\' ? 2 : 1;
            }
        } else if (acrSource[lAt] == '"' || (acrSource[lAt] == '\'' && !isDigitSeparator(acrSource, lAt))) {
            const std::size_t lEnd = endOfQuoted(acrSource, lAt);
            lBare += acrSource.substr(lAt, lEnd - lAt);
            lAt = lEnd;
            lIsAtLineStart = false;
        } else {
            lIsAtLineStart = acrSource[lAt] == '\n' || (lIsAtLineStart && acrSource[lAt] == ' ');
            lBare += acrSource[lAt++];
        }
    }
    return lBare;
}

std::size_t skipBlanks(const std::string& acrText, std::size_t aAt) {
    while (aAt < acrText.size() && std::isspace(static_cast<unsigned char>(acrText[aAt])) != 0) {
        ++aAt;
    }
    return aAt;
}
