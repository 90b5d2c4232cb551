/// The reference-counted owning pointer through which every shared object is held.
///
/// A pointer is empty, or shares its object with all of its copies; the last of them to go releases the object. Use of
/// an empty pointer, copying one included, is a bug and ends the process by an assertion. Pointers to one object may
/// be copied and destroyed on different threads; one pointer is guarded by its owner.

#ifndef COMMON_INCLUDE_POINTER_H
#define COMMON_INCLUDE_POINTER_H

#include <cstddef>
#include <cstdlib>
#include <new>
#include <type_traits>
#include <utility>

#include "common/include/Assert.h"
#include "common/include/Exception.h"
#include "common/include/Memory.h"
#include "common/include/ReferenceCount.h"

/// What a pointer points to.
enum ZTEPointerSizeType : unsigned char {
    ZTPST_None = 0,
    ZTPST_Individual = 1,  ///< one object
    ZTPST_Array = 2,       ///< an array made with array new
    ZTPST_Max = 3
};

/// How it was allocated.
enum ZTEPointerAllocType : unsigned char {
    ZTPAT_None = 0,
    ZTPAT_New = 1,     ///< new or array new; released by the matching delete
    ZTPAT_Malloc = 2,  ///< malloc; released by free, without a destructor
    ZTPAT_Max = 3
};

/// Whether objects of the class are made together with their count, in one allocation, by ZTCPointer<T>::make and in no
/// other way. A class says so by declaring `using ZTMadeWithItsCount = void;`. Those are the objects of a scope record:
/// each costs one allocation instead of two on the path of an event.
template <typename T>
concept ZTCIsMadeWithItsCount = requires {
    typename T::ZTMadeWithItsCount;
};

/// An object with its count, for an owner that holds it as a member and shares it through pointers, all of which go
/// before the owner does. The owner has a share of its own, so that the pointers never release the object.
template <typename T>
class ZTCCounted {
public:
    template <typename... Arguments>
    explicit ZTCCounted(Arguments&&... arArguments) : mCount(1), mObject(std::forward<Arguments>(arArguments)...) {}
    ZTCCounted(const ZTCCounted&) = delete;
    ZTCCounted& operator=(const ZTCCounted&) = delete;

private:
    template <typename Other>
    friend class ZTCPointer;

    ZTCReferenceCount mCount;
    T mObject;
};

// The log shows the conditions as they are written here: 0, not nullptr.

template <typename T>
class ZTCPointer {
public:
    /// Makes an object with its count, and the pointer to it. Throws what the object's constructor does, and
    /// ZTCNoMemoryEx("Out of Memory", 2).
    template <typename... Arguments>
    static ZTCPointer make(Arguments&&... arArguments) {
        static_assert(ZTCIsMadeWithItsCount<T>, "the class does not say that it is made so");
        static_assert(alignof(ZTSJoined) <= __STDCPP_DEFAULT_NEW_ALIGNMENT__);
        void* const lpBlock = ::operator new(sizeof(ZTSJoined), std::nothrow);
        if (lpBlock == nullptr) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
        ZTCPointer lPointer;
        try {
            lPointer.mPointer = new (static_cast<unsigned char*>(lpBlock) + offsetof(ZTSJoined, mObject))
                T(std::forward<Arguments>(arArguments)...);
        } catch (...) {
            ::operator delete(lpBlock);
            throw;
        }
        lPointer.mReferenceCount = new (lpBlock) ZTCReferenceCount(1);
        lPointer.mSizeType = ZTPST_Individual;
        lPointer.mAllocType = ZTPAT_New;
        return lPointer;
    }

    /// Shares an object that is part of its owner.
    explicit ZTCPointer(ZTCCounted<T>& arCounted) noexcept
        : mPointer(&arCounted.mObject),
          mReferenceCount(&arCounted.mCount),
          mSizeType(ZTPST_Individual),
          mAllocType(ZTPAT_New) {
        mReferenceCount->increment();
    }

    /// An empty pointer.
    ZTCPointer() noexcept = default;

