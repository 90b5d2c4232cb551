/// A trace instance of the library's own: one event, finished SCSI commands, with a filter and small buffers that no
/// other user of tracing shares.
#ifndef LIBKPM_LINUX_SRC_TRACEINSTANCE_H
#define LIBKPM_LINUX_SRC_TRACEINSTANCE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "libkpm/common/include/Descriptor.h"
#include "libkpm/linux/src/TraceFormat.h"

/// Makes and removes directories of instances; on tracefs that makes and removes the instance with all its files. Tests
/// have a double that does what the kernel would.
class ZTCTraceDirectories {
public:
    virtual ~ZTCTraceDirectories() = default;

    /// 0, or the error number.
    virtual int make(const std::string& acrPath);
    virtual int remove(const std::string& acrPath);
};

enum ZTETraceRead : std::uint8_t { ZTTR_Page, ZTTR_Empty, ZTTR_Failed };

/// What a read of a buffer that gave nothing means: what it returned, and the error number where that is negative.
ZTETraceRead judgeEmptyTraceRead(std::int64_t aRead, int aError);

/// One thread at a time.
class ZTCTraceInstance {
public:
    /// Removes what killed runs have left, makes the instance, and opens its buffers; nothing is recorded yet. Null,
    /// with the reason and what would help in `arProblem`, where that cannot be done. `arDirectories` outlives the
    /// instance.
    static std::unique_ptr<ZTCTraceInstance> open(const std::string& acrRoot, ZTCTraceDirectories& arDirectories,
                                                  std::string& arProblem);

    /// Switches the event off and removes the instance.
    ~ZTCTraceInstance();
    ZTCTraceInstance(const ZTCTraceInstance&) = delete;
    ZTCTraceInstance& operator=(const ZTCTraceInstance&) = delete;

    /// Records finished commands of these hosts from now on, in ascending order; of none, nothing is recorded. False,
    /// with the reason, where the kernel refuses; the event is off then.
    bool watchHosts(const std::vector<std::uint32_t>& acrHosts, std::string& arProblem);

    const ZTSScsiDoneLayout& getRecordLayout() const { return mRecordLayout; }
    const ZTSTracePageLayout& getPageLayout() const { return mPageLayout; }

    /// Whether the buffers' descriptors are readable as soon as one record is there, rather than when they are half
    /// full.
    bool wakesAtOnce() const { return mWakesAtOnce; }

    std::size_t getBufferCount() const { return mBuffers.size(); }
    int getDescriptor(std::size_t aBuffer) const { return mBuffers.at(aBuffer).mPipe.get(); }

    /// Takes a page off a buffer, never waiting. `aPage` has room for a page.
    ZTETraceRead read(std::size_t aBuffer, std::span<std::uint8_t> aPage, std::size_t& arSize);

    /// Records that the buffer has lost since the last call; nothing where the kernel does not tell.
    std::optional<std::uint64_t> takeLosses(std::size_t aBuffer);

    const std::string& getPath() const { return mPath; }

private:
    struct Buffer {
        ZTCLibraryDescriptor mPipe;
        std::string mStatsPath;
        std::uint64_t mLosses = 0;
    };

    ZTCTraceInstance(std::string aPath, ZTCTraceDirectories& arDirectories)
        : mPath(std::move(aPath)), mrDirectories(arDirectories) {}

    bool readLayouts(const std::string& acrRoot, std::string& arProblem);
    bool openBuffers(std::string& arProblem);
    int write(const std::string& acrName, const std::string& acrText) const;

    const std::string mPath;
    ZTCTraceDirectories& mrDirectories;
    ZTSScsiDoneLayout mRecordLayout;
    ZTSTracePageLayout mPageLayout;
    bool mWakesAtOnce = false;
    std::vector<Buffer> mBuffers;
};

/// The name of this process's instance: a common begin, the process's number, and when it was started, so that another
/// of the same number is not taken for it.
std::string makeTraceInstanceName();

/// Whether an instance of this name is one of the library's, and its process is gone.
bool isTraceInstanceLeftOver(const std::string& acrName);

#endif
