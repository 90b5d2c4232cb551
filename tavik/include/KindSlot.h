/// Numbers the pairs of one-bit category and one-bit subcategory, so that a table by pair is a plain array.
#ifndef TAVIK_INCLUDE_KINDSLOT_H
#define TAVIK_INCLUDE_KINDSLOT_H

#include <bit>

inline constexpr unsigned int gcKindCategoryBits = 5;
inline constexpr unsigned int gcKindSubcategoryBits = 8;

/// The number of slots. It is also the result for a pair that has no slot.
inline constexpr unsigned int gcKindSlots = gcKindCategoryBits * gcKindSubcategoryBits;

/// The slot of the pair, or gcKindSlots where category or subcategory is something else than one bit.
constexpr unsigned int getKindSlot(unsigned char aCategory, unsigned char aSubcategory) {
    const bool lIsOneBitEach = aCategory != 0 && (aCategory & (aCategory - 1)) == 0 && aSubcategory != 0 &&
                               (aSubcategory & (aSubcategory - 1)) == 0;
    if (!lIsOneBitEach || aCategory >= 1U << gcKindCategoryBits) {
        return gcKindSlots;
    }
    return static_cast<unsigned int>(std::countr_zero(aCategory)) * gcKindSubcategoryBits +
           static_cast<unsigned int>(std::countr_zero(aSubcategory));
}

#endif
