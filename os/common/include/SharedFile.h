/// A file that this process writes through a shared mapping while other processes read it.

#ifndef OS_COMMON_INCLUDE_SHAREDFILE_H
#define OS_COMMON_INCLUDE_SHAREDFILE_H

#include <cstddef>

#include "common/include/String.h"

/// The file gets its name when its first content is complete, and is never cut: a reader that has it mapped does not
/// fault. Its blocks are reserved before they are mapped: a full file system is an error here and not a signal later.
/// Used by one thread at a time; the mapped bytes by any.
class ZTCSharedFile {
public:
    ZTCSharedFile() = default;
    /// Unmaps. The file stays.
    ~ZTCSharedFile();
    ZTCSharedFile(const ZTCSharedFile&) = delete;
    ZTCSharedFile& operator=(const ZTCSharedFile&) = delete;

    /// Makes a file of so many zeros beside the path, as PATH.new, with mode 0600, and maps it. What another start left
    /// under that name is removed. Throws ZTCClibEx with the path and the reason; nothing is left behind then.
    void make(const char* apPath, std::size_t aSize);

    /// Renames the file to its path, in place of what is there. Throws ZTCClibEx; the file is removed then.
    void publish();

    /// Makes the file longer, by zeros, and maps it anew: pointers into the former mapping are not valid any more.
    /// Throws ZTCClibEx; file and mapping are as they were then, but for blocks that were reserved.
    void grow(std::size_t aSize);

    /// Null before make.
    void* get() const { return mpMapped; }

private:
    void map(std::size_t aSize);
    void drop() noexcept;

    ZTCString mPath;
    ZTCString mNewPath;
    int mDescriptor = -1;
    void* mpMapped = nullptr;
    std::size_t mSize = 0;
};

#endif
