/// What the adapters' libraries that are built here have in common behind the C interface: one session, open from Init
/// to Close, and the entries that ask its engine.
///
/// A session has a member mEngine with getNumberOfAdapters, getAdapterInfo, registerForPort, unregisterForPort,
/// registerForBoard and unregisterForBoard, which take what the entries of libkpm.h take and return their statuses.

#ifndef LIBKPM_COMMON_INCLUDE_OPENLIBRARY_H
#define LIBKPM_COMMON_INCLUDE_OPENLIBRARY_H

#include <cstdint>
#include <exception>
#include <memory>
#include <mutex>
#include <new>
#include <utility>

#include "libkpm/common/include/LibraryStatus.h"
#include "libkpm/include/libkpm.h"

/// Any thread may call anything. The lock is not held while a session starts, works or stops.
template <class Session>
class ZTCOpenLibrary {
public:
    /// The library of this process. Never destroyed: a process may end with the library open and its threads running.
    /// In static memory, so that unloading the library leaks nothing.
    static ZTCOpenLibrary& get() {
        alignas(ZTCOpenLibrary) static unsigned char sMemory[sizeof(ZTCOpenLibrary)];
        static ZTCOpenLibrary& srLibrary = *new (sMemory) ZTCOpenLibrary;
        return srLibrary;
    }

    /// The session, which lives as long as someone uses it; null where the library is not open.
    std::shared_ptr<Session> getSession() {
        const std::lock_guard<std::mutex> lGuard(mLock);
        return mpSession;
    }

    /// False where the library is open, or another thread is opening it. Else endOpening has to follow.
    bool beginOpening() {
        const std::lock_guard<std::mutex> lGuard(mLock);
        if (mpSession != nullptr || mIsOpening) {
            return false;
        }
        mIsOpening = true;
        return true;
    }

    /// Opens the library with this session. Null: opening has failed, and the library stays closed.
    void endOpening(std::shared_ptr<Session> apSession) {
        const std::lock_guard<std::mutex> lGuard(mLock);
        mpSession = std::move(apSession);
        mIsOpening = false;
    }

    /// Closes the library and returns its session, which the caller stops; null where there was none.
    std::shared_ptr<Session> takeSession() {
        const std::lock_guard<std::mutex> lGuard(mLock);
        return std::exchange(mpSession, nullptr);
    }

private:
    ZTCOpenLibrary() = default;

    std::mutex mLock;
    std::shared_ptr<Session> mpSession;  // guarded by mLock; null: not open
    bool mIsOpening = false;             // guarded by mLock: an Init is under way
};

/// The entries of KPM_FunctionList that ask the engine. No exception leaves them: tReport gets its text.
template <class Session, void (*tReport)(const char*) noexcept>
class ZTCEngineEntries {
public:
    static std::uint32_t getNumberOfAdapters() {
        return call(0, 0, [](auto& arEngine) { return arEngine.getNumberOfAdapters(); });
    }

    static std::uint32_t getAdapterInfo(std::uint32_t aIndex, HBA_wwn* apNodeName, HBA_wwn* apPortName) {
        return call(ZTLST_NotOpen, ZTLST_NoResources,
                    [&](auto& arEngine) { return arEngine.getAdapterInfo(aIndex, apNodeName, apPortName); });
    }

    static std::uint32_t registerForPort(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aCategory,
                                         std::uint32_t aSubcategory, void* apContext, std::uint32_t* apHandle,
                                         KPM_ScopeCallback apCallback) {
        return call(ZTLST_NotOpen, ZTLST_NoResources, [&](auto& arEngine) {
            return arEngine.registerForPort(aBoard, aPort, aCategory, aSubcategory, apContext, apHandle, apCallback);
        });
    }

    static std::uint32_t unregisterForPort(std::uint32_t aBoard, HBA_wwn aPort, std::uint32_t aHandle) {
        return call(ZTLST_NotOpen, ZTLST_NoResources,
                    [&](auto& arEngine) { return arEngine.unregisterForPort(aBoard, aPort, aHandle); });
    }

    /// The handle, 0 on failure.
    static std::uint32_t registerForBoard(std::uint32_t aBoard, std::uint32_t aEventType, void* apContext,
                                          std::uint32_t /*aSize*/, KPM_EventCallback apCallback) {
        return call(
            0, 0, [&](auto& arEngine) { return arEngine.registerForBoard(aBoard, aEventType, apContext, apCallback); });
    }

    static std::uint32_t unregisterForBoard(std::uint32_t aBoard, std::uint32_t aHandle) {
        return call(ZTLST_NotOpen, ZTLST_NoResources,
                    [&](auto& arEngine) { return arEngine.unregisterForBoard(aBoard, aHandle); });
    }

private:
    /// Calls `aCall` on the open engine; `aNotOpen` where there is none, `aFailed` where it throws.
    template <class Call>
    static std::uint32_t call(std::uint32_t aNotOpen, std::uint32_t aFailed, Call aCall) {
        try {
            const std::shared_ptr<Session> lpSession = ZTCOpenLibrary<Session>::get().getSession();
            return lpSession == nullptr ? aNotOpen : aCall(lpSession->mEngine);
        } catch (const std::exception& lrException) {
            tReport(lrException.what());
            return aFailed;
        }
    }
};

#endif
