#include "sensor/client/include/ClientErrors.h"

#include <system_error>

ZTCSystemCallEx::ZTCSystemCallEx(const std::string& acrWhat, int aErrno)
    : ZTCClientEx(acrWhat + ": " + std::generic_category().message(aErrno)), mErrno(aErrno) {}
