/// A vector with checked bounds.

#ifndef COMMON_INCLUDE_VECTOR_H
#define COMMON_INCLUDE_VECTOR_H

#include <new>
#include <stdexcept>
#include <vector>

#include "common/include/Exception.h"
#include "common/include/Types.h"

/// Elements by index, in the order of adding. Not locked: its owner guards it.
template <typename T>
class ZTCVector {
public:
    ZTCVector() = default;

    /// An empty vector with room for aCapacity elements. More than a vector can ever hold is
    /// ZTCInvalidEx("Cannot reserve space for Vector", 6), a failed allocation ZTCNoMemoryEx("Out of Memory", 2).
    explicit ZTCVector(unsigned aCapacity) {
        try {
            mVector.reserve(aCapacity);
        } catch (const std::length_error&) {
            throw ZTCInvalidEx("Cannot reserve space for Vector", gcErrInvalid);
        } catch (const std::bad_alloc&) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
    }

    /// Appends. A failed allocation is ZTCNoMemoryEx("Out of Memory", 2), and the vector is unchanged.
    void add(const T& acrElement) {
        try {
            mVector.push_back(acrElement);
        } catch (const std::bad_alloc&) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
    }

    /// An element. An index at or past the end is ZTCInvalidEx("Vector out of bounds access", 6).
    T& get(unsigned aIndex) {
        checkIndex(aIndex);
        return mVector[aIndex];
    }
    const T& get(unsigned aIndex) const {
        checkIndex(aIndex);
        return mVector[aIndex];
    }
    T& operator[](unsigned aIndex) { return get(aIndex); }
    const T& operator[](unsigned aIndex) const { return get(aIndex); }

    /// The number of elements.
    Size numberOfElements() const noexcept { return static_cast<Size>(mVector.size()); }

private:
    void checkIndex(unsigned aIndex) const {
        if (aIndex >= mVector.size()) {
            throw ZTCInvalidEx("Vector out of bounds access", gcErrInvalid);
        }
    }

    std::vector<T> mVector;
};

#endif
