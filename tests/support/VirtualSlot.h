/// Where a virtual operation is in its class's table of virtual functions.
#ifndef TESTS_SUPPORT_VIRTUALSLOT_H
#define TESTS_SUPPORT_VIRTUALSLOT_H

#include <cstddef>
#include <cstring>
#include <numeric>
#include <vector>

/// The slot of a virtual operation, from 0 on; a destructor takes two. The common C++ ABI keeps the slot's offset in
/// the pointer to the operation: plus 1, or on some processors as it is with the mark in the word behind it.
template <typename Operation>
std::size_t virtualSlotOf(Operation apOperation) {
    static_assert(sizeof(apOperation) == 2 * sizeof(std::size_t));
    std::size_t lWords[2];
    std::memcpy(lWords, &apOperation, sizeof lWords);
    return lWords[0] / sizeof(void*);
}

/// So many slots in a row, the first of them behind that of the destructor.
inline std::vector<std::size_t> slotsBehindTheDestructor(std::size_t aCount) {
    std::vector<std::size_t> lSlots(aCount);
    std::iota(lSlots.begin(), lSlots.end(), std::size_t{2});
    return lSlots;
}

#endif
