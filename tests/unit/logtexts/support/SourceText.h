/// Steps through the text of a C++ source, for the checks that read the sources.
#ifndef TESTS_UNIT_LOGTEXTS_SUPPORT_SOURCETEXT_H
#define TESTS_UNIT_LOGTEXTS_SUPPORT_SOURCETEXT_H

#include <cstddef>
#include <string>

bool isWordChar(char aChar);

/// The end of the text or character in quotes that begins here, one past its closing quote.
std::size_t endOfQuoted(const std::string& acrText, std::size_t aBegin);

/// Whether the quote at this place separates the digits of a number.
bool isDigitSeparator(const std::string& acrText, std::size_t aAt);

/// The source without comments and preprocessor lines.
std::string withoutComments(const std::string& acrSource);

/// The first place from here on that is not a blank.
std::size_t skipBlanks(const std::string& acrText, std::size_t aAt);

#endif
