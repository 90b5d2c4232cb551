/// A directory of a test's own, removed with everything in it when the test ends; and small file helpers.
#ifndef TESTS_SUPPORT_TEMPORARYDIRECTORY_H
#define TESTS_SUPPORT_TEMPORARYDIRECTORY_H

#include <cstddef>
#include <string>

class ZTCTemporaryDirectory {
public:
    ZTCTemporaryDirectory();
    ~ZTCTemporaryDirectory();
    ZTCTemporaryDirectory(const ZTCTemporaryDirectory&) = delete;
    ZTCTemporaryDirectory& operator=(const ZTCTemporaryDirectory&) = delete;

    const std::string& path() const { return mPath; }
    std::string path(const std::string& acrName) const { return mPath + "/" + acrName; }

private:
    std::string mPath;
};

/// The file's content; empty where there is no such file.
std::string readFile(const std::string& acrPath);
/// The same from an offset on.
std::string readFileFrom(const std::string& acrPath, std::size_t aOffset);
/// Makes the file anew with this content; throws std::runtime_error where that fails.
void writeFile(const std::string& acrPath, const std::string& acrContent);
bool exists(const std::string& acrPath);
bool isFifo(const std::string& acrPath);

#endif
