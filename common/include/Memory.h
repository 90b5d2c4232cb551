/// Allocation: every failure becomes ZTCNoMemoryEx.

#ifndef COMMON_INCLUDE_MEMORY_H
#define COMMON_INCLUDE_MEMORY_H

#include <cstddef>
#include <cstdlib>
#include <new>
#include <type_traits>

/// The non-throwing new. Its result is tested: most simply by giving it to a ZTCPointer, which throws on null.
#define NEW new (std::nothrow)

/// A zero-filled block from malloc, to be freed by free. Throws ZTCNoMemoryEx.
void* allocateZeroed(std::size_t aBytes);

/// The same for aCount elements of aElementBytes; a product past the address space is out of memory too.
void* allocateZeroed(std::size_t aCount, std::size_t aElementBytes);

/// Fills a block with zeros in a way that survives optimisation.
void wipeMemory(void* apBlock, std::size_t aBytes) noexcept;

#define ZT_MALLOC(apPointer, aType) ((apPointer) = static_cast<aType*>(allocateZeroed(sizeof(aType))))
#define ZT_MALLOCARR(apPointer, aType, aCount) \
    ((apPointer) = static_cast<aType*>(allocateZeroed(static_cast<std::size_t>(aCount), sizeof(aType))))
#define ZT_MALLOCSIZE(apPointer, aType, aBytes) \
    ((apPointer) = static_cast<aType*>(allocateZeroed(static_cast<std::size_t>(aBytes))))

/// Frees a block from malloc, if there is one, and sets the pointer to null.
#define ZT_FREE(apPointer)            \
    do {                              \
        if ((apPointer) != nullptr) { \
            std::free(apPointer);     \
            (apPointer) = nullptr;    \
        }                             \
    } while (false)

/// The same, after the block's bytes were set to zero.
#define ZT_FREEARR(apPointer, aBytes)          \
    do {                                       \
        if ((apPointer) != nullptr) {          \
            wipeMemory((apPointer), (aBytes)); \
            std::free(apPointer);              \
            (apPointer) = nullptr;             \
        }                                      \
    } while (false)

/// Deletes an object, if there is one, and sets the pointer to null.
#define ZT_DELETE(apPointer)   \
    do {                       \
        delete (apPointer);    \
        (apPointer) = nullptr; \
    } while (false)

/// The same for an array.
#define ZT_DELETEARR(apPointer) \
    do {                        \
        delete[](apPointer);    \
        (apPointer) = nullptr;  \
    } while (false)

/// The lesser of two values, each evaluated once.
template <typename Left, typename Right>
constexpr std::common_type_t<Left, Right> selectLesser(const Left& acrLeft, const Right& acrRight) {
    return acrRight < acrLeft ? acrRight : acrLeft;
}

/// The greater of two values, each evaluated once.
template <typename Left, typename Right>
constexpr std::common_type_t<Left, Right> selectGreater(const Left& acrLeft, const Right& acrRight) {
    return acrLeft < acrRight ? acrRight : acrLeft;
}

#define ZT_MIN(aLeft, aRight) selectLesser((aLeft), (aRight))
#define ZT_MAX(aLeft, aRight) selectGreater((aLeft), (aRight))

#endif
