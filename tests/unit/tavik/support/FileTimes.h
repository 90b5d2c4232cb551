/// Modification times as tests set and read them, in whole seconds since the epoch.
#ifndef TESTS_UNIT_TAVIK_SUPPORT_FILETIMES_H
#define TESTS_UNIT_TAVIK_SUPPORT_FILETIMES_H

#include <ctime>
#include <string>

/// Throw std::runtime_error where that fails.
void setFileTime(const std::string& acrPath, std::time_t aSeconds);
std::time_t fileTime(const std::string& acrPath);

/// A process of the test's own that ends at once and is not waited for while the object lives: a zombie.
class ZTCZombie {
public:
    ZTCZombie();
    ~ZTCZombie();
    ZTCZombie(const ZTCZombie&) = delete;
    ZTCZombie& operator=(const ZTCZombie&) = delete;

    int getPid() const { return mPid; }

private:
    int mPid;
};

/// A process id that belonged to a process that is gone.
int idOfAGoneProcess();

#endif
