#include "sensor/tavik/src/ReportArchive.h"

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <stdexcept>
#include <system_error>

#include "sensor/client/include/FileDescriptor.h"

static void sReplace(std::string& arText, const std::string& acrSecret) {
    static constexpr std::string_view scLeftOut = "[left out]";
    for (std::size_t lPlace = 0; (lPlace = arText.find(acrSecret, lPlace)) != std::string::npos;
         lPlace += scLeftOut.size()) {
        arText.replace(lPlace, acrSecret.size(), scLeftOut);
    }
}

void leaveOut(std::vector<ZTSReportFile>& arFiles, const std::vector<std::string>& acrSecrets) {
    for (ZTSReportFile& lrFile : arFiles) {
        for (const std::string& lrSecret : acrSecrets) {
            sReplace(lrFile.mText, lrSecret);
            sReplace(lrFile.mPath, lrSecret);
        }
    }
}

struct ZTSArchiveCloser {
    void operator()(archive* apArchive) const { archive_write_free(apArchive); }
};
struct ZTSEntryCloser {
    void operator()(archive_entry* apEntry) const { archive_entry_free(apEntry); }
};

/// Removes the unfinished file where the archive was not moved into place.
class ZTCUnfinishedFile {
public:
    explicit ZTCUnfinishedFile(const std::string& acrPath) : mPath(acrPath + ".part") {
        unlink(mPath.c_str());
        mFile = ZTCFileDescriptor(open(mPath.c_str(), O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, S_IRUSR | S_IWUSR));
        if (!mFile.isOpen()) {
            throw std::system_error(errno, std::generic_category(), "cannot make " + mPath);
        }
    }
    ~ZTCUnfinishedFile() {
        if (!mPath.empty()) {
            unlink(mPath.c_str());
        }
    }
    ZTCUnfinishedFile(const ZTCUnfinishedFile&) = delete;
    ZTCUnfinishedFile& operator=(const ZTCUnfinishedFile&) = delete;

    int get() const { return mFile.get(); }
    void moveTo(const std::string& acrPath) {
        if (rename(mPath.c_str(), acrPath.c_str()) != 0) {
            throw std::system_error(errno, std::generic_category(), "cannot rename " + mPath + " to " + acrPath);
        }
        mPath.clear();
    }

private:
    std::string mPath;
    ZTCFileDescriptor mFile;
};

static void sCheck(int aResult, archive* apArchive, const std::string& acrPath) {
    if (aResult != ARCHIVE_OK) {
        const char* const lpText = archive_error_string(apArchive);
        throw std::runtime_error("cannot write " + acrPath + ": " + (lpText != nullptr ? lpText : "unknown reason"));
    }
}

std::uint64_t writeArchive(const std::string& acrPath, const std::string& acrFolder,
                           const std::vector<ZTSReportFile>& acrFiles, std::int64_t aSeconds) {
    ZTCUnfinishedFile lUnfinished(acrPath);
    const std::unique_ptr<archive, ZTSArchiveCloser> lpArchive(archive_write_new());
    if (lpArchive == nullptr) {
        throw std::bad_alloc();
    }
    sCheck(archive_write_add_filter_gzip(lpArchive.get()), lpArchive.get(), acrPath);
    sCheck(archive_write_set_format_pax_restricted(lpArchive.get()), lpArchive.get(), acrPath);
    sCheck(archive_write_open_fd(lpArchive.get(), lUnfinished.get()), lpArchive.get(), acrPath);
    for (const ZTSReportFile& lrFile : acrFiles) {
        const std::unique_ptr<archive_entry, ZTSEntryCloser> lpEntry(archive_entry_new());
        if (lpEntry == nullptr) {
            throw std::bad_alloc();
        }
        archive_entry_set_pathname(lpEntry.get(), (acrFolder + "/" + lrFile.mPath).c_str());
        archive_entry_set_size(lpEntry.get(), static_cast<la_int64_t>(lrFile.mText.size()));
        archive_entry_set_filetype(lpEntry.get(), AE_IFREG);
        archive_entry_set_perm(lpEntry.get(), S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH);
        archive_entry_set_mtime(lpEntry.get(), static_cast<time_t>(aSeconds), 0);
        sCheck(archive_write_header(lpArchive.get(), lpEntry.get()), lpArchive.get(), acrPath);
        const la_ssize_t lWritten = archive_write_data(lpArchive.get(), lrFile.mText.data(), lrFile.mText.size());
        if (lWritten < 0 || static_cast<std::size_t>(lWritten) != lrFile.mText.size()) {
            sCheck(ARCHIVE_FATAL, lpArchive.get(), acrPath);
        }
    }
    sCheck(archive_write_close(lpArchive.get()), lpArchive.get(), acrPath);
    struct stat lStatus {};
    if (fsync(lUnfinished.get()) != 0 || fstat(lUnfinished.get(), &lStatus) != 0) {
        throw std::system_error(errno, std::generic_category(), "cannot write " + acrPath);
    }
    lUnfinished.moveTo(acrPath);
    return static_cast<std::uint64_t>(lStatus.st_size);
}
