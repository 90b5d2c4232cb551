#include "tests/support/TemporaryDirectory.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <system_error>

ZTCTemporaryDirectory::ZTCTemporaryDirectory()
    : mPath((std::filesystem::temp_directory_path() / "tavik-test-XXXXXX").string()) {
    if (mkdtemp(mPath.data()) == nullptr) {
        throw std::runtime_error("mkdtemp of " + mPath + ": " + std::strerror(errno));
    }
}

ZTCTemporaryDirectory::~ZTCTemporaryDirectory() {
    std::error_code lError;
    std::filesystem::remove_all(mPath, lError);
}

std::string readFile(const std::string& acrPath) {
    return readFileFrom(acrPath, 0);
}

std::string readFileFrom(const std::string& acrPath, std::size_t aOffset) {
    std::ifstream lFile(acrPath, std::ios::binary);
    lFile.seekg(static_cast<std::streamoff>(aOffset));
    std::ostringstream lContent;
    lContent << lFile.rdbuf();
    return lContent.str();
}

void writeFile(const std::string& acrPath, const std::string& acrContent) {
    std::ofstream lFile(acrPath, std::ios::binary | std::ios::trunc);
    lFile << acrContent;
    lFile.close();
    if (!lFile) {
        throw std::runtime_error("cannot write " + acrPath);
    }
}

bool exists(const std::string& acrPath) {
    struct stat lStatus {};
    return lstat(acrPath.c_str(), &lStatus) == 0;
}

bool isFifo(const std::string& acrPath) {
    struct stat lStatus {};
    return lstat(acrPath.c_str(), &lStatus) == 0 && S_ISFIFO(lStatus.st_mode);
}
