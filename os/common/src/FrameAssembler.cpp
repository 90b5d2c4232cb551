#include "os/common/include/FrameAssembler.h"

#include "common/include/Exception.h"
#include "common/include/Memory.h"
#include "os/common/include/Clib.h"

ZTCFrameAssembler::ZTCFrameAssembler(Size aMaxBodySize) : mMaxBodySize(aMaxBodySize), mBody(NEW ZTCBuffer()) {}

Size ZTCFrameAssembler::getWanted() const {
    if (mState != ZTFS_Incomplete) {
        return 0;
    }
    return mHad < gcHeaderSize ? gcHeaderSize - mHad : mLength - (mHad - gcHeaderSize);
}

unsigned char* ZTCFrameAssembler::getSpace() {
    if (mHad < gcHeaderSize) {
        return mHeader + mHad;
    }
    if (mBody->getSize() != mLength) {
        mBody->resize(mLength);
    }
    return mBody->getData() + (mHad - gcHeaderSize);
}

void ZTCFrameAssembler::commit(Size aCount) {
    if (aCount > getWanted()) {
        throw ZTCInvalidEx("More bytes than the frame wants");
    }
    mHad += aCount;
    if (mHad < gcHeaderSize) {
        return;
    }
    if (mHad == gcHeaderSize) {
        Size lNetworkOrder;
        ClibMemcpy(&lNetworkOrder, mHeader, gcHeaderSize);
        mLength = ClibNtohl(lNetworkOrder);
        if (mLength == 0 || mLength > mMaxBodySize) {
            mState = ZTFS_BadLength;
        }
        return;
    }
    if (mHad - gcHeaderSize == mLength) {
        mState = ZTFS_Complete;
    }
}

std::uint64_t ZTCFrameAssembler::getTotal() const {
    return mHad < gcHeaderSize ? std::uint64_t{gcHeaderSize} : std::uint64_t{gcHeaderSize} + mLength;
}

ZTCPointer<ZTCBuffer> ZTCFrameAssembler::take() {
    if (mState != ZTFS_Complete) {
        throw ZTCInvalidEx("The frame is not complete");
    }
    const ZTCPointer<ZTCBuffer> lNext(NEW ZTCBuffer());
    const ZTCPointer<ZTCBuffer> lBody(mBody);
    mBody = lNext;
    reset();
    return lBody;
}

void ZTCFrameAssembler::reset() {
    mState = ZTFS_Incomplete;
    mLength = 0;
    mHad = 0;
    mBody->clear();
}
