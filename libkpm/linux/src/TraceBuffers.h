/// The trace buffers of one instance, one for each processor: the instance's directory, the size and clock of its
/// buffers, reading their pages, and what they have lost.
#ifndef LIBKPM_LINUX_SRC_TRACEBUFFERS_H
#define LIBKPM_LINUX_SRC_TRACEBUFFERS_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/linux/src/FeedState.h"
#include "libkpm/linux/src/TraceFiles.h"
#include "libkpm/linux/src/TraceFormat.h"

/// Descriptors that the library leaves to the rest of the process.
inline constexpr std::size_t gcTraceDescriptorReserve = 64;

enum ZTETraceRead : std::uint8_t { ZTTR_Page, ZTTR_Empty, ZTTR_Failed };

/// Why a read of a buffer gave nothing. `aRead` is its result; `aError` is the error number where that is negative.
ZTETraceRead judgeEmptyTraceRead(std::int64_t aRead, int aError);

/// The problem that an error number of tracefs is: what could not be done, why, and what would help.
ZTSFeedProblem makeTraceProblem(const std::string& acrWhat, int aError);

enum ZTETraceOwner : std::uint8_t {
    ZTTO_Library,  ///< the library makes the instance and removes it
    ZTTO_Prepared  ///< somebody has made it, and it stays
};

/// One thread at a time.
class ZTCTraceBuffers {
public:
    /// Makes the instance of this directory, or takes the one that is there, and opens its buffers. Null, with the
    /// reason in `arProblem`, where that cannot be done. `arFiles` outlives the object.
    static std::unique_ptr<ZTCTraceBuffers> open(const std::string& acrPath, ZTETraceOwner aOwner,
                                                 ZTCTraceFiles& arFiles, ZTSFeedProblem& arProblem);

    /// Closes the buffers, and removes the instance if the library has made it. Its events are off before.
    ~ZTCTraceBuffers();
    ZTCTraceBuffers(const ZTCTraceBuffers&) = delete;
    ZTCTraceBuffers& operator=(const ZTCTraceBuffers&) = delete;

    const std::string& getPath() const { return mPath; }
    const ZTSTracePageLayout& getPageLayout() const { return mPageLayout; }

    /// Whether the buffers' descriptors are readable as soon as one record is there. Otherwise they are readable when
    /// the buffers are filled to some part.
    bool wakesAtOnce() const { return mWakesAtOnce; }

    std::size_t size() const { return mBuffers.size(); }
    int getDescriptor(std::size_t aBuffer) const { return mBuffers.at(aBuffer).mPipe.get(); }

    /// Takes a page off a buffer, never waiting. `aPage` has room for a page.
    ZTETraceRead read(std::size_t aBuffer, std::span<std::uint8_t> aPage, std::size_t& arSize);

    /// Records that the buffer has lost since the last call; nothing where the kernel does not say.
    std::optional<std::uint64_t> takeLosses(std::size_t aBuffer);

private:
    struct Buffer {
        ZTCLibraryDescriptor mPipe;
        std::string mStatsPath;
        std::uint64_t mLosses = 0;
    };

    ZTCTraceBuffers(std::string aPath, ZTCTraceFiles& arFiles) : mPath(std::move(aPath)), mrFiles(arFiles) {}

    bool make(ZTSFeedProblem& arProblem);
    bool readPageLayout(ZTSFeedProblem& arProblem);
    void setSizes();
    bool openAll(ZTSFeedProblem& arProblem);

    const std::string mPath;
    ZTCTraceFiles& mrFiles;
    bool mIsMade = false;  // by the library, and removed by it
    ZTSTracePageLayout mPageLayout;
    bool mWakesAtOnce = false;
    std::vector<Buffer> mBuffers;
};

#endif
