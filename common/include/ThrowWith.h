/// Throwing an exception whose text is formatted: the one way to do so.

#ifndef COMMON_INCLUDE_THROWWITH_H
#define COMMON_INCLUDE_THROWWITH_H

#include <cstdarg>
#include <cstdio>

#include "common/include/Exception.h"

/// Throws the exception with the formatted text, cut to ZTCException::gcMessageCapacity, and the code of its class.
/// Never allocates.
template <typename Exception>
[[noreturn]] void throwWith(const char* apFormat, ...) __attribute__((format(printf, 1, 2)));

template <typename Exception>
void throwWith(const char* apFormat, ...) {
    char lText[ZTCException::gcMessageCapacity] = "";
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    std::vsnprintf(lText, sizeof(lText), apFormat, lArguments);
    va_end(lArguments);
    throw Exception(lText);
}

#endif
