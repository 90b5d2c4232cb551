#include "sensor/client/include/ClientErrors.h"

#include <cerrno>
#include <system_error>

ZTCSystemCallEx::ZTCSystemCallEx(const std::string& acrWhat, int aErrno)
    : ZTCClientEx(acrWhat + ": " + std::generic_category().message(aErrno)), mErrno(aErrno) {}

bool isShortage(int aErrno) {
    return aErrno == EMFILE || aErrno == ENFILE || aErrno == ENOMEM;
}
