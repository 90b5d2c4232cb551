/// dlsym of the agent. Not for a program that has a sanitizer: what "next" is there, depends on who asks.
#include <dlfcn.h>

#include "tests/faults/Interposer.h"

using ZTPDlsym = void* (*)(void*, const char*);

extern "C" void* sFaulty_dlsym(void* apLibrary, const char* apName) __asm__("dlsym");
void* sFaulty_dlsym(void* apLibrary, const char* apName) {
    static const auto spNext = reinterpret_cast<ZTPDlsym>(dlvsym(RTLD_NEXT, "dlsym", "GLIBC_2.34"));
    return takeFault("dlsym", __builtin_return_address(0)).mFires ? nullptr : spNext(apLibrary, apName);
}
