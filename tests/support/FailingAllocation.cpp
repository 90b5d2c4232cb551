#include "tests/support/FailingAllocation.h"

#include <cstddef>
#include <cstdlib>
#include <new>

static thread_local constinit unsigned sUntilFailure = 0;
static thread_local constinit bool sHasFailed = false;

static bool sIsToFail() noexcept {
    if (sUntilFailure == 0 || --sUntilFailure != 0) {
        return false;
    }
    sHasFailed = true;
    return true;
}

ZTCFailingAllocation::ZTCFailingAllocation(unsigned aNth) noexcept {
    sHasFailed = false;
    sUntilFailure = aNth;
}

ZTCFailingAllocation::~ZTCFailingAllocation() {
    sUntilFailure = 0;
}

bool ZTCFailingAllocation::hasFailed() const noexcept {
    return sHasFailed;
}

extern "C" {
void* __real_malloc(std::size_t);
void* __real_realloc(void*, std::size_t);
void* __wrap_malloc(std::size_t);
void* __wrap_realloc(void*, std::size_t);

void* __wrap_malloc(std::size_t aBytes) {
    return sIsToFail() ? nullptr : __real_malloc(aBytes);
}

void* __wrap_realloc(void* apBlock, std::size_t aBytes) {
    return sIsToFail() ? nullptr : __real_realloc(apBlock, aBytes);
}
}

static void* sAllocate(std::size_t aBytes) noexcept {
    return sIsToFail() ? nullptr : __real_malloc(aBytes == 0 ? 1 : aBytes);
}

void* operator new(std::size_t aBytes) {
    void* const lpBlock = sAllocate(aBytes);
    if (lpBlock == nullptr) {
        throw std::bad_alloc();
    }
    return lpBlock;
}

void* operator new[](std::size_t aBytes) {
    return operator new(aBytes);
}
void* operator new(std::size_t aBytes, const std::nothrow_t&) noexcept {
    return sAllocate(aBytes);
}
void* operator new[](std::size_t aBytes, const std::nothrow_t&) noexcept {
    return sAllocate(aBytes);
}
void operator delete(void* apBlock) noexcept {
    std::free(apBlock);
}
void operator delete[](void* apBlock) noexcept {
    std::free(apBlock);
}
void operator delete(void* apBlock, std::size_t) noexcept {
    std::free(apBlock);
}
void operator delete[](void* apBlock, std::size_t) noexcept {
    std::free(apBlock);
}
void operator delete(void* apBlock, const std::nothrow_t&) noexcept {
    std::free(apBlock);
}
void operator delete[](void* apBlock, const std::nothrow_t&) noexcept {
    std::free(apBlock);
}
