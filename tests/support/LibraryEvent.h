/// One event that the scripted adapters' library is to deliver, and its one-line text form, in which it travels from
/// the test to the library.
#ifndef TESTS_SUPPORT_LIBRARYEVENT_H
#define TESTS_SUPPORT_LIBRARYEVENT_H

#include <cstdint>
#include <istream>
#include <string>

#include "tests/support/Bytes.h"

enum class ZTELibraryEventType { Scope, Link, Rscn, Temperature };

/// What the event structure's payload pointer leads to.
enum class ZTELibraryEventPayload {
    Data,        ///< a payload object whose data pointer points to the bytes
    NullData,    ///< a payload object whose data pointer is null
    NullPayload  ///< nothing: the payload pointer is null
};

struct ZTSLibraryEvent {
    ZTELibraryEventType mType = ZTELibraryEventType::Scope;
    unsigned mBoard = 0;
    ZTSWwn mPort{};  ///< scope: the local port; link: the local port's name in the LINKINFO
    unsigned mCategory = 0;
    unsigned mSubcategory = 0;
    std::uint64_t mSize = 0;  ///< scope: zt_evt_size; RSCN: the length argument
    ZTELibraryEventPayload mPayload = ZTELibraryEventPayload::Data;
    bool mIsMisaligned = false;  ///< scope: event, payload object and data all stand at odd addresses
    ZTCBytes mData{};

    /// A scope event whose size counts the data and the header.
    static ZTSLibraryEvent scope(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, ZTCBytes aData);
    /// A scope event without a payload object, of a size that counts the header alone.
    static ZTSLibraryEvent bare(unsigned aBoard, unsigned aCategory, unsigned aSubcategory);
    static ZTSLibraryEvent link(unsigned aBoard, const ZTSWwn& acrPort);
    static ZTSLibraryEvent rscn(unsigned aBoard, ZTCBytes aPayload);
    static ZTSLibraryEvent temperature(unsigned aBoard);

    std::string text() const;
    /// Reads what text() wrote; throws std::runtime_error where it is something else.
    static ZTSLibraryEvent parse(std::istream& arText);
};

#endif
