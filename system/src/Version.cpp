#include "system/include/Version.h"

#include "os/common/include/Clib.h"

ZTCString ZTCVersion::getVersion() const {
    char lText[64];
    ClibSprintf(lText, sizeof(lText), "%u.%u.%u.%u", mMajor, mMinor, mRevision, mBuild);
    return ZTCString(lText);
}
