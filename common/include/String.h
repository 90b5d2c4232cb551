/// Text with value semantics: two strings never share their text.

#ifndef COMMON_INCLUDE_STRING_H
#define COMMON_INCLUDE_STRING_H

#include <cstddef>
#include <string>

#include "common/include/Pointer.h"

/// A text. Every allocation failure is ZTCNoMemoryEx("Out of Memory", 2), and leaves the string as it was.
class ZTCString {
public:
    /// Holds a copy of a zero-terminated text. A null text is ZTCInvalidEx.
    ZTCString(const char* apText = "");

    /// Holds a copy of aLength bytes, zeros included. A null text is ZTCInvalidEx unless the length is 0.
    ZTCString(const char* apText, std::size_t aLength);

    ZTCString(const ZTCString& acrCopy);
    ZTCString& operator=(const ZTCString& acrCopy);
    ~ZTCString() = default;

    /// The text, terminated by a zero; valid until the string is changed or gone.
    const char* get() const;
    char* get();

    /// The number of bytes, without the terminating zero.
    std::size_t length() const;

    /// Whether the texts up to their first zero bytes are the same.
    bool operator==(const ZTCString& acrCopy) const;

    /// The lexicographic order of the bytes.
    bool operator<(const ZTCString& acrCopy) const;

    /// This text followed by the other.
    ZTCString operator+(const ZTCString& acrOther) const;

private:
    ZTCPointer<std::string> mString;
};

#endif
