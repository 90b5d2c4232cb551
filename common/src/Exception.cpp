#include "common/include/Exception.h"

#include <cstring>

ZTCException::ZTCException(const char* apMessage, ZTError aError) noexcept : mMessage{}, mError(aError) {
    if (apMessage != nullptr) {
        std::memcpy(mMessage, apMessage, strnlen(apMessage, gcMessageCapacity - 1));
    }
}

ZTCException::~ZTCException() = default;
