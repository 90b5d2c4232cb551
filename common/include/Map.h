/// An ordered map. A missing key and a key that is there already are reported by the framework's exceptions.

#ifndef COMMON_INCLUDE_MAP_H
#define COMMON_INCLUDE_MAP_H

#include <map>
#include <new>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "common/include/Types.h"

/// A map ordered by the keys' less-than. Not locked: its owner guards it.
template <typename K, typename V>
class ZTCMap {
public:
    using iterator = typename std::map<K, V>::iterator;
    using const_iterator = typename std::map<K, V>::const_iterator;

    /// Inserts a pair. A key that is present already is logged at error level and is ZTCExistsEx, code 10; a failed
    /// allocation is ZTCNoMemoryEx("Out of Memory", 2). The map is unchanged then.
    void insert(const K& acrKey, const V& acrValue) {
        bool lInserted = false;
        try {
            lInserted = mMap.try_emplace(acrKey, acrValue).second;
        } catch (const std::bad_alloc&) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
        if (!lInserted) {
            ZT_LOG_ERR("%s", "Element already existed in the map");
            throw ZTCExistsEx("Element already exists in map.. can't insert", gcErrExists);
        }
    }

    /// The value of a key. A key that is absent is logged at info level and is ZTCNotFoundEx, code 8.
    V& get(const K& acrKey) { return const_cast<V&>(static_cast<const ZTCMap&>(*this).get(acrKey)); }
    const V& get(const K& acrKey) const {
        const V* const lpValue = get(acrKey, std::nothrow);
        if (lpValue == nullptr) {
            throw ZTCNotFoundEx("No element for the key exists in map", gcErrNotFound);
        }
        return *lpValue;
    }

    /// The same without an exception: null for an absent key, which is logged too.
    const V* get(const K& acrKey, std::nothrow_t) const noexcept {
        const const_iterator lFound = mMap.find(acrKey);
        if (mMap.end() == lFound) {
            ZT_LOG_INFO("%s", "Element does not exist in the map");
            return nullptr;
        }
        return &lFound->second;
    }

    /// Whether a key is present.
    bool hasKey(const K& acrKey) const noexcept { return mMap.find(acrKey) != mMap.end(); }

    /// The place of a key, or end().
    const_iterator find(const K& acrKey) const { return mMap.find(acrKey); }

    /// The pairs in ascending order of their keys.
    iterator begin() noexcept { return mMap.begin(); }
    iterator end() noexcept { return mMap.end(); }
    const_iterator begin() const noexcept { return mMap.begin(); }
    const_iterator end() const noexcept { return mMap.end(); }

    /// Removes all pairs.
    void clear() noexcept { mMap.clear(); }

    /// The number of pairs.
    Size size() const noexcept { return static_cast<Size>(mMap.size()); }

    /// Exchanges the contents of two maps.
    void swap(ZTCMap& arOther) noexcept { mMap.swap(arOther.mMap); }

private:
    std::map<K, V> mMap;
};

#endif
