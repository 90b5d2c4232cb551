/// Knows which files of a folder are on the disk for good: an fsync() of the file, and one of its folder behind that,
/// have succeeded. Without power fsync() fails. It takes the place of fsync() for the whole program; any thread may
/// call that.
#ifndef TESTS_UNIT_COLLECTOR_SYNCEDFILES_H
#define TESTS_UNIT_COLLECTOR_SYNCEDFILES_H

#include <functional>
#include <string>

class ZTCSyncedFiles {
public:
    /// One at a time. @param aHasPower  called by the threads that sync
    explicit ZTCSyncedFiles(std::function<bool()> aHasPower);
    ~ZTCSyncedFiles();
    ZTCSyncedFiles(const ZTCSyncedFiles&) = delete;
    ZTCSyncedFiles& operator=(const ZTCSyncedFiles&) = delete;

    /// @param acrPath  as the file was when it was synced; one that has been renamed since is not
    bool isOnDisk(const std::string& acrPath) const;
};

#endif
