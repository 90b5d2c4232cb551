#include "tests/faults/Interposer.h"

#include <fcntl.h>
#include <link.h>
#include <sys/mman.h>
#include <time.h>
#include <unistd.h>
#include <unwind.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "tests/faults/FaultControl.h"

namespace {

constexpr char scAgentName[] = "qrv-tvk";
constexpr char scLibraryName[] = "libkpm-linux";

struct ZTSRange {
    std::uintptr_t mBegin = 0;
    std::uintptr_t mEnd = 0;

    bool holds(const void* apAddress) const {
        const auto lAddress = reinterpret_cast<std::uintptr_t>(apAddress);
        return lAddress >= mBegin && lAddress < mEnd;
    }
};

constexpr std::size_t scMaxTransparent = 8;

ZTSFaultControl* spControl = nullptr;
ZTSRange sProgram;
ZTSRange sThisModule;
ZTSRange sLibrary;  ///< the kernel's library, once it was seen
/// This module, and the libraries that only work for their callers: a call counts as that of their caller.
ZTSRange sTransparent[scMaxTransparent];
std::size_t sNumberOfTransparent = 0;

ZTSRange sRangeOf(const dl_phdr_info* apObject) {
    ZTSRange lRange;
    for (int lIndex = 0; lIndex < apObject->dlpi_phnum; ++lIndex) {
        const ElfW(Phdr)& lcrHeader = apObject->dlpi_phdr[lIndex];
        if (lcrHeader.p_type == PT_LOAD) {
            const std::uintptr_t lBegin = apObject->dlpi_addr + lcrHeader.p_vaddr;
            if (lRange.mEnd == 0 || lBegin < lRange.mBegin) {
                lRange.mBegin = lBegin;
            }
            if (lBegin + lcrHeader.p_memsz > lRange.mEnd) {
                lRange.mEnd = lBegin + lcrHeader.p_memsz;
            }
        }
    }
    return lRange;
}

int sNoteObject(dl_phdr_info* apObject, std::size_t, void* apIsFirst) {
    const ZTSRange lRange = sRangeOf(apObject);
    bool& lrIsFirst = *static_cast<bool*>(apIsFirst);
    const char* lpName = apObject->dlpi_name;
    const bool lIsThisModule = lRange.holds(reinterpret_cast<const void*>(&sNoteObject));
    if (lIsThisModule) {
        sThisModule = lRange;
    }
    if (lrIsFirst) {
        sProgram = lRange;
    } else if (sNumberOfTransparent < scMaxTransparent &&
               (lIsThisModule || std::strstr(lpName, "libstdc++") || std::strstr(lpName, "libasan") ||
                std::strstr(lpName, "libubsan") || std::strstr(lpName, "libtsan"))) {
        sTransparent[sNumberOfTransparent++] = lRange;
    }
    lrIsFirst = false;
    return 0;
}

int sNoteLibrary(dl_phdr_info* apObject, std::size_t, void*) {
    if (std::strstr(apObject->dlpi_name, scLibraryName) == nullptr) {
        return 0;
    }
    sLibrary = sRangeOf(apObject);
    return 1;
}

/// The module whose calls are meant. The library is opened while the agent runs, and stays.
const ZTSRange& sMeantModule() {
    if (spControl->mIsOfLibrary == 0) {
        return sProgram;
    }
    if (sLibrary.mEnd == 0) {
        dl_iterate_phdr(&sNoteLibrary, nullptr);
    }
    return sLibrary;
}

std::int64_t sNow() {
    timespec lTime{};
    clock_gettime(CLOCK_MONOTONIC, &lTime);
    return std::int64_t{lTime.tv_sec} * 1000 + lTime.tv_nsec / 1000000;
}

/// Whether this call, from 1, is one that fails.
bool sIsMeant(std::uint32_t aCall) {
    if (aCall == spControl->mNth) {
        spControl->mFirstTime.store(sNow());
        return true;
    }
    if (aCall < spControl->mNth || spControl->mIsLasting == 0) {
        return false;
    }
    const std::int64_t lFirst = spControl->mFirstTime.load();
    return spControl->mSpan == 0 || lFirst == 0 || sNow() < lFirst + std::int64_t{spControl->mSpan};
}

bool sIsTransparent(const void* apAddress) {
    for (std::size_t lIndex = 0; lIndex < sNumberOfTransparent; ++lIndex) {
        if (sTransparent[lIndex].holds(apAddress)) {
            return true;
        }
    }
    return false;
}

_Unwind_Reason_Code sFindCaller(_Unwind_Context* apContext, void* apCaller) {
    const auto* lpAddress = reinterpret_cast<const void*>(_Unwind_GetIP(apContext));
    if (sIsTransparent(lpAddress)) {
        return _URC_NO_REASON;
    }
    *static_cast<const void**>(apCaller) = lpAddress;
    return _URC_END_OF_STACK;
}

[[gnu::constructor]] void sAttach() {
    const char* lpPath = std::getenv(gcFaultFileVariable);
    const char* lpName = std::strrchr(program_invocation_name, '/');
    lpName = lpName != nullptr ? lpName + 1 : program_invocation_name;
    const char* const lpMeant = std::getenv(gcFaultProgramVariable);
    if (lpPath == nullptr || std::strcmp(lpName, lpMeant != nullptr ? lpMeant : scAgentName) != 0) {
        return;
    }
    bool lIsFirst = true;
    dl_iterate_phdr(&sNoteObject, &lIsFirst);
    const int lFile = open(lpPath, O_RDWR | O_CLOEXEC);
    void* lpMapped =
        lFile < 0 ? MAP_FAILED : mmap(nullptr, sizeof(ZTSFaultControl), PROT_READ | PROT_WRITE, MAP_SHARED, lFile, 0);
    if (lFile >= 0) {
        close(lFile);
    }
    if (lpMapped != MAP_FAILED) {
        spControl = static_cast<ZTSFaultControl*>(lpMapped);
        spControl->mIsAttached.store(1);
    }
}

}  // namespace

ZTSFault takeFault(const char* apCall, const void* apCaller) noexcept {
    if (spControl == nullptr || spControl->mIsArmed.load() == 0 || std::strcmp(spControl->mCall, apCall) != 0) {
        return {};
    }
    if (sThisModule.holds(apCaller)) {
        return {};
    }
    const int lErrno = errno;
    const ZTSRange& lrMeant = sMeantModule();
    const void* lpCaller = apCaller;
    if (!lrMeant.holds(lpCaller) && sIsTransparent(lpCaller)) {
        _Unwind_Backtrace(&sFindCaller, &lpCaller);
    }
    errno = lErrno;
    if (!lrMeant.holds(lpCaller) || !sIsMeant(spControl->mCalls.fetch_add(1) + 1)) {
        return {};
    }
    if (spControl->mFired.fetch_add(1) == 0) {
        spControl->mPlace.store(reinterpret_cast<std::uintptr_t>(lpCaller) - lrMeant.mBegin);
    }
    return {true, spControl->mErrno, spControl->mCount};
}

int getPlannedErrno() noexcept {
    return spControl == nullptr || spControl->mIsArmed.load() == 0 ? EINTR : spControl->mErrno;
}

void countBlocks(int aChange) noexcept {
    if (spControl != nullptr) {
        spControl->mLiveBlocks.fetch_add(aChange, std::memory_order_relaxed);
    }
}
