/// A status page that a test writes by hand, in the agent's place.
#ifndef TESTS_SUPPORT_STATUSPAGEFILE_H
#define TESTS_SUPPORT_STATUSPAGEFILE_H

#include <cstddef>
#include <cstdint>
#include <string>

#include "sensor/agentcommon/include/StatusPage.h"

class ZTCStatusPageFile {
public:
    /// Makes the file with a good header, so many boards and zeros for the rest, and maps it for writing. Throws
    /// std::runtime_error.
    explicit ZTCStatusPageFile(const std::string& acrPath, std::uint32_t aBoards = 0);
    ~ZTCStatusPageFile();
    ZTCStatusPageFile(const ZTCStatusPageFile&) = delete;
    ZTCStatusPageFile& operator=(const ZTCStatusPageFile&) = delete;

    ZTSStatusPage& page() { return *static_cast<ZTSStatusPage*>(mpMapped); }
    ZTSStatusHeader& header() { return page().mHeader; }
    ZTSStatusBoard& board(std::uint32_t aBoard);
    ZTSStatusRow& row(std::uint32_t aBoard, std::uint32_t aRow) { return board(aBoard).mRows[aRow]; }

    /// Makes the file longer, for so many boards, and counts them in the header.
    void grow(std::uint32_t aBoards);

    /// Gives the file this length, whatever the header says.
    void setSize(std::size_t aSize);

private:
    void map(std::size_t aSize);

    std::string mPath;
    void* mpMapped = nullptr;
    std::size_t mMappedSize = 0;
};

/// Writes a text into the page as the agent does.
template <std::size_t Words>
void setText(ZTStatusText<Words>& arText, const std::string& acrText) {
    for (std::size_t lWord = 0; lWord < Words; ++lWord) {
        std::uint64_t lBytes = 0;
        for (std::size_t lByte = 0; lByte < 8 && 8 * lWord + lByte < acrText.size(); ++lByte) {
            reinterpret_cast<char*>(&lBytes)[lByte] = acrText[8 * lWord + lByte];
        }
        arText[lWord] = lBytes;
    }
}

#endif
