/// Reads the kernel's own descriptions of its trace data: the `format` file of an event, `header_page` and
/// `header_event`. Every offset that the library uses comes from them. Pure: text in, layout out.
#ifndef LIBKPM_LINUX_SRC_TRACEFORMAT_H
#define LIBKPM_LINUX_SRC_TRACEFORMAT_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

struct ZTSTraceField {
    std::string mName;
    std::size_t mOffset = 0;
    std::size_t mSize = 0;
};

struct ZTSTraceFormat {
    std::optional<std::uint32_t> mId;  ///< number of the event; header_page has none
    std::vector<ZTSTraceField> mFields;

    const ZTSTraceField* find(std::string_view aName) const;
};

/// Whatever in the text has the form of a field or an ID; lines of another form, and fields past gcMostTraceOffset, are
/// passed over.
ZTSTraceFormat parseTraceFormat(std::string_view aText);

/// No field of an event lies behind this, and no page is longer.
inline constexpr std::size_t gcMostTraceOffset = std::size_t{1024} * 1024;

/// A description of tracefs that is longer than this, in bytes, is not read.
inline constexpr std::size_t gcMostTraceDescription = 65536;

/// Where a field is in a record. A size of 0 means that the kernel has no such field.
struct ZTSTraceFieldPlace {
    std::size_t mOffset = 0;
    std::size_t mSize = 0;
};

/// How a page of the ring buffer begins.
struct ZTSTracePageLayout {
    std::size_t mCommitOffset = 0;  ///< of the word with the length of the data
    std::size_t mCommitSize = 0;
    std::size_t mDataOffset = 0;
    std::size_t mPageSize = 0;
    ZTSTraceFieldPlace mTime{};  ///< of the page; a size of 0: not described
};

/// Where the fields of a finished SCSI command are in its record.
struct ZTSScsiDoneLayout {
    using Place = ZTSTraceFieldPlace;

    std::uint32_t mId = 0;
    Place mType;
    Place mHost;
    Place mChannel;
    Place mTarget;
    Place mLun;
    Place mResult;
    Place mOpcode;
    Place mDriverTag;
    Place mSchedulerTag;
    Place mSenseKey;
    Place mAsc;
    Place mAscq;

    /// Sense data are there all three or not at all.
    bool hasSense() const { return mSenseKey.mSize != 0; }
};

/// What a description does not have that the library needs, as a text for people.
struct ZTSTraceProblem {
    std::string mText;
};

/// A field that a layout takes from a description.
struct ZTSTraceFieldRow {
    const char* mpName;
    ZTSTraceFieldPlace* mpPlace;
    bool mIsNeeded;
};

/// Fills in the places of integers. Returns the problem of the first needed field that cannot be used.
std::optional<ZTSTraceProblem> fillTracePlaces(const ZTSTraceFormat& acrFormat,
                                               std::span<const ZTSTraceFieldRow> aRows);

std::variant<ZTSTracePageLayout, ZTSTraceProblem> makeTracePageLayout(const ZTSTraceFormat& acrFormat);
std::variant<ZTSScsiDoneLayout, ZTSTraceProblem> makeScsiDoneLayout(const ZTSTraceFormat& acrFormat);

#endif
