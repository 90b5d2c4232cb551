#include "tests/support/LibraryEvent.h"

#include <algorithm>
#include <sstream>
#include <stdexcept>
#include <utility>

#include "libkpm/include/libkpm.h"

ZTSLibraryEvent ZTSLibraryEvent::scope(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, ZTCBytes aData) {
    ZTSLibraryEvent lEvent;
    lEvent.mBoard = aBoard;
    lEvent.mPort = makeWwn(0x10000000c9000000 + aBoard);
    lEvent.mCategory = aCategory;
    lEvent.mSubcategory = aSubcategory;
    lEvent.mSize = ZT_EVENT_HEADER_SIZE + aData.size();
    lEvent.mData = std::move(aData);
    return lEvent;
}

ZTSLibraryEvent ZTSLibraryEvent::bare(unsigned aBoard, unsigned aCategory, unsigned aSubcategory) {
    ZTSLibraryEvent lEvent = scope(aBoard, aCategory, aSubcategory, {});
    lEvent.mPayload = ZTELibraryEventPayload::NullPayload;
    return lEvent;
}

ZTSLibraryEvent ZTSLibraryEvent::link(unsigned aBoard, const ZTSWwn& acrPort) {
    ZTSLibraryEvent lEvent;
    lEvent.mType = ZTELibraryEventType::Link;
    lEvent.mBoard = aBoard;
    lEvent.mPort = acrPort;
    return lEvent;
}

ZTSLibraryEvent ZTSLibraryEvent::rscn(unsigned aBoard, ZTCBytes aPayload) {
    ZTSLibraryEvent lEvent;
    lEvent.mType = ZTELibraryEventType::Rscn;
    lEvent.mBoard = aBoard;
    lEvent.mSize = aPayload.size();
    lEvent.mData = std::move(aPayload);
    return lEvent;
}

ZTSLibraryEvent ZTSLibraryEvent::temperature(unsigned aBoard) {
    ZTSLibraryEvent lEvent;
    lEvent.mType = ZTELibraryEventType::Temperature;
    lEvent.mBoard = aBoard;
    return lEvent;
}

std::string ZTSLibraryEvent::text() const {
    std::ostringstream lText;
    lText << static_cast<unsigned>(mType) << ' ' << mBoard << ' '
          << hexOf(ZTCBytes(mPort.mBytes.begin(), mPort.mBytes.end())) << ' ' << mCategory << ' ' << mSubcategory << ' '
          << mSize << ' ' << static_cast<unsigned>(mPayload) << ' ' << (mIsMisaligned ? 1 : 0) << ' '
          << (mData.empty() ? std::string("-") : hexOf(mData));
    return lText.str();
}

ZTSLibraryEvent ZTSLibraryEvent::parse(std::istream& arText) {
    ZTSLibraryEvent lEvent;
    unsigned lType = 0;
    unsigned lPayload = 0;
    unsigned lIsMisaligned = 0;
    std::string lPort;
    std::string lData;
    if (!(arText >> lType >> lEvent.mBoard >> lPort >> lEvent.mCategory >> lEvent.mSubcategory >> lEvent.mSize >>
          lPayload >> lIsMisaligned >> lData)) {
        throw std::runtime_error("bad event text");
    }
    const ZTCBytes lPortBytes = bytesOf(lPort);
    if (lPortBytes.size() != lEvent.mPort.mBytes.size()) {
        throw std::runtime_error("bad port name in event text");
    }
    std::copy(lPortBytes.begin(), lPortBytes.end(), lEvent.mPort.mBytes.begin());
    lEvent.mType = static_cast<ZTELibraryEventType>(lType);
    lEvent.mPayload = static_cast<ZTELibraryEventPayload>(lPayload);
    lEvent.mIsMisaligned = lIsMisaligned != 0;
    lEvent.mData = lData == "-" ? ZTCBytes() : bytesOf(lData);
    return lEvent;
}
