#include "tests/support/StatusPageFile.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <new>
#include <stdexcept>

#include "tests/support/TemporaryDirectory.h"

ZTCStatusPageFile::ZTCStatusPageFile(const std::string& acrPath, std::uint32_t aBoards) : mPath(acrPath) {
    writeFile(mPath, "");
    setSize(getStatusPageSize(aBoards));
    map(getStatusPageSize(aBoards));
    ZTSStatusHeader& lrHeader = header();
    lrHeader.mMagic = gcStatusMagic;
    lrHeader.mVersion = gcStatusVersion;
    lrHeader.mHeaderSize = sizeof(ZTSStatusHeader);
    lrHeader.mLossSize = sizeof(ZTSStatusLoss);
    lrHeader.mLosses = gcStatusLosses;
    lrHeader.mRowSize = sizeof(ZTSStatusRow);
    lrHeader.mRowsPerBoard = gcStatusRowsPerBoard;
    lrHeader.mBoardSize = sizeof(ZTSStatusBoard);
    lrHeader.mBoards = aBoards;
}

ZTCStatusPageFile::~ZTCStatusPageFile() {
    munmap(mpMapped, mMappedSize);
}

ZTSStatusBoard& ZTCStatusPageFile::board(std::uint32_t aBoard) {
    return reinterpret_cast<ZTSStatusBoard*>(static_cast<unsigned char*>(mpMapped) + sizeof(ZTSStatusPage))[aBoard];
}

void ZTCStatusPageFile::grow(std::uint32_t aBoards) {
    setSize(getStatusPageSize(aBoards));
    map(getStatusPageSize(aBoards));
    header().mBoards = aBoards;
}

void ZTCStatusPageFile::setSize(std::size_t aSize) {
    if (truncate(mPath.c_str(), static_cast<off_t>(aSize)) != 0) {
        throw std::runtime_error("the length of " + mPath + " cannot be set");
    }
}

void ZTCStatusPageFile::map(std::size_t aSize) {
    if (mpMapped != nullptr) {
        munmap(mpMapped, mMappedSize);
    }
    const int lFile = open(mPath.c_str(), O_RDWR | O_CLOEXEC);
    mpMapped = mmap(nullptr, aSize, PROT_READ | PROT_WRITE, MAP_SHARED, lFile, 0);
    ::close(lFile);
    if (mpMapped == MAP_FAILED) {
        throw std::runtime_error(mPath + " cannot be mapped");
    }
    mMappedSize = aSize;
}
