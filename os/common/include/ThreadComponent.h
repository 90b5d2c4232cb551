/// A thread of the agent: its procedure, its name, its system and its mark for exit.

#ifndef OS_COMMON_INCLUDE_THREADCOMPONENT_H
#define OS_COMMON_INCLUDE_THREADCOMPONENT_H

#include <atomic>

#include "common/include/String.h"
#include "os/common/include/SystemInterface.h"

class ZTCThreadComponent;

/// What the argument of a thread procedure points to. It lives for as long as the thread.
struct ZTSThreadArguments {
    ZTCThreadComponent* mpThreadComponent;
    ZTCSystemInterface* mpSystemInterface;
};

/// A component is made and given to the system before its thread starts, and lives longer than the thread. Its
/// procedure loops until isSetForExit(); the system calls finish() on the same thread when the procedure has ended,
/// however it did.
class ZTCThreadComponent {
public:
    using ZTThreadProcedure = void* (*)(void*);

    /// The system is borrowed, and outlives the component's thread.
    ZTCThreadComponent(ZTThreadProcedure apProcedure, const ZTCString& acrName, ZTCSystemInterface* apSystemInterface)
        : mpProcedure(apProcedure), mName(acrName), mpSystemInterface(apSystemInterface) {}
    virtual ~ZTCThreadComponent() = default;

    ZTCThreadComponent(const ZTCThreadComponent&) = delete;
    ZTCThreadComponent& operator=(const ZTCThreadComponent&) = delete;

    /// Called on the component's thread after its procedure. Does nothing here.
    virtual void finish() {}

    /// Any thread. Once set, a component stays set.
    bool isSetForExit() const { return mIsSetForExit.load(std::memory_order_acquire); }
    void setForExit() { mIsSetForExit.store(true, std::memory_order_release); }

    const ZTCString& getName() const { return mName; }
    ZTThreadProcedure getProcedure() const { return mpProcedure; }
    ZTCSystemInterface* getSystemInterface() const { return mpSystemInterface; }

private:
    const ZTThreadProcedure mpProcedure;
    const ZTCString mName;
    ZTCSystemInterface* const mpSystemInterface;

    // Acquire and release: a thread that sees the mark sees what its setter did before.
    std::atomic<bool> mIsSetForExit{false};
};

#endif
