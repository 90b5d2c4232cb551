/// A value that is a number or a text.

#ifndef SYSTEM_INCLUDE_MULTITYPE_H
#define SYSTEM_INCLUDE_MULTITYPE_H

#include "common/include/String.h"

enum ZTEMultiType : unsigned char { ZTMT_None = 0, ZTMT_Number = 1, ZTMT_Text = 2, ZTMT_Max = 3 };

/// Never changes after construction.
class ZTCMultiType {
public:
    explicit ZTCMultiType(unsigned aNumber) : mType(ZTMT_Number), mNumber(aNumber), mText("") {}
    explicit ZTCMultiType(const ZTCString& acrText) : mType(ZTMT_Text), mNumber(0), mText(acrText) {}

    ZTEMultiType getType() const { return mType; }

    /// Throw ZTCInvalidEx where the value is of the other type.
    unsigned getNumber() const;
    ZTCString getText() const;

private:
    const ZTEMultiType mType;
    const unsigned mNumber;
    const ZTCString mText;
};

#endif
