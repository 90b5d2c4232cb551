/// Writes a compressed tar archive. It gets its name only when it is complete.
#ifndef SENSOR_TAVIK_SRC_REPORTARCHIVE_H
#define SENSOR_TAVIK_SRC_REPORTARCHIVE_H

#include <cstdint>
#include <string>
#include <vector>

struct ZTSReportFile {
    std::string mPath;  ///< within the archive
    std::string mText;
};

/// Replaces each of the texts by "[left out]" in the files' contents and names.
void leaveOut(std::vector<ZTSReportFile>& arFiles, const std::vector<std::string>& acrSecrets);

/// Writes the files below one folder of that name. The archive is made under another name and moved into place; only
/// its owner may read it. Returns its size in bytes. Throws std::system_error or std::runtime_error with the path.
std::uint64_t writeArchive(const std::string& acrPath, const std::string& acrFolder,
                           const std::vector<ZTSReportFile>& acrFiles, std::int64_t aSeconds);

#endif
