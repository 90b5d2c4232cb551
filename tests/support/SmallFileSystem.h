/// A small file system of a test's own, mounted where only this process and its children see it: one that can be
/// filled, and made read-only.
#ifndef TESTS_SUPPORT_SMALLFILESYSTEM_H
#define TESTS_SUPPORT_SMALLFILESYSTEM_H

#include <cstddef>
#include <string>

class ZTCSmallFileSystem {
public:
    /// Mounts it at the directory, which exists. Where this process may not mount, not even in a user namespace of its
    /// own, isMounted() is false: the test takes another way to the same error.
    ZTCSmallFileSystem(std::string aPath, std::size_t aKilobytes);
    ~ZTCSmallFileSystem();
    ZTCSmallFileSystem(const ZTCSmallFileSystem&) = delete;
    ZTCSmallFileSystem& operator=(const ZTCSmallFileSystem&) = delete;

    bool isMounted() const { return mIsMounted; }
    void makeReadOnly();
    void makeWritable();
    /// Takes all the room there is; and gives it back.
    void fill();
    void empty();

private:
    std::string fillerPath() const { return mPath + "/filler"; }

    std::string mPath;
    bool mIsMounted = false;
    bool mIsCovered = false;
};

#endif
