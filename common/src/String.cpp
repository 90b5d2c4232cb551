#include "common/include/String.h"

#include <cstring>
#include <new>
#include <stdexcept>
#include <utility>

namespace {

template <typename... Arguments>
std::string* sMakeText(Arguments&&... aArguments) {
    try {
        return NEW std::string(std::forward<Arguments>(aArguments)...);
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    } catch (const std::length_error&) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    }
}

const char* sCheckText(const char* apText) {
    if (apText == nullptr) {
        throw ZTCInvalidEx("Cannot make a string from a null text", gcErrInvalid);
    }
    return apText;
}

}  // namespace

ZTCString::ZTCString(const char* apText) : mString(sMakeText(sCheckText(apText))) {}

ZTCString::ZTCString(const char* apText, std::size_t aLength)
    : mString(sMakeText(aLength == 0 ? "" : sCheckText(apText), aLength)) {}

// The log shows the conditions as they are written here: 0, not nullptr.

ZTCString::ZTCString(const ZTCString& acrCopy) {
    ZT_ASSERT(acrCopy.mString != 0);
    mString = ZTCPointer<std::string>(sMakeText(*acrCopy.mString));
}

ZTCString& ZTCString::operator=(const ZTCString& acrCopy) {
    if (this != &acrCopy) {
        ZT_ASSERT(acrCopy.mString != 0);
        mString = ZTCPointer<std::string>(sMakeText(*acrCopy.mString));
    }
    return *this;
}

const char* ZTCString::get() const {
    ZT_ASSERT(mString != 0);
    return mString->c_str();
}

char* ZTCString::get() {
    ZT_ASSERT(mString != 0);
    return mString->data();
}

std::size_t ZTCString::length() const {
    ZT_ASSERT(mString != 0);
    return mString->length();
}

bool ZTCString::operator==(const ZTCString& acrCopy) const {
    ZT_ASSERT(mString != 0);
    ZT_ASSERT(acrCopy.mString != 0);
    return std::strcmp(mString->c_str(), acrCopy.mString->c_str()) == 0;
}

bool ZTCString::operator<(const ZTCString& acrCopy) const {
    ZT_ASSERT(mString != 0);
    return *mString < *acrCopy.mString;
}

ZTCString ZTCString::operator+(const ZTCString& acrOther) const {
    ZT_ASSERT(mString != 0);
    ZT_ASSERT(acrOther.mString != 0);
    ZTCString lSum(*this);
    try {
        lSum.mString->append(*acrOther.mString);
    } catch (const std::bad_alloc&) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    } catch (const std::length_error&) {
        throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
    }
    return lSum;
}
