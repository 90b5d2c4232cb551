/// A list in the order of appending.

#ifndef COMMON_INCLUDE_LIST_H
#define COMMON_INCLUDE_LIST_H

#include <list>
#include <new>

#include "common/include/Exception.h"
#include "common/include/Types.h"

/// A doubly linked list. Not locked: its owner guards it.
template <typename T>
class ZTCList {
public:
    using iterator = typename std::list<T>::iterator;
    using const_iterator = typename std::list<T>::const_iterator;

    /// Appends. A failed allocation is ZTCNoMemoryEx("Out of Memory", 2), and the list is unchanged.
    void push_back(const T& acrElement) {
        try {
            mList.push_back(acrElement);
        } catch (const std::bad_alloc&) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
    }

    /// The elements in the order of appending.
    iterator begin() noexcept { return mList.begin(); }
    iterator end() noexcept { return mList.end(); }
    const_iterator begin() const noexcept { return mList.begin(); }
    const_iterator end() const noexcept { return mList.end(); }

    /// Removes all elements.
    void clear() noexcept { mList.clear(); }

    /// The number of elements.
    Size size() const noexcept { return static_cast<Size>(mList.size()); }

private:
    std::list<T> mList;
};

#endif
