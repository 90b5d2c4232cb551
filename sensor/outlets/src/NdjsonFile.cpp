#include "sensor/outlets/include/NdjsonFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"

ZTCNdjsonFile::ZTCNdjsonFile(const std::string& acrPath, std::uint64_t aMostBytes, std::uint64_t aKeep)
    : mPath(acrPath), mMostBytes(aMostBytes), mKeep(aKeep) {}

/// A process that was killed while it wrote, or a power cut, may have left a part of a line. It was not counted as
/// written, and comes again, whole: so the part is taken away, which would spoil the next line. Returns the size of the
/// rest.
static off_t sRemoveTornLine(const std::string& acrPath, int aDescriptor, off_t aSize) {
    const ZTCFileDescriptor lReader = ZTCFileDescriptor::open(acrPath.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK);
    std::array<char, 4096> lBytes;
    off_t lEnd = aSize;  // all behind this is a part of a line
    while (lEnd > 0) {
        const off_t lBegin = std::max<off_t>(0, lEnd - static_cast<off_t>(lBytes.size()));
        const ssize_t lCount = pread(lReader.get(), lBytes.data(), static_cast<std::size_t>(lEnd - lBegin), lBegin);
        if (lCount != lEnd - lBegin) {
            throw ZTCSystemCallEx("cannot read the end of " + acrPath + " (ndjson.path)", lCount < 0 ? errno : EIO);
        }
        const std::size_t lBreak = std::string_view(lBytes.data(), static_cast<std::size_t>(lCount)).rfind('\n');
        if (lBreak != std::string_view::npos) {
            lEnd = lBegin + static_cast<off_t>(lBreak) + 1;
            break;
        }
        lEnd = lBegin;
    }
    if (lEnd != aSize && ftruncate(aDescriptor, lEnd) != 0) {
        throw ZTCSystemCallEx("cannot take back a part of a line in " + acrPath, errno);
    }
    return lEnd;
}

void ZTCNdjsonFile::open() {
    if (mPath == "-") {
        mFile = ZTCFileDescriptor(fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
    } else if (!mFile.isOpen() || !mFile.isAtPath(mPath.c_str())) {  // another program may have taken it away
        mFile = ZTCFileDescriptor::open(mPath.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_NONBLOCK, 0640);
        mIsChecked = false;
    }
    struct stat lStatus {};
    if (!mFile.isOpen() || fstat(mFile.get(), &lStatus) != 0) {
        throw ZTCSystemCallEx("cannot open " + mPath + " (ndjson.path)", errno);
    }
    if (mPath != "-" && S_ISREG(lStatus.st_mode) && !mIsChecked) {
        lStatus.st_size = sRemoveTornLine(mPath, mFile.get(), lStatus.st_size);
        mIsChecked = true;
    }
    mSize = S_ISREG(lStatus.st_mode) ? static_cast<std::uint64_t>(lStatus.st_size) : 0;
}

void ZTCNdjsonFile::rotate() {
    for (std::uint64_t i = mKeep; i > 0; --i) {
        const std::string lOlder = mPath + "." + std::to_string(i);
        const std::string lNewer = i == 1 ? mPath : mPath + "." + std::to_string(i - 1);
        if (rename(lNewer.c_str(), lOlder.c_str()) != 0 && errno != ENOENT) {
            throw ZTCSystemCallEx("cannot rename " + lNewer + " to " + lOlder, errno);
        }
    }
    if (mKeep == 0 && unlink(mPath.c_str()) != 0 && errno != ENOENT) {
        throw ZTCSystemCallEx("cannot remove " + mPath, errno);
    }
    mFile.reset();
    open();
}

void ZTCNdjsonFile::write(const std::string& acrLines) {
    std::size_t lWritten = 0;
    while (lWritten < acrLines.size()) {
        const ssize_t lCount = ::write(mFile.get(), acrLines.data() + lWritten, acrLines.size() - lWritten);
        if (lCount < 0 && errno == EINTR) {
            continue;
        }
        if (lCount < 0) {
            const int lErrno = errno;
            // A part of a line would spoil the next one.
            if (lWritten != 0 && ftruncate(mFile.get(), static_cast<off_t>(mSize)) != 0) {
                throw ZTCSystemCallEx("cannot take back a part of a line in " + mPath, errno);
            }
            throw ZTCSystemCallEx("cannot write " + mPath + " (ndjson.path)", lErrno);
        }
        lWritten += static_cast<std::size_t>(lCount);
    }
    mSize += lWritten;
}

void ZTCNdjsonFile::append(const std::string& acrLines) {
    open();
    if (mPath != "-" && mSize != 0 && mSize + acrLines.size() > mMostBytes) {
        rotate();
    }
    write(acrLines);
    if (fdatasync(mFile.get()) != 0 && errno != EINVAL && errno != EROFS) {  // pipes cannot be synced
        throw ZTCSystemCallEx("cannot sync " + mPath + " (ndjson.path)", errno);
    }
}
