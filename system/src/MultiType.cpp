#include "system/include/MultiType.h"

#include "common/include/Exception.h"

unsigned ZTCMultiType::getNumber() const {
    if (mType != ZTMT_Number) {
        throw ZTCInvalidEx("The value is not a number");
    }
    return mNumber;
}

ZTCString ZTCMultiType::getText() const {
    if (mType != ZTMT_Text) {
        throw ZTCInvalidEx("The value is not a text");
    }
    return mText;
}
