/// What a thread component knows of its system.

#ifndef OS_COMMON_INCLUDE_SYSTEMINTERFACE_H
#define OS_COMMON_INCLUDE_SYSTEMINTERFACE_H

#include "common/include/String.h"

/// Three texts, set on the main thread before the threads start and only read afterwards; they are not locked.
class ZTCSystemInterface {
public:
    ZTCSystemInterface() : mInstallDir(""), mPidFilePathStr(""), mConfFilePathStr("") {}
    virtual ~ZTCSystemInterface() = default;

    ZTCSystemInterface(const ZTCSystemInterface&) = delete;
    ZTCSystemInterface& operator=(const ZTCSystemInterface&) = delete;

    /// The directory of the pipes and pid files.
    ZTCString getInstallDir() const { return mInstallDir; }
    void setInstallDir(const ZTCString& acrInstallDir) { mInstallDir = acrInstallDir; }

    /// The path of this process's own pid file.
    ZTCString getPidFilePathStr() const { return mPidFilePathStr; }
    void setPidFilePathStr(const ZTCString& acrPidFilePath) { mPidFilePathStr = acrPidFilePath; }

    /// The path of the configuration file, empty by default.
    ZTCString getConfFilePathStr() const { return mConfFilePathStr; }
    void setConfFilePathStr(const ZTCString& acrConfFilePath) { mConfFilePathStr = acrConfFilePath; }

private:
    ZTCString mInstallDir;
    ZTCString mPidFilePathStr;
    ZTCString mConfFilePathStr;
};

#endif
