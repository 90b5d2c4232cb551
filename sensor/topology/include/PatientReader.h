/// Reads many small files where any of them may block: an attribute of a sick adapter can take minutes.
///
/// The files are read one after the other by a thread of the reader's own. Where one file takes longer than the
/// patience, that thread is left behind with it and another goes on with the next file. So a file that blocks costs its
/// own value and the patience, once; as long as it blocks it is skipped.
#ifndef SENSOR_TOPOLOGY_INCLUDE_PATIENTREADER_H
#define SENSOR_TOPOLOGY_INCLUDE_PATIENTREADER_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

/// Most bytes that are read of a file.
inline constexpr std::size_t gcMostAttributeBytes = 4096;

/// Files that may block at once. With so many, the rest of a call is not read.
inline constexpr std::size_t gcMostBlockedFiles = 32;

class ZTCPatientReader {
public:
    /// @param aPatience  longest wait for one file
    explicit ZTCPatientReader(std::chrono::milliseconds aPatience = std::chrono::milliseconds(250));
    /// Does not wait for files that block: their threads end when the files answer.
    ~ZTCPatientReader();
    ZTCPatientReader(const ZTCPatientReader&) = delete;
    ZTCPatientReader& operator=(const ZTCPatientReader&) = delete;

    /// The content of each file, without blanks and line breaks at its end, in the order of the paths. Absent where the
    /// file cannot be read or blocks. One thread at a time calls it.
    std::vector<std::optional<std::string>> readAll(std::vector<std::string> aPaths);

    /// Files that readAll() was asked for so far.
    std::uint64_t countFiles() const { return mFiles; }

    /// The files that block now: asked for in some call of readAll(), and no answer has come.
    std::vector<std::string> getBlockedPaths() const;

private:
    struct ZTSBlocked;
    std::chrono::milliseconds mPatience;
    std::uint64_t mFiles = 0;
    std::shared_ptr<ZTSBlocked> mpBlocked;
};

#endif
