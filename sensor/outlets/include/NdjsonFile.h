/// A file of JSON lines, rotated by rename: NAME becomes NAME.1, NAME.1 becomes NAME.2, and so on.
///
/// A line is in the file whole or not at all; what a killed process has left of one is taken away. Readers that follow
/// the file by name see each line once.
#ifndef SENSOR_OUTLETS_INCLUDE_NDJSONFILE_H
#define SENSOR_OUTLETS_INCLUDE_NDJSONFILE_H

#include <cstdint>
#include <string>

#include "sensor/client/include/FileDescriptor.h"

class ZTCNdjsonFile {
public:
    /// Opens nothing yet. @param acrPath  "-": standard output, which is never rotated
    /// @param aMostBytes  the file is rotated before a line would make it larger
    /// @param aKeep       old files that are kept
    ZTCNdjsonFile(const std::string& acrPath, std::uint64_t aMostBytes, std::uint64_t aKeep);

    /// Adds lines, each with its line break. Throws ZTCSystemCallEx where that fails: the file then ends behind the
    /// last whole line of an earlier call, and the same text can be given again.
    void append(const std::string& acrLines);

private:
    void open();
    void rotate();
    void write(const std::string& acrLines);

    const std::string mPath;
    const std::uint64_t mMostBytes;
    const std::uint64_t mKeep;
    ZTCFileDescriptor mFile;
    std::uint64_t mSize = 0;
    bool mIsChecked = false;  ///< what mFile ends with is whole
};

#endif