    /// Takes ownership, also when it throws. A null object is the result of an allocation that failed:
    /// ZTCNoMemoryEx("Out of Memory", 2).
    ZTCPointer(T* apObject, ZTEPointerSizeType aSizeType = ZTPST_Individual, ZTEPointerAllocType aAllocType = ZTPAT_New)
        : mPointer(apObject), mSizeType(aSizeType), mAllocType(aAllocType) {
        static_assert(!ZTCIsMadeWithItsCount<T>, "such an object comes from make");
        if (mPointer == nullptr) {
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
        mReferenceCount = NEW ZTCReferenceCount(1);
        if (mReferenceCount == nullptr) {
            _releaseMemory();
            throw ZTCNoMemoryEx("Out of Memory", gcErrNoMemory);
        }
    }

    /// Shares the object. Copying an empty pointer is fatal.
    ZTCPointer(const ZTCPointer& acrCopy) {
        ZT_ASSERT(0 != acrCopy.mPointer);
        ZT_ASSERT(0 != acrCopy.mReferenceCount);
        shareFieldsOf(acrCopy);
    }

    /// Shares the object of a pointer to a class derived from T. The same rules as for copying; T needs a virtual
    /// destructor, since the release may come through it, and arrays cannot be converted.
    template <typename Derived>
    requires(!std::is_same_v<Derived, T> && std::is_convertible_v<Derived*, T*>)
        ZTCPointer(const ZTCPointer<Derived>& acrCopy) {
        static_assert(
            std::is_same_v<std::remove_cv_t<Derived>, std::remove_cv_t<T>> || std::has_virtual_destructor_v<T>,
            "an object is released through a base class only by a virtual destructor");
        static_assert(ZTCIsMadeWithItsCount<Derived> == ZTCIsMadeWithItsCount<T>,
                      "both classes have to know how the object was made");
        ZT_ASSERT(0 != acrCopy.mPointer);
        ZT_ASSERT(0 != acrCopy.mReferenceCount);
        ZT_ASSERT(ZTPST_Individual == acrCopy.mSizeType);
        shareFieldsOf(acrCopy);
    }

    /// Shares the other object and gives up the own one. Assigning from an empty pointer is fatal.
    ZTCPointer& operator=(const ZTCPointer& acrCopy) {
        ZT_ASSERT(0 != acrCopy.mPointer);
        ZT_ASSERT(0 != acrCopy.mReferenceCount);
        if (this != &acrCopy) {
            // The source may live inside of the object that is given up, so that one goes last.
            ZTCPointer lFormer;
            lFormer.takeFieldsOf(*this);
            shareFieldsOf(acrCopy);
        }
        return *this;
    }

    ~ZTCPointer() {
        if (mReferenceCount != nullptr && mReferenceCount->decrement() == 0) {
            _releaseMemory();
        }
        clearFields();
    }

    /// The one object.
    T* operator->() const {
        ZT_ASSERT(0 != mPointer);
        ZT_ASSERT(0 != mReferenceCount);
        ZT_ASSERT(ZTPST_Individual == mSizeType);
        return mPointer;
    }

    /// The object, or the first element of an array.
    T& operator*() const {
        ZT_ASSERT(0 != mPointer);
        ZT_ASSERT(0 != mReferenceCount);
        switch (mSizeType) {
            case ZTPST_Individual:
            case ZTPST_Array:
                break;
            default:
                ZT_NEVER_GET_HERE();
        }
        return *mPointer;
    }

    /// The raw pointer; the object stays owned.
    T* get() const {
        ZT_ASSERT(0 != mPointer);
        ZT_ASSERT(0 != mReferenceCount);
        return mPointer;
    }

    /// Compares with a raw pointer: `lPointer != nullptr` asks whether the pointer is not empty.
    bool operator!=(const T* apOther) const noexcept { return mPointer != apOther; }

private:
    template <typename Other>
    friend class ZTCPointer;

    /// The one allocation of make.
    struct ZTSJoined {
        alignas(ZTCReferenceCount) unsigned char mCount[sizeof(ZTCReferenceCount)];
        alignas(T) unsigned char mObject[sizeof(T)];
    };

    template <typename Other>
    void shareFieldsOf(const ZTCPointer<Other>& acrCopy) noexcept {
        mPointer = acrCopy.mPointer;
        mReferenceCount = acrCopy.mReferenceCount;
        mSizeType = acrCopy.mSizeType;
        mAllocType = acrCopy.mAllocType;
        mReferenceCount->increment();
    }

    void takeFieldsOf(ZTCPointer& arSource) noexcept {
        mPointer = arSource.mPointer;
        mReferenceCount = arSource.mReferenceCount;
        mSizeType = arSource.mSizeType;
        mAllocType = arSource.mAllocType;
        arSource.clearFields();
    }

    void clearFields() noexcept {
        mPointer = nullptr;
        mReferenceCount = nullptr;
        mSizeType = ZTPST_None;
        mAllocType = ZTPAT_None;
    }

    /// Frees the count and the object, each if there is one.
    void _releaseMemory() {
        static_assert(
            requires { sizeof(T); }, "an object is released only where its type is complete");
        ZTCReferenceCount* const lpCount = mReferenceCount;
        mReferenceCount = nullptr;
        if constexpr (ZTCIsMadeWithItsCount<T>) {
            mPointer->~T();
            ::operator delete(lpCount);
        } else {
            delete lpCount;
            if (mPointer == nullptr) {
                return;
            }
            switch (mAllocType) {
                case ZTPAT_New:
                    switch (mSizeType) {
                        case ZTPST_Individual:
                            delete mPointer;
                            break;
                        case ZTPST_Array:
                            delete[] mPointer;
                            break;
                        default:
                            ZT_NEVER_GET_HERE();
                    }
                    break;
                case ZTPAT_Malloc:
                    std::free(const_cast<std::remove_cv_t<T>*>(mPointer));
                    break;
                default:
                    ZT_NEVER_GET_HERE();
            }
        }
    }

    T* mPointer = nullptr;
    ZTCReferenceCount* mReferenceCount = nullptr;
    ZTEPointerSizeType mSizeType = ZTPST_None;
    ZTEPointerAllocType mAllocType = ZTPAT_None;
    unsigned char mPadding[2] = {0, 0};
};

#endif
