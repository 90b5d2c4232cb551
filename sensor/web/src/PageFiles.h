/// The files of the page, built into the program from sensor/web/page.
#ifndef SENSOR_WEB_SRC_PAGEFILES_H
#define SENSOR_WEB_SRC_PAGEFILES_H

#include <span>
#include <string_view>

struct ZTSPageFile {
    std::string_view mPath;  ///< "/app.js"; the page itself is "/"
    const char* mpType;      ///< for the header Content-Type
    std::string_view mContent;
};

std::span<const ZTSPageFile> getPageFiles();

/// The file of that path, or null.
const ZTSPageFile* findPageFile(std::string_view aPath);

#endif
