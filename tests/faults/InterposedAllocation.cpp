/// The allocations of the agent, its operators new among them: they rest on these. Not for a program that has the
/// address sanitizer, which allocates by itself.
#include <cerrno>
#include <cstddef>

#include "tests/faults/FaultControl.h"
#include "tests/faults/Interposer.h"

extern "C" {
void* __libc_malloc(std::size_t);
void* __libc_calloc(std::size_t, std::size_t);
void* __libc_realloc(void*, std::size_t);
void __libc_free(void*);

void* sMalloc(std::size_t) __asm__("malloc");
void* sCalloc(std::size_t, std::size_t) __asm__("calloc");
void* sRealloc(void*, std::size_t) __asm__("realloc");
void sFree(void*) __asm__("free");
}

static bool sFails(const void* apCaller) {
    if (!takeFault(gcAllocationCall, apCaller).mFires) {
        return false;
    }
    errno = ENOMEM;
    return true;
}

static void* sCounted(void* apBlock) {
    if (apBlock != nullptr) {
        countBlocks(1);
    }
    return apBlock;
}

void* sMalloc(std::size_t aSize) {
    return sFails(__builtin_return_address(0)) ? nullptr : sCounted(__libc_malloc(aSize));
}

void* sCalloc(std::size_t aNumber, std::size_t aSize) {
    return sFails(__builtin_return_address(0)) ? nullptr : sCounted(__libc_calloc(aNumber, aSize));
}

void* sRealloc(void* apBlock, std::size_t aSize) {
    if (sFails(__builtin_return_address(0))) {
        return nullptr;
    }
    void* const lpBlock = __libc_realloc(apBlock, aSize);
    return apBlock == nullptr ? sCounted(lpBlock) : lpBlock;
}

void sFree(void* apBlock) {
    if (apBlock != nullptr) {
        countBlocks(-1);
    }
    __libc_free(apBlock);
}
