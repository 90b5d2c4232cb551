/// Where `tavikctl get` keeps the bytes of the answer.
#ifndef SENSOR_CLIENT_SRC_RAWFILE_H
#define SENSOR_CLIENT_SRC_RAWFILE_H

#include <string>

#include "sensor/client/include/CommandEncoder.h"
#include "sensor/client/include/FileDescriptor.h"

/// Opened before anything is asked, and changed only once there is an answer.
class ZTCRawFile {
public:
    /// @param acrPath  empty: nothing is kept. Throws ZTCSystemCallEx where the file cannot be opened.
    explicit ZTCRawFile(const std::string& acrPath);

    /// Replaces the file's content. Throws ZTCSystemCallEx.
    void write(const ZTCWireBytes& acrBytes);

private:
    std::string mPath;
    ZTCFileDescriptor mFile;
};

#endif
