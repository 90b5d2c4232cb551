#include "common/include/HeldLines.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>

int ZTCHeldLines::add(const char* apLine, std::size_t aLength) noexcept {
    const std::size_t lNeeded = mLength + aLength;
    if (lNeeded > gcCapacity) {
        return gcFull;
    }
    if (lNeeded > mRoom) {
        const std::size_t lRoom = std::min(gcCapacity, std::max(lNeeded, mRoom * 2));
        void* const lpData = std::realloc(mpData, lRoom);
        if (lpData == nullptr) {
            return ENOMEM;
        }
        mpData = static_cast<char*>(lpData);
        mRoom = lRoom;
    }
    std::memcpy(mpData + mLength, apLine, aLength);
    mLength = lNeeded;
    return 0;
}

std::size_t ZTCHeldLines::getLineLength(std::size_t aBegin) const noexcept {
    const void* const lpEnd = std::memchr(mpData + aBegin, '\n', mLength - aBegin);
    return static_cast<std::size_t>(static_cast<const char*>(lpEnd) - (mpData + aBegin)) + 1;
}

void ZTCHeldLines::drop() noexcept {
    std::free(mpData);
    mpData = nullptr;
    mLength = 0;
    mRoom = 0;
}
