/// Walks the records of one page of the kernel's trace ring buffer as `trace_pipe_raw` gives it. Pure: bytes in,
/// records out.
///
/// A page begins with a header (time stamp and commit word, header_page says where). The commit word has the length of
/// the data in its low 27 bits, and marks above them that records before this page were lost. Then come records, each
/// with a word of 5 bits of type or length and 27 bits of time:
///
///     0         a length word follows, which counts itself and the data
///     1 to 28   four times as many bytes of data
///     29        padding; the rest of the page is empty where its time is 0, else a length word follows
///     30        so much time has passed: the word's time, and one more word with the bits above those 27
///     31        it is now that time, in the same two words; the highest 5 of 64 bits are as before
///
/// The time of a word is what has passed since the record before it, or since the page's own time stamp.
#ifndef LIBKPM_LINUX_SRC_TRACEPAGE_H
#define LIBKPM_LINUX_SRC_TRACEPAGE_H

#include <bit>
#include <cstddef>
#include <cstdint>
#include <optional>

#include "libkpm/linux/src/HostBytes.h"
#include "libkpm/linux/src/TraceFormat.h"

class ZTCTracePage {
public:
    explicit ZTCTracePage(ZTCByteSpan aPage, const ZTSTracePageLayout& acrLayout,
                          std::endian aOrder = std::endian::native);

    /// The data of the next record; nothing when the page is at its end.
    std::optional<ZTCByteSpan> next();

    /// When the last record was written, in nanoseconds of the instance's clock; 0 where pages do not have it.
    std::uint64_t getTime() const { return mHasTime ? mTime : 0; }

    /// Whether the page did not parse to its end.
    bool isMalformed() const { return mIsMalformed; }

    /// Whether the kernel marks that records before this page were lost.
    bool hasLossBefore() const { return mHasLossBefore; }

private:
    std::optional<ZTCByteSpan> take(std::size_t aHeader, std::size_t aLength);

    ZTCByteSpan mRest;
    std::endian mOrder;
    bool mHasTime = false;
    std::uint64_t mTime = 0;
    bool mIsMalformed = false;
    bool mHasLossBefore = false;
};

#endif
